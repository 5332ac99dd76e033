#pragma once

#include <array>
#include <string>
#include <utility>
#include <vector>

#include "platform/series/result_series.h"

namespace mirevo {

/// The cells of a MODFLOW grid: numbered from 0, columns first, then rows, then layers.
struct ModflowGrid {
  std::uint64_t columns = 0;
  std::uint64_t rows = 0;
  std::uint64_t layers = 0;
  std::uint64_t cells() const { return columns * rows * layers; }
  /// "(1,2,3)": layer, row and column, from 1.
  std::string nameOf(std::uint64_t cell) const;
};

/// A binary file of heads, drawdowns or concentrations of MODFLOW (`.hds`, `.ddn`, `.ucn`): a record for each layer at
/// each time. Items are the cells, "head(1,2,3)" for layer, row and column; columns change first, then rows, then
/// layers. Numbers are of 32 or 64 bits, which the first record tells. Source of the layout: US Geological Survey,
/// "MODFLOW 6, Description of Input and Output", "Dependent variable file"; that of 32 bits: "MODFLOW-2005" (Techniques
/// and Methods 6-A16), ULASAV.
///
/// Cells that are dry or inactive (1e30, -1e30) are missing.
class ModflowHeads final : public ResultSeries {
 public:
  explicit ModflowHeads(std::shared_ptr<SeriesReading> reading = nullptr) : ResultSeries(std::move(reading)) {}

  int itemCount() const override;
  std::string itemName(int item) const override;

 private:
  struct Record {
    std::uint32_t step = 0;  ///< index among the times
    std::uint32_t layer = 0;
    std::uint64_t place = 0;  ///< where its values begin
  };
  struct Quantity {
    std::string name;
    std::vector<Record> records = {};
  };

  bool readHeader() override;
  std::optional<std::vector<double>> readValues(int item) override;
  bool isSingle() const override { return width_ == 4; }
  bool findWidth();

  std::uint64_t width_ = 8;  ///< bytes of a number
  ModflowGrid grid_;
  std::vector<Quantity> quantities_;
};

/// The text of 16 characters in a header, in lower case and without the blanks around it; empty if it is none.
std::string modflowText(std::string_view field);
/// Whether a number marks a cell that is dry or inactive.
bool isNoModflowValue(double value);
/// The most items that a file can have, as they are numbered in 32 bits.
inline constexpr std::uint64_t kMostResultItems = 2'000'000'000;

}  // namespace mirevo

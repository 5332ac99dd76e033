#pragma once

#include <array>
#include <string>
#include <string_view>
#include <vector>

#include "platform/series/result_series.h"

namespace mirevo {

/// The binary output file of SWMM 5 (`.out`). Items are the variables of the subcatchments, nodes and links that the
/// file has, and of the system, in the file's order: "node J1: depth". Source of the layout: US EPA, "Storm Water
/// Management Model, Interfacing Guide", section on the binary output file.
///
/// Its dates are days since 1899-12-30 in 64 bits, some of which lie a millisecond beside the step: they are rounded to
/// whole seconds.
class SwmmResults final : public ResultSeries {
 public:
  explicit SwmmResults(std::shared_ptr<SeriesReading> reading = nullptr) : ResultSeries(std::move(reading)) {}

  int itemCount() const override;
  std::string itemName(int item) const override;
  std::string itemUnit(int item) const override;
  static bool fits(std::string_view head);

 private:
  enum Kind : std::size_t { kSubcatchment, kNode, kLink, kSystem, kKinds };
  struct Group {
    std::vector<std::string> objects;
    std::vector<int> variables;  ///< their codes
    std::uint64_t begin = 0;     ///< of its values in a record, behind the date
    int itemCount() const { return static_cast<int>(objects.size() * variables.size()); }
  };
  struct Place {
    Kind kind = kSubcatchment;
    std::size_t object = 0;
    std::size_t variable = 0;
  };

  bool readHeader() override;
  std::optional<std::vector<double>> readValues(int item) override;
  bool isSingle() const override { return true; }
  bool readEnd();
  bool readNames(std::uint64_t& place);
  bool readVariables(std::uint64_t& place);
  bool readSteps();
  Place placeOf(int item) const;

  std::array<Group, kKinds> groups_;
  std::vector<std::string> pollutants_;
  std::vector<int> pollutantUnits_;
  int flowUnits_ = 0;
  std::uint64_t names_ = 0;    ///< where the names begin
  std::uint64_t results_ = 0;  ///< where the first record begins
  std::uint64_t record_ = 0;   ///< bytes
  std::size_t steps_ = 0;
};

}  // namespace mirevo

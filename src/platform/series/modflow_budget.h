#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/series/modflow_clock.h"
#include "platform/series/modflow_heads.h"
#include "platform/series/result_series.h"

namespace mirevo {

/// A binary cell-by-cell budget of MODFLOW (`.cbc`, `.bud`), in its compact form: a record for each term at each time.
/// Items are the cells of each term, "riv(1,2,3)" for layer, row and column, with the name of the package before the
/// bracket where several have the same term. Source of the layout: US Geological Survey, "MODFLOW 6, Description of
/// Input and Output", "Model budget file" (methods 1 and 6); "MODFLOW-2005" (Techniques and Methods 6-A16), UBDSV1 to
/// UBDSVB (methods 0 to 5, numbers of 32 or 64 bits).
///
/// Flows into the cell are positive. Boundaries of a term in the same cell are added up. A cell is 0 at a time at which
/// a list has no boundary in it; one that is in no list of the file is refused. Flows between neighbours
/// (FLOW-JA-FACE), which are not of cells, are passed over.
class ModflowBudget final : public ResultSeries {
 public:
  explicit ModflowBudget(std::shared_ptr<SeriesReading> reading = nullptr) : ResultSeries(std::move(reading)) {}

  int itemCount() const override;
  std::string itemName(int item) const override;

 private:
  struct Record {
    std::uint32_t step = 0;  ///< index among the times
    int method = 0;
    std::uint64_t place = 0;   ///< where its values begin
    std::uint64_t length = 0;  ///< of a list
    std::uint64_t stride = 0;  ///< bytes from one entry of a list to the next
    std::uint64_t offset = 0;  ///< of the value in an entry
  };
  struct Term {
    std::string text;
    std::string package;  ///< empty where the file has none
    std::string further;  ///< name of an auxiliary value; empty: the flow
    std::string name;
    std::vector<Record> records;
  };
  struct Header;

  bool readHeader() override;
  std::optional<std::vector<double>> readValues(int item) override;
  bool isSingle() const override { return width_ == 4; }
  bool readRecords(std::vector<std::int64_t>& seconds);
  bool readRecord(Header& header);
  bool readList(Header& header);
  bool takeGrid(const Header& header);
  bool addRecord(const Header& header, std::string_view package, std::string_view further, const Record& record);
  bool refuse(std::uint64_t place, std::string_view expected, std::string_view found);
  void nameTerms();
  std::optional<double> valueIn(const Record& record, std::uint64_t cell, bool isFlow, bool& isThere);

  ModflowClock clock_;
  std::uint64_t width_ = 8;  ///< bytes of a number
  std::size_t recordCount_ = 0;
  ModflowGrid grid_;
  std::vector<Term> terms_;
};

}  // namespace mirevo

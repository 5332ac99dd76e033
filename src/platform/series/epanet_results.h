#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "platform/series/result_series.h"

namespace mirevo {

/// The binary output file of EPANET 2 (`.out`). Items are the four results of each node, then the eight of each link,
/// in the order of the file: "node J1: pressure". Source of the layout: US EPA, "EPANET 2.2 User Manual" and the
/// documentation of its toolkit, "Output file".
///
/// The file has no date: its time 0 is read as 2000-01-01 00:00. Where it has a statistic instead of a time series (the
/// report option STATISTIC), it is refused.
class EpanetResults final : public ResultSeries {
 public:
  explicit EpanetResults(std::shared_ptr<SeriesReading> reading = nullptr) : ResultSeries(std::move(reading)) {}

  int itemCount() const override;
  std::string itemName(int item) const override;
  std::string itemUnit(int item) const override;
  static bool fits(std::string_view head);

 private:
  bool readHeader() override;
  std::optional<std::vector<double>> readValues(int item) override;
  bool isSingle() const override { return true; }
  bool readNames();
  bool readSteps();
  /// The number of a result among those of nodes (0 to 3), then of links (4 to 11).
  std::size_t resultOf(int item) const;
  std::size_t objectOf(int item) const;

  std::vector<std::string> nodes_;
  std::vector<std::string> links_;
  std::vector<std::int32_t> head_;  ///< its numbers
  std::string concentration_;       ///< unit of the quality of water
  std::uint64_t results_ = 0;       ///< where the first record begins
};

}  // namespace mirevo

#pragma once

#include <cstdint>
#include <limits>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/series/file_parts.h"
#include "platform/series/stored_time_series.h"

namespace mirevo {

/// A file whose items may have times of their own, as exchange formats with several gauges have. The axis has the times
/// of all that will be read; an item is missing where it has none.
class GatheredSeries : public StoredTimeSeries {
 public:
  bool open(const std::string& fileName) final;
  /// The same for content in memory; `sourceName` is used in messages.
  bool parse(std::string sourceName, std::string_view content);
  bool endsLine() const final { return endsLine_; }
  /// NaN: what marks missing values in the file is replaced by it.
  std::optional<float> deleteValue() const final { return std::numeric_limits<float>::quiet_NaN(); }
  std::vector<std::string> doubts() const final { return doubts_; }
  /// The axis then has the times of these alone, so that others leave no gaps in them; others have no values.
  void willRead(std::span<const int> items) final { wanted_.assign(items.begin(), items.end()); }

 protected:
  using Seconds = std::vector<std::int64_t>;  ///< secondNumber()s, strictly increasing
  struct Column {
    std::string name;
    std::string unit = {};
    std::size_t axis = 0;             ///< index of its times
    std::vector<double> values = {};  ///< one per time, NaN where one is missing
  };

  explicit GatheredSeries(std::shared_ptr<SeriesReading> reading) : reading_(std::move(reading)) {}

  /// Reads a file from its beginning, when nothing of another one is left, and gathers its series; false, with fail(),
  /// if it is none of the format.
  virtual bool read(FileParts& parts) = 0;
  /// Makes the items and the common axis.
  void gather(const std::vector<Seconds>& axes, std::vector<Column> columns);
  /// Stores "source:line: expected ..., found ..." as the last error; returns false.
  bool fail(std::size_t line, std::string_view expected, std::string_view found);
  /// The same for a file that cannot be read.
  bool failToRead(std::string_view fault);
  const std::string& sourceName() const final { return sourceName_; }

  std::string sourceName_;
  std::vector<std::string> doubts_;
  bool endsLine_ = true;

 private:
  bool readAll(std::string sourceName, FileParts& parts);
  void forget();
  bool readItem(std::size_t place) final;
  std::vector<double> readExactItem(std::size_t place) final;

  std::shared_ptr<SeriesReading> reading_;
  std::vector<int> wanted_;                        ///< items that are read; none: all
  std::vector<std::vector<double>> values_;        ///< of each item, at the times of its own axis
  std::vector<std::size_t> axisOf_;                ///< of each item
  std::vector<std::vector<std::uint32_t>> steps_;  ///< of each axis: the steps of its times on the common one
};

}  // namespace mirevo

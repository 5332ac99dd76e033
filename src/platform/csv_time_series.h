#pragma once

#include <cstdint>
#include <limits>
#include <string>
#include <string_view>
#include <vector>

#include "platform/time_series_object.h"

namespace mirevo {

namespace csv {
class DateScanner;
}

/// A text table of series: `#` comments, a header row, one row a time step, columns separated by comma, semicolon or
/// tab. The file is read in one go; open() reads the time axis and checks the shape of every row, getData() reads one
/// column, so that columns that nobody asks for (and their text flags) cost nothing and break nothing.
class CsvTimeSeries final : public TimeSeriesObject {
 public:
  bool open(const std::string& fileName) override;
  /// open() with the content at hand; `sourceName` is for messages.
  bool parse(std::string sourceName, std::string content);

  const std::string& lastError() const override { return lastError_; }
  std::optional<DateRecord> startTime() const override;
  /// That of the `# missing =` comment, else NaN. Empty cells, NaN and NA are NaN among the values.
  std::optional<float> deleteValue() const override { return deleteValue_; }
  int itemCount() const override { return static_cast<int>(names_.size()); }
  std::string itemName(int item) const override;
  bool getData(int item) override;
  int timeStepCount() const override { return static_cast<int>(times_.size()); }
  std::span<const double> times() const override { return times_; }
  std::span<const float> values(int item) const override;

 private:
  void clear();
  bool readPreamble(std::size_t& position);
  bool readMissingMark(std::string_view line);
  bool readHeader(std::string_view line);
  bool readRows(std::size_t position);
  bool readRow(const char* line, const char* lineEnd, csv::DateScanner& dates, std::int64_t& second);
  void moveToItem(int item);
  /// Keeps "file:line:column: expected ..., found ..." for the place `at` in the content; returns false.
  bool fail(const char* at, std::string_view expected, std::string_view found);

  std::string sourceName_;
  std::string content_;
  std::string lastError_;
  char separator_ = ',';
  bool hasQuotes_ = false;  ///< anywhere among the rows; without them a cell ends at the next separator
  float deleteValue_ = std::numeric_limits<float>::quiet_NaN();
  std::vector<std::string> names_;          ///< one an item
  std::int64_t startSecond_ = 0;            ///< of the first step
  std::vector<double> times_;               ///< days since the first step
  std::vector<std::size_t> cells_;          ///< one a row: where its cell of item cellsItem_ begins in the content
  int cellsItem_ = 1;                       ///< moves with getData(), so that items asked in order are found at once
  std::vector<std::vector<float>> values_;  ///< one an item, empty until getData()
};

}  // namespace mirevo

#pragma once

#include <cstdint>
#include <limits>
#include <string>
#include <string_view>
#include <vector>

#include "platform/series/stored_time_series.h"

namespace mirevo {

namespace csv {
class DateScanner;
}

/// A text table of series: `#` comments, a header row, one row a time step, columns separated by comma, semicolon or
/// tab. The file is read in one go; open() reads the time axis and checks the shape of every row, getData() reads one
/// column, so that columns that nobody asks for (and their text flags) cost nothing and break nothing.
class CsvTimeSeries final : public StoredTimeSeries {
 public:
  bool open(const std::string& fileName) override;
  /// open() with the content at hand; `sourceName` is for messages.
  bool parse(std::string sourceName, std::string content);

  /// That of the `# missing =` comment, else NaN. Empty cells, NaN and NA are NaN among the values.
  std::optional<float> deleteValue() const override { return deleteValue_; }

 private:
  bool readItem(std::size_t place) override;
  const std::string& sourceName() const override { return sourceName_; }
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
  char separator_ = ',';
  bool hasQuotes_ = false;  ///< anywhere among the rows; without them a cell ends at the next separator
  float deleteValue_ = std::numeric_limits<float>::quiet_NaN();
  std::vector<std::size_t> cells_;  ///< one a row: where its cell of item cellsItem_ begins in the content
  int cellsItem_ = 1;               ///< moves with getData(), so that items asked in order are found at once
};

}  // namespace mirevo

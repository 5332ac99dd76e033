#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/text.h"
#include "platform/series/stored_time_series.h"
#include "platform/series/text_doubts.h"

namespace mirevo {

namespace csv {
class DateScanner;
}

/// A text table of series: `#` comments, a header row, one row per time step, columns separated by comma, semicolon or
/// tab. The file is read at once; open() reads the time axis and checks the number of cells in every row, getData()
/// reads one column, so that unused columns cost nothing and may hold any text.
class CsvTimeSeries final : public StoredTimeSeries {
 public:
  /// With `reading` the reading ends when the time of its watch is over.
  explicit CsvTimeSeries(std::shared_ptr<SeriesReading> reading = nullptr) : reading_(std::move(reading)) {}

  bool open(const std::string& fileName) override;
  /// open() for content in memory; `sourceName` is used in messages.
  bool parse(std::string sourceName, std::string content);

  /// The value of the `# missing =` comment, else NaN. Empty cells, NaN and NA become NaN.
  std::optional<float> deleteValue() const override { return marks_.value(); }
  bool endsLine() const override { return mirevo::endsLine(content_); }
  /// A time of day in a column of its own, which would be the first item; comments that seem to mark missing values in
  /// another way, or a second time.
  std::vector<std::string> doubts() const override;
  std::string firstLines() const override;

 private:
  bool readItem(std::size_t place) override;
  std::vector<double> readExactItem(std::size_t place) override;
  template <typename Value>
  bool readCells(std::size_t place, std::vector<Value>& values);
  const std::string& sourceName() const override { return sourceName_; }
  void clear();
  bool readPreamble(std::size_t& position);
  bool readMissingMark(std::string_view line, std::size_t number);
  bool readHeader(std::string_view line);
  bool readRows(std::size_t position);
  bool readRow(const char* line, const char* lineEnd, csv::DateScanner& dates, std::int64_t& second);
  void moveToItem(int item);
  /// Whether the time is over, with lastError_ set then.
  bool isOver();
  /// Stores "file:line:column: expected ..., found ..." for the position `at` in the content as the last error; returns
  /// false.
  bool fail(const char* at, std::string_view expected, std::string_view found);
  bool failOfLength(const char* line, const char* lineEnd);

  std::shared_ptr<SeriesReading> reading_;
  std::string sourceName_;
  std::string content_;
  char separator_ = ',';
  bool hasQuotes_ = false;  ///< in any row; without quotes a cell ends at the next separator
  MissingMarks marks_;
  bool beginsWithTimeOfDay_ = false;  ///< the value of the first item in the first row
  std::vector<std::size_t> cells_;    ///< one per row: where the cell of item cellsItem_ begins in the content
  int cellsItem_ = 1;                 ///< moves with getData(), so that items read in order are found at once
};

}  // namespace mirevo

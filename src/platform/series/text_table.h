#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "common/text.h"
#include "platform/series/stored_time_series.h"
#include "platform/series/text_doubts.h"
#include "platform/series/text_form.h"
#include "platform/series/text_layout.h"

namespace mirevo {

class TimeReading;

/// A text table whose form the setup states: header rows, comments, separators or fixed widths, times in one column or
/// several, one table of many. Everything but the time columns is an item. The file is read at once; open() reads the
/// times and checks the number of cells in every row, getData() reads one column, so that others may hold any text.
class TextTable final : public StoredTimeSeries {
 public:
  /// findFault() must have found none in `form`.
  explicit TextTable(TextForm form, std::shared_ptr<SeriesReading> reading = nullptr)
      : form_(std::move(form)), reading_(std::move(reading)) {}

  bool open(const std::string& fileName) override;
  /// open() for content in memory; `sourceName` is used in messages.
  bool parse(std::string sourceName, std::string content);

  /// The value of the `# missing =` comment, else NaN.
  std::optional<float> deleteValue() const override { return marks_.value(); }
  bool endsLine() const override { return mirevo::endsLine(content_); }
  /// What the plain text reader doubts, columns that cut a number, and rows that are perhaps no header.
  std::vector<std::string> doubts() const override;
  std::string firstLines() const override { return describeFirstLines(content_, form_); }

 private:
  struct Row {
    std::size_t begin = 0;  ///< in the content
    std::size_t line = 0;
  };
  using Cells = std::vector<std::string_view>;

  bool readItem(std::size_t place) override;
  std::vector<double> readExactItem(std::size_t place) override;
  const std::string& sourceName() const override { return sourceName_; }
  void clear();
  bool read();
  bool readLine(const TextLayout::Line& line, TimeReading& times);
  bool splitLine(const TextLayout::Line& line, std::string_view expected);
  bool readComment(const TextLayout::Line& line);
  bool readHeader(const TextLayout::Line& line, TimeReading& times);
  bool readRow(const TextLayout::Line& line, TimeReading& times);
  /// When all header rows are read, and of the first row if there are none.
  bool nameColumns(std::size_t line);
  /// Refuses rows of values that were taken as header rows, as far as their times tell.
  bool checkHeader(TimeReading& times);
  /// The text of the time columns in cells_; `joined` is the room for that of several.
  std::string_view timeText(std::string& joined) const;
  bool isTimeColumn(std::size_t column) const;
  void noteCut(const TextLayout::Line& line);
  /// The 0-based index of the column that `named` tells by number or name.
  std::optional<std::size_t> findColumn(const std::string& named, std::size_t line);
  bool requireTable(std::size_t lastLine);
  std::optional<double> valueOf(std::string_view cell) const;
  /// The values of an item, one per row; false, with lastError_ set, at a cell that is none.
  template <typename Value>
  bool readCells(std::size_t place, std::vector<Value>& values);
  /// Whether the time is over, with lastError_ set then.
  bool isOver();
  /// Stores "source:line: expected ..., found ..." as the last error; returns false.
  bool fail(std::size_t line, std::string_view expected, std::string_view found);

  TextForm form_;
  std::shared_ptr<SeriesReading> reading_;
  std::string sourceName_;
  std::string content_;
  std::optional<TextLayout> layout_;
  Cells cells_;                           ///< of the line that is read
  std::vector<std::string> names_;        ///< of all columns
  std::vector<std::size_t> timeColumns_;  ///< 0-based
  std::vector<std::size_t> itemColumns_;
  std::vector<std::size_t> hourColumns_;  ///< that hold a time of day in the first row
  std::vector<Row> rows_;
  std::vector<TextLayout::Line> headers_;
  std::size_t blankLine_ = 0;    ///< number of the first one behind the last row; 0: none
  std::int64_t second_ = 0;      ///< of the last row
  std::size_t numbersLine_ = 0;  ///< number of a header row of numbers alone; 0: none
  std::size_t cutCount_ = 0;     ///< rows with a number that is cut
  std::string firstCut_;         ///< as a message
  MissingMarks marks_;
};

}  // namespace mirevo

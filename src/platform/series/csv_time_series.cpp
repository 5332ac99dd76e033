#include "platform/series/csv_time_series.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstring>
#include <utility>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/encoding.h"
#include "common/files.h"
#include "common/large_pages.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/series/csv_cells.h"
#include "platform/series/series_reading.h"
#include "platform/series/text_doubts.h"
#include "platform/series/text_layout.h"

namespace mirevo {
namespace {

constexpr std::ptrdiff_t kLongestLine = std::ptrdiff_t{1} << 26;
constexpr std::size_t kRowsPerLook = 65536;  ///< at the clock
constexpr std::size_t kMostItems = 1'000'000;

std::string_view viewOf(const char* begin, const char* end) {
  return {begin, static_cast<std::size_t>(end - begin)};
}

/// The separator that ends the first cell of the header row, the name of the time column; other separators may occur in
/// later names.
std::optional<char> findSeparator(std::string_view header) {
  bool quoted = false;
  for (const char c : header) {
    if (c == '"') quoted = !quoted;
    if (!quoted && (c == ',' || c == ';' || c == '\t')) return c;
  }
  return std::nullopt;
}

constexpr std::string_view kOneColumn = "the date and the time of day must be in one column, such as 2001-01-31 12:30";

/// What goes behind a fault in a row, if the cell that comes after the date or in place of a value is a time of day.
std::string hintOfTwoColumns(std::string_view cell) {
  return isTimeOfDay(cell) ? fmt::format("; {}", kOneColumn) : std::string{};
}

/// The same for the cell after a date that occurs a second time, without a time of day.
std::string hintOfHour(std::string_view cell) {
  std::string_view rest = cell;
  const auto hour = takeNumber(rest, 1, 2);
  if (!hour || *hour > 24 || !rest.empty()) return {};
  return fmt::format("; if {} is the hour: {}", cell, kOneColumn);
}

/// What goes behind a fault if the text of one cell or more may be numbers with decimal commas.
std::string hintOfDecimalComma(std::string_view text) {
  const bool isOfDigits = text.find_first_not_of("0123456789+-, ") == std::string_view::npos;
  return isOfDigits && text.find(',') != std::string_view::npos ? "; numbers have a decimal point" : std::string{};
}

}  // namespace

bool CsvTimeSeries::open(const std::string& fileName) {
  std::string reason;
  std::optional<std::string> content =
      reading_ ? readTextFile(fileName, reason, reading_->watch) : readTextFile(fileName, reason);
  if (!content) {
    clear();
    lastError_ = fileName + ": " + reason;
    return false;
  }
  return parse(fileName, std::move(*content));
}

bool CsvTimeSeries::parse(std::string sourceName, std::string content) {
  clear();
  sourceName_ = std::move(sourceName);
  content_ = std::move(content);
  if (isUtf16(content_)) {
    lastError_ = sourceName_ + ": " + faultOfEncoding(content_);
    return false;
  }
  std::size_t position = content_.starts_with(kByteOrderMark) ? kByteOrderMark.size() : 0;
  if (readPreamble(position) && readRows(position)) return true;
  items_.clear();
  times_.clear();
  cells_.clear();
  return false;
}

void CsvTimeSeries::clear() {
  content_.clear();
  lastError_.clear();
  marks_ = {};
  items_.clear();
  times_.clear();
  cells_.clear();
  cellsItem_ = 1;
  beginsWithTimeOfDay_ = false;
}

bool CsvTimeSeries::readPreamble(std::size_t& position) {
  const char* const end = content_.data() + content_.size();
  for (std::size_t number = 1; position < content_.size(); ++number) {
    const char* const begin = content_.data() + position;
    const char* const lineEnd = csv::endOfLine(begin, end);
    position = static_cast<std::size_t>(lineEnd - content_.data()) + (lineEnd != end ? 1 : 0);
    if (lineEnd - begin > kLongestLine) return failOfLength(begin, lineEnd);
    const std::string_view line = viewOf(begin, csv::trimReturn(begin, lineEnd));
    const std::string_view text = trim(line);
    if (text.empty()) continue;
    if (text.front() != '#') return readHeader(line);
    if (!readMissingMark(text, number)) return false;
  }
  return fail(end, "a header row (the time column's name, then one name an item)", "the end of the file");
}

bool CsvTimeSeries::readMissingMark(std::string_view line, std::size_t number) {
  const auto wrong = marks_.read(line.substr(1), "#", number);
  if (!wrong) return true;
  const char* const at = wrong->empty() ? line.data() + line.size() : wrong->data();
  return fail(at, "a number after \"# missing =\"", quotedForMessage(*wrong));
}

bool CsvTimeSeries::readHeader(std::string_view line) {
  const char* const end = line.data() + line.size();
  const std::optional<char> separator = findSeparator(line);
  if (!separator) {
    return fail(line.data(), "a header row with its columns separated by comma, semicolon or tab",
                quotedForMessage(line));
  }
  separator_ = *separator;
  const char* cell = line.data();
  if (csv::DateScanner().scanCell(cell, end)) {
    return fail(line.data(), "a header row before the first time step", quotedForMessage(line));
  }
  cell = csv::endOfCell(line.data(), end, separator_);
  while (cell != end) {
    const char* const begin = cell + 1;
    cell = csv::endOfCell(begin, end, separator_);
    if (items_.size() == kMostItems) return fail(begin, fmt::format("at most {} items", kMostItems), "more");
    items_.push_back({std::string(csv::cellText(begin, cell))});
    items_.back().unit = splitUnit(items_.back().name).second;
  }
  return true;
}

bool CsvTimeSeries::readRows(std::size_t position) {
  const char* const end = content_.data() + content_.size();
  const char* line = content_.data() + position;
  hasQuotes_ = std::memchr(line, '"', static_cast<std::size_t>(end - line)) != nullptr;
  // Estimates the number of rows from the length of the first; the shortest row is a date and an empty cell.
  constexpr std::size_t kShortestRow = 12;
  const std::size_t rowLength = std::max(kShortestRow, static_cast<std::size_t>(csv::endOfLine(line, end) - line) + 1);
  reserveToFill(times_, (content_.size() - position) / rowLength + 1);
  reserveToFill(cells_, times_.capacity());
  csv::DateScanner dates;
  std::int64_t second = 0;
  for (std::size_t row = 0; line < end; ++row) {
    const char* const next = csv::endOfLine(line, end);
    if (next - line > kLongestLine) return failOfLength(line, next);
    if (row % kRowsPerLook == 0 && isOver()) return false;
    const char* const lineEnd = csv::trimReturn(line, next);
    if (!std::all_of(line, lineEnd, csv::isBlank) && !readRow(line, lineEnd, dates, second)) return false;
    line = next + 1;
  }
  return true;
}

bool CsvTimeSeries::readRow(const char* line, const char* lineEnd, csv::DateScanner& dates, std::int64_t& second) {
  const char* at = line;
  std::optional<std::int64_t> now = dates.scanOnLastDay(at, lineEnd, separator_);
  if (!now) now = dates.scanCell(at, lineEnd);
  if (!now || (at != lineEnd && *at != separator_)) {
    const char* const cellEnd = csv::endOfCell(line, lineEnd, separator_);
    return fail(line, "a valid time like 2001-01-31 12:30", quotedForMessage(csv::cellText(line, cellEnd)));
  }
  if (!times_.empty() && *now <= second) {
    const char* const next = std::min(at + 1, lineEnd);
    const std::string_view after = csv::cellText(next, csv::endOfCell(next, lineEnd, separator_));
    // With a single item the cell is the value.
    const bool mayBeHour = *now == second && itemCount() > 1 && std::find(line, at, ':') == at;
    return fail(line, "a time later than " + formatDate(dateOfSecond(second)),
                formatDate(dateOfSecond(*now)) + hintOfTwoColumns(after) + (mayBeHour ? hintOfHour(after) : ""));
  }
  if (times_.empty()) startSecond_ = *now;
  second = *now;
  const int cellCount = csv::countSeparators(at, lineEnd, separator_, hasQuotes_);
  if (cellCount != itemCount()) {
    return fail(
        line, std::to_string(items_.size() + 1) + " columns as in the header row",
        std::to_string(cellCount + 1) +
            (cellCount == 2 * itemCount() ? hintOfDecimalComma(viewOf(std::min(at + 1, lineEnd), lineEnd)) : ""));
  }
  times_.push_back(static_cast<double>(second - startSecond_) / 86400.0);
  cells_.push_back(static_cast<std::size_t>(at + 1 - content_.data()));
  if (cells_.size() == 1 && at != lineEnd) {
    beginsWithTimeOfDay_ = isTimeOfDay(csv::cellText(at + 1, csv::endOfCell(at + 1, lineEnd, separator_)));
  }
  return true;
}

std::vector<std::string> CsvTimeSeries::doubts() const {
  std::vector<std::string> doubts = marks_.doubts(sourceName_);
  const bool mayBeHours = beginsWithTimeOfDay_ || isHeadingOfHours(itemCount() < 2 ? "" : itemName(1));
  if (itemCount() < 2 || !mayBeHours || !areDates(startSecond_, times_)) return doubts;
  doubts.push_back(fmt::format("{}: column 2 is called {} and is read as item No. 1, not as a part of the time; {}",
                               sourceName_, quotedForMessage(itemName(1)), kOneColumn));
  return doubts;
}

std::string CsvTimeSeries::firstLines() const {
  const std::string lines = describeFirstLines(content_, TextForm());
  return lines.empty() ? lines
                       : lines +
                             "\nHeader_Rows, Column_Separator, Time_Format and other keywords of the section tell how "
                             "a text file of another form is to be read";
}

bool CsvTimeSeries::isOver() {
  if (!reading_ || !reading_->watch.isOver()) return false;
  lastError_ = sourceName_ + ": " + reading_->watch.reason();
  return true;
}

void CsvTimeSeries::moveToItem(int item) {
  if (item == cellsItem_) return;
  const char* const begin = content_.data();
  const char* const end = begin + content_.size();
  for (std::size_t& position : cells_) {
    const char* cell = begin + position;
    for (int i = cellsItem_; i < item; ++i) cell = csv::endOfCell(cell, end, separator_) + 1;
    for (int i = cellsItem_; i > item; --i) cell = csv::previousCell(cell, separator_);
    position = static_cast<std::size_t>(cell - begin);
  }
  cellsItem_ = item;
}

template <typename Value>
bool CsvTimeSeries::readCells(std::size_t place, std::vector<Value>& values) {
  moveToItem(static_cast<int>(place) + 1);
  reserveToFill(values, times_.size());
  const char* const begin = content_.data();
  const char* const end = begin + content_.size();
  const auto endsCell = [&](const char* at) {
    return at == end || *at == separator_ || *at == '\n' || (*at == '\r' && (at + 1 == end || at[1] == '\n'));
  };
  for (std::size_t row = 0; row < cells_.size(); ++row) {
    if (std::is_same_v<Value, float> && row % kRowsPerLook == 0 && isOver()) {
      values.clear();
      return false;
    }
    const char* const cell = begin + cells_[row];
    Value value{};
    const auto [stop, error] = std::from_chars(cell, end, value);
    if (error == std::errc{} && endsCell(stop) && std::isfinite(value)) {
      values.push_back(value);
      continue;
    }
    const char* const lineEnd = csv::trimReturn(cell, csv::endOfLine(cell, end));
    const char* const cellEnd = csv::endOfCell(cell, lineEnd, separator_);
    std::optional<Value> slow;
    if constexpr (std::is_same_v<Value, float>) slow = csv::parseCell(cell, cellEnd);
    if constexpr (std::is_same_v<Value, double>) slow = csv::parseExactCell(cell, cellEnd);
    if (!slow) {
      values.clear();
      const std::string_view text = csv::cellText(cell, cellEnd);
      return fail(cell, "a number of at most 3.4028235e38 in size, an empty cell, NaN or NA",
                  quotedForMessage(text) + hintOfTwoColumns(text) + hintOfDecimalComma(text));
    }
    values.push_back(*slow);
  }
  return true;
}

bool CsvTimeSeries::readItem(std::size_t place) {
  return readCells(place, items_[place].values);
}

std::vector<double> CsvTimeSeries::readExactItem(std::size_t place) {
  std::vector<double> values;
  readCells(place, values);
  return values;
}

bool CsvTimeSeries::failOfLength(const char* line, const char* lineEnd) {
  return fail(line, fmt::format("a line of at most {} bytes", kLongestLine), fmt::format("{}", lineEnd - line));
}

bool CsvTimeSeries::fail(const char* at, std::string_view expected, std::string_view found) {
  const char* const begin = content_.data();
  const auto line = std::count(begin, at, '\n') + 1;
  const char* lineBegin = at;
  while (lineBegin != begin && lineBegin[-1] != '\n') --lineBegin;
  lastError_ = sourceName_ + ":" + std::to_string(line) + ":" + std::to_string(at - lineBegin + 1) + ": expected ";
  lastError_ += expected;
  lastError_ += ", found ";
  lastError_ += found;
  if (const std::string fault = faultOfEncoding(content_); !fault.empty()) lastError_ += "; " + fault;
  return false;
}

}  // namespace mirevo

#include "platform/series/text_table.h"

#include <algorithm>
#include <cmath>
#include <type_traits>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/encoding.h"
#include "common/files.h"
#include "platform/series/csv_cells.h"
#include "platform/series/series_reading.h"
#include "platform/series/text_time.h"

namespace mirevo {
namespace {

constexpr std::size_t kLongestLine = std::size_t{1} << 26;
constexpr std::size_t kRowsPerLook = 65536;  ///< at the clock
constexpr std::size_t kMostColumns = 1'000'000;

/// A line under or between names: "----", "=====".
bool isRuler(std::string_view cell) {
  return !cell.empty() && cell.find_first_not_of("-=_*+|") == std::string_view::npos;
}

}  // namespace

bool TextTable::open(const std::string& fileName) {
  std::string reason;
  std::optional<std::string> content =
      reading_ ? readTextFile(fileName, reason, reading_->watch) : readTextFile(fileName, reason);
  if (!content) {
    clear();
    content_.clear();
    lastError_ = fileName + ": " + reason;
    return false;
  }
  return parse(fileName, std::move(*content));
}

bool TextTable::parse(std::string sourceName, std::string content) {
  clear();
  lastError_.clear();
  sourceName_ = std::move(sourceName);
  content_ = std::move(content);
  if (isUtf16(content_)) {
    lastError_ = sourceName_ + ": " + faultOfEncoding(content_);
    return false;
  }
  if (read()) return true;
  clear();
  return false;
}

void TextTable::clear() {
  layout_.reset();
  names_.clear();
  timeColumns_.clear();
  itemColumns_.clear();
  hourColumns_.clear();
  rows_.clear();
  items_.clear();
  times_.clear();
  headers_.clear();
  blankLine_ = 0;
  second_ = 0;
  numbersLine_ = 0;
  cutCount_ = 0;
  firstCut_.clear();
  marks_ = {};
}

bool TextTable::read() {
  layout_.emplace(content_, form_);
  TimeReading times(form_);
  TextLayout::Line line;
  std::size_t lines = 0;
  while (layout_->next(line)) {
    if (lines++ % kRowsPerLook == 0 && isOver()) return false;
    if (line.text.size() > kLongestLine) {
      return fail(line.number, fmt::format("a line of at most {} bytes", kLongestLine),
                  std::to_string(line.text.size()));
    }
    if (!readLine(line, times)) return false;
  }
  return requireTable(line.number);
}

bool TextTable::readLine(const TextLayout::Line& line, TimeReading& times) {
  switch (line.kind) {
    case TextLayout::Kind::comment:
      return readComment(line);
    case TextLayout::Kind::header:
      return readHeader(line, times);
    case TextLayout::Kind::row:
      return readRow(line, times);
    case TextLayout::Kind::blank:
      if (blankLine_ == 0) blankLine_ = line.number;
      return true;
    default:
      return true;
  }
}

bool TextTable::requireTable(std::size_t lastLine) {
  const std::size_t line = std::max<std::size_t>(lastLine, 1);
  const std::string table(trim(form_.table));
  const std::vector<std::size_t>& titles = layout_->titleLines();
  if (titles.size() > 1) {
    return fail(titles[1], fmt::format("one line that begins with {}, the title of the table", quotedForMessage(table)),
                fmt::format("a second one, after line {}", titles[0]));
  }
  const bool hasTable = !names_.empty();
  if (!hasTable && !table.empty() && titles.empty()) {
    const auto number = parseInteger(table);
    if (number && *number > 0 && layout_->tableCount() < static_cast<std::size_t>(*number)) {
      return fail(line, fmt::format("table {} of those with blank lines between them", *number),
                  countText(layout_->tableCount(), "table"));
    }
    if (!number) {
      return fail(line, fmt::format("a line that begins with {}, the title of the table", quotedForMessage(table)),
                  "none");
    }
  }
  if (form_.headerRows == 0 && !hasTable) return fail(line, "a row with a time", "the end of the file");
  if (!hasTable || timeColumns_.size() + itemColumns_.size() != names_.size()) {
    return fail(line,
                fmt::format("{} with the names of the columns",
                            countText(static_cast<std::size_t>(form_.headerRows), "header row")),
                "the end of the file");
  }
  return true;
}

bool TextTable::readComment(const TextLayout::Line& line) {
  if (!rows_.empty()) return true;
  const std::string_view sign = form_.commentSign.empty() ? std::string_view("#") : form_.commentSign;
  const auto wrong = marks_.read(trim(line.text).substr(sign.size()), sign, line.number);
  return !wrong || fail(line.number, "a number after \"missing =\"", quotedForMessage(*wrong));
}

bool TextTable::splitLine(const TextLayout::Line& line, std::string_view expected) {
  if (!layout_->split(line.text, cells_)) {
    return fail(line.number,
                fmt::format("{}columns separated by tab, semicolon or comma, unless Column_Separator or Column_Widths "
                            "tells otherwise",
                            expected),
                quotedForMessage(line.text));
  }
  if (form_.columnWidths.empty()) return true;
  if (const std::string_view rest = layout_->behindColumns(line.text); !rest.empty()) {
    return fail(line.number, "nothing behind the last of Column_Widths", quotedForMessage(rest));
  }
  if (const std::size_t tab = trimTrailing(line.text).find('\t'); tab != std::string_view::npos) {
    return fail(line.number,
                "blanks between columns of fixed width (Column_Separator = 'blank' in place of Column_Widths takes "
                "tabs, too)",
                fmt::format("a tab behind {}", quotedForMessage(line.text.substr(0, tab))));
  }
  return true;
}

bool TextTable::readHeader(const TextLayout::Line& line, TimeReading& times) {
  if (!splitLine(line, "a header row with ")) return false;
  if (cells_.size() > kMostColumns) {
    return fail(line.number, fmt::format("at most {} columns", kMostColumns), std::to_string(cells_.size()));
  }
  // The only header row has names, whatever they look like.
  const bool mayRule = form_.headerRows > 1;
  const bool isLine = mayRule && std::all_of(cells_.begin(), cells_.end(), isRuler);
  // Where blanks separate, a name that is missing shifts those behind it.
  if (!isLine && !names_.empty() && layout_->separator() == ' ' && cells_.size() != names_.size()) {
    return fail(line.number,
                countText(names_.size(), "name") +
                    " as in the header row above (Column_Widths reads rows of names with gaps and names with blanks; "
                    "Skip_Rows leaves rows out)",
                std::to_string(cells_.size()));
  }
  if (!isLine) {
    names_.resize(std::max(names_.size(), cells_.size()));
    for (std::size_t i = 0; i < cells_.size(); ++i) {
      if (cells_[i].empty() || (mayRule && isRuler(cells_[i]))) continue;
      if (!names_[i].empty()) names_[i] += ' ';
      names_[i] += cells_[i];
    }
  }
  headers_.push_back(line);
  if (headers_.size() < static_cast<std::size_t>(form_.headerRows)) return true;
  return nameColumns(line.number) && checkHeader(times);
}

bool TextTable::checkHeader(TimeReading& times) {
  const bool hasNumbers = form_.timeUnit != TimeUnit::none;
  std::string joined;
  for (const TextLayout::Line& header : headers_) {
    layout_->split(header.text, cells_);
    cells_.resize(names_.size());
    // A row of column numbers below the names.
    std::size_t next = 0;
    const bool isNumbering = headers_.size() > 1 && std::ranges::all_of(cells_, [&next](std::string_view cell) {
                               return parseInteger(cell) == static_cast<std::int32_t>(++next);
                             });
    if (hasNumbers && isNumbering) continue;
    const std::string_view time = timeText(joined);
    if (!timeColumns_.empty() && times.read(time)) {
      return fail(
          header.number,
          "a header row (Header_Rows tells how many there are, 0 if columns have no names, and Skip_Rows how many "
          "lines are before them)",
          "the time " + quotedForMessage(time));
    }
    const auto isNumber = [this](std::string_view cell) {
      const auto number = withDecimalPoint(cell, form_.decimalSign.front());
      return number && parseReal(*number);
    };
    if (timeColumns_.empty() && std::ranges::all_of(cells_, isNumber)) numbersLine_ = header.number;
  }
  return true;
}

bool TextTable::isTimeColumn(std::size_t column) const {
  return std::find(timeColumns_.begin(), timeColumns_.end(), column) != timeColumns_.end();
}

std::string_view TextTable::timeText(std::string& joined) const {
  if (timeColumns_.empty()) return {};
  if (timeColumns_.size() == 1) return cells_[timeColumns_.front()];
  joined.clear();
  for (const std::size_t column : timeColumns_) {
    if (!joined.empty()) joined += ' ';
    joined += cells_[column];
  }
  return joined;
}

void TextTable::noteCut(const TextLayout::Line& line) {
  // Parts of a time often follow one another without blanks.
  auto cut = layout_->findCut(line.text, 0);
  while (cut && isTimeColumn(cut->column) && isTimeColumn(cut->column + 1)) {
    cut = layout_->findCut(line.text, cut->column + 1);
  }
  if (!cut || cutCount_++ > 0) return;
  firstCut_ = fmt::format(
      "{}:{}: Column_Widths ends column {} before character {}, between {} and {}: it cuts a number, unless these are "
      "two without a blank between them",
      sourceName_, line.number, cut->column + 1, cut->character, quotedForMessage(cells_[cut->column]),
      quotedForMessage(cells_[cut->column + 1]));
}

std::optional<std::size_t> TextTable::findColumn(const std::string& named, std::size_t line) {
  if (const auto number = parseInteger(named)) {
    if (*number >= 1 && static_cast<std::size_t>(*number) <= names_.size())
      return static_cast<std::size_t>(*number) - 1;
    fail(line, fmt::format("column {}, a Time_Column", *number), countText(names_.size(), "column"));
    return std::nullopt;
  }
  std::vector<std::size_t> found;
  for (const bool ignoresCase : {false, true}) {
    for (std::size_t i = 0; i < names_.size(); ++i) {
      if (ignoresCase ? equalIgnoringCase(names_[i], named) : names_[i] == named) found.push_back(i);
    }
    if (!found.empty()) break;
  }
  if (found.size() == 1) return found.front();
  if (found.size() > 1) {
    fail(line, fmt::format("one column called {}, a Time_Column", quotedForMessage(named)),
         fmt::format("columns {} and {}; a number tells which", found[0] + 1, found[1] + 1));
    return std::nullopt;
  }
  const auto nearest = nearestName(named, names_);
  fail(line, fmt::format("a column called {}, a Time_Column", quotedForMessage(named)),
       nearest ? fmt::format("none; did you mean {}?", quotedForMessage(*nearest)) : "none");
  return std::nullopt;
}

bool TextTable::nameColumns(std::size_t line) {
  for (const std::string& named : mirevo::timeColumns(form_)) {
    const auto column = findColumn(named, line);
    if (!column) return false;
    if (isTimeColumn(*column)) {
      return fail(line, "each Time_Column once", fmt::format("column {} twice", *column + 1));
    }
    timeColumns_.push_back(*column);
  }
  for (std::size_t column = 0; column < names_.size(); ++column) {
    if (isTimeColumn(column)) continue;
    itemColumns_.push_back(column);
    items_.push_back({names_[column]});
    items_.back().unit = splitUnit(names_[column]).second;
  }
  if (names_.empty()) return fail(line, "the names of the columns", "none");
  return true;
}

bool TextTable::readRow(const TextLayout::Line& line, TimeReading& times) {
  const bool isFirst = names_.empty();
  if (!splitLine(line, "")) return false;
  if (isFirst) {
    if (cells_.size() > kMostColumns) {
      return fail(line.number, fmt::format("at most {} columns", kMostColumns), std::to_string(cells_.size()));
    }
    for (std::size_t i = 0; i < cells_.size(); ++i) names_.push_back(fmt::format("column {}", i + 1));
    if (!nameColumns(line.number)) return false;
  }
  if (cells_.size() != names_.size()) {
    return fail(line.number,
                fmt::format("{} as in the {} row", countText(names_.size(), "column"),
                            form_.headerRows == 0 ? "first" : "header"),
                std::to_string(cells_.size()));
  }
  if (timeColumns_.empty() && !rows_.empty() && blankLine_ != 0) {
    return fail(blankLine_, "no blank line between rows that are counted, as Time_Column = 'none' says",
                fmt::format("one before the row in line {}", line.number));
  }
  blankLine_ = 0;
  std::string joined;
  const std::string_view text = timeText(joined);
  const auto second = timeColumns_.empty() ? times.ofStep(static_cast<double>(rows_.size())) : times.read(text);
  if (!second) return fail(line.number, times.expected(), quotedForMessage(text));
  if (!rows_.empty() && *second <= second_) {
    return fail(line.number, "a time later than " + formatDate(dateOfSecond(second_)),
                formatDate(dateOfSecond(*second)));
  }
  if (rows_.empty()) {
    startSecond_ = *second;
    for (std::size_t i = 0; i < cells_.size(); ++i) {
      if (isTimeOfDay(cells_[i])) hourColumns_.push_back(i);
    }
  }
  second_ = *second;
  times_.push_back(static_cast<double>(*second - startSecond_) / static_cast<double>(kSecondsOfDay));
  rows_.push_back({static_cast<std::size_t>(line.text.data() - content_.data()), line.number});
  if (!form_.columnWidths.empty()) noteCut(line);
  return true;
}

std::vector<std::string> TextTable::doubts() const {
  std::vector<std::string> doubts = marks_.doubts(sourceName_, form_.missingValues);
  if (numbersLine_ != 0) {
    doubts.push_back(
        fmt::format("{}:{}: these numbers are read as names of the columns; if they are values, Header_Rows = "
                    "0 or fewer Skip_Rows must say so",
                    sourceName_, numbersLine_));
  }
  for (std::size_t place = 0; itemColumns_.size() > 1 && place < itemColumns_.size(); ++place) {
    const std::size_t column = itemColumns_[place];
    const bool isNextToTime = (column > 0 && isTimeColumn(column - 1)) || isTimeColumn(column + 1);
    const bool mayBeHours = isHeadingOfHours(names_[column]) || std::ranges::count(hourColumns_, column) > 0;
    if (!isNextToTime || !mayBeHours || !areDates(startSecond_, times_)) continue;
    const std::string_view format = form_.timeFormat.empty() ? "" : ", with hh in Time_Format,";
    const std::string remedy =
        form_.timeUnit == TimeUnit::none
            ? fmt::format("; Time_Column = '{}, {}'{} takes it as one", form_.timeColumn, column + 1, format)
            : "";
    doubts.push_back(fmt::format("{}: column {} is called {} and is read as item No. {}, not as a part of the time{}",
                                 sourceName_, column + 1, quotedForMessage(names_[column]), place + 1, remedy));
  }
  if (cutCount_ > 0) {
    doubts.push_back(firstCut_ +
                     (cutCount_ > 1 ? fmt::format("; so in {}", countText(cutCount_ - 1, "more row")) : ""));
  }
  return doubts;
}

std::optional<double> TextTable::valueOf(std::string_view cell) const {
  std::optional<double> value;
  if (form_.decimalSign == ".") {
    value = csv::parseExactCell(cell.data(), cell.data() + cell.size());
  } else {
    const auto number = withDecimalPoint(cell, form_.decimalSign.front());
    if (number) value = csv::parseExactCell(number->data(), number->data() + number->size());
  }
  if (!value) return std::nullopt;
  for (const double missing : form_.missingValues) {
    if (*value == missing) return std::numeric_limits<double>::quiet_NaN();
  }
  return value;
}

template <typename Value>
bool TextTable::readCells(std::size_t place, std::vector<Value>& values) {
  values.reserve(rows_.size());
  const std::size_t column = itemColumns_[place];
  const char* const end = content_.data() + content_.size();
  for (std::size_t row = 0; row < rows_.size(); ++row) {
    if (std::is_same_v<Value, float> && row % kRowsPerLook == 0 && isOver()) {
      values.clear();
      return false;
    }
    const char* const begin = content_.data() + rows_[row].begin;
    const char* const lineEnd = csv::trimReturn(begin, csv::endOfLine(begin, end));
    layout_->split({begin, static_cast<std::size_t>(lineEnd - begin)}, cells_);
    const auto value = valueOf(cells_[column]);
    if (!value) {
      values.clear();
      const bool mayBeComma = form_.decimalSign == "." && cells_[column].find(',') != std::string_view::npos;
      return fail(rows_[row].line, "a number of at most 3.4028235e38 in size, an empty cell, NaN or NA",
                  quotedForMessage(cells_[column]) + fmt::format(" in column {}", column + 1) +
                      (mayBeComma ? "; Decimal_Sign = ',' reads decimal commas" : ""));
    }
    values.push_back(static_cast<Value>(*value));
  }
  return true;
}

bool TextTable::readItem(std::size_t place) {
  return readCells(place, items_[place].values);
}

std::vector<double> TextTable::readExactItem(std::size_t place) {
  std::vector<double> values;
  readCells(place, values);
  return values;
}

bool TextTable::isOver() {
  if (!reading_ || !reading_->watch.isOver()) return false;
  lastError_ = sourceName_ + ": " + reading_->watch.reason();
  return true;
}

bool TextTable::fail(std::size_t line, std::string_view expected, std::string_view found) {
  lastError_ = fmt::format("{}:{}: expected {}, found {}", sourceName_, line, expected, found);
  if (const std::string fault = faultOfEncoding(content_); !fault.empty()) lastError_ += "; " + fault;
  return false;
}

}  // namespace mirevo

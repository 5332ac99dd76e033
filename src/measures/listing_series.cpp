#include "measures/listing_series.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <unordered_map>
#include <utility>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/encoding.h"
#include "common/files.h"
#include "common/short_list.h"
#include "common/take_text.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/series/csv_cells.h"

namespace mirevo {

namespace {

constexpr std::size_t kMostNamed = 3;
constexpr std::string_view kNoPrefix = "values";  ///< the series of names that are a date or number alone

/// "a", "b", "c" and 4 more
std::string listOf(const std::vector<std::string>& names) {
  ShortList list(kMostNamed);
  for (const std::string& name : names) list.add(quotedForMessage(name));
  return list.text();
}

std::string timeText(std::int64_t second) {
  return formatDate(dateOfSecond(second));
}

bool isDigit(char c) {
  return c >= '0' && c <= '9';
}

/// The name of the series of a number, without the date or number that ended its own name.
std::string_view withoutSeparator(std::string_view front) {
  constexpr std::string_view kSeparators = "_-.:";
  if (!front.empty() && kSeparators.find(front.back()) != std::string_view::npos) front.remove_suffix(1);
  return front;
}

/// What of a name is in front of the digits at its end.
std::string_view withoutDigits(std::string_view name) {
  while (!name.empty() && isDigit(name.back())) name.remove_suffix(1);
  return name;
}

/// The form of the dates in which names end.
class DatePattern final {
 public:
  /// False, with `reason`, for a text that is none.
  bool parse(std::string_view text, std::string& reason) {
    constexpr std::pair<std::string_view, int> kFields[] = {{"YYYY", date_field::kYear}, {"MM", date_field::kMonth},
                                                            {"DD", date_field::kDay},    {"hh", date_field::kHour},
                                                            {"mm", date_field::kMinute}, {"ss", date_field::kSecond}};
    bool has[std::size(kFields)] = {};
    for (std::size_t at = 0; at < text.size(); at += parts_.back().length) {
      const std::string_view rest = text.substr(at);
      const char next = text[at];
      const auto field = std::ranges::find_if(kFields, [&](const auto& one) { return rest.starts_with(one.first); });
      const auto index = static_cast<std::size_t>(field - std::begin(kFields));
      const bool isField = field != std::end(kFields);
      const bool isFault =
          isField ? has[index] : isDigit(next) || std::string_view("YMDhms").find(next) != std::string_view::npos;
      if (isFault) {
        reason = fmt::format("expected each of YYYY, MM, DD, hh, mm and ss at most once, and no digits, found {}",
                             quotedForMessage(text));
        return false;
      }
      if (isField) has[index] = true;
      parts_.push_back(isField ? Part{field->first.size(), field->second} : Part{1, -1, next});
      length_ += parts_.back().length;
    }
    for (std::size_t i = 0; i + 1 < std::size(kFields); ++i) {
      if (has[i] || (i > 1 && !has[i + 1])) continue;
      reason = fmt::format("expected {} in the form of dates, found {}", kFields[i].first, quotedForMessage(text));
      return false;
    }
    return true;
  }

  enum class Match { none, valid, invalid };
  /// Whether a name ends in a date; `front` and `second` are then what is before it and its time.
  Match match(std::string_view name, std::string_view& front, std::int64_t& second) const {
    if (name.size() < length_) return Match::none;
    front = name.substr(0, name.size() - length_);
    std::string_view rest = name.substr(front.size());
    if (isDigit(rest.front()) && !front.empty() && isDigit(front.back())) return Match::none;
    DateRecord date{};
    date[date_field::kDay] = 1;
    for (const Part& part : parts_) {
      if (part.field < 0) {
        if (!equalIgnoringCase(rest.substr(0, 1), std::string_view(&part.literal, 1))) return Match::none;
        rest.remove_prefix(1);
        continue;
      }
      const auto number = takeNumber(rest, part.length, part.length);
      if (!number) return Match::none;
      date[static_cast<std::size_t>(part.field)] = static_cast<std::int32_t>(*number);
    }
    if (!isValidDate(date) || date[date_field::kSecond] > 59) return Match::invalid;
    second = secondNumber(date);
    return Match::valid;
  }

 private:
  struct Part {
    std::size_t length = 0;
    int field = -1;  ///< of a DateRecord; -1: this character
    char literal = 0;
  };
  std::vector<Part> parts_;
  std::size_t length_ = 0;
};

/// What a table says of one name.
struct TableRow {
  std::size_t line = 0;
  std::optional<std::int64_t> second;  ///< empty: the number belongs to no series
  std::optional<std::string> series;
};

/// A table of names and times, by names in small letters.
class TimesTable final {
 public:
  /// False, with place and cause in `reason`, for a text that is none.
  bool parse(const std::string& sourceName, std::string_view text, std::string& reason) {
    if (const std::string fault = faultOfEncoding(text); !fault.empty()) {
      reason = fmt::format("{}: {}", sourceName, fault);
      return false;
    }
    takeText(text, kByteOrderMark);
    std::size_t lineNumber = 0;
    for (const std::string_view line : splitLines(text)) {
      ++lineNumber;
      const std::string_view trimmed = trim(line);
      if (trimmed.empty() || trimmed.front() == '#') continue;
      if (!(columnCount_ == 0 ? readHeader(trimmed) : readRow(cellsOf(trimmed), lineNumber))) {
        reason = fmt::format("{}:{}: {}", sourceName, lineNumber, fault_);
        return false;
      }
    }
    if (columnCount_ != 0) return true;
    reason = sourceName + ": it is empty: expected a row with the column names name and time, and one row per number";
    return false;
  }

  const TableRow* find(std::string_view name) const {
    const auto found = rows_.find(toLowerAscii(name));
    return found == rows_.end() ? nullptr : &found->second;
  }
  bool hasSeries() const { return series_ != kNone; }

 private:
  static constexpr std::size_t kNone = static_cast<std::size_t>(-1);

  std::vector<std::string_view> cellsOf(std::string_view line) const {
    std::vector<std::string_view> cells;
    const char* at = line.data();
    const char* const end = at + line.size();
    while (true) {
      const char* const cellEnd = csv::endOfCell(at, end, separator_);
      cells.push_back(csv::cellText(at, cellEnd));
      if (cellEnd == end) return cells;
      at = cellEnd + 1;
    }
  }

  bool readHeader(std::string_view line) {
    for (const char candidate : {'\t', ';', ','}) {
      if (line.find(candidate) == std::string_view::npos) continue;
      separator_ = candidate;
      break;
    }
    const std::vector<std::string_view> cells = cellsOf(line);
    const auto columnOf = [&cells](std::string_view name) {
      const auto found = std::ranges::find_if(cells, [name](auto cell) { return equalIgnoringCase(cell, name); });
      return found == cells.end() ? kNone : static_cast<std::size_t>(found - cells.begin());
    };
    name_ = columnOf("name");
    time_ = columnOf("time");
    series_ = columnOf("series");
    columnCount_ = cells.size();
    if (name_ != kNone && time_ != kNone) return true;
    fault_ = "expected a row with the column names name and time, found " + quotedForMessage(line.substr(0, 60));
    return false;
  }

  bool readRow(const std::vector<std::string_view>& cells, std::size_t lineNumber) {
    if (cells.size() != columnCount_) {
      fault_ = fmt::format("expected {} cells as in the row of column names, found {}", columnCount_, cells.size());
      return false;
    }
    TableRow row{lineNumber, {}, {}};
    if (const std::string_view cell = cells[time_]; !cell.empty()) {
      const char* at = cell.data();
      const char* const end = at + cell.size();
      row.second = dates_.scan(at, end);
      if (!row.second || at != end) {
        fault_ = "expected a time like 2001-01-31 or 2001-01-31 12:30, found " + quotedForMessage(cell);
        return false;
      }
    }
    if (series_ != kNone) row.series = std::string(cells[series_]);
    const auto [known, isNew] = rows_.try_emplace(toLowerAscii(cells[name_]), std::move(row));
    if (isNew && !cells[name_].empty()) return true;
    fault_ = isNew ? "expected a name"
                   : fmt::format("the name {} is there twice, first in line {}", quotedForMessage(cells[name_]),
                                 known->second.line);
    return false;
  }

  std::unordered_map<std::string, TableRow> rows_;
  csv::DateScanner dates_;
  char separator_ = ',';
  std::size_t columnCount_ = 0;
  std::size_t name_ = kNone;
  std::size_t time_ = kNone;
  std::size_t series_ = kNone;
  std::string fault_;
};

}  // namespace

/// Makes a ListingForm; each way of telling times has a method.
class ListingFormMaker final {
 public:
  ListingFormMaker(const ListingSettings& settings, InstructionFile instructions, ListingFault& fault)
      : settings_(settings), form_(new ListingForm(std::move(instructions))), fault_(fault) {}

  std::shared_ptr<const ListingForm> make(std::string_view times) {
    const bool isMade = !settings_.timesFile.empty() ? takeTable(times)
                        : !settings_.dates.empty()   ? takeDates()
                                                     : takeSteps();
    if (!isMade || !finish()) return nullptr;
    return std::move(form_);
  }

 private:
  const std::vector<std::string>& names() const { return form_->instructions_.names(); }

  bool fail(std::string_view keyword, std::string text) {
    fault_ = {keyword, std::move(text)};
    return false;
  }

  bool takeTable(std::string_view text) {
    keyword_ = kInstructionTimesKeyword;
    TimesTable table;
    std::string reason;
    if (!table.parse(settings_.timesFile, text, reason)) return fail(keyword_, reason);
    std::vector<std::string> absent;
    for (std::size_t i = 0; i < names().size(); ++i) {
      const TableRow* const row = table.find(names()[i]);
      if (row == nullptr) absent.push_back(names()[i]);
      if (row == nullptr || !row->second) continue;
      const std::string_view prefix = withoutSeparator(withoutDigits(names()[i]));
      if (!add(row->series.value_or(std::string(prefix)), i, *row->second)) return false;
    }
    if (absent.empty()) return true;
    return fail(keyword_, fmt::format("{}: expected a row for each name in {}, found none for {}; the time of a number "
                                      "that belongs to no series is left blank",
                                      settings_.timesFile, settings_.instructionFile, listOf(absent)));
  }

  bool takeDates() {
    keyword_ = kInstructionDatesKeyword;
    DatePattern pattern;
    std::string reason;
    if (!pattern.parse(settings_.dates, reason)) return fail(keyword_, reason);
    for (std::size_t i = 0; i < names().size(); ++i) {
      std::string_view front;
      std::int64_t second = 0;
      const DatePattern::Match match = pattern.match(names()[i], front, second);
      if (match == DatePattern::Match::none) {
        others_.push_back(names()[i]);
      } else if (match == DatePattern::Match::invalid) {
        return fail(keyword_, fmt::format("{}: expected a date as {} at the end of the name {}",
                                          settings_.instructionFile, settings_.dates, quotedForMessage(names()[i])));
      } else if (!add(std::string(withoutSeparator(front)), i, second)) {
        return false;
      }
    }
    return true;
  }

  bool takeSteps() {
    keyword_ = kInstructionStartKeyword;
    const std::int64_t start = secondNumber(settings_.start.value());
    std::map<std::string, std::int64_t> lastNumbers;  // of each series
    std::optional<std::int64_t> firstNumber;
    for (std::size_t i = 0; i < names().size(); ++i) {
      const std::string& name = names()[i];
      const std::string_view front = withoutDigits(name);
      std::string_view digits = std::string_view(name).substr(front.size());
      if (digits.empty()) {
        others_.push_back(name);
        continue;
      }
      const std::optional<std::int64_t> number = takeNumber(digits, 1, 9);
      if (!firstNumber) firstNumber = number;
      const std::string prefix(withoutSeparator(front));
      const auto [last, isNew] = lastNumbers.try_emplace(toLowerAscii(prefix), *firstNumber - 1);
      if (!number || !digits.empty() || *number != last->second + 1) {
        return fail(keyword_,
                    fmt::format("{}: the numbers at the ends of names count the steps of each series: expected {} for "
                                "the next one of {}, found {}. For other names {} gives each its time",
                                settings_.instructionFile, last->second + 1, quotedForMessage(prefix),
                                quotedForMessage(name), kInstructionTimesKeyword));
      }
      last->second = *number;
      const auto step = static_cast<double>(*number - *firstNumber);
      if (!add(prefix, i, start + std::llround(step * *settings_.stepHours * 3600.0))) return false;
    }
    return true;
  }

  bool add(std::string name, std::size_t place, std::int64_t second) {
    if (name.empty()) name = kNoPrefix;
    const auto [found, isNew] = index_.try_emplace(toLowerAscii(name), form_->series_.size());
    if (isNew) {
      form_->series_.push_back({std::move(name)});
      seconds_.emplace_back();
    }
    ListingForm::Series& series = form_->series_[found->second];
    std::vector<std::int64_t>& seconds = seconds_[found->second];
    if (!seconds.empty() && second <= seconds.back()) {
      return fail(keyword_, fmt::format("the number {}, of {}, is read behind {}, of {}, in the series {}: expected "
                                        "times that rise in the order of reading",
                                        quotedForMessage(names()[place]), timeText(second),
                                        quotedForMessage(names()[series.places.back()]), timeText(seconds.back()),
                                        quotedForMessage(series.name)));
    }
    series.places.push_back(place);
    seconds.push_back(second);
    return true;
  }

  bool finish() {
    if (form_->series_.empty()) {
      return fail(keyword_, fmt::format("{}: no name gives a number of a series, such as {}", settings_.instructionFile,
                                        listOf(others_.empty() ? names() : others_)));
    }
    if (!others_.empty()) {
      form_->doubts_.push_back(
          fmt::format("{}: names without {} at the end are of no series: {}", settings_.instructionFile,
                      settings_.dates.empty() ? "a number" : "a date as " + settings_.dates, listOf(others_)));
    }
    std::map<std::vector<std::int64_t>, std::size_t> known;
    for (std::size_t i = 0; i < seconds_.size(); ++i) {
      const auto [axis, isNew] = known.try_emplace(seconds_[i], form_->axes_.size());
      if (isNew) form_->axes_.push_back(seconds_[i]);
      form_->series_[i].axis = axis->second;
    }
    return true;
  }

  const ListingSettings& settings_;
  std::shared_ptr<ListingForm> form_;
  ListingFault& fault_;
  std::string_view keyword_;                            ///< that of the way in which times are told
  std::unordered_map<std::string, std::size_t> index_;  ///< of series, by name in small letters
  std::vector<std::vector<std::int64_t>> seconds_;      ///< of each series
  std::vector<std::string> others_;                     ///< names that are of no series
};

std::shared_ptr<const ListingForm> ListingForm::read(const ListingSettings& settings, ListingFault& fault) {
  std::string reason;
  const auto instructions = readTextFile(settings.instructionFile, reason);
  if (!instructions) {
    fault = {kInstructionFileKeyword, fmt::format("{}: {}", settings.instructionFile, reason)};
    return nullptr;
  }
  std::optional<std::string> times;
  if (!settings.timesFile.empty()) {
    times = readTextFile(settings.timesFile, reason);
    if (!times) {
      fault = {kInstructionTimesKeyword, fmt::format("{}: {}", settings.timesFile, reason)};
      return nullptr;
    }
  }
  return make(settings, *instructions, times.value_or(std::string()), fault);
}

std::shared_ptr<const ListingForm> ListingForm::make(const ListingSettings& settings, std::string_view instructions,
                                                     std::string_view times, ListingFault& fault) {
  const bool hasSteps = settings.start && settings.stepHours;
  const int ways = (settings.timesFile.empty() ? 0 : 1) + (settings.dates.empty() ? 0 : 1) +
                   (settings.start || settings.stepHours ? 1 : 0);
  if (ways != 1 || (settings.start || settings.stepHours) != hasSteps) {
    fault = {kInstructionFileKeyword,
             fmt::format("expected one way of telling the times of its numbers beside it: {}, {}, or {} and {}",
                         kInstructionTimesKeyword, kInstructionDatesKeyword, kInstructionStartKeyword,
                         kInstructionStepKeyword)};
    return nullptr;
  }
  std::string reason;
  auto file = InstructionFile::parse(settings.instructionFile, instructions, reason);
  if (!file) {
    fault = {kInstructionFileKeyword, std::move(reason)};
    return nullptr;
  }
  return ListingFormMaker(settings, *std::move(file), fault).make(times);
}

bool ListingSeries::read(FileParts& parts) {
  std::string content;
  for (std::string_view part = parts.next(); !part.empty(); part = parts.next()) content += part;
  if (!parts.fault().empty()) return failToRead(parts.fault());
  endsLine_ = mirevo::endsLine(content);
  doubts_ = form_->doubts();
  std::vector<Column> columns;
  for (const ListingForm::Series& series : form_->series()) columns.push_back({series.name, {}, series.axis});
  if (trim(content).empty()) {
    gather(std::vector<Seconds>(form_->axes().size()), std::move(columns));
    return true;
  }
  std::string reason;
  std::vector<std::string> cuts;
  const auto numbers =
      form_->instructions().read(sourceName_, content, reason, reading_ ? &reading_->watch : nullptr, &cuts);
  if (!numbers) {
    failToRead("");
    lastError_ = std::move(reason);
    return false;
  }
  for (std::size_t i = 0; i < columns.size(); ++i) {
    for (const std::size_t place : form_->series()[i].places) columns[i].values.push_back((*numbers)[place]);
  }
  gather(form_->axes(), std::move(columns));
  doubts_.insert(doubts_.end(), cuts.begin(), cuts.end());
  return true;
}

}  // namespace mirevo

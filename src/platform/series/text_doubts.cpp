#include "platform/series/text_doubts.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <utility>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/take_text.h"
#include "common/text.h"
#include "platform/series/csv_cells.h"
#include "platform/series/missing_marker.h"

namespace mirevo {

std::optional<std::string_view> MissingMarks::read(std::string_view comment, std::string_view sign, std::size_t line) {
  const auto mark = missingMark(comment);
  if (!mark) {  // a comment about other things, perhaps
    if (const std::string_view marker = numberMeantAsMissing(comment); !marker.empty()) {
      doubts_.push_back(
          {line,
           fmt::format("this comment marks no missing values; if {} is one, the line must be \"{} missing = {}\"",
                       marker, sign, marker),
           csv::parseCell(marker.data(), marker.data() + marker.size())});
    }
    return std::nullopt;
  }
  const std::optional<float> value = csv::parseCell(mark->data(), mark->data() + mark->size());
  if (!value || mark->empty()) return mark;
  if (line_ != 0 && *value != value_ && !(std::isnan(*value) && std::isnan(value_))) {
    doubts_.push_back({line,
                       fmt::format("{} marks missing values, and no longer {}, as line {} says: only one value does",
                                   *mark, value_, line_),
                       std::nullopt});
  }
  value_ = *value;
  line_ = line;
  return std::nullopt;
}

std::vector<std::string> MissingMarks::doubts(const std::string& sourceName, std::span<const double> marked) const {
  constexpr std::size_t kMostDoubts = 10;
  std::vector<std::string> texts;
  std::size_t count = 0;
  for (const Doubt& doubt : doubts_) {
    const bool isMarked = doubt.marker && std::ranges::any_of(marked, [&doubt](double value) {
                            return static_cast<float>(value) == *doubt.marker;
                          });
    if (isMarked || doubt.marker == value_ || ++count > kMostDoubts) continue;
    texts.push_back(fmt::format("{}:{}: {}", sourceName, doubt.line, doubt.text));
  }
  if (count > kMostDoubts) {
    texts.push_back(fmt::format("{}: {} more comments like these", sourceName, count - kMostDoubts));
  }
  return texts;
}

bool isHeadingOfHours(std::string_view heading) {
  constexpr std::array<std::string_view, 10> kHeadings = {"hour", "hours",     "hourofday", "hr",   "hrs",
                                                          "time", "timeofday", "hh",        "hhmm", "hhmmss"};
  std::string letters;
  for (const char c : heading.substr(0, heading.find_first_of("([{"))) {
    if (c != ' ' && c != '_' && c != '-' && c != ':' && c != '.') letters += c;
  }
  return std::find(kHeadings.begin(), kHeadings.end(), toLowerAscii(letters)) != kHeadings.end();
}

bool isTimeOfDay(std::string_view cell) {
  const auto hour = takeNumber(cell, 1, 2);
  if (!hour || !takeText(cell, ":") || !takeNumber(cell, 2, 2)) return false;
  return cell.empty() || cell.front() == ':';
}

bool areDates(std::int64_t startSecond, std::span<const double> days) {
  return startSecond % kSecondsOfDay == 0 &&
         std::all_of(days.begin(), days.end(), [](double day) { return day == std::floor(day); });
}

}  // namespace mirevo

#include "platform/series/file_zone.h"

#include <algorithm>
#include <cstdlib>
#include <iterator>
#include <utility>

#include <fmt/core.h>

#include "common/take_text.h"
#include "platform/series/csv_cells.h"

namespace mirevo {
namespace {

std::string offsetText(int minutes) {
  return fmt::format("UTC{}{:02}:{:02}", minutes < 0 ? '-' : '+', std::abs(minutes) / 60, std::abs(minutes) % 60);
}

/// Takes "Z", "+01:00", "-0500" or "+01" off the whole of `text`; false for anything else that is not empty.
bool takeOffset(std::string_view text, std::optional<int>& minutes) {
  if (text.empty()) return true;
  if (text == "Z") {
    minutes = 0;
    return true;
  }
  const int sign = text.front() == '-' ? -1 : 1;
  if (!takeText(text, "+") && !takeText(text, "-")) return false;
  const auto hours = takeNumber(text, 2, 2);
  takeText(text, ":");
  const auto rest = text.empty() ? std::optional<std::int64_t>(0) : takeNumber(text, 2, 2);
  if (!hours || !rest || !text.empty() || *hours > 14 || *rest > 59) return false;
  minutes = sign * static_cast<int>(*hours * 60 + *rest);
  return true;
}

}  // namespace

std::optional<ZonedTime> parseZonedTime(std::string_view text) {
  csv::DateScanner scanner;
  const char* at = text.data();
  const auto second = scanner.scan(at, text.data() + text.size());
  if (!second) return std::nullopt;
  text.remove_prefix(static_cast<std::size_t>(at - text.data()));
  ZonedTime time{.second = *second};
  if (takeText(text, ".")) {
    const std::string_view fraction = takeDigits(text);
    if (fraction.empty()) return std::nullopt;
    if (fraction.front() >= '5') ++time.second;
  }
  if (!takeOffset(text, time.offsetMinutes)) return std::nullopt;
  return time;
}

std::optional<int> offsetOfZone(std::string_view code) {
  // Hours; the zones of the United States and its territories.
  constexpr std::pair<std::string_view, int> kZones[] = {
      {"UTC", 0},   {"GMT", 0},   {"AST", -4},  {"ADT", -3}, {"EST", -5}, {"EDT", -4},
      {"CST", -6},  {"CDT", -5},  {"MST", -7},  {"MDT", -6}, {"PST", -8}, {"PDT", -7},
      {"AKST", -9}, {"AKDT", -8}, {"HST", -10}, {"HDT", -9}, {"SST", -11}};
  const auto zone =
      std::find_if(std::begin(kZones), std::end(kZones), [code](const auto& each) { return each.first == code; });
  return zone == std::end(kZones) ? std::nullopt : std::optional<int>(zone->second * 60);
}

std::optional<std::int64_t> FileZone::take(const ZonedTime& time) {
  if (!isFirst_ && smallest_.has_value() != time.offsetMinutes.has_value()) return std::nullopt;
  isFirst_ = false;
  if (!time.offsetMinutes) return time.second;
  smallest_ = std::min(smallest_.value_or(*time.offsetMinutes), *time.offsetMinutes);
  largest_ = std::max(largest_.value_or(*time.offsetMinutes), *time.offsetMinutes);
  return time.second - std::int64_t{*time.offsetMinutes} * 60;
}

std::string FileZone::doubt() const {
  if (smallest_ == largest_) return {};
  return fmt::format("its times change between {} and {}, and are all read in {}", offsetText(*smallest_),
                     offsetText(*largest_), offsetText(*smallest_));
}

}  // namespace mirevo

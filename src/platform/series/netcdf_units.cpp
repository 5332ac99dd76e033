#include "platform/series/netcdf_units.h"

#include <algorithm>
#include <array>
#include <utility>

#include "common/calendar.h"
#include "common/take_text.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Seconds in a unit of time; empty for any other word. Months and years have no fixed length and are not accepted.
std::optional<double> secondsOf(std::string_view unit) {
  constexpr std::array<std::pair<std::string_view, double>, 14> kUnits{{{"days", 86400.0},
                                                                        {"day", 86400.0},
                                                                        {"d", 86400.0},
                                                                        {"hours", 3600.0},
                                                                        {"hour", 3600.0},
                                                                        {"hrs", 3600.0},
                                                                        {"hr", 3600.0},
                                                                        {"h", 3600.0},
                                                                        {"minutes", 60.0},
                                                                        {"minute", 60.0},
                                                                        {"min", 60.0},
                                                                        {"seconds", 1.0},
                                                                        {"second", 1.0},
                                                                        {"s", 1.0}}};
  for (const auto& [name, seconds] : kUnits) {
    if (equalIgnoringCase(unit, name)) return seconds;
  }
  return std::nullopt;
}

/// Takes `:minutes[:seconds[.zeros]]` after the hours, if present; false if it is malformed.
bool takeMinutesAndSeconds(std::string_view& text, DateRecord& date) {
  if (!takeText(text, ":")) return true;
  const auto minute = takeNumber(text, 1, 2);
  if (!minute) return false;
  date[date_field::kMinute] = static_cast<std::int32_t>(*minute);
  if (!takeText(text, ":")) return true;
  const auto second = takeNumber(text, 1, 2);
  if (!second || *second > 59) return false;
  date[date_field::kSecond] = static_cast<std::int32_t>(*second);
  if (takeText(text, ".")) text.remove_prefix(std::min(text.find_first_not_of('0'), text.size()));
  return true;
}

/// The whole of `text` as a date.
std::optional<DateRecord> parseOrigin(std::string_view text) {
  std::optional<DateRecord> date = takeDay(text, 1);
  if (!date) return std::nullopt;
  const bool hasT = takeText(text, "T");
  if (!hasT) text = trim(text);
  if (const auto hour = takeNumber(text, 1, 2)) {
    (*date)[date_field::kHour] = static_cast<std::int32_t>(*hour);
    if (!takeMinutesAndSeconds(text, *date)) return std::nullopt;
  } else if (hasT) {
    return std::nullopt;
  }
  const std::string zone = toLowerAscii(trim(text));
  for (const std::string_view utc : {"", "z", "utc", "gmt", "+0", "-0", "+00", "+0:00", "+00:00", "-00:00", "+0000"}) {
    if (zone == utc && isValidDate(*date)) return date;
  }
  return std::nullopt;
}

/// How many days the Julian calendar, in which every fourth year is a leap year, is behind the Gregorian one: Julian
/// 1582-10-05 is Gregorian 1582-10-15.
std::int64_t daysBehind(const DateRecord& date) {
  const int lastFebruary = date[date_field::kYear] - (date[date_field::kMonth] <= 2 ? 1 : 0);
  return lastFebruary < 0 ? -2 : lastFebruary / 100 - lastFebruary / 400 - 2;
}

}  // namespace

std::optional<TimeUnits> parseTimeUnits(std::string_view units, std::string_view calendar, std::string& reason) {
  const std::string calendarName = toLowerAscii(trim(calendar));
  const bool isMixed = calendarName.empty() || calendarName == "standard" || calendarName == "gregorian";
  if (!isMixed && calendarName != "proleptic_gregorian") {
    reason = "expected the calendar standard, gregorian or proleptic_gregorian, found \"" + calendarName +
             "\": its years have other days than those of the evaluation period; convert the series to the standard "
             "calendar, or write it as CSV, in which every value has its date";
    return std::nullopt;
  }
  reason = "expected time units like \"hours since 1990-01-01 00:00\", found \"" + std::string(units) + "\"";
  const std::string_view text = trim(units);
  const std::size_t blank = text.find(' ');
  if (blank == std::string_view::npos) return std::nullopt;
  const std::optional<double> seconds = secondsOf(text.substr(0, blank));
  std::string_view rest = trim(text.substr(blank));
  constexpr std::string_view kSince = "since ";
  if (!seconds || !equalIgnoringCase(rest.substr(0, kSince.size()), kSince)) return std::nullopt;
  rest = trim(rest.substr(kSince.size()));
  const std::optional<DateRecord> origin = parseOrigin(rest);
  if (!origin) return std::nullopt;
  reason.clear();
  TimeUnits result{*seconds, secondNumber(*origin)};
  if (isMixed && result.originSecond < secondNumber({1582, 10, 15})) {
    constexpr std::int64_t kDaySeconds = 86400;
    result.originSecond += kDaySeconds * daysBehind(*origin);
  }
  return result;
}

}  // namespace mirevo

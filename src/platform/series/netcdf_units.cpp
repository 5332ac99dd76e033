#include "platform/series/netcdf_units.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <utility>

#include "common/calendar.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Seconds in a unit of time; nothing for another word. Months and years have no fixed length and are not taken.
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

/// A number of at most `digits` digits at the front of `text`, which is moved past it.
std::optional<int> takeNumber(std::string_view& text, std::size_t digits) {
  int number = 0;
  const char* const last = text.data() + std::min(digits, text.size());
  if (text.empty() || text.front() == '-') return std::nullopt;
  const auto [end, error] = std::from_chars(text.data(), last, number);
  if (error != std::errc{}) return std::nullopt;
  text.remove_prefix(static_cast<std::size_t>(end - text.data()));
  return number;
}

bool takeCharacter(std::string_view& text, char c) {
  if (text.empty() || text.front() != c) return false;
  text.remove_prefix(1);
  return true;
}

/// The `: minutes [: seconds [. zeros]]` after the hours.
bool takeMinutesAndSeconds(std::string_view& text, DateRecord& date) {
  if (!takeCharacter(text, ':')) return true;
  const std::optional<int> minute = takeNumber(text, 2);
  if (!minute) return false;
  date[date_field::kMinute] = *minute;
  if (!takeCharacter(text, ':')) return true;
  const std::optional<int> second = takeNumber(text, 2);
  if (!second || *second > 59) return false;
  date[date_field::kSecond] = *second;
  if (takeCharacter(text, '.')) {
    while (takeCharacter(text, '0')) {
    }
  }
  return true;
}

/// The whole of `text` as the date of an origin.
std::optional<DateRecord> parseOrigin(std::string_view text) {
  DateRecord date{};
  const std::optional<int> year = takeNumber(text, 4);
  if (!year || !takeCharacter(text, '-')) return std::nullopt;
  const std::optional<int> month = takeNumber(text, 2);
  if (!month || !takeCharacter(text, '-')) return std::nullopt;
  const std::optional<int> day = takeNumber(text, 2);
  if (!day) return std::nullopt;
  date[date_field::kYear] = *year;
  date[date_field::kMonth] = *month;
  date[date_field::kDay] = *day;
  const bool hasT = takeCharacter(text, 'T');
  if (!hasT) text = trim(text);
  if (const std::optional<int> hour = takeNumber(text, 2)) {
    date[date_field::kHour] = *hour;
    if (!takeMinutesAndSeconds(text, date)) return std::nullopt;
  } else if (hasT) {
    return std::nullopt;
  }
  const std::string zone = toLowerAscii(trim(text));
  for (const std::string_view utc : {"", "z", "utc", "gmt", "+0", "-0", "+00", "+0:00", "+00:00", "-00:00", "+0000"}) {
    if (zone == utc && isValidDate(date)) return date;
  }
  return std::nullopt;
}

/// dayNumber() of a date of the Julian calendar, in which every fourth year is a leap year. Its 1582-10-05 is the
/// Gregorian 1582-10-15.
std::int64_t julianDayNumber(int year, int month, int day) {
  const std::int64_t y = month <= 2 ? year - 1 : year;
  const std::int64_t fourYears = (y >= 0 ? y : y - 3) / 4;
  constexpr std::int64_t kTwoDays = 2;  // Julian 0000-03-01 is two days before the Gregorian one
  return y * 365 + fourYears + (153 * ((month + 9) % 12) + 2) / 5 + day - 1 - kTwoDays;
}

}  // namespace

std::optional<TimeUnits> parseTimeUnits(std::string_view units, std::string_view calendar, std::string& reason) {
  const std::string calendarName = toLowerAscii(trim(calendar));
  const bool isMixed = calendarName.empty() || calendarName == "standard" || calendarName == "gregorian";
  if (!isMixed && calendarName != "proleptic_gregorian") {
    reason = "expected the calendar standard, gregorian or proleptic_gregorian, found \"" + calendarName + "\"";
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
    const DateRecord& o = *origin;
    constexpr std::int64_t kDaySeconds = 86400;
    result.originSecond +=
        kDaySeconds * (julianDayNumber(o[date_field::kYear], o[date_field::kMonth], o[date_field::kDay]) -
                       dayNumber(o[date_field::kYear], o[date_field::kMonth], o[date_field::kDay]));
  }
  return result;
}

}  // namespace mirevo

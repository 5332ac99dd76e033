#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "common/date_record.h"

namespace mirevo {

/// The 400 years after which the Gregorian calendar repeats. The years of std::chrono end at 32767; dates are looked up
/// in the first of these cycles, so that every year has its days.
using CalendarCycles =
    std::chrono::duration<std::int64_t, std::ratio_multiply<std::ratio<400>, std::chrono::years::period>>;

/// The day from which days and seconds are counted.
inline constexpr std::chrono::sys_days kFirstDay{std::chrono::year(0) / std::chrono::March / 1};

/// Days in a month (1 to 12) of a year of the Gregorian calendar.
constexpr int daysInMonth(std::int64_t year, int month) {
  using namespace std::chrono;
  return static_cast<int>(unsigned{(std::chrono::year(static_cast<int>(year % 400)) / month / last).day()});
}

/// The rule of validity of every date that is read: year >= 0, a day of its month, hour 0 to 24 and 24 only with
/// minute 0, minute 0 to 60. The minute of 60 is accepted on purpose. Seconds are not looked at.
constexpr bool isValidDate(const DateRecord& date) {
  using namespace date_field;
  return date[kYear] >= 0 && date[kMonth] >= 1 && date[kMonth] <= 12 && date[kHour] >= 0 && date[kHour] <= 24 &&
         (date[kHour] != 24 || date[kMinute] == 0) && date[kMinute] >= 0 && date[kMinute] <= 60 && date[kDay] >= 1 &&
         date[kDay] <= daysInMonth(date[kYear], date[kMonth]);
}

/// Days of the proleptic Gregorian calendar since 0000-03-01. The month must be 1 to 12; any day number is taken
/// arithmetically.
constexpr std::int64_t dayNumber(std::int64_t year, int month, int day) {
  using namespace std::chrono;
  const auto cycles = floor<CalendarCycles>(years(year));
  const std::chrono::year yearOfCycle(static_cast<int>(year - 400 * cycles.count()));
  return (days(cycles) + (sys_days(yearOfCycle / month / 1) - kFirstDay)).count() + day - 1;
}

/// Seconds since 0000-03-01 00:00 of a valid date; 24:00 is the next day's 00:00 and minute 60 the next hour's start.
constexpr std::int64_t secondNumber(const DateRecord& date) {
  using namespace date_field;
  const std::int64_t hours = dayNumber(date[kYear], date[kMonth], date[kDay]) * 24 + date[kHour];
  return (hours * 60 + date[kMinute]) * 60 + date[kSecond];
}

/// The inverse of secondNumber(), with an hour of 0 to 23.
DateRecord dateOfSecond(std::int64_t second);

inline constexpr std::int64_t kSecondsOfDay = 86400;

/// Milliseconds since 1970 from a secondNumber(): a time as browsers count it.
constexpr std::int64_t epochMilliseconds(std::int64_t second) {
  return (second - dayNumber(1970, 1, 1) * kSecondsOfDay) * 1000;
}

/// "2001-01-31 12:30", with ":SS" where the seconds are not 0.
std::string formatDate(const DateRecord& date);

/// "2001-01-31T12:30:00" from a secondNumber(): the form that programs read.
std::string isoTime(std::int64_t second);

/// Takes a date without its time off the front of `text`: a year of `leastYearDigits` to 4 digits, a month and a day of
/// 1 or 2 digits each, with "-" between them. The fields are not checked: month 13 is accepted here. Empty where `text`
/// begins otherwise; what was taken off it by then is lost.
std::optional<DateRecord> takeDay(std::string_view& text, std::size_t leastYearDigits = 4);

}  // namespace mirevo

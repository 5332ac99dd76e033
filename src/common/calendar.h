#pragma once

#include <array>
#include <cstdint>
#include <string>

#include "common/date_record.h"

namespace mirevo {

/// Gregorian, in every year: divisible by 4, and either not by 100 or by 400.
constexpr bool isLeapYear(std::int64_t year) {
  return year % 4 == 0 && (year % 100 != 0 || year % 400 == 0);
}

/// Days in a month (1 to 12) of a year.
constexpr int daysInMonth(std::int64_t year, int month) {
  constexpr std::array<int, 12> kDays{31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
  return month == 2 && isLeapYear(year) ? 29 : kDays[static_cast<std::size_t>(month - 1)];
}

/// The rule of validity of every date that is read: year >= 0, a day of its month, hour 0 to 24 and 24 only with
/// minute 0, minute 0 to 60. The minute of 60 is accepted on purpose. Seconds are not looked at.
constexpr bool isValidDate(const DateRecord& date) {
  using namespace date_field;
  return date[kYear] >= 0 && date[kMonth] >= 1 && date[kMonth] <= 12 && date[kHour] >= 0 && date[kHour] <= 24 &&
         (date[kHour] != 24 || date[kMinute] == 0) && date[kMinute] >= 0 && date[kMinute] <= 60 && date[kDay] >= 1 &&
         date[kDay] <= daysInMonth(date[kYear], date[kMonth]);
}

/// Days of the proleptic Gregorian calendar since 0000-03-01, so that leap days end a four-year cycle. The month must
/// be 1 to 12; any day number is taken arithmetically.
constexpr std::int64_t dayNumber(std::int64_t year, int month, int day) {
  const std::int64_t y = month <= 2 ? year - 1 : year;
  const int monthFromMarch = (month + 9) % 12;
  const std::int64_t era = (y >= 0 ? y : y - 399) / 400;
  const std::int64_t yearOfEra = y - era * 400;
  return era * 146097 + yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + (153 * monthFromMarch + 2) / 5 + day - 1;
}

/// Seconds since 0000-03-01 00:00 of a valid date; 24:00 is the next day's 00:00 and minute 60 the next hour's start.
constexpr std::int64_t secondNumber(const DateRecord& date) {
  using namespace date_field;
  const std::int64_t hours = dayNumber(date[kYear], date[kMonth], date[kDay]) * 24 + date[kHour];
  return (hours * 60 + date[kMinute]) * 60 + date[kSecond];
}

/// The inverse of secondNumber(), with an hour of 0 to 23.
DateRecord dateOfSecond(std::int64_t second);

/// "2001-01-31 12:30", with ":SS" where the seconds are not 0.
std::string formatDate(const DateRecord& date);

/// The date of secondNumber() `second` as "1981-10-01T00:00:00".
std::string isoTime(std::int64_t second);

}  // namespace mirevo

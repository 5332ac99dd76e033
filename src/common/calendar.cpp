#include "common/calendar.h"

#include <fmt/core.h>

namespace mirevo {

DateRecord dateOfSecond(std::int64_t second) {
  constexpr std::int64_t kDaySeconds = 86400;
  constexpr std::int64_t kEraDays = 146097;  // 400 years
  const std::int64_t day = (second >= 0 ? second : second - kDaySeconds + 1) / kDaySeconds;
  const auto secondOfDay = static_cast<std::int32_t>(second - day * kDaySeconds);
  const std::int64_t era = (day >= 0 ? day : day - kEraDays + 1) / kEraDays;
  const std::int64_t dayOfEra = day - era * kEraDays;
  const std::int64_t yearOfEra = (dayOfEra - dayOfEra / 1460 + dayOfEra / 36524 - dayOfEra / 146096) / 365;
  const std::int64_t dayOfYear = dayOfEra - (365 * yearOfEra + yearOfEra / 4 - yearOfEra / 100);
  const std::int64_t monthFromMarch = (5 * dayOfYear + 2) / 153;
  const auto month = static_cast<std::int32_t>(monthFromMarch < 10 ? monthFromMarch + 3 : monthFromMarch - 9);
  DateRecord date{};
  date[date_field::kYear] = static_cast<std::int32_t>(yearOfEra + era * 400 + (month <= 2 ? 1 : 0));
  date[date_field::kMonth] = month;
  date[date_field::kDay] = static_cast<std::int32_t>(dayOfYear - (153 * monthFromMarch + 2) / 5 + 1);
  date[date_field::kHour] = secondOfDay / 3600;
  date[date_field::kMinute] = secondOfDay / 60 % 60;
  date[date_field::kSecond] = secondOfDay % 60;
  return date;
}

std::string formatDate(const DateRecord& date) {
  using namespace date_field;
  std::string text =
      fmt::format("{:04}-{:02}-{:02} {:02}:{:02}", date[kYear], date[kMonth], date[kDay], date[kHour], date[kMinute]);
  if (date[kSecond] != 0) text += fmt::format(":{:02}", date[kSecond]);
  return text;
}

}  // namespace mirevo

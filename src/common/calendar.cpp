#include "common/calendar.h"

#include <fmt/core.h>

#include "common/take_text.h"

namespace mirevo {

DateRecord dateOfSecond(std::int64_t second) {
  using namespace std::chrono;
  const auto day = floor<days>(seconds(second));
  const auto cycles = floor<CalendarCycles>(day);
  const year_month_day date(kFirstDay + (day - cycles));
  const hh_mm_ss time(seconds(second) - day);
  return {static_cast<std::int32_t>(400 * cycles.count() + int{date.year()}),
          static_cast<std::int32_t>(unsigned{date.month()}),
          static_cast<std::int32_t>(unsigned{date.day()}),
          static_cast<std::int32_t>(time.hours().count()),
          static_cast<std::int32_t>(time.minutes().count()),
          static_cast<std::int32_t>(time.seconds().count())};
}

std::string formatDate(const DateRecord& date) {
  using namespace date_field;
  std::string text =
      fmt::format("{:04}-{:02}-{:02} {:02}:{:02}", date[kYear], date[kMonth], date[kDay], date[kHour], date[kMinute]);
  if (date[kSecond] != 0) text += fmt::format(":{:02}", date[kSecond]);
  return text;
}

std::string isoTime(std::int64_t second) {
  using namespace date_field;
  const DateRecord date = dateOfSecond(second);
  return fmt::format("{:04}-{:02}-{:02}T{:02}:{:02}:{:02}", date[kYear], date[kMonth], date[kDay], date[kHour],
                     date[kMinute], date[kSecond]);
}

std::optional<DateRecord> takeDay(std::string_view& text, std::size_t leastYearDigits) {
  const auto year = takeNumber(text, leastYearDigits, 4);
  if (!year || !takeText(text, "-")) return std::nullopt;
  const auto month = takeNumber(text, 1, 2);
  if (!month || !takeText(text, "-")) return std::nullopt;
  const auto day = takeNumber(text, 1, 2);
  if (!day) return std::nullopt;
  return DateRecord{static_cast<std::int32_t>(*year), static_cast<std::int32_t>(*month),
                    static_cast<std::int32_t>(*day)};
}

}  // namespace mirevo

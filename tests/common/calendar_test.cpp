#include "common/calendar.h"

#include <utility>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(Calendar, EveryDayOfFourCenturiesFollowsTheOneBefore) {
  DateRecord date{1799, 12, 31};
  std::int64_t second = secondNumber(date);
  for (int day = 0; day < 146097; ++day) {
    second += 86400;
    if (++date[date_field::kDay] > daysInMonth(date[date_field::kYear], date[date_field::kMonth])) {
      date[date_field::kDay] = 1;
      if (++date[date_field::kMonth] > 12) {
        date[date_field::kMonth] = 1;
        ++date[date_field::kYear];
      }
    }
    ASSERT_EQ(secondNumber(date), second);
    ASSERT_EQ(dateOfSecond(second), date);
  }
  EXPECT_EQ(formatDate(dateOfSecond(secondNumber({2000, 2, 28, 23, 60, 7}))), "2000-02-29 00:00:07");
}

TEST(Calendar, CountsFromMarchOfTheYearZeroInEveryYear) {
  const std::pair<DateRecord, std::int64_t> cases[] = {{{0, 3, 1}, 0},
                                                       {{0, 2, 29}, -1},
                                                       {{-1, 3, 1}, -366},
                                                       {{1970, 1, 1}, 719468},
                                                       {{32767, 12, 31}, 11967900 + 306 - 1},
                                                       {{32768, 2, 29}, 11967900 + 306 + 59},
                                                       {{2147483647, 12, 31}, 784352296244}};
  for (const auto& [date, day] : cases) {
    using namespace date_field;
    EXPECT_EQ(dayNumber(date[kYear], date[kMonth], date[kDay]), day) << date[kYear];
    EXPECT_EQ(dateOfSecond(day * 86400), date) << day;
  }
}

}  // namespace
}  // namespace mirevo

#include "common/calendar.h"

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

}  // namespace
}  // namespace mirevo

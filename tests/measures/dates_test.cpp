#include "measures/dates.h"

#include <cmath>
#include <tuple>

#include <fmt/format.h>
#include <gtest/gtest.h>

#include "refusal.h"

namespace mirevo {
namespace {

TEST(Dates, CheckAcceptsAndRefuses) {
  const std::pair<DateRecord, bool> cases[] = {
      {{2000, 2, 29, 0, 0}, true},
      {{1900, 2, 29, 0, 0}, false},
      {{2004, 2, 29, 0, 0}, true},
      {{2001, 12, 31, 24, 0}, true},
      {{2001, 12, 31, 24, 1}, false},
      {{2001, 12, 31, 24, 60}, false},
      {{2001, 12, 31, 23, 60}, true},
      {{2001, 12, 31, 23, 61}, false},
      {{2001, 4, 31, 0, 0}, false},
      {{2001, 0, 1, 0, 0}, false},
      {{2001, 13, 1, 0, 0}, false},
      {{2001, 1, 0, 0, 0}, false},
      {{-1, 1, 1, 0, 0}, false},
      {{0, 2, 29, 0, 0}, true},
      {{2001, 1, 1, -1, 0}, false},
      {{2001, 1, 1, 0, 0, 99, -7, 1 << 30, 5}, true},  // the other fields are not looked at
  };
  for (const auto& [date, isValid] : cases) {
    bool valid = false;
    EXPECT_EQ(refusalMessageOf([&, &checked = date] { valid = date_check(checked, 9); }),
              isValid ? "accepted"
                      : fmt::format("Error: Invalid date {} {} {} {} {}", date[0], date[1], date[2], date[3], date[4]));
    EXPECT_EQ(valid, isValid);
  }
  const DateRecord good{2001, 1, 1};
  EXPECT_EQ(refusalMessageOf([&] { date_check(good, 5); }), "ERROR IN argument list of function date_check !");
}

TEST(Dates, DifferenceInHours) {
  const std::tuple<DateRecord, DateRecord, double> cases[] = {
      {{2001, 3, 1, 0, 0}, {2000, 2, 28, 12, 0}, 8796.0},      {{2000, 2, 28, 12, 0}, {2001, 3, 1, 0, 0}, -8796.0},
      {{2000, 3, 1, 0, 0}, {2000, 2, 28, 0, 0}, 48.0},         {{1900, 3, 1, 0, 0}, {1900, 2, 28, 0, 0}, 24.0},
      {{2001, 1, 2, 0, 0}, {2001, 1, 1, 24, 0}, -0.0},  // one moment: 24 - 24 hours
      {{2001, 1, 1, 13, 0}, {2001, 1, 1, 12, 60}, 0.0},        {{2001, 1, 1, 0, 20}, {2001, 1, 1, 0, 0}, 20.0 / 60.0},
      {{2001, 1, 1, 0, 0, 59}, {2001, 1, 1, 0, 0, 1}, 0.0},  // seconds do not enter
      {{2400, 1, 1, 0, 0}, {2000, 1, 1, 0, 0}, 24.0 * 146097},
  };
  for (const auto& [a, b, hours] : cases) {
    int status = 7;
    EXPECT_EQ(DBTIMDIF(status, a, b, 9), hours);
    EXPECT_EQ(status, 0);
  }
  int status = 7;
  const DateRecord day{2001, 1, 1};
  EXPECT_TRUE(std::signbit(DBTIMDIF(status, day, day, 9)));  // equal dates take the sign -1
}

TEST(Dates, DifferenceValidatesTheSecondDateFirst) {
  const DateRecord good{2001, 1, 1};
  const DateRecord badA{2001, 2, 30};
  const DateRecord badB{2001, 2, 31};
  int status = 0;
  EXPECT_EQ(refusalMessageOf([&] { DBTIMDIF(status, badA, badB, 9); }), "Error: Invalid date 2001 2 31 0 0");
  EXPECT_EQ(status, -1);
  EXPECT_EQ(refusalMessageOf([&] { DBTIMDIF(status, badA, good, 9); }), "Error: Invalid date 2001 2 30 0 0");
  EXPECT_EQ(refusalMessageOf([&] { DBTIMDIF(status, good, good, 8); }), "ERROR IN argument list of function DBTIMDIF!");
}

TEST(Dates, DaysSinceAddsTheSeconds) {
  EXPECT_EQ(daysSince({2001, 1, 1, 0, 0, 30}, {2001, 1, 2, 12, 0, 30}), 1.5);
  EXPECT_EQ(daysSince({2001, 1, 1, 0, 0, 45}, {2001, 1, 1, 0, 1, 0}), 1.0 / 60.0 / 24.0 - 45.0 / 86400.0);
}

}  // namespace
}  // namespace mirevo

#include "models/muskingum.h"

#include <cmath>
#include <numeric>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

namespace models {
namespace {

// Chow, Maidment and Mays (1988), example 8.4.1: K = 2.3 h, X = 0.15, dt = 1 h, from 85 ft3/s; an hour counts as a day
// here.
TEST(MuskingumRiver, RoutesThePublishedFlood) {
  const std::vector<std::vector<double>> inflowAndOutflow{{93, 85},   {137, 91},  {208, 114}, {320, 159}, {442, 233},
                                                          {546, 324}, {630, 420}, {678, 509}, {691, 578}, {675, 623},
                                                          {634, 642}, {571, 635}, {477, 603}, {390, 546}, {329, 479},
                                                          {247, 413}, {184, 341}, {134, 274}, {108, 215}, {90, 170}};
  MuskingumRiver river(2.3, 0.15);
  ASSERT_EQ(river.steps(), 1);
  ASSERT_EQ(river.reaches(), 1);
  EXPECT_NEAR(river.c1(), 0.0631, 5e-5);
  EXPECT_NEAR(river.c2(), 0.3442, 5e-5);
  EXPECT_NEAR(river.c3(), 0.5927, 5e-5);
  double outflow = 85.0;  // the example is not steady at first
  for (std::size_t i = 1; i < inflowAndOutflow.size(); ++i) {
    outflow = river.c1() * inflowAndOutflow[i][0] + river.c2() * inflowAndOutflow[i - 1][0] + river.c3() * outflow;
    EXPECT_NEAR(outflow, inflowAndOutflow[i][1], 1.0) << i;
  }
}

// One day with 10 m3/s more: no water is lost, no outflow is negative, and the pulse arrives K days later on average if
// a day is one step.
TEST(MuskingumRiver, KeepsTheWaterAndItsTravelTimeForAnyReach) {
  for (const double k : {0.01, 0.05, 0.17, 0.6, 1.0, 1.3, 4.0, 25.0}) {
    for (const double x : {0.0, 0.1, 0.2, 0.33, 0.4, 0.45, 0.49}) {
      SCOPED_TRACE(testing::Message() << "K " << k << ", X " << x);
      MuskingumRiver river(k, x);
      for (const double c : {river.c1(), river.c2(), river.c3()}) ASSERT_GE(c, -1e-12);
      EXPECT_NEAR(river.c1() + river.c2() + river.c3(), 1.0, 1e-12);
      EXPECT_NEAR(river.advance(5.0), 5.0, 1e-12);
      double volume = 0.0;
      double moment = 0.0;
      for (int day = 0; day < 3000; ++day) {
        const double outflow = river.advance(day == 0 ? 15.0 : 5.0);
        ASSERT_GE(outflow, 5.0 - 1e-9);
        volume += outflow - 5.0;
        moment += day * (outflow - 5.0);
      }
      EXPECT_NEAR(volume, 10.0, 1e-7);
      if (river.steps() == 1) {
        EXPECT_NEAR(moment / volume, k, 1e-6);
      }
    }
  }
}

TEST(MuskingumRiver, TakesAsFewStepsAsItCan) {
  const std::tuple<double, double, int, int> cases[] = {
      {1.0, 0.2, 1, 1},    // 0.4 <= 1 <= 1.6
      {4.0, 0.2, 1, 2},    // 1.6 <= 2 <= 6.4
      {0.25, 0.2, 3, 1},   // 0.3 <= 1 <= 1.2
      {0.1, 0.4, 9, 1},    // 0.72 <= 1 <= 1.08
      {1.3, 0.45, 3, 4}};  // no integer in 1.17..1.43 nor in 2.34..2.86, but in 3.51..4.29
  for (const auto& [k, x, steps, reaches] : cases) {
    const MuskingumRiver river(k, x);
    EXPECT_EQ(river.steps(), steps) << k;
    EXPECT_EQ(river.reaches(), reaches) << k;
  }
}

}  // namespace
}  // namespace models

#include "algorithms/numbers/row_space.h"

#include <cmath>
#include <numeric>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

using ::testing::DoubleNear;
using ::testing::Pointwise;

/// By hand: x + y = 2 and y + z = 2, and twice the first, which says nothing new.
TEST(RowSpace, SolvesSpansAndLeavesOutWhatIsDetermined) {
  RowSpace rows(3);
  EXPECT_TRUE(rows.add(std::vector{1.0, 1.0, 0.0}, 2.0));
  EXPECT_FALSE(rows.add(std::vector{2.0, 2.0, 0.0}, 4.0));
  EXPECT_FALSE(rows.add(std::vector{0.0, 0.0, 0.0}, 1.0));
  EXPECT_TRUE(rows.add(std::vector{0.0, 1.0, 1.0}, 2.0));
  EXPECT_THAT(rows.shortestSolution(), Pointwise(DoubleNear(1e-14), {2.0 / 3.0, 4.0 / 3.0, 2.0 / 3.0}));
  const auto space = rows.nullSpace();
  ASSERT_EQ(space.size(), 1U);
  EXPECT_NEAR(std::abs(std::accumulate(space[0].begin(), space[0].end(), 0.0)), 1.0 / std::sqrt(3.0), 1e-14);
  EXPECT_NEAR(space[0][0] + space[0][1], 0.0, 1e-14);
  // 3 (1, 1, 0) - 2 (0, 1, 1) and something orthogonal to both.
  EXPECT_THAT(rows.coefficientsOf(std::vector{3.0 + 5.0, 1.0 - 5.0, -2.0 + 5.0}),
              Pointwise(DoubleNear(1e-13), {3.0, -2.0}));
}

}  // namespace
}  // namespace mirevo

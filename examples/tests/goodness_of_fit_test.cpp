#include "tools/goodness_of_fit.h"

#include <array>
#include <cmath>

#include <gtest/gtest.h>

namespace mirevo::examples {
namespace {

TEST(GoodnessOfFit, AgreesWithAWorkedExample) {
  // Means 2.5 and 3, sums of squared deviations 5 and 8, of products 6, of squared errors 2.
  const std::array observed{1.0, 2.0, 3.0, 4.0};
  const std::array simulated{1.0, 3.0, 3.0, 5.0};
  const GoodnessOfFit fit = goodnessOfFit(simulated, observed);
  EXPECT_DOUBLE_EQ(fit.nse, 1.0 - 2.0 / 5.0);
  EXPECT_DOUBLE_EQ(fit.rmse, std::sqrt(0.5));
  EXPECT_NEAR(fit.volumeBias, 0.2, 1e-15);
  const double r = 6.0 / std::sqrt(5.0 * 8.0);
  EXPECT_DOUBLE_EQ(fit.kge, 1.0 - std::sqrt((r - 1) * (r - 1) + std::pow(std::sqrt(1.6) - 1, 2) + 0.04));
}

}  // namespace
}  // namespace mirevo::examples

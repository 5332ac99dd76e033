#include "measures/fit_figures.h"

#include <cmath>
#include <limits>
#include <vector>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

constexpr float kNaN = std::numeric_limits<float>::quiet_NaN();
constexpr double kNone = std::numeric_limits<double>::quiet_NaN();

void expectFigure(const char* name, double found, double expected) {
  if (std::isnan(expected)) {
    EXPECT_TRUE(std::isnan(found)) << name << " is " << found;
  } else {
    EXPECT_NEAR(found, expected, 1e-12) << name;
  }
}

// Computed by hand; of the first case sum of squared errors 2, of squared deviations 5 (observed) and 4 (simulated), of
// products 4.
TEST(FitFigures, AreThoseOfTheirDefinitions) {
  const double r = 4.0 / std::sqrt(20.0);
  const struct {
    const char* name;
    std::vector<float> simulated, observed;
    FitFigures expected;
  } cases[] = {
      {"gaps on either side do not count",
       {2, 2, kNaN, 4, 4, 9},
       {1, 2, 7, 3, 4, kNaN},
       {4, 0.6, 1.0 - std::sqrt(2.0 * (1.0 - r) * (1.0 - r) + 0.04), r, std::sqrt(0.8), 1.2, 20.0, std::sqrt(0.5),
        0.8}},
      {"too little is negative", {1, 2}, {2, 4}, {2, -1.5, 1.0 - std::sqrt(0.5), 1, 0.5, 0.5, -50, std::sqrt(2.5), 1}},
      {"observations all the same", {1, 3}, {2, 2}, {2, kNone, kNone, kNone, kNone, 1, 0, 1, kNone}},
      {"observations with the mean 0", {0, 1}, {-1, 1}, {2, 0.5, kNone, 1, 0.5, kNone, kNone, std::sqrt(0.5), 1}},
      {"no pair", {1, kNaN}, {kNaN, 1}, {0, kNone, kNone, kNone, kNone, kNone, kNone, kNone, kNone}},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    const FitFigures found = fitFigures(c.simulated, c.observed);
    EXPECT_EQ(found.count, c.expected.count);
    expectFigure("NSE", found.nse, c.expected.nse);
    expectFigure("KGE", found.kge, c.expected.kge);
    expectFigure("r", found.correlation, c.expected.correlation);
    expectFigure("alpha", found.variability, c.expected.variability);
    expectFigure("beta", found.meanRatio, c.expected.meanRatio);
    expectFigure("percent bias", found.percentBias, c.expected.percentBias);
    expectFigure("RMSE", found.rmse, c.expected.rmse);
    expectFigure("r2", found.rSquared, c.expected.rSquared);
  }
}

}  // namespace
}  // namespace mirevo

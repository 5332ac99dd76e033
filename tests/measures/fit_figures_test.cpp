#include "measures/fit_figures.h"

#include <cmath>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>

namespace mirevo {
namespace {

// Computed by hand; of the first case sum of squared errors 2, of squared deviations 5 (observed) and 4 (simulated), of
// products 4.
TEST(FitFigures, AreThoseOfTheirDefinitions) {
  const double r = 4.0 / std::sqrt(20.0);
  const std::tuple<const char*, std::vector<float>, std::vector<float>, FitFigures> cases[] = {
      {"gaps on either side do not count",
       {2, 2, NAN, 4, 4, 9},
       {1, 2, 7, 3, 4, NAN},
       {4, 0.6, 1.0 - std::sqrt(2.0 * (1.0 - r) * (1.0 - r) + 0.04), r, std::sqrt(0.8), 1.2, 20.0, std::sqrt(0.5),
        0.8}},
      {"too little is negative", {1, 2}, {2, 4}, {2, -1.5, 1.0 - std::sqrt(0.5), 1, 0.5, 0.5, -50, std::sqrt(2.5), 1}},
      {"observations all the same", {1, 3}, {2, 2}, {2, NAN, NAN, NAN, NAN, 1, 0, 1, NAN}},
      {"observations with the mean 0", {0, 1}, {-1, 1}, {2, 0.5, NAN, 1, 0.5, NAN, NAN, std::sqrt(0.5), 1}},
      {"no pair", {1, NAN}, {NAN, 1}, {0, NAN, NAN, NAN, NAN, NAN, NAN, NAN, NAN}},
  };
  for (const auto& [name, simulated, observed, expected] : cases) {
    SCOPED_TRACE(name);
    const FitFigures found = fitFigures(simulated, observed);
    EXPECT_EQ(found.count, expected.count);
    double FitFigures::*const figures[] = {&FitFigures::nse,         &FitFigures::kge,       &FitFigures::correlation,
                                           &FitFigures::variability, &FitFigures::meanRatio, &FitFigures::percentBias,
                                           &FitFigures::rmse,        &FitFigures::rSquared};
    for (std::size_t i = 0; i < std::size(figures); ++i) {
      EXPECT_THAT(found.*figures[i], ::testing::NanSensitiveDoubleNear(expected.*figures[i], 1e-12)) << "figure " << i;
    }
  }
}

}  // namespace
}  // namespace mirevo

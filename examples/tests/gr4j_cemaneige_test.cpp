// The rainfall-runoff model of the examples against the published equations and against conservation of mass.
#include "models/gr4j_cemaneige.h"

#include <array>
#include <cmath>
#include <numeric>

#include <gtest/gtest.h>

namespace models {
namespace {

TEST(SolidFraction, GoesFromAllToNothingAsTheDayThaws) {
  const double ranges[][3] = {{-8, -1, 1}, {-8, 0, 1}, {-3, 1, 0.75}, {-1, 3, 0.25}, {0, 0, 1}, {0, 5, 0}};
  for (const auto& [least, most, fraction] : ranges) EXPECT_DOUBLE_EQ(solidFractionOfRange(least, most), fraction);
  const double expected[][2] = {{-20.0, 1.0}, {-1.0, 1.0}, {0.0, 0.75}, {2.0, 0.25}, {3.0, 0.0}, {30.0, 0.0}};
  for (const auto& [temperature, fraction] : expected) {
    EXPECT_DOUBLE_EQ(solidFractionOfMean(temperature), fraction) << temperature;
  }
}

/// Precipitation, evapotranspiration that could be; runoff, evapotranspiration, exchange, both stores.
using ExpectedDay = std::array<double, 7>;

// Expected values computed separately from the published equations, with the unit hydrographs as sums over the past.
TEST(Gr4j, FollowsThePublishedEquationsDayByDay) {
  const std::vector<std::pair<double, std::vector<ExpectedDay>>> cases{
      {0.8,
       {{20, 3, 0.755481834373497, 3, 0.141421356237316, 105.179908918507, 40.013403183093},
        {0, 4, 0.875794672626877, 2.29312567526305, 0.14158728164657, 102.872903661432, 40.4435836978385},
        {55, 1, 1.20231971090359, 1, 0.146986936346919, 147.218669419171, 42.7583478668375},
        {0, 0, 2.20533458075353, 0, 0.178598675977383, 147.135507255837, 46.9113679475206},
        {2, 2, 1.62402527926998, 2, 0.247046308397613, 147.052579449868, 45.7911314053267}}},
      // The exchange takes more than the direct branch has, then more than both have.
      {-1.5, {{1, 5, 0.592208376784166, 3.02101740828088, -0.132697676558545, 87.9726359896708, 39.2772818932926}}},
      {-500.0, {{1, 5, 0.0, 3.02101740828088, -40.0021879466353, 87.9726359896708, 0.0}}},
  };
  for (const auto& [x2, days] : cases) {
    Gr4j model(Parameters{.x1 = 300.0, .x2 = x2, .x3 = 80.0, .x4 = 1.5});
    for (const auto& [precipitation, pet, runoff, evapotranspiration, exchange, production, routing] : days) {
      SCOPED_TRACE(testing::Message() << "X2 " << x2 << ", P " << precipitation);
      const Fluxes fluxes = model.advance(precipitation, pet);
      EXPECT_NEAR(fluxes.runoff, runoff, 1e-11);
      EXPECT_NEAR(fluxes.evapotranspiration, evapotranspiration, 1e-11);
      EXPECT_NEAR(fluxes.exchange, exchange, 1e-11);
      EXPECT_NEAR(model.production(), production, 1e-11);
      EXPECT_NEAR(model.routing(), routing, 1e-11);
    }
  }
}

// CTG 0.5, Kf 4, full cover at 0.9 * 100 mm. Thermal state and melt worked out by hand.
TEST(SnowPack, MeltsOnlyOnceItIsWarmAndSlowerWhereCoverIsPatchy) {
  SnowPack snow(Parameters{.ctg = 0.5, .kf = 4.0}, 100.0);
  EXPECT_EQ(snow.advance({45.0, 0.0, -4.0, 1.0}), 0.0);  // T -4: all snow, eTG = -2
  EXPECT_DOUBLE_EQ(snow.thermalState(), -2.0);
  EXPECT_DOUBLE_EQ(snow.water(), 45.0);
  EXPECT_EQ(snow.advance({0.0, 0.0, 1.0, 0.0}), 0.0);  // T 1, but eTG = -1 + 0.5 is below zero still
  EXPECT_DOUBLE_EQ(snow.thermalState(), -0.5);
  // T 3: eTG = min(0, -0.25 + 1.5) = 0; potential 12 mm, cover 45/90: 12 (0.9 * 0.5 + 0.1) = 6.6 mm. Rain passes.
  EXPECT_DOUBLE_EQ(snow.advance({5.0, 0.0, 3.0, 0.0}), 5.0 + 6.6);
  EXPECT_DOUBLE_EQ(snow.water(), 45.0 - 6.6);
  // T 20: the potential melt is all there is, 38.4 mm, cover 38.4/90.
  EXPECT_DOUBLE_EQ(snow.advance({0.0, 0.0, 20.0, 0.0}), 38.4 * (0.9 * 38.4 / 90.0 + 0.1));
}

std::vector<Forcing> variedWeather(int count) {
  std::vector<Forcing> days;
  unsigned state = 12345;
  const auto uniform = [&state] { return (state = state * 1664525u + 1013904223u) / 4294967296.0; };
  for (int i = 0; i < count; ++i) {
    const double season = std::sin(i * 2.0 * 3.14159265358979 / 365.25);
    const double mean = 5.0 + 15.0 * season + 8.0 * (uniform() - 0.5);
    const double wet = uniform() < 0.4 ? 20.0 * uniform() * uniform() : 0.0;
    days.push_back({i % 700 == 0 ? 120.0 : wet, std::max(0.0, 2.0 + 2.5 * season), mean,
                    solidFractionOfRange(mean - 5.0, mean + 5.0)});
  }
  return days;
}

TEST(Model, KeepsEveryMillimetre) {
  const std::vector<Forcing> days = variedWeather(4000);
  const std::vector<Parameters> cases{
      {},
      {.x1 = 50.0, .x2 = -5.0, .x3 = 10.0, .x4 = 0.5, .ctg = 0.0, .kf = 1.0},
      {.x1 = 2000.0, .x2 = 5.0, .x3 = 500.0, .x4 = 5.0, .ctg = 1.0, .kf = 10.0},
      {.x4 = 1.0},
      {.x4 = 2.0000001},
      {.x4 = 100.0},
      {.x1 = 0.01, .x2 = -1000.0, .x3 = 0.01, .x4 = 0.01, .ctg = 0.9, .kf = 0.0},
  };
  for (const Parameters& parameters : cases) {
    SnowPack snow(parameters, meanAnnualSolidPrecipitation(days));
    Gr4j model(parameters);
    for (const Forcing& day : days) {
      const double before = snow.water() + model.stored();
      const Fluxes fluxes = model.advance(snow.advance(day), day.pet);
      const double gained = day.precipitation + fluxes.exchange - fluxes.evapotranspiration - fluxes.runoff;
      ASSERT_NEAR(snow.water() + model.stored() - before, gained, 1e-9) << "X1 " << parameters.x1;
      ASSERT_GE(fluxes.runoff, 0.0);
      ASSERT_GE(snow.water(), 0.0);
      ASSERT_LE(model.production(), parameters.x1);
    }
  }
}

}  // namespace
}  // namespace models

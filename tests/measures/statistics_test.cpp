#include "measures/statistics.h"

#include <cmath>
#include <numeric>
#include <optional>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "measures/measure_statistics.h"
#include "platform/series/memory_time_series.h"

namespace mirevo {
namespace {

constexpr float kNothing = -99.0F;

MeasureStatistics compare(const OutputMeasure& measure, std::vector<float> simulated, std::vector<float> observed) {
  std::vector<double> days(simulated.size());
  std::iota(days.begin(), days.end(), 0.0);
  const DateRecord start{2001, 1, 1};
  MemoryTimeSeries simulation(start, days, {std::move(simulated)}, kNothing);
  MemoryTimeSeries observation(start, days, {std::move(observed)}, kNothing);
  return computeMeasureStatistics(measure, {start, {2001, 1, 31}}, simulation, observation, 1.0F, 1.0F,
                                  statisticOf(measure.statisticType).needsPeaks);
}

TEST(Statistics, APerfectFitIsBestAndZeroInAnObjective) {
  const std::vector<float> observed{2, 1, 4, 3, 2.5, 1.5, 3.5, 1.25};
  for (std::size_t i = 0; i < statisticTable().size(); ++i) {
    const Statistic& statistic = statisticTable()[i];
    SCOPED_TRACE(statistic.key.name);
    const OutputMeasure measure{.statisticType = static_cast<StatisticType>(i)};
    const double best = selectStatistic(compare(measure, observed, observed), measure.statisticType);
    const double other = selectStatistic(compare(measure, {3, 4, 5, 9, 3, 2, 7, 3}, observed), measure.statisticType);
    EXPECT_TRUE(statistic.best == Best::zero       ? best == 0.0
                : statistic.best == Best::smallest ? best < other
                                                   : best > other);
    EXPECT_EQ(statistic.inObjective(best), 0.0);
    EXPECT_GT(statistic.inObjective(other), 0.0);
  }
}

// Computed apart from the program, with 40 digits, from the published definitions.
TEST(Statistics, WithoutACodeAreThoseOfTheirDefinitions) {
  constexpr std::size_t kFirst = 5;
  struct Case {
    const char* name;
    std::vector<float> simulated;
    std::vector<float> observed;
    std::vector<double> expected;  // in the order of the table
  };
  const Case cases[] = {
      {"gaps and ties",
       {3, kNothing, 2.5, 2.5, 6, 4.25, 3.5, kNothing, 2.25, 2, 1.5, 1.75, 1.25, 1},
       {2.75, 3, kNothing, 2.5, 7.5, 5, 3.5, 2, 2.5, 2.5, 1.25, 1.5, kNothing, 1},
       {0.90433212996389889, 0.94043157158212842, 0.92937421808204967, 0.74686962811159852, 0.804623747150362,
        0.90267740838463628, -7.5, 0.375, 0.30930223089415487, 0.97014443829363795, 0.96898771211234636, -20, 0,
        -5.6478405315614619, -20, -15.712187486278593, -53.78522306207703, 3.3125}},
      {"zeros",
       {0, 0, 0.5, 4, 2, 0.25, 0, 0, 0, 0},
       {0, 0.25, 0, 3, 5, 1, 0.5, 0, 0, 0},
       {0.56890288205376605, 0.28685168018879553, 0.62146360782242682, 0.56161954681068815, 0.59882849893424228,
        0.5312743975168005, -30.76923076923077, 0.59999999999999998, 0.65657986410354829, 0.60379698399753523,
        0.84940268706216793, -20, -24, -30.76923076923077, -20, -7.5657738431323187, NAN, 11.125}},
      {"a negative value",
       {1, 2, -1, 4, 3, 2, 1, 2},
       {1, 3, 2, 5, 2, 1, 0.5, 2},
       {0.068131868131868126, NAN, NAN, 0.55225408036566559, 0.49832715667141986, 0.54571717214567161,
        -15.151515151515152, 0.9375, 0.96533317143260533, 0.33753987947536335, 0.72521062864549579, -20, 0,
        -16.666666666666668, -20, -4.9815974365216418, NAN, 13.25}},
      {"constant observations",
       {1, 2, 3, 4},
       {2, 2, 2, 2},
       {NAN, NAN, NAN, NAN, NAN, NAN, 25, 1, NAN, NAN, 0, 100, 72, 25, 100, NAN, NAN, 6}},
      {"a constant simulation",
       {2, 2, 2, 2, 2},
       {1, 4, 2, 3, 1},
       {-0.029411764705882353, -0.0097646672167841404, -0.0014384783016489747, NAN, NAN, NAN, -9.0909090909090917, 1,
        1.0145993123917847, NAN, 0.22907488986784141, -50, -24, -20, -50, -100, NAN, 7}},
      {"one pair",
       {1.5, kNothing},
       {2, kNothing},
       {NAN, NAN, NAN, NAN, NAN, NAN, -25, 0.5, NAN, NAN, 0, -25, 0, NAN, -25, NAN, NAN, 0.25}},
  };
  for (const Case& each : cases) {
    ASSERT_EQ(kFirst + each.expected.size(), statisticTable().size());
    for (std::size_t i = 0; i < each.expected.size(); ++i) {
      const OutputMeasure measure{.statisticType = static_cast<StatisticType>(kFirst + i)};
      const double found = selectStatistic(compare(measure, each.simulated, each.observed), measure.statisticType);
      EXPECT_THAT(found, ::testing::NanSensitiveDoubleNear(each.expected[i],
                                                           1e-12 * std::fmax(1.0, std::abs(each.expected[i]))))
          << each.name << ", " << statisticOf(measure.statisticType).key.name;
    }
  }
}

TEST(Statistics, CompareTransformedValues) {
  const std::vector<float> simulated{2, 1, 4, 3};
  const std::vector<float> observed{1, 1, 4, 2};
  const auto nse = [](double a, double b, double c, double d, double p, double q, double r, double s) {
    const double mean = (p + q + r + s) / 4.0;
    const double errors = std::pow(a - p, 2) + std::pow(b - q, 2) + std::pow(c - r, 2) + std::pow(d - s, 2);
    const double spread = std::pow(p - mean, 2) + std::pow(q - mean, 2) + std::pow(r - mean, 2) + std::pow(s - mean, 2);
    return 1.0 - errors / spread;
  };
  const auto root = [](double value) { return 2.0 * (std::sqrt(value) - 1.0); };
  const std::tuple<ValueTransformation, std::optional<double>, double> cases[] = {
      {ValueTransformation::squareRoot, std::nullopt, nse(std::sqrt(2), 1, 2, std::sqrt(3), 1, 1, 2, std::sqrt(2))},
      // The observed mean is 2.
      {ValueTransformation::inverse, std::nullopt,
       nse(1 / 2.02, 1 / 1.02, 1 / 4.02, 1 / 3.02, 1 / 1.02, 1 / 1.02, 1 / 4.02, 1 / 2.02)},
      {ValueTransformation::logarithm, 1.0,
       nse(std::log(3), std::log(2), std::log(5), std::log(4), std::log(2), std::log(2), std::log(5), std::log(3))},
      {ValueTransformation::boxCox, 0.0, nse(root(2), 0, root(4), root(3), 0, 0, root(4), root(2))},
      {ValueTransformation::rank, std::nullopt, nse(2, 1, 4, 3, 1.5, 1.5, 4, 3)},
  };
  for (const auto& [transformation, epsilon, expected] : cases) {
    const OutputMeasure measure{.statisticType = findStatistic("nse").value(),
                                .transformation = transformation,
                                .epsilon = epsilon,
                                .boxCoxLambda = 0.5};
    EXPECT_NEAR(selectStatistic(compare(measure, simulated, observed), measure.statisticType), expected, 1e-12)
        << static_cast<int>(transformation);
  }
  const OutputMeasure rms{.statisticType = StatisticType::rootMeanSquare,
                          .transformation = ValueTransformation::squareRoot};
  EXPECT_FLOAT_EQ(static_cast<float>(selectStatistic(compare(rms, {4, 9, 1, 1}, {1, 1, 1, 1}), rms.statisticType)),
                  std::sqrt(5.0F / 4.0F));
}

/// The value for daily observations with a second item.
double valueWith(OutputMeasure measure, const std::vector<float>& simulated, const std::vector<float>& observed,
                 const std::vector<float>& second, const ObservationWeighting& weighting) {
  std::vector<double> days(simulated.size());
  std::iota(days.begin(), days.end(), 0.0);
  const EvaluationPeriod period{{2001, 1, 1}, {2001, 1, 31}};
  MemoryTimeSeries simulation(period.start, days, {simulated}, kNothing);
  MemoryTimeSeries observation(period.start, days, {observed, second}, kNothing);
  measure.weighting = weighting;
  return measureValue(measure, period, simulation, observation);
}

TEST(Statistics, AnObservationOfWeightTwoCountsAsFour) {
  const std::vector<float> simulated{3, 2.5, 6, 9.25, 1};
  const std::vector<float> observed{2.75, 2, 7.5, 8, 1.25};
  const ObservationWeighting weights{.weightItem = 2};
  const ObservationWeighting errors{.errorItem = 2};
  for (std::size_t i = 0; i < statisticTable().size(); ++i) {
    const Statistic& statistic = statisticTable()[i];
    SCOPED_TRACE(statistic.key.name);
    const OutputMeasure measure{.statisticType = static_cast<StatisticType>(i), .epsilon = 0.1};
    const double without =
        selectStatistic(compare(measure, simulated, {2.75, 2, 7.5, kNothing, 1.25}), measure.statisticType);
    EXPECT_THAT(valueWith(measure, simulated, observed, {0, 1, kNothing, 9, 0}, {.qualityItem = 2, .leftOut = {8, 9}}),
                ::testing::NanSensitiveDoubleEq(without));
    if (!takesWeights(measure)) continue;
    EXPECT_EQ(valueWith(measure, simulated, observed, {1, 1, 1, 0, 1}, weights), without);
    if (statistic.key.code) continue;
    const double repeated = selectStatistic(
        compare(measure, {3, 2.5, 2.5, 2.5, 2.5, 6, 1}, {2.75, 2, 2, 2, 2, 7.5, 1.25}), measure.statisticType);
    EXPECT_NEAR(valueWith(measure, simulated, observed, {1, 2, 1, kNothing, 1}, weights), repeated, 1e-12);
    if (statistic.key.name == "sum of squared errors") continue;  // four times as large
    EXPECT_NEAR(valueWith(measure, simulated, {2.75, 2, 7.5, kNothing, 1.25}, {1, 0.5, 1, 0, 1}, errors), repeated,
                1e-12);
    EXPECT_NEAR(valueWith(measure, simulated, observed, {0, 1, 0, 9, 0},
                          {.qualityItem = 2, .leftOut = {9}, .downWeighted = {0}}),
                repeated, 1e-12);
  }
  // Differences 0.25, 0.5, -1.5, -0.25.
  const auto rms = static_cast<float>(valueWith({.statisticType = StatisticType::rootMeanSquare}, simulated,
                                                {2.75, 2, 7.5, kNothing, 1.25}, {1, 2, 1, 1, 1}, weights));
  EXPECT_FLOAT_EQ(rms, std::sqrt(3.375F / 4.0F));
}

TEST(Statistics, AreFoundByNameInAnyLetterCase) {
  EXPECT_EQ(findStatistic("Root MEAN square"), StatisticType::rootMeanSquare);
  EXPECT_EQ(findStatistic("root mean"), std::nullopt);
  for (std::size_t i = 0; i < statisticNames().size(); ++i) {
    EXPECT_EQ(findStatistic(statisticNames()[i].name), static_cast<StatisticType>(i)) << "a name twice";
  }
}

}  // namespace
}  // namespace mirevo

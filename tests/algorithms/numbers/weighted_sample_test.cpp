#include "algorithms/numbers/weighted_sample.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

TEST(WeightedQuantiles, AreTheLeastValuesUpToWhichTheShareOfTheWeightLies) {
  WeightedQuantiles quantiles;
  quantiles.take(std::vector<double>{4.0, 1.0, kNaN, 3.0, 2.0, 99.0},
                 std::vector<double>{0.4, 0.1, 0.7, 0.3, 0.2, 0.0});
  EXPECT_EQ(quantiles.count(), 4U) << "neither NaN nor a value without weight";
  const std::pair<double, double> cases[] = {{0.0, 1.0},  {0.1, 1.0}, {0.11, 2.0}, {0.3, 2.0},
                                             {0.31, 3.0}, {0.6, 3.0}, {0.61, 4.0}, {1.0, 4.0}};
  for (const auto& [probability, value] : cases) EXPECT_EQ(quantiles.at(probability), value) << probability;
  EXPECT_EQ(quantiles.shareUpTo(0.5), 0.0);
  EXPECT_NEAR(quantiles.shareUpTo(3.0), 0.6, 1e-15);
  EXPECT_EQ(quantiles.shareUpTo(5.0), 1.0);
  quantiles.take(std::vector<double>{kNaN}, std::vector<double>{1.0});
  EXPECT_TRUE(std::isnan(quantiles.at(0.5)));
}

TEST(WeightedQuantiles, OfEqualWeightsAreNotMovedByRounding) {
  // Whatever their number, k of n equal weights are the share k / n.
  for (const std::size_t n : {20U, 60U, 700U, 9980U}) {
    std::vector<double> values;
    for (std::size_t i = 0; i < n; ++i) values.push_back(static_cast<double>(i + 1));
    WeightedQuantiles quantiles;
    quantiles.take(values, std::vector<double>(n, 1.0 / static_cast<double>(n)));
    EXPECT_EQ(quantiles.at(0.05), std::ceil(0.05 * static_cast<double>(n) - 1e-9)) << n;
    EXPECT_EQ(quantiles.at(0.95), std::ceil(0.95 * static_cast<double>(n) - 1e-9)) << n;
  }
}

TEST(WeightedSummary, OfRepeatedValuesIsThatOfTheirWeights) {
  // 2 three times and 5 once: mean 2.75; of weights 3/4 and 1/4 the variance is 1.6875 / (1 - 10/16).
  const SampleSummary summary = summariseWeighted(std::vector<double>{2.0, 5.0}, std::vector<double>{0.75, 0.25});
  EXPECT_DOUBLE_EQ(summary.mean, 2.75);
  EXPECT_DOUBLE_EQ(summary.standardDeviation, std::sqrt(1.6875 / 0.375));
  EXPECT_EQ(summary.quantiles[2], 2.0);
  EXPECT_EQ(summary.quantiles[4], 5.0);
  // Equal weights: as a sample, divisor n - 1.
  const std::vector<double> values{1e9 + 1.0, 1e9 + 2.0, 1e9 + 6.0};
  const SampleSummary equal = summariseWeighted(values, std::vector<double>(3, 1.0 / 3.0));
  EXPECT_NEAR(equal.standardDeviation, summariseSample(values).standardDeviation, 1e-6);
  EXPECT_TRUE(std::isnan(summariseWeighted(values, std::vector<double>{0.0, 1.0, 0.0}).standardDeviation));
}

TEST(WeightedCorrelations, AreThoseOfTheRepeatedSample) {
  const std::vector<std::vector<double>> columns{{1.0, 2.0, 4.0}, {3.0, 1.0, 2.0}, {7.0, 7.0, 7.0}};
  const auto found = weightedCorrelations(columns, std::vector<double>{0.5, 0.25, 0.25});
  const std::vector<double> first{1.0, 1.0, 2.0, 4.0};
  const std::vector<double> second{3.0, 3.0, 1.0, 2.0};
  EXPECT_NEAR(found[0][1], sampleCorrelation(first, second), 1e-14);
  EXPECT_EQ(found[0][1], found[1][0]);
  EXPECT_EQ(found[0][0], 1.0);
  EXPECT_TRUE(std::isnan(found[2][0])) << "of a constant";
}

TEST(EffectiveCount, IsThatOfEqualWeightsOrOfTheOnlyOne) {
  EXPECT_DOUBLE_EQ(effectiveCount(std::vector<double>(8, 0.125)), 8.0);
  EXPECT_DOUBLE_EQ(effectiveCount(std::vector<double>{0.0, 1.0, 0.0}), 1.0);
  EXPECT_EQ(effectiveCount(std::vector<double>(3, 0.0)), 0.0);
}

TEST(DistributionDistance, IsTheLargestOfTheDistributionFunctions) {
  const std::vector<double> drawn{1.0, 2.0, 3.0, 4.0};
  // Up to 2 all of the weight and half of those drawn.
  EXPECT_DOUBLE_EQ(distributionDistance(std::vector<double>{1.0, 2.0}, std::vector<double>{0.5, 0.5}, drawn), 0.5);
  // At 3, just before the weight, half; from 4 on all: 3/4 lie below.
  EXPECT_DOUBLE_EQ(distributionDistance(std::vector<double>{4.0}, std::vector<double>{1.0}, drawn), 0.75);
  EXPECT_DOUBLE_EQ(distributionDistance(drawn, std::vector<double>(4, 0.25), drawn), 0.0);
  EXPECT_TRUE(std::isnan(distributionDistance(drawn, std::vector<double>(4, 0.0), drawn)));
}

}  // namespace
}  // namespace mirevo

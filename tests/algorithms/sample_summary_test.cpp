#include "algorithms/sample_summary.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <gtest/gtest.h>

#include "algorithms/series_band.h"
#include "algorithms/uniform_generator.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

TEST(SampleSummary, MatchesAWorkedExample) {
  // 2 4 4 5 10 with values that do not count: mean 5, squares 9 + 1 + 1 + 0 + 25 = 36, 5 % at position 0.2.
  const SampleSummary summary =
      summariseSample(std::vector<double>{10, 4, kNaN, 2, 5, 4, std::numeric_limits<double>::infinity()});
  EXPECT_EQ(summary.count, 5U);
  EXPECT_EQ(summary.mean, 5.0);
  EXPECT_EQ(summary.standardDeviation, 3.0);
  const double expected[] = {2.4, 4.0, 4.0, 5.0, 9.0};
  for (std::size_t k = 0; k < 5; ++k) EXPECT_DOUBLE_EQ(summary.quantiles[k], expected[k]) << k;
}

TEST(SampleSummary, SaysNaNWhereTheSampleIsTooSmall) {
  EXPECT_TRUE(std::isnan(summariseSample({}).mean));
  EXPECT_TRUE(std::isnan(summariseSample({}).quantiles[2]));
  const SampleSummary one = summariseSample(std::vector<double>{3.0});
  EXPECT_EQ(one.quantiles[0], 3.0);
  EXPECT_TRUE(std::isnan(one.standardDeviation));
}

TEST(SampleCorrelation, MatchesAWorkedExampleAndRefusesConstants) {
  const std::vector<std::vector<double>> rows = {{1, 2, 7}, {2, 1, 7}, {3, 4, 7}, {4, 3, 7}};
  const auto matrix = correlationMatrix(rows);
  EXPECT_DOUBLE_EQ(matrix[0][1], 0.6);
  EXPECT_EQ(matrix[1][0], matrix[0][1]);
  EXPECT_TRUE(std::isnan(matrix[0][2]));
  EXPECT_EQ(matrix[2][2], 1.0);
}

TEST(SeriesBand, HasTheQuantilesOfAllValuesWhateverTheirOrder) {
  UniformGenerator random(3);
  for (const std::size_t n : {1, 2, 19, 21, 22, 200, 401}) {
    std::vector<double> values;
    SeriesBand band({0.5, kNaN, -1.0, 0.5}, 401);
    for (std::size_t i = 0; i < n; ++i) {
      values.push_back(random.next());
      band.add(std::vector<double>{values.back(), values.back(), values.back(), kNaN});
    }
    const SeriesBand::Bounds bounds = band.bounds();
    std::sort(values.begin(), values.end());
    EXPECT_NEAR(bounds.lower[0], sortedQuantile(values, 0.05), 1e-15) << n;
    EXPECT_NEAR(bounds.upper[0], sortedQuantile(values, 0.95), 1e-15) << n;
    EXPECT_TRUE(std::isnan(bounds.lower[3]));
    EXPECT_EQ(bounds.observationCount, 2U);
    if (n >= 19) {
      EXPECT_EQ(bounds.shareInside, 0.5);
    }
  }
  EXPECT_TRUE(std::isnan(SeriesBand({1.0}, 5).bounds().shareInside));
}

}  // namespace
}  // namespace mirevo

#include "algorithms/numbers/sample_summary.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/analyses/series_band.h"
#include "algorithms/numbers/uniform_generator.h"
#include "matchers.h"

namespace mirevo {
namespace {

TEST(SampleSummary, MatchesAWorkedExample) {
  // 2 4 4 5 10 with values that do not count: mean 5, squares 9 + 1 + 1 + 0 + 25 = 36, 5 % at position 0.2.
  const SampleSummary summary =
      summariseSample(std::vector<double>{10, 4, NAN, 2, 5, 4, std::numeric_limits<double>::infinity()});
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

std::vector<double> column(const std::vector<std::vector<double>>& rows, std::size_t j) {
  std::vector<double> values;
  for (const auto& row : rows) values.push_back(row[j]);
  return values;
}

TEST(SampleCorrelation, MatchesAWorkedExampleAndRefusesConstants) {
  const std::vector<std::vector<double>> rows = {{1, 2, 7}, {2, 1, 7}, {3, 4, 7}, {4, 3, 7}};
  const auto matrix = correlationMatrix(rows);
  EXPECT_DOUBLE_EQ(matrix[0][1], 0.6);
  EXPECT_EQ(matrix[1][0], matrix[0][1]);
  EXPECT_TRUE(std::isnan(matrix[0][2]));
  EXPECT_EQ(matrix[2][2], 1.0);
}

TEST(SampleCorrelation, TheLargestOfManyAreThoseOfTheMatrix) {
  std::vector<std::vector<double>> rows(7, std::vector<double>(30));
  std::uint32_t state = 1;
  for (auto& row : rows) {
    for (double& value : row) value = (state = state * 1664525U + 1013904223U) >> 8U;
    row[3] = 5.0;          // without variance
    row[9] = -2 * row[4];  // two with the same absolute value
    row[8] = row[4];
  }
  const auto matrix = correlationMatrix(rows);
  std::vector<PairCorrelation> all;
  for (std::size_t i = 0; i < 30; ++i) {
    for (std::size_t j = i + 1; j < 30; ++j) {
      if (!std::isnan(matrix[i][j])) all.push_back({i, j, matrix[i][j]});
    }
  }
  std::ranges::stable_sort(all, [](auto& a, auto& b) { return std::abs(a.value) > std::abs(b.value); });
  for (const std::size_t count : {0, 1, 2, 50, 1000}) {
    const auto largest = largestCorrelations(SampleCorrelations(rows), count);
    ASSERT_EQ(largest.size(), std::min(count, all.size()));
    for (std::size_t k = 0; k < largest.size(); ++k) {
      EXPECT_EQ(std::pair(largest[k].first, largest[k].second), std::pair(all[k].first, all[k].second)) << k;
      EXPECT_EQ(largest[k].value, sampleCorrelation(column(rows, largest[k].second), column(rows, largest[k].first)));
    }
  }
}

TEST(SampleCorrelation, OfMoreThanTenColumnsIsToldByItsLargestPairs) {
  std::vector<std::string> names;
  for (int j = 1; j <= 11; ++j) names.push_back(fmt::format("p{}", j));
  std::vector<std::vector<double>> matrix(11, std::vector<double>(11, 0.1));
  EXPECT_EQ(formatCorrelation("Ten", std::span(names).first(10), std::span(matrix).first(10), "c.dat").size(), 11U);
  matrix[2][6] = matrix[6][2] = 0.5;
  matrix[3][10] = matrix[10][3] = -0.7;
  const std::vector<std::string> lines = formatCorrelation("Sample correlation", names, matrix, "c.dat");
  ASSERT_EQ(lines.size(), 12U);
  EXPECT_THAT(lines[0], HasSubstr("Sample correlation        Largest"));
  EXPECT_THAT(lines[1], AllOf(StartsWith("   p4, p11 "), HasSubstr(" -0.7")));
  EXPECT_THAT(lines[2], AllOf(StartsWith("   p3, p7 "), HasSubstr(" 0.5")));
  EXPECT_EQ(lines[11], "   All correlations of the 11 parameters are in c.dat");
}

TEST(SeriesBand, HasTheQuantilesOfWhatSucceededAndCountsTheObservationsInside) {
  std::vector<double> columns;
  for (std::size_t observation = 0; observation < 5; ++observation) {
    for (std::size_t i = 0; i < 101; ++i) {
      const auto value = static_cast<double>((37 * i) % 101);  // 0 to 100, shuffled
      const bool isMissing = observation == 3 || (observation == 2 && i == 0);
      columns.push_back(isMissing ? NAN : observation == 4 ? -value : value);
    }
  }
  const auto read = [&](std::size_t first, std::size_t count) {
    const auto from = columns.begin() + static_cast<std::ptrdiff_t>(101 * first);
    return std::vector(from, from + static_cast<std::ptrdiff_t>(101 * count));
  };
  const SeriesBand band = seriesBand(std::vector{5.0, 4.9, 50.0, 1.0, -95.0}, 101, read);
  EXPECT_DOUBLE_EQ(band.lower[0], 5.0);
  EXPECT_DOUBLE_EQ(band.median[0], 50.0);
  EXPECT_DOUBLE_EQ(band.upper[0], 95.0);
  EXPECT_DOUBLE_EQ(band.lower[2], 1.0 + 99.0 * 0.05);  // 1 to 100
  EXPECT_TRUE(std::isnan(band.lower[3]) && std::isnan(band.median[3]) && std::isnan(band.upper[3]));
  EXPECT_DOUBLE_EQ(band.lower[4], -95.0);
  EXPECT_EQ(band.coverage.observationCount, 4U);
  EXPECT_EQ(fewerRunsText(band),
            "at 1 of 4 observations the quantiles are of fewer runs than at the others, of 100 to 101: runs have no "
            "value there");
  EXPECT_EQ(fewerRunsText(seriesBand(std::vector{5.0}, 101, read)), "");
  EXPECT_EQ(band.coverage.shareInside, 0.75);
  const std::vector<double> values = {5.0, 4.9, NAN, 1.0, NAN};
  const SeriesBand ofSteps = seriesBand(values, 101, read);
  EXPECT_EQ(ofSteps.coverage.observationCount, 2U);
  EXPECT_EQ(ofSteps.coverage.shareInside, 0.5);
  EXPECT_THAT(fewerRunsText(ofSteps), StartsWith("at 1 of 4 times the quantiles are of fewer runs"));
  EXPECT_THAT(seriesBandText("flow", {0, {2001, 1, 1}, {0.0, 1.0, 1.5, 2.0, 3.0}, values}, ofSteps, true),
              EndsWith("\n2001-01-02 12:00,,5.95,50.5,95.05,100\n2001-01-03 00:00,1,NaN,NaN,NaN,0\n"
                       "2001-01-04 00:00,,-95,-50,-5,101\n"));
  EXPECT_TRUE(
      std::isnan(seriesBand(std::vector{1.0}, 0, [](auto...) { return std::vector<double>(); }).coverage.shareInside));
}

}  // namespace
}  // namespace mirevo

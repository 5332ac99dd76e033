#include "algorithms/distributions/parameter_distributions.h"

#include <cmath>
#include <numeric>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/uniform_generator.h"
#include "refusal.h"

namespace mirevo {
namespace {

using Matrix = std::vector<std::vector<double>>;

const std::vector<std::string> kNames{"a", "b", "c", "d"};

GaussianCopula copulaOf(const Matrix& correlations) {
  return GaussianCopula(correlations, std::span(kNames).first(correlations.size()));
}

Matrix drawn(const ParameterDistributions& distributions, int count) {
  UniformGenerator random(3);
  Matrix sets;
  std::vector<double> point(distributions.size());
  for (int i = 0; i < count; ++i) {
    for (double& p : point) p = random.next();
    sets.push_back(distributions.setAt(point));
  }
  return sets;
}

std::vector<double> ranks(const Matrix& rows, std::size_t column) {
  std::vector<std::size_t> order(rows.size());
  std::iota(order.begin(), order.end(), 0U);
  std::sort(order.begin(), order.end(), [&](auto a, auto b) { return rows[a][column] < rows[b][column]; });
  std::vector<double> ranks(rows.size());
  for (std::size_t k = 0; k < order.size(); ++k) ranks[order[k]] = static_cast<double>(k);
  return ranks;
}

TEST(ParameterDistributions, UniformOnesFillTheBounds) {
  const SearchSpace space{.names = {"a", "n"},
                          .lower = {1.0, 0.0},
                          .upper = {3.0, 4.0},
                          .transformation = {TransformationType::none, TransformationType::integer}};
  const ParameterDistributions uniform = ParameterDistributions::uniform(space);
  EXPECT_EQ(uniform.setAt(std::vector{0.25, 0.75}), (ParameterSet{1.5, 3.0}));
  EXPECT_DOUBLE_EQ(uniform.logDensity(std::vector{3.0, 0.0}), -std::log(8.0));
  EXPECT_EQ(uniform.logDensity(std::vector{3.1, 0.0}), -INFINITY);
}

/// Moments of the samples are within five standard errors, correlations within the same.
TEST(ParameterDistributions, ReachTheirMomentsAndCorrelations) {
  const Matrix correlations{{1, 0.7, 0, -0.4}, {0.7, 1, 0, 0.2}, {0, 0, 1, 0}, {-0.4, 0.2, 0, 1}};
  const ParameterDistributions distributions(
      {normalDistribution(5, 2), lognormal(0, 0.5), triangular(0, 1, 5), betaDistribution(2, 5, 0, 1)},
      copulaOf(correlations));
  constexpr int kCount = 20'000;
  const Matrix sets = drawn(distributions, kCount);
  const double means[] = {5, std::exp(0.125), 2, 2.0 / 7.0};
  const double variances[] = {4, (std::exp(0.25) - 1) * std::exp(0.25), 21.0 / 18.0, 10.0 / (49 * 8)};
  for (std::size_t j = 0; j < 4; ++j) {
    std::vector<double> values;
    for (const auto& set : sets) values.push_back(set[j]);
    const SampleSummary summary = summariseSample(values);
    EXPECT_NEAR(summary.mean, means[j], 5 * std::sqrt(variances[j] / kCount)) << j;
    EXPECT_NEAR(summary.standardDeviation / std::sqrt(variances[j]), 1.0, 0.04) << j;
    for (std::size_t i = 0; i < j; ++i) {  // the rank correlation of the Gaussian copula
      const double expected = 6.0 / M_PI * std::asin(correlations[i][j] / 2.0);
      EXPECT_NEAR(sampleCorrelation(ranks(sets, i), ranks(sets, j)), expected, 5 / std::sqrt(kCount)) << i << j;
      EXPECT_NEAR(ofRankCorrelation(expected), correlations[i][j], 1e-14);
    }
  }
}

TEST(ParameterDistributions, SingleValuesAndMovesAreThoseOfTheWholeSet) {
  const std::vector<DistributionPointer> ofParameters{normalDistribution(5, 2), lognormal(0, 0.5), triangular(0, 1, 5),
                                                      betaDistribution(2, 5, 0, 1)};
  UniformGenerator random(8);
  for (const ParameterDistributions& distributions :
       {ParameterDistributions(ofParameters),
        ParameterDistributions(ofParameters,
                               copulaOf({{1, 0, 0.7, 0.2}, {0, 1, 0, 0}, {0.7, 0, 1, -0.3}, {0.2, 0, -0.3, 1}}))}) {
    std::vector<double> point{0.2, 0.4, 0.6, 0.8};
    ParameterSet moving = distributions.setAt(point);
    for (int i = 0; i < 40; ++i) {
      const auto j = static_cast<std::size_t>(i % 4);
      point[j] = random.next();
      distributions.move(moving, j, point);
      EXPECT_EQ(moving, distributions.setAt(point));
      for (std::size_t k = 0; k < 4; ++k) EXPECT_EQ(distributions.valueAt(k, point), moving[k]);
    }
  }
}

TEST(ParameterDistributions, DensityOfCorrelatedNormalsIsThatOfTheirJointOne) {
  const double r = 0.6;
  const ParameterDistributions joint({normalDistribution(1, 2), normalDistribution(-1, 0.5)},
                                     copulaOf({{1, r}, {r, 1}}));
  const double x = (2.5 - 1) / 2;
  const double y = (-1.4 + 1) / 0.5;
  const double expected =
      -(x * x - 2 * r * x * y + y * y) / (2 * (1 - r * r)) - std::log(2 * M_PI * 2 * 0.5 * std::sqrt(1 - r * r));
  EXPECT_NEAR(joint.logDensity(std::vector{2.5, -1.4}), expected, 1e-14);
}

/// The density is what setAt() makes of the unit cube: the volume of the image of a small cube is its inverse.
TEST(ParameterDistributions, DensityIsThatOfTheSetsDrawn) {
  const ParameterDistributions joint(
      {ofLogarithm(triangular(1, 2, 8)), onGridOf(0, normalDistribution(3, 2)), betaDistribution(2, 3, 0, 4)},
      copulaOf({{1, 0.5, -0.3}, {0.5, 1, 0.4}, {-0.3, 0.4, 1}}));
  const double kStep = 1e-6;
  for (const std::vector<double>& point : {std::vector{0.2, 0.4, 0.9}, {0.7, 0.6, 0.3}, {0.05, 0.98, 0.5}}) {
    const ParameterSet set = joint.setAt(point);
    double logVolume = 0.0;  // the Jacobian is triangular: a coordinate moves its own parameter and those behind it
    for (std::size_t j = 0; j < 3; ++j) {
      std::vector<double> moved = point;
      moved[j] += kStep;
      logVolume += std::log((joint.setAt(moved)[j] - set[j]) / kStep);
    }
    EXPECT_NEAR(joint.logDensity(set), -logVolume, 1e-4);
  }
}

TEST(ParameterDistributions, NameTheFirstWithoutADensity) {
  const double values[] = {1, 2};
  const ParameterDistributions mixed({normalDistribution(0, 1), discreteDistribution(values, std::vector{1.0, 3.0})});
  EXPECT_EQ(mixed.firstWithoutDensity(), 1U);
  EXPECT_NEAR(mixed.logDensity(std::vector{0.0, 2.0}), -0.5 * std::log(2 * M_PI) + std::log(0.75), 1e-15);
  EXPECT_EQ(ParameterDistributions({normalDistribution(0, 1)}).firstWithoutDensity(), std::nullopt);
}

TEST(GaussianCopula, RefusesCorrelationsThatContradictEachOther) {
  const Matrix matrix{{1, 0.9, 0.9}, {0.9, 1, -0.9}, {0.9, -0.9, 1}};
  EXPECT_NEAR(smallestEigenvalue(matrix), -0.8, 1e-6);  // the others are 1.9
  EXPECT_EQ(refusalOf([&] { copulaOf(matrix); }),
            "Error: Correlations of the parameters are not positive definite\n"
            "no distribution can have all of them: the smallest eigenvalue of their matrix is -0.8, expected above 0; "
            "the largest are a and b 0.9, a and c 0.9, b and c -0.9\n"
            "It would be positive if all were multiplied by a factor below 0.5556; or correct those that contradict "
            "each other");
  Matrix smaller = matrix;
  for (std::size_t i = 0; i < 3; ++i) {
    for (std::size_t j = 0; j < 3; ++j) smaller[i][j] *= i == j ? 1 : 0.5555;
  }
  EXPECT_EQ(refusalOf([&] { copulaOf(smaller); }), "accepted");
  for (const double r : {1.0, -1.0, 1.0 - 1e-10}) {
    EXPECT_THAT(
        refusalOf([&] {
          copulaOf({{1, r}, {r, 1}});
        }),
        ::testing::HasSubstr("a function of others, but for rounding: the smallest eigenvalue of their matrix is "
                             "0, expected 1e-08 or more"));
  }
  EXPECT_EQ(refusalOf([&] { copulaOf({{1, 0.999}, {0.999, 1}}); }), "accepted");
}

}  // namespace
}  // namespace mirevo

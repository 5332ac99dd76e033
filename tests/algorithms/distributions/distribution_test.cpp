#include "algorithms/distributions/distribution.h"

#include <cmath>
#include <string>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

/// One of every kind, on the model scale and on search scales of its own.
std::vector<DistributionPointer> oneOfEach() {
  const double values[] = {1, 2, 4, 7};
  const double weights[] = {1, 2, 4, 1};
  std::vector<double> sample;
  for (int i = 0; i < 200; ++i) sample.push_back(std::exp(std::sin(1.7 * i)));
  std::vector<DistributionPointer> all{normalDistribution(3, 0.5),
                                       truncatedNormal(3, 0.5, 3.5, 4.5),
                                       truncatedNormal(3, 0.5, 1, 2),
                                       truncatedNormal(0, 1, 8, 9),
                                       lognormal(0.5, 0.7),
                                       uniformDistribution(-1, 4),
                                       logUniform(0.01, 10),
                                       triangular(1, 2, 5),
                                       triangular(1, 1, 5),
                                       betaDistribution(0.5, 3, 2, 4),
                                       betaDistribution(4, 1, 0.5, 6),
                                       sampledDistribution(sample)};
  for (const auto& positive : {lognormal(0.5, 0.7), triangular(1, 2, 5), betaDistribution(2, 3, 0, 4)}) {
    all.push_back(ofLogarithm(positive));
  }
  for (const auto& quantity : {normalDistribution(4, 1.5), uniformDistribution(1.5, 7.5), lognormal(1, 0.3),
                               discreteDistribution(values, weights)}) {
    all.push_back(onGridOf(2, quantity));
  }
  return all;
}

TEST(Distribution, FunctionQuantileTailAndDensityAgree) {
  for (const DistributionPointer& distribution : oneOfEach()) {
    SCOPED_TRACE(std::string(distribution->name()) + ", " + distribution->text());
    constexpr int kSteps = 20'000;
    const double low = distribution->quantile(1e-9);
    const double high = distribution->quantile(1 - 1e-9);
    ASSERT_LT(low, high);
    // The trapezoidal rule between ends of steps of the density and poles at the limits is good to 1e-3.
    double integral = 0.0;
    for (int k = 0; k < kSteps; ++k) {
      const double x = low + (high - low) * (k + 0.5) / kSteps;
      integral += std::exp(distribution->logDensity(x)) * (high - low) / kSteps;
      const double tolerance = k % 500 == 0 ? 6e-3 : 1.0;
      EXPECT_NEAR(integral, distribution->cumulative(x), tolerance) << x;
    }
    EXPECT_NEAR(integral, 1.0, 6e-3);
    for (const double p : {1e-6, 0.001, 0.2, 0.5, 0.77, 0.999, 1 - 1e-6}) {
      const double x = distribution->quantile(p);
      EXPECT_NEAR(distribution->cumulative(x), p, 1e-7) << p;
      EXPECT_NEAR(distribution->upperTail(x), 1.0 - p, 1e-7) << p;
      EXPECT_NEAR(distribution->atScore(distribution->scoreOf(x)), x, 1e-6 * std::max(1.0, std::abs(x))) << p;
    }
    EXPECT_TRUE(distribution->isContinuous());
  }
}

TEST(Distribution, HasPublishedValues) {
  struct Case {
    DistributionPointer distribution;
    double p;
    double x;
  };
  // Tables of the normal and beta distributions (Abramowitz and Stegun 1964, tables 26.1 and 26.6); the others follow
  // from their definitions.
  const Case cases[] = {{normalDistribution(0, 1), 0.975, 1.959963984540054},
                        {normalDistribution(10, 2), 0.05, 10 - 2 * 1.6448536269514722},
                        {truncatedNormal(0, 1, 0, 40), 0.5, 0.6744897501960817},
                        {truncatedNormal(0, 1, -40, 0), 0.05, -1.959963984540054},
                        {lognormal(1, 0.5), 0.95, std::exp(1 + 0.5 * 1.6448536269514722)},
                        {logUniform(0.1, 10), 0.75, std::sqrt(10.0)},
                        {triangular(0, 1, 4), 0.25, 1},
                        {triangular(0, 1, 4), 0.75, 4 - std::sqrt(3.0)},
                        {betaDistribution(2, 2, 0, 1), 0.5, 0.5},
                        {betaDistribution(1, 3, 0, 1), 0.875, 0.5},
                        {betaDistribution(0.5, 0.5, -1, 1), 0.75, std::sqrt(0.5)},
                        {ofLogarithm(lognormal(1, 0.5)), 0.95, 1 + 0.5 * 1.6448536269514722}};
  for (const auto& [distribution, p, x] : cases) {
    EXPECT_NEAR(distribution->quantile(p), x, 1e-12 * std::abs(x)) << distribution->name() << " " << p;
    EXPECT_NEAR(distribution->cumulative(x), p, 1e-12) << distribution->name() << " " << p;
  }
}

TEST(Distribution, OfALogarithmCountsTheJacobian) {
  const DistributionPointer uniform = uniformDistribution(2, 12);
  // ln x has the density x / 10.
  EXPECT_DOUBLE_EQ(ofLogarithm(uniform)->logDensity(std::log(5.0)), std::log(0.5));
  // A quantity that is uniform in its logarithm has a density that is the same everywhere.
  const DistributionPointer flat = ofLogarithm(logUniform(1, std::exp(4.0)));
  for (const double y : {0.1, 1.0, 3.9}) EXPECT_NEAR(flat->logDensity(y), -std::log(4.0), 1e-14) << y;
  EXPECT_EQ(flat->logDensity(4.1), -INFINITY);
}

TEST(Distribution, OfAnIntegerGivesEachValueTheWidthOfOne) {
  const DistributionPointer normal = onGridOf(2, normalDistribution(4.2, 1.5));
  const auto probability = [](double value) {  // of the nearest integer
    return normalProbability((value + 0.5 - 4.2) / 1.5) - normalProbability((value - 0.5 - 4.2) / 1.5);
  };
  for (const double value : {2.0, 4.0, 9.0}) {
    for (const double share : {0.0, 0.3, 0.999}) {
      EXPECT_NEAR(std::exp(normal->logDensity(value + share)), probability(value), 1e-14) << value << " " << share;
    }
  }
  // Below the grid the model gets the value above.
  EXPECT_NEAR(std::exp(normal->logDensity(0.0 + 0.4)), probability(1.0), 1e-14);
  EXPECT_EQ(normal->logDensity(1.5), -INFINITY);
  // The last value has its whole probability: 1 to 6, each a sixth.
  const DistributionPointer die = onGridOf(1, uniformDistribution(0.5, 6.5));
  std::vector<int> counts(8);
  for (int i = 0; i < 6000; ++i) ++counts[static_cast<std::size_t>(die->quantile((i + 0.5) / 6000))];
  EXPECT_THAT(counts, ::testing::ElementsAre(0, 1000, 1000, 1000, 1000, 1000, 1000, 0));
}

TEST(Distribution, OfAnIntegerDrawsSingleValuesBetweenTwoIntegersAsItsDensityHasThem) {
  const double values[] = {1, 2.5, 4.5, 5};
  const double weights[] = {1, 1, 1, 1};
  const DistributionPointer halves = onGridOf(1, discreteDistribution(values, weights));
  std::vector<double> counts(7);
  for (int i = 0; i < 400; ++i) ++counts[static_cast<std::size_t>(halves->quantile((i + 0.5) / 400))];
  EXPECT_THAT(counts, ::testing::ElementsAre(0, 100, 100, 0, 100, 100, 0));
  for (std::size_t value = 0; value < counts.size(); ++value) {
    EXPECT_EQ(std::exp(halves->logDensity(static_cast<double>(value) + 0.5)), counts[value] / 400) << value;
  }
}

TEST(Distribution, OfALimitWithAPoleHasTheDensityOfTheValuesThatAreRoundedToIt) {
  struct Case {
    double alpha;
    double beta;
    double minimum;
    double maximum;
    double limit;
    double rounded;  ///< how far from the limit values are rounded to it
  };
  const double unit = std::numeric_limits<double>::epsilon();
  const Case cases[] = {{0.1, 1, 5, 6, 5, 2 * unit},
                        {0.1, 1, -6, -5, -6, 2 * unit},
                        {1, 0.1, 5, 6, 6, 2 * unit},
                        {1, 0.5, 999, 1000, 1000, 256 * unit},
                        {0.2, 1, 1024, 4096, 1024, 512 * unit}};
  for (const auto& [alpha, beta, minimum, maximum, limit, rounded] : cases) {
    const DistributionPointer distribution = betaDistribution(alpha, beta, minimum, maximum);
    // One shape is 1: the probability of these values is the share of the range to the power of the other.
    const double pole = std::min(alpha, beta);
    const double share = rounded / (maximum - minimum);
    EXPECT_NEAR(std::exp(distribution->logDensity(limit)), pole * std::pow(share, pole) / rounded,
                1e-6 * std::pow(share, pole) / rounded)
        << limit;
  }
  // At 0 numbers are as small as they come.
  EXPECT_NEAR(betaDistribution(0.5, 1, 0, 1)->logDensity(0.0),
              -0.5 * std::log(std::numeric_limits<double>::min()) - std::log(2.0), 1e-9);
}

TEST(Distribution, OfValuesKeepsTheirProbabilities) {
  const double values[] = {5, 1, 3, 1};
  const double weights[] = {2, 1, 0, 1};
  for (const bool isLogarithm : {false, true}) {
    DistributionPointer discrete = discreteDistribution(values, weights);
    if (isLogarithm) discrete = ofLogarithm(discrete);
    const auto at = [&](double x) { return isLogarithm ? std::log(x) : x; };
    EXPECT_FALSE(discrete->isContinuous());
    EXPECT_THAT(discrete->singleValues(), ::testing::ElementsAre(1, 5));
    EXPECT_EQ(discrete->quantile(0.5), at(1));
    EXPECT_EQ(discrete->quantile(0.50001), at(5));
    EXPECT_EQ(discrete->cumulative(at(4)), 0.5);
    EXPECT_NEAR(discrete->logDensity(at(5)), std::log(0.5), 1e-15);
    EXPECT_EQ(discrete->logDensity(at(3)), -INFINITY);
  }
}

TEST(SampledDistribution, HasTheQuantilesOfItsSampleAndRefusesRepeatedValues) {
  const DistributionPointer few = sampledDistribution({4, 1, 2});
  EXPECT_EQ(few->quantile(0.5), 2);
  EXPECT_EQ(few->quantile(0.75), 3);
  EXPECT_DOUBLE_EQ(few->logDensity(1.5), std::log(0.5));
  EXPECT_DOUBLE_EQ(few->logDensity(3.5), std::log(0.25));
  EXPECT_EQ(few->logDensity(4.5), -INFINITY);
  EXPECT_EQ(sampledDistribution({1, 1, 1, 2}), nullptr);
}

}  // namespace
}  // namespace mirevo

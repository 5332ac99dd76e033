#include <algorithm>
#include <cmath>
#include <numbers>
#include <optional>

#include <gtest/gtest.h>

#include "algorithms/bayes/sampled_function.h"
#include "algorithms/distributions/distribution_settings.h"
#include "algorithms/distributions/parameter_distributions.h"

namespace mirevo {
namespace {

/// One parameter with a prior, and the logarithm of the likelihood of its value on the model scale.
DreamProblem ofOneParameter(const ModelParameter& parameter, const DistributionSettings& prior,
                            std::function<double(double)> logLikelihood) {
  const SearchSpace space = BuildSearchSpace(std::vector{parameter});
  EXPECT_FALSE(validateDistribution(prior, space, 0));
  const ParameterDistributions distributions({searchDistribution(prior, space, 0)});
  DreamProblem problem = sampledFunction(space.lower, space.upper, [space, logLikelihood](std::span<const double> x) {
    return logLikelihood(toModelScale(space, 0, x[0]));
  });
  problem.drawPrior = [distributions](std::span<const double> unit) { return distributions.setAt(unit); };
  problem.logPrior = [distributions](std::span<const double> x) { return distributions.logDensity(x); };
  return problem;
}

/// N(mean, deviation^2) between limits.
Moments truncatedMoments(double mean, double deviation, double lower, double upper) {
  const double a = (lower - mean) / deviation;
  const double b = (upper - mean) / deviation;
  const auto density = [](double z) { return std::exp(-0.5 * z * z) / std::sqrt(2.0 * std::numbers::pi); };
  const double mass = normalProbability(b) - normalProbability(a);
  const double shift = (density(a) - density(b)) / mass;
  const double variance = 1.0 + (a * density(a) - b * density(b)) / mass - shift * shift;
  return {mean + deviation * shift, deviation * std::sqrt(variance)};
}

struct PriorCase {
  const char* name;
  TransformationType transformation;
  DistributionKind kind;  ///< truncated normal or uniform
  double mean = 0.0;
  double deviation = 0.0;
  double observed = 0.0;  ///< y ~ N(x, error^2)
  double error = 0.0;
  double lower = 0.0;
  double upper = 0.0;
};

// A posterior under a prior of the model scale is one of the model scale, on whichever scale it is sampled.
TEST(PriorScales, PosteriorsOfNormalObservationsAreThoseInClosedForm) {
  constexpr auto kLogarithmic = TransformationType::logarithmic;
  constexpr auto kPlain = TransformationType::none;
  const std::vector<PriorCase> cases{
      {"logarithmic, uniform", kLogarithmic, DistributionKind::uniform, 0.0, 0.0, 3.0, 1.5, 0.1, 10.0},
      {"logarithmic, truncated", kLogarithmic, DistributionKind::truncatedNormal, 2.0, 1.5, 3.0, 1.0, 0.1, 10.0},
      {"logarithmic, truncated, at its lower bound", kLogarithmic, DistributionKind::truncatedNormal, 0.5, 1.0, -0.5,
       0.8, 0.05, 4.0},
      {"plain, truncated, at its lower bound", kPlain, DistributionKind::truncatedNormal, 0.5, 1.0, -2.0, 1.0, 0.0,
       4.0},
      {"plain, truncated, at its upper bound", kPlain, DistributionKind::truncatedNormal, 2.0, 1.0, 7.0, 1.0, 0.0, 4.0},
  };
  for (const PriorCase& own : cases) {
    SCOPED_TRACE(own.name);
    ModelParameter parameter;
    parameter.initialValue = 0.5 * (own.lower + own.upper);
    parameter.lowerBound = own.lower;
    parameter.upperBound = own.upper;
    parameter.transformationType = own.transformation;
    DistributionSettings prior;
    prior.kind = own.kind;
    prior.scale = DistributionScale::model;
    prior.mean = own.mean;
    prior.standardDeviation = own.deviation;
    const DreamProblem problem = ofOneParameter(parameter, prior, [&own](double x) {
      return -0.5 * (own.observed - x) * (own.observed - x) / (own.error * own.error);
    });
    const DreamSampler sampler = sampled(untilBudget(40'000), problem);
    const double ofPrior = own.kind == DistributionKind::uniform ? 0.0 : 1.0 / (own.deviation * own.deviation);
    const double precision = ofPrior + 1.0 / (own.error * own.error);
    const double mean = (ofPrior * own.mean + own.observed / (own.error * own.error)) / precision;
    const Moments expected = truncatedMoments(mean, 1.0 / std::sqrt(precision), own.lower, own.upper);
    std::vector<double> values = posteriorOf(sampler, 0);
    if (own.transformation == kLogarithmic) {
      std::ranges::transform(values, values.begin(), [](double value) { return std::exp(value); });
    }
    const double tolerance = 4.0 * expected.deviation / std::sqrt(sampler.checkNow()->effectiveSizes[0]);
    EXPECT_LT(tolerance, 0.08 * expected.deviation);
    EXPECT_NEAR(momentsOf(values).mean, expected.mean, tolerance);
    EXPECT_NEAR(momentsOf(values).deviation, expected.deviation, tolerance);
    const auto [least, largest] = std::ranges::minmax(values);
    EXPECT_GE(least, own.lower * (1.0 - 1e-12));
    EXPECT_LE(largest, own.upper * (1.0 + 1e-12));
  }
}

// Each value has the share of its prior probability times its likelihood, those at the bounds too.
TEST(PriorScales, IntegersHaveTheProbabilitiesOfBayesTheorem) {
  constexpr int kMost = 5;
  const auto poisson = [](double value) { return 2.0 * std::log(value + 0.5) - value; };  // 2 events, rate n + 0.5
  for (const bool isUniform : {true, false}) {
    SCOPED_TRACE(isUniform ? "uniform" : "normal");
    ModelParameter parameter;
    parameter.upperBound = kMost;
    parameter.transformationType = TransformationType::integer;
    DistributionSettings prior;
    prior.kind = isUniform ? DistributionKind::uniform : DistributionKind::normal;
    prior.scale = isUniform ? DistributionScale::search : DistributionScale::model;
    prior.mean = 3.7;
    prior.standardDeviation = 1.3;
    const DreamSampler sampler = sampled(untilBudget(40'000), ofOneParameter(parameter, prior, poisson));
    std::vector<double> expected;
    double sum = 0.0;
    for (int n = 0; n <= kMost; ++n) {
      const double z = (n - prior.mean) / prior.standardDeviation;
      const double half = 0.5 / prior.standardDeviation;
      const double probability = isUniform ? 1.0 : normalProbability(z + half) - normalProbability(z - half);
      expected.push_back(probability * std::exp(poisson(n)));
      sum += expected.back();
    }
    std::vector<double> found(kMost + 1, 0.0);
    const std::vector<double> values = posteriorOf(sampler, 0);
    for (const double value : values) {
      const auto n = std::min(static_cast<std::size_t>(value), static_cast<std::size_t>(kMost));
      found[n] += 1.0 / static_cast<double>(values.size());
    }
    const double size = sampler.checkNow()->effectiveSizes[0];
    for (std::size_t n = 0; n < found.size(); ++n) {
      const double share = expected[n] / sum;
      EXPECT_NEAR(found[n], share, 4.0 * std::sqrt(share * (1.0 - share) / size)) << n;
    }
  }
}

}  // namespace
}  // namespace mirevo

#pragma once

#include <cmath>
#include <functional>
#include <limits>
#include <span>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "algorithms/bayes/chain_diagnostics.h"
#include "algorithms/bayes/dream_sampler.h"

namespace mirevo {

/// A posterior that is a function, between bounds, under a uniform prior.
inline DreamProblem sampledFunction(std::vector<double> lower, std::vector<double> upper,
                                    std::function<double(std::span<const double>)> logLikelihood) {
  DreamProblem problem;
  problem.modelParameterCount = lower.size();
  problem.drawPrior = [lower, upper](std::span<const double> unit) {
    std::vector<double> point;
    for (std::size_t j = 0; j < unit.size(); ++j) point.push_back(lower[j] + unit[j] * (upper[j] - lower[j]));
    return point;
  };
  problem.logPrior = [](std::span<const double>) { return 0.0; };
  problem.evaluate = [logLikelihood = std::move(logLikelihood), number = 0](auto proposals) mutable {
    std::vector<ProposalResult> results;
    for (const DreamProposal& proposal : proposals) {
      const bool isKnown = proposal.knownRun != 0;
      results.push_back({logLikelihood(proposal.point), isKnown ? proposal.knownRun : ++number});
    }
    return results;
  };
  problem.lower = std::move(lower);
  problem.upper = std::move(upper);
  return problem;
}

/// To the end of the budget, whatever the chains' agreement.
inline DreamSettings untilBudget(int runs) {
  DreamSettings settings;
  settings.mostRuns = runs;
  settings.effectiveSize = 1e9;
  return settings;
}

/// The chains at the end of their run.
inline DreamSampler sampled(const DreamSettings& settings, DreamProblem problem, int seed = 1) {
  DreamSampler sampler(settings, std::move(problem), seed);
  while (!sampler.isFinished()) sampler.advance();
  return sampler;
}

/// The values of a dimension behind burn-in.
inline std::vector<double> posteriorOf(const DreamSampler& sampler, std::size_t dimension) {
  std::vector<double> values;
  for (const auto& chain : sampler.history().columns(dimension, sampler.burnIn().value_or(0))) {
    values.insert(values.end(), chain.begin(), chain.end());
  }
  return values;
}

struct Moments {
  double mean = 0.0;
  double deviation = 0.0;
};

inline Moments momentsOf(std::span<const double> values) {
  Moments moments;
  for (const double value : values) moments.mean += value / static_cast<double>(values.size());
  for (const double value : values) {
    moments.deviation += (value - moments.mean) * (value - moments.mean) / static_cast<double>(values.size());
  }
  moments.deviation = std::sqrt(moments.deviation);
  return moments;
}

/// Mean and standard deviation behind burn-in, within four standard errors by the effective sample size. The
/// kurtosis is at least that of the target: the standard error of a deviation grows with it.
inline void expectMoments(const DreamSampler& sampler, std::size_t dimension, double mean, double deviation,
                          double kurtosis = 5.0) {
  const std::size_t burnIn = sampler.burnIn().value();
  const std::size_t stride = (sampler.history().generations() - burnIn) / 1000 + 1;
  const double size = leastEffectiveSampleSize(sampler.history().columns(dimension, burnIn, stride));
  const Moments found = momentsOf(posteriorOf(sampler, dimension));
  EXPECT_GT(size, 50.0) << dimension;
  EXPECT_NEAR(found.mean, mean, 4.0 * deviation / std::sqrt(size)) << dimension;
  EXPECT_NEAR(found.deviation, deviation, 4.0 * deviation * std::sqrt((kurtosis - 1.0) / (4.0 * size))) << dimension;
}

}  // namespace mirevo

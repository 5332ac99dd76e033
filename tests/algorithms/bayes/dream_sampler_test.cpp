#include "algorithms/bayes/dream_sampler.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numbers>

#include <gtest/gtest.h>

#include "algorithms/bayes/known_densities.h"
#include "algorithms/bayes/likelihoods.h"
#include "algorithms/bayes/sampled_function.h"

namespace mirevo {
namespace {

std::vector<double> times(std::size_t count, double value) {
  return std::vector<double>(count, value);
}

double lnStandardNormal(std::span<const double> x) {
  double sum = 0.0;
  for (const double value : x) sum -= 0.5 * value * value;
  return sum;
}

TEST(DreamSampler, TwoPeaksOfAMixtureHaveTheirShares) {
  DreamSettings settings = untilBudget(500'000);
  settings.chainCount = 5;
  const DreamSampler sampler =
      sampled(settings, sampledFunction(times(10, -20.0), times(10, 20.0), testing::lnTwoPeaks));
  for (std::size_t j = 0; j < 10; ++j) expectMoments(sampler, j, 1.6667, 4.8189);
  const std::vector<double> values = posteriorOf(sampler, 0);
  const auto high = std::ranges::count_if(values, [](double value) { return value > 0.0; });
  EXPECT_NEAR(static_cast<double>(high) / static_cast<double>(values.size()), 2.0 / 3.0, 0.1);
}

TEST(DreamSampler, HundredCorrelatedDimensionsKeepTheirMoments) {
  constexpr std::size_t kDimension = 100;
  DreamSettings settings = untilBudget(150'000);
  settings.burnInShare = 0.5;
  const DreamSampler sampler =
      sampled(settings, sampledFunction(times(kDimension, -50.0), times(kDimension, 50.0), testing::lnCorrelated));
  for (std::size_t j = 0; j < kDimension; j += 9) expectMoments(sampler, j, 0.0, std::sqrt(static_cast<double>(j + 1)));
}

TEST(DreamSampler, ATwistedNormalKeepsItsShape) {
  // No bound takes the ends of the ridge.
  const DreamSampler sampler =
      sampled(untilBudget(400'000), sampledFunction(times(10, -300.0), times(10, 300.0), testing::lnTwisted), 3);
  expectMoments(sampler, 0, 0.0, 10.0);
  expectMoments(sampler, 1, 0.0, std::sqrt(201.0), 15.0);
  for (std::size_t j = 2; j < 10; ++j) expectMoments(sampler, j, 0.0, 1.0);
}

TEST(DreamSampler, NarrowRidgesAndPeaksFarApartAreMixed) {
  // Two dimensions with a correlation of 0.9999.
  const auto ridge = [](std::span<const double> x) {
    return -0.5 * (x[0] * x[0] + x[1] * x[1] - 2.0 * 0.9999 * x[0] * x[1]) / (1.0 - 0.9999 * 0.9999);
  };
  const DreamSampler along = sampled(untilBudget(20'000), sampledFunction(times(2, -50.0), times(2, 50.0), ridge));
  EXPECT_GT(along.checkNow()->leastEffectiveSize(), 1000.0);
  for (std::size_t j = 0; j < 2; ++j) expectMoments(along, j, 0.0, 1.0);
  // 1/3 N(-5, 0.1^2) + 2/3 N(5, 0.1^2) in three dimensions, with chains that begin in both peaks.
  const auto peaks = [](std::span<const double> x) {
    double low = 0.0;
    double high = 0.0;
    for (const double value : x) {
      low -= 50.0 * (value + 5.0) * (value + 5.0);
      high -= 50.0 * (value - 5.0) * (value - 5.0);
    }
    const double top = std::max(low, high);
    return top + std::log(std::exp(low - top) / 3.0 + 2.0 * std::exp(high - top) / 3.0);
  };
  DreamProblem problem = sampledFunction(times(3, -20.0), times(3, 20.0), peaks);
  problem.drawPrior = [calls = 0](std::span<const double> unit) mutable {
    const double centre = ++calls % 2 == 0 ? -5.0 : 5.0;
    std::vector<double> point;
    for (const double value : unit) point.push_back(centre + 0.3 * (value - 0.5));
    return point;
  };
  const DreamSampler between = sampled(untilBudget(40'000), std::move(problem));
  for (std::size_t j = 0; j < 3; ++j) expectMoments(between, j, 5.0 / 3.0, std::sqrt(0.01 + 25.0 - 25.0 / 9.0));
  EXPECT_GT(between.checkNow()->leastEffectiveSize(), 250.0);
}

TEST(DreamSampler, EachKindOfUpdateByItselfKeepsTheTarget) {
  for (const double snookers : {0.0, 0.9}) {
    DreamSettings settings = untilBudget(60'000);
    settings.snookerShare = snookers;
    const DreamSampler sampler = sampled(settings, sampledFunction(times(5, -20.0), times(5, 20.0), lnStandardNormal));
    for (std::size_t j = 0; j < 5; ++j) expectMoments(sampler, j, 0.0, 1.0);
  }
}

TEST(DreamSampler, ChainsThatBeginInTheirTargetStayInIt) {
  // Chains and archive are exact draws of a twisted normal of two dimensions, and 300 generations later the states must
  // be no less far out: a chain must not find the way back from a tail more easily than others find the way there.
  constexpr int kRepetitions = 250;
  for (const double snookers : {0.0, 0.1, 0.9}) {
    SCOPED_TRACE(snookers);
    double squares = 0.0;
    double bent = 0.0;
    double count = 0.0;
    for (int k = 1; k <= kRepetitions; ++k) {
      ChainRandom random(k, 1);
      DreamProblem problem = sampledFunction(times(2, -300.0), times(2, 300.0), testing::lnTwisted);
      problem.drawPrior = [&random](auto) {
        const double x = 10.0 * random.normal();
        return std::vector<double>{x, 10.0 - 0.1 * x * x + random.normal()};
      };
      DreamSettings settings = untilBudget(1'000'000);
      settings.burnInShare = 0.9;  // which is not reached: states alone move
      settings.snookerShare = snookers;
      DreamSampler sampler(settings, std::move(problem), k);
      for (int g = 0; g < 300; ++g) sampler.advance();
      for (std::size_t c = 0; c < 4; ++c) {
        const auto last = sampler.history().at(299, c).point;
        squares += last[0] * last[0] / 100.0;
        bent += last[1] / std::sqrt(201.0);
        ++count;
      }
    }
    EXPECT_NEAR(squares / count, 1.0, 4.0 * std::sqrt(2.0 / count));  // a chi-square has the variance 2
    EXPECT_NEAR(bent / count, 0.0, 4.0 / std::sqrt(count));
  }
}

TEST(DreamSampler, BoundsAreKeptWithoutLoss) {
  // exp(3 x) on [0, 1], highest at a bound.
  const double e = std::exp(3.0);
  const double mean = e / (e - 1.0) - 1.0 / 3.0;
  const double square = e / (e - 1.0) - 2.0 / 3.0 * mean;
  for (const BoundaryHandling handling : {BoundaryHandling::fold, BoundaryHandling::reject}) {
    DreamSettings settings = untilBudget(40'000);
    settings.boundary = handling;
    const auto rising = [](std::span<const double> x) { return 3.0 * (x[0] + x[1]); };
    const DreamSampler sampler = sampled(settings, sampledFunction(times(2, 0.0), times(2, 1.0), rising));
    for (std::size_t j = 0; j < 2; ++j) {
      expectMoments(sampler, j, mean, std::sqrt(square - mean * mean));
      const auto [least, largest] = std::ranges::minmax(posteriorOf(sampler, j));
      EXPECT_GE(least, 0.0);
      EXPECT_LE(largest, 1.0);
    }
  }
}

TEST(DreamSampler, ARejectedProposalRepeatsTheStateAndNeverEntersThePosterior) {
  std::vector<std::vector<double>> proposed;
  DreamProblem problem = sampledFunction(times(3, -10.0), times(3, 10.0), lnStandardNormal);
  const auto evaluate = problem.evaluate;
  problem.evaluate = [&](std::span<const DreamProposal> proposals) {
    EXPECT_LE(proposals.size(), 4U);  // all chains of a generation in one batch
    for (const DreamProposal& proposal : proposals) {
      if (proposal.knownRun == 0) proposed.push_back(proposal.point);
    }
    return evaluate(proposals);
  };
  const DreamSampler sampler = sampled(untilBudget(8'000), std::move(problem));
  const ChainHistory& history = sampler.history();
  std::size_t accepted = 0;
  for (std::size_t g = *sampler.burnIn(); g < history.generations(); ++g) {
    for (std::size_t c = 0; c < history.chainCount(); ++c) {
      const auto state = history.at(g, c);
      const auto before = history.at(g - 1, c);
      const bool isSame = std::ranges::equal(state.point, before.point) && state.evaluation == before.evaluation &&
                          state.logLikelihood == before.logLikelihood;
      EXPECT_EQ(isSame, !state.accepted);
      EXPECT_EQ(state.logLikelihood, lnStandardNormal(proposed[static_cast<std::size_t>(state.evaluation) - 1]));
      if (state.accepted) ++accepted;
    }
  }
  const std::size_t proposals = sampler.parallelCounts().proposals + sampler.snookerCounts().proposals;
  EXPECT_EQ(accepted, sampler.parallelCounts().accepted + sampler.snookerCounts().accepted);
  EXPECT_EQ(proposals, (history.generations() - *sampler.burnIn()) * history.chainCount());
  EXPECT_LT(accepted, proposals);
}

TEST(DreamSampler, AProposalIsAcceptedWithTheRatioOfTheDensities) {
  std::vector<double> proposed;
  DreamProblem problem = sampledFunction(times(3, -10.0), times(3, 10.0), lnStandardNormal);
  const auto evaluate = problem.evaluate;
  problem.evaluate = [&](std::span<const DreamProposal> proposals) {
    for (const DreamProposal& proposal : proposals) proposed.push_back(lnStandardNormal(proposal.point));
    return evaluate(proposals);
  };
  DreamSettings settings = untilBudget(20'000);
  settings.snookerShare = 0.0;  // whose acceptance has a further factor
  const DreamSampler sampler = sampled(settings, std::move(problem));
  double excess = 0.0;
  double variance = 0.0;
  for (std::size_t g = *sampler.burnIn(); g < sampler.history().generations(); ++g) {
    for (std::size_t c = 0; c < 4; ++c) {
      const double ratio = std::exp(proposed[4 * g + c] - sampler.history().at(g - 1, c).logLikelihood);
      const bool isAccepted = sampler.history().at(g, c).accepted;
      if (ratio >= 1.0) {
        EXPECT_TRUE(isAccepted);
        continue;
      }
      excess += (isAccepted ? 1.0 : 0.0) - ratio;
      variance += ratio * (1.0 - ratio);
    }
  }
  EXPECT_GT(variance, 500.0);
  EXPECT_LT(std::abs(excess), 4.0 * std::sqrt(variance));
}

TEST(DreamSampler, RunsThatFailOrMayNotBeMadeAreNoPartOfThePosterior) {
  // A half normal: where x < 0 runs fail; y < 0 is not allowed, and no run is made there.
  const auto failing = [](std::span<const double> x) {
    EXPECT_GE(x[1], 0.0);
    return x[0] < 0.0 ? -std::numeric_limits<double>::infinity() : lnStandardNormal(x);
  };
  DreamProblem problem = sampledFunction(times(2, -10.0), times(2, 10.0), failing);
  problem.logPrior = [](std::span<const double> x) {
    return x[1] < 0.0 ? -std::numeric_limits<double>::infinity() : 0.0;
  };
  const DreamSampler sampler = sampled(untilBudget(20'000), std::move(problem));
  const double mean = std::sqrt(2.0 / std::numbers::pi);
  for (std::size_t j = 0; j < 2; ++j) expectMoments(sampler, j, mean, std::sqrt(1.0 - mean * mean));
}

TEST(DreamSampler, AChainThatIsCaughtFarBelowGoesOnFromTheBestDuringBurnInAlone) {
  // Two sharp peaks, one e^-200 as high as the other: no jump by differences of the archive, which stays as it is,
  // leads from there to the other one.
  const auto peaks = [](std::span<const double> x) {
    double low = -200.0;
    double high = 0.0;
    for (const double value : x) {
      low -= 5000.0 * (value + 5.0) * (value + 5.0);
      high -= 5000.0 * (value - 5.0) * (value - 5.0);
    }
    return std::max(low, high);
  };
  DreamSettings settings = untilBudget(40'000);
  settings.chainCount = 8;
  settings.archiveInterval = 1'000'000;
  DreamProblem problem = sampledFunction(times(4, -10.0), times(4, 10.0), peaks);
  problem.drawPrior = [calls = 0](std::span<const double> unit) mutable {
    const double centre = ++calls == 40 + 8 ? -5.0 : 5.0;  // behind the archive, the last chain
    std::vector<double> point;
    for (const double value : unit) point.push_back(centre + 0.05 * (value - 0.5));
    return point;
  };
  const DreamSampler sampler = sampled(settings, std::move(problem));
  EXPECT_EQ(sampler.outlierCount(), 1);
  EXPECT_LT(sampler.history().at(100, 7).point[0], 0.0);
  for (std::size_t j = 0; j < 4; ++j) expectMoments(sampler, j, 5.0, 0.01);
}

TEST(DreamSampler, TheRunEndsOnceTheChainsAgreeAndTheSameSeedMakesTheSameChains) {
  DreamSettings settings;
  settings.mostRuns = 100'000;
  const auto chainsOf = [&](int seed) {
    return sampled(settings, sampledFunction(times(2, -10.0), times(2, 10.0), lnStandardNormal), seed);
  };
  const DreamSampler first = chainsOf(1);
  EXPECT_EQ(first.end(), DreamEnd::converged);
  EXPECT_LT(first.runs(), 60'000);
  EXPECT_LE(first.checks().back().largestRHat(), settings.rHatLimit);
  EXPECT_GE(first.checks().back().leastEffectiveSize(), settings.effectiveSize);
  EXPECT_EQ(chainsOf(1).history().columns(0, 0), first.history().columns(0, 0));
  EXPECT_EQ(chainsOf(-1).history().columns(0, 0), first.history().columns(0, 0));
  EXPECT_NE(chainsOf(2).history().columns(0, 0), first.history().columns(0, 0));
}

TEST(DreamSampler, BehindAShortBurnInNoChainIsMoved) {
  // All but one of the chains rise far above it behind the first generation.
  for (const int burnInGenerations : {1, 2, 3}) {
    SCOPED_TRACE(burnInGenerations);
    DreamSettings settings = untilBudget(400);
    settings.chainCount = 8;
    settings.snookerShare = 0.0;
    settings.burnInShare = 8.0 * burnInGenerations / 400.0;
    DreamProblem problem = sampledFunction({0.0}, {1.0}, [](std::span<const double>) { return 0.0; });
    int evaluated = 0;
    problem.evaluate = [&](std::span<const DreamProposal> proposals) {
      std::vector<ProposalResult> results;
      const double ofFourth = evaluated == 0 ? -1000.0 : -std::numeric_limits<double>::infinity();
      const double ofOthers = evaluated == 0 ? -1000.0 : 0.0;
      for (std::size_t c = 0; c < proposals.size(); ++c) results.push_back({c == 3 ? ofFourth : ofOthers, ++evaluated});
      return results;
    };
    const DreamSampler sampler = sampled(settings, std::move(problem));
    const ChainHistory& history = sampler.history();
    EXPECT_EQ(*sampler.burnIn(), static_cast<std::size_t>(burnInGenerations));
    for (std::size_t g = *sampler.burnIn() + 1; g < history.generations(); ++g) {
      for (std::size_t c = 0; c < 8; ++c) {
        if (history.at(g, c).accepted) continue;
        EXPECT_EQ(history.at(g, c).evaluation, history.at(g - 1, c).evaluation) << g << ' ' << c;
      }
    }
  }
}

TEST(ChainHistory, StatesAreSpreadOverAllChainsAlike) {
  for (const std::size_t chains : {2U, 3U, 4U, 6U}) {
    ChainHistory history(chains, 1);
    for (int k = 0; k < 3001; ++k) {
      const std::vector<double> point{static_cast<double>(k)};
      history.add({point, 0.0, 0.0, k, false});
    }
    for (const std::size_t most : {100U, 500U, 1500U, 10'000U}) {
      std::vector<std::size_t> ofChains(chains, 0);
      const std::vector<ChainHistory::State> states = history.spread(100, most);
      for (const ChainHistory::State& state : states) {
        ++ofChains[static_cast<std::size_t>(state.evaluation) % chains];
        EXPECT_GE(state.evaluation, static_cast<int>(100 * chains));
      }
      EXPECT_EQ(std::ranges::count(ofChains, ofChains.front()), static_cast<int>(chains)) << chains << ' ' << most;
      EXPECT_LE(states.size(), most);
      EXPECT_GE(2 * states.size() + chains, std::min(most, (history.generations() - 100) * chains));
    }
  }
}

TEST(DreamSampler, LargeEffectiveSizesAreReached) {
  DreamSettings settings;
  settings.mostRuns = 400'000;
  settings.effectiveSize = 10'000.0;
  const DreamSampler sampler = sampled(settings, sampledFunction(times(2, -10.0), times(2, 10.0), lnStandardNormal));
  EXPECT_EQ(sampler.end(), DreamEnd::converged);
}

/// z = X b + e with e ~ N(0, s^2 R), and what the likelihood of DREAM is given for it.
struct LinearCase {
  const char* name;
  LikelihoodForm form;
  std::vector<std::pair<ErrorTerm, double>> terms;
  double correlation = 0.0;  ///< of the errors z one day apart
  bool isLogarithmic = false;
};

TEST(DreamSampler, PosteriorsOfALinearModelAreThoseInClosedForm) {
  const std::vector<LinearCase> cases{
      {"normal", LikelihoodForm::normal, {{kDeviation, 0.5}}},
      {"AR(1)", LikelihoodForm::autoregressive, {{kDeviation, 0.4}, {kCorrelation, 0.6}}, 0.6},
      {"Box-Cox", LikelihoodForm::boxCox, {{kDeviation, 0.5}, {kLambda, 0.0}}, 0.0, true},
      {"Student with many degrees of freedom", LikelihoodForm::student, {{kDeviation, 0.5}, {kFreedom, 1e5}}},
      {"generalised", LikelihoodForm::generalised, {{kDeviation, 0.4}, {kCorrelation, 0.6}}, 0.6},
  };
  constexpr std::size_t kCount = 30;
  std::vector<double> days;
  std::vector<double> z;
  ChainRandom random(5);
  for (std::size_t t = 0; t < kCount; ++t) {
    days.push_back(static_cast<double>(t));
    z.push_back(1.0 + 0.1 * days[t] + 0.5 * random.normal());
  }
  for (const LinearCase& own : cases) {
    SCOPED_TRACE(own.name);
    ErrorValues errors = neutralErrors();
    for (const auto& [term, value] : own.terms) errors[term] = value;
    // The inverse of the correlation of a stationary AR(1) process is tridiagonal.
    const double phi = own.correlation;
    const double precision = 1.0 / (errors[kDeviation] * errors[kDeviation]);
    const auto weight = [&](std::size_t i, std::size_t j) {
      if (i == j) return precision * (i == 0 || i == kCount - 1 ? 1.0 : 1.0 + phi * phi);
      return i + 1 == j || j + 1 == i ? -precision * phi : 0.0;
    };
    double a = 0.0;  // X' W X = (a b; b c), X' W z = (u; v)
    double b = 0.0;
    double c = 0.0;
    double u = 0.0;
    double v = 0.0;
    for (std::size_t i = 0; i < kCount; ++i) {
      for (std::size_t j = 0; j < kCount; ++j) {
        a += weight(i, j);
        b += weight(i, j) * days[j];
        c += days[i] * weight(i, j) * days[j];
        u += weight(i, j) * z[j];
        v += days[i] * weight(i, j) * z[j];
      }
    }
    const double determinant = a * c - b * b;
    std::vector<double> observed = z;
    if (own.isLogarithmic) std::ranges::transform(z, observed.begin(), [](double value) { return std::exp(value); });
    const SeriesErrors series(own.form, 0.0, days, observed);
    const auto linear = [&](std::span<const double> x) {
      std::vector<double> simulated;
      for (const double day : days) {
        const double value = x[0] + x[1] * day;
        simulated.push_back(own.isLogarithmic ? std::exp(value) : value);
      }
      return series.logLikelihood(simulated, errors);
    };
    const DreamSampler sampler = sampled(untilBudget(16'000), sampledFunction({-10.0, -2.0}, {10.0, 2.0}, linear));
    expectMoments(sampler, 0, (c * u - b * v) / determinant, std::sqrt(c / determinant));
    expectMoments(sampler, 1, (a * v - b * u) / determinant, std::sqrt(a / determinant));
  }
}

TEST(DreamSampler, AnEstimatedErrorHasItsOwnPosteriorWithoutFurtherRuns) {
  // y ~ N(m, s^2), flat in m and ln s: m has Student's t with n - 1 degrees of freedom, (n - 1) v / s^2 a chi-square.
  const std::vector<double> observed{4.1, 5.3, 3.2, 4.4, 6.0, 5.1, 4.8, 3.9, 5.5, 4.7, 4.0, 5.8};
  const Moments sample = momentsOf(observed);
  const auto n = static_cast<double>(observed.size());
  DreamProblem problem = sampledFunction({-20.0, std::log(0.01)}, {30.0, std::log(100.0)}, [&](auto x) {
    double sum = -n * x[1];
    for (const double value : observed) sum -= 0.5 * (value - x[0]) * (value - x[0]) * std::exp(-2.0 * x[1]);
    return sum;
  });
  problem.modelParameterCount = 1;
  DreamSettings settings = untilBudget(30'000);
  const DreamSampler sampler = sampled(settings, std::move(problem));
  expectMoments(sampler, 0, sample.mean, sample.deviation / std::sqrt(n - 3.0));
  double precision = 0.0;  // mean of n v / s^2 is n - 1
  const std::vector<double> logarithms = posteriorOf(sampler, 1);
  for (const double value : logarithms) precision += std::exp(-2.0 * value) / static_cast<double>(logarithms.size());
  EXPECT_NEAR(precision * n * sample.deviation * sample.deviation, n - 1.0, 0.5);
  const double states = static_cast<double>(sampler.history().generations()) * 4.0;
  EXPECT_GT(states, 1.05 * sampler.runs());
}

// The likelihood has the whole part of a dimension: the chains agree or not by it.
TEST(DreamSampler, ChainsAreComparedByTheValuesThatAreUsed) {
  const auto checkOf = [](double width, bool hasSteps) {
    DreamProblem problem = sampledFunction({0.0, -5.0}, {4.0, 5.0}, [=](std::span<const double> x) {
      const double difference = (std::floor(x[0]) - 2.0) / width;
      return -0.5 * (difference * difference + x[1] * x[1]);
    });
    if (hasSteps) problem.usedValue = [](std::size_t j, double value) { return j == 0 ? std::floor(value) : value; };
    const DreamSampler sampler = sampled(untilBudget(2'000), std::move(problem));
    const std::size_t draws = (sampler.history().generations() - *sampler.burnIn()) * sampler.history().chainCount();
    return std::pair(*sampler.checkNow(), static_cast<double>(draws));
  };
  const auto [known, draws] = checkOf(0.01, true);  // the other steps are as good as impossible
  EXPECT_EQ(known.rHat[0], 1.0);
  EXPECT_EQ(known.effectiveSizes[0], draws);
  EXPECT_GT(known.rHat[1], 1.0);
  const ConvergenceCheck hidden = checkOf(0.01, false).first;
  EXPECT_GT(hidden.rHat[0], 1.0);
  EXPECT_EQ(hidden.rHat[1], known.rHat[1]) << "the chains are the same";
  const auto [several, of] = checkOf(1.0, true);
  EXPECT_LT(several.rHat[0], 1.1);
  EXPECT_LT(several.effectiveSizes[0], of);
}

TEST(DreamSampler, AStepOnWhichChainsStandStillIsNotKnown) {
  DreamProblem problem = sampledFunction({0.0}, {1.0}, [](auto) { return 0.0; });
  problem.usedValue = [](std::size_t, double) { return 0.0; };
  problem.evaluate = [number = 0](std::span<const DreamProposal> proposals) mutable {
    std::vector<ProposalResult> results;  // each better than what follows, which is never accepted
    for (std::size_t i = 0; i < proposals.size(); ++i) {
      ++number;
      results.push_back({-1e6 * number, number});
    }
    return results;
  };
  const DreamSampler sampler = sampled(untilBudget(400), std::move(problem));
  EXPECT_FALSE(sampler.checkNow()->largestRHat() <= 1e9);
}

}  // namespace
}  // namespace mirevo

#include "algorithms/searches/cma_surrogate.h"

#include <algorithm>
#include <cmath>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/rotated_functions.h"
#include "algorithms/searches/cma_es.h"

namespace mirevo {
namespace {

using ::testing::DoubleNear;
using ::testing::Pointwise;

std::vector<double> scaledBowl(const std::vector<double>& lengths, const std::vector<double>& at,
                               const std::vector<std::vector<double>>& places) {
  std::vector<double> values;
  for (const auto& place : places) {
    double sum = 0.0;
    for (std::size_t j = 0; j < at.size(); ++j) sum += std::pow((place[j] - at[j]) / lengths[j], 2.0);
    values.push_back(sum);
  }
  return values;
}

std::vector<std::vector<double>> placesOf(std::size_t n, int count) {
  UniformGenerator random(4);
  std::vector<std::vector<double>> places;
  for (int i = 0; i < count; ++i)
    places.push_back(drawUniformly(std::vector<double>(n, 0.3), std::vector<double>(n, 0.7), random));
  return places;
}

TEST(CmaSurrogate, FindsTheMinimumOnceAndWithinTheBox) {
  const std::vector<double> at{0.42, 0.55, 0.5};
  const CmaSurrogate::PlaceOf anywhere = [](const std::vector<double>& place) { return std::optional(place); };
  for (const auto type : {SurrogateModelType::quadraticPolynomial, SurrogateModelType::gaussianProcess}) {
    CmaSurrogate surrogate({.modelType = type, .initialGenerations = 2}, 3);
    const auto places = placesOf(3, 40);
    const std::vector<double> values = scaledBowl({1.0, 0.3, 3.0}, at, places);
    for (std::size_t i = 0; i < places.size(); ++i) {
      EXPECT_EQ(surrogate.isActive(2), i >= (type == SurrogateModelType::gaussianProcess ? 5U : 10U)) << i;
      surrogate.note(places[i], values[i]);
    }
    EXPECT_FALSE(surrogate.isActive(1));
    const CmaDistribution distribution({0.5, 0.5, 0.5}, 0.1, 6);
    ASSERT_TRUE(surrogate.fit(distribution));
    EXPECT_NEAR(surrogate.predict(std::vector<double>{0.5, 0.5, 0.6}).value(),
                scaledBowl({1.0, 0.3, 3.0}, at, {{0.5, 0.5, 0.6}}).front(), 1e-3);
    const auto minimum = surrogate.minimum(places.front(), anywhere);
    ASSERT_TRUE(minimum);
    EXPECT_THAT(*minimum, Pointwise(DoubleNear(5e-3), at));
    // Only where a set can be run, the lowest value is on the border of that.
    const auto inside = surrogate.minimum(std::vector<double>{0.6, 0.5, 0.5}, [](const std::vector<double>& place) {
      return place[0] < 0.5 ? std::nullopt : std::optional(place);
    });
    ASSERT_TRUE(inside);
    EXPECT_NEAR((*inside)[0], 0.5, 5e-3);
    // A place that is known is not run again.
    surrogate.note(*minimum, 0.0);
    ASSERT_TRUE(surrogate.fit(distribution));
    const auto again = surrogate.minimum(*minimum, [&minimum](const std::vector<double>&) { return minimum; });
    EXPECT_FALSE(again);
  }
}

TEST(CmaSurrogate, PredictsNothingWhereTheNearestRunHasFailed) {
  CmaSurrogate surrogate({}, 2);
  for (const auto& place : placesOf(2, 30)) {
    surrogate.note(place, place[0] < 0.4 ? std::nullopt : std::optional(place[0] + place[1]));
  }
  ASSERT_TRUE(surrogate.fit(CmaDistribution({0.5, 0.5}, 0.1, 6)));
  EXPECT_FALSE(surrogate.predict(std::vector<double>{0.31, 0.5}));
  EXPECT_NEAR(surrogate.predict(std::vector<double>{0.6, 0.5}).value(), 1.1, 1e-3);
}

struct ModelTrial {
  SearchSummary summary;
  std::vector<std::vector<ParameterSet>> batches;
  int failures = 0;
};

struct ModelConditions {
  std::optional<SurrogateSettings> surrogate = SurrogateSettings{};
  int budget = 400;
  int seed = 1;
  Feasibility feasibility = {};
  CmaEsSettings settings = {};
};

ModelTrial search(const SearchBounds& bounds, const FunctionEvaluator::Function& function, const ModelConditions& c) {
  ModelTrial trial;
  FunctionEvaluator evaluator([&](const ParameterSet& set) {
    EvaluationResult result = function(set);
    if (!result.ok()) ++trial.failures;
    return result;
  });
  UniformGenerator random(c.seed);
  std::optional<ProposalSelector> selector;
  SearchProblem problem{bounds, {c.budget, 1000000, 0.0}, {.includeInitialParameters = false}, {}, evaluator, random};
  problem.feasibility = c.feasibility;
  if (c.surrogate) problem.selector = &selector.emplace(*c.surrogate, bounds, c.feasibility);
  CmaEs cma(c.settings, std::move(problem));
  EXPECT_EQ(cma.initialise(), kSearchOk);
  while (!cma.isTerminated()) EXPECT_EQ(cma.advance(), kSearchOk);
  EXPECT_EQ(cma.summary().evaluationCount, evaluator.evaluationCount);
  EXPECT_LE(evaluator.evaluationCount, c.budget);
  trial.summary = cma.summary();
  trial.batches = std::move(evaluator.batches);
  return trial;
}

/// Where alone the search is hardly on its way: medians alone are some 1e3, 5 and 0.1.
TEST(CmaEsWithModel, NeedsAFewRunsOfASmoothFunction) {
  struct Case {
    testing::TestFunction function;
    SurrogateModelType type;
    int budget;
    double most;
  };
  const Case cases[] = {
      {testing::rotatedEllipsoid(8, 1), SurrogateModelType::gaussianProcess, 350, 1.0},
      {testing::rotatedEllipsoid(8, 1), SurrogateModelType::quadraticPolynomial, 350, 1.0},
      {testing::cube("Rosenbrock", 5, -5, 5, 1, 0.0, testing::rosenbrock), SurrogateModelType::gaussianProcess, 350,
       0.1},
      {testing::cube("Ackley", 5, -30, 25, 0, 0.0, testing::ackley), SurrogateModelType::gaussianProcess, 300, 0.1},
  };
  for (const auto& [function, type, budget, most] : cases) {
    int successes = 0;
    for (int seed = 1; seed <= 2; ++seed) {
      const ModelTrial trial =
          search(testing::boundsOf(function), [&](const ParameterSet& x) { return resultOf(function.value(x)); },
                 {.surrogate = SurrogateSettings{.modelType = type}, .budget = budget, .seed = seed});
      EXPECT_EQ(function.value(trial.summary.best), trial.summary.bestResult.aggregate) << "of a run, not predicted";
      successes += trial.summary.bestResult.aggregate < most ? 1 : 0;
    }
    EXPECT_GE(successes, 1) << function.name << static_cast<int>(type);
  }
}

/// After the sample and the generations without it, batches are a share of a generation or as much of it as is in
/// doubt.
TEST(CmaEsWithModel, RunsPartsOfAGenerationAndTakesTheSameWayWithALargerBudget) {
  const testing::TestFunction function = testing::ellipsoid(4, 2);
  std::vector<ParameterSet> longer;
  for (const int budget : {200, 90, 31}) {
    const ModelTrial trial =
        search(testing::boundsOf(function), [&](const ParameterSet& x) { return resultOf(function.value(x)); },
               {.surrogate = SurrogateSettings{.samplingRate = 30, .initialGenerations = 2},
                .budget = budget,
                .settings = {.populationSize = 10}});
    for (std::size_t i = 0; i < 3; ++i) EXPECT_EQ(trial.batches[i].size(), 10U) << "the sample and two generations";
    EXPECT_LE(std::ranges::max(trial.batches, {}, [](const auto& batch) { return batch.size(); }).size(), 10U);
    std::vector<ParameterSet> sets;
    for (const auto& batch : trial.batches) sets.insert(sets.end(), batch.begin(), batch.end());
    EXPECT_EQ(std::ssize(sets), budget);
    if (longer.empty()) longer = sets;
    EXPECT_TRUE(std::equal(sets.begin(), sets.end(), longer.begin())) << budget;
    if (budget == 200) {
      EXPECT_GE(trial.summary.loopCount, 20) << "more generations than 200 runs have without a model";
    }
  }
}

TEST(CmaEsWithModel, StaysWithinBoundsAndConstraintsAndAwayFromFailures) {
  const SearchBounds bounds{std::vector<double>(3, -1.0), std::vector<double>(3, 1.0), std::vector<double>(3, 0.0)};
  const auto isAllowed = [](const auto& x) { return x[0] + x[1] <= 0.5; };
  const auto bowl = [](const ParameterSet& x) {
    return resultOf(std::pow(x[0] - 0.7, 2.0) + std::pow(x[1] - 0.7, 2.0) + std::pow(x[2] - 3.0, 2.0));
  };
  const ModelTrial trial = search(bounds, bowl, {.budget = 300, .feasibility = feasibleWhere(isAllowed, "sum")});
  for (const auto& batch : trial.batches) {
    for (const ParameterSet& set : batch) {
      ASSERT_TRUE(isAllowed(set));
      for (const double value : set) ASSERT_TRUE(value >= -1.0 && value <= 1.0);
    }
  }
  EXPECT_NEAR(trial.summary.bestResult.aggregate, 2.0 * 0.45 * 0.45 + 4.0, 1e-2);

  const auto cutOff = [](const ParameterSet& x) {
    return x[0] < 0.3 ? failedResult() : resultOf(std::pow(x[0] - 0.3, 2.0) + x[1] * x[1] + x[2] * x[2]);
  };
  const ModelTrial assisted = search(bounds, cutOff, {.budget = 200});
  EXPECT_LT(assisted.failures, 50) << "half of what is drawn around the optimum";
  EXPECT_LT(assisted.summary.bestResult.aggregate, 1e-4);
  // Nothing succeeds: there is never a model.
  const ModelTrial none = search(bounds, [](const ParameterSet&) { return failedResult(); }, {.budget = 60});
  EXPECT_EQ(none.failures, 60);
}

/// An integer parameter counts as the model takes it: runs of one and the same model input are few.
TEST(CmaEsWithModel, HardlyEverRunsAnIntegerSetTwice) {
  SearchBounds bounds{std::vector<double>(3, 1.0), std::vector<double>(3, 13.0 - 1e-9), std::vector<double>(3, 5.0)};
  bounds.isInteger = {true, true, true};
  std::set<std::vector<double>> seen;
  const ModelTrial trial = search(bounds,
                                  [&seen](const ParameterSet& x) {
                                    std::vector<double> taken;
                                    double sum = 0.0;
                                    for (const double value : x) {
                                      taken.push_back(std::floor(value));
                                      sum += std::pow(taken.back() - 8.0, 2.0) + std::cos(2.0 * taken.back());
                                    }
                                    seen.insert(taken);
                                    return resultOf(sum);
                                  },
                                  {.budget = 120});
  EXPECT_GE(seen.size(), 90U);
  EXPECT_TRUE(seen.contains({8.0, 8.0, 8.0}));
}

}  // namespace
}  // namespace mirevo

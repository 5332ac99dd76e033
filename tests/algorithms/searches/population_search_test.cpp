#include "algorithms/searches/population_search.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <memory>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/searches/opse.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "algorithms/test_functions.h"
#include "matchers.h"

namespace mirevo {
namespace {

using testing::boundsOf;

enum class Kind { sce, pse, opse };

/// With the settings that are usual, or another number of evolution steps in a loop of SCE.
std::unique_ptr<PopulationSearch> makeSearch(Kind kind, int complexes, const SearchProblem& problem, int steps = 0) {
  const int n = static_cast<int>(problem.bounds.size());
  const SimplexSettings simplex{n + 1};
  if (steps == 0) steps = 2 * n + 1;
  if (kind == Kind::sce) return std::make_unique<Sce>(SceSettings{complexes, 2 * n + 1, steps}, simplex, problem);
  const PseSettings pse{complexes * (2 * n + 1)};
  if (kind == Kind::pse) return std::make_unique<Pse>(pse, simplex, problem);
  return std::make_unique<Opse>(OpseSettings{pse, pse.populationSize / 2}, simplex, problem);
}

/// Looks after each loop whether the best point is kept.
SearchSummary runToEnd(PopulationSearch& search) {
  EXPECT_EQ(search.initialise(), kSearchOk);
  for (int loop = 0; loop < 100000 && !search.isTerminated(); ++loop) {
    const double best = search.population().front().value();
    EXPECT_EQ(search.advance(), kSearchOk);
    EXPECT_FALSE(search.population().front().value() > best);
    EXPECT_EQ(search.summary().best, search.population().front().set);
  }
  EXPECT_TRUE(search.isTerminated());
  return search.summary();
}

constexpr StoppingCriteria onBudget(int evaluations) {
  return {evaluations, 1000000, 0.0};
}

/// The summary of a search by so many complexes, from the seed.
SearchSummary search(Kind kind, int complexes, const SearchBounds& bounds, int budget, FunctionEvaluator& evaluator,
                     int seed, ProposalSelector* selector = nullptr) {
  UniformGenerator random(seed);
  return runToEnd(*makeSearch(kind, complexes, {bounds, onBudget(budget), {}, {}, evaluator, random, selector}));
}

std::string nameOf(const ::testing::TestParamInfo<Kind>& instance) {
  return instance.param == Kind::sce ? "Sce" : instance.param == Kind::pse ? "Pse" : "Opse";
}

class EitherSearch : public ::testing::TestWithParam<Kind> {};
INSTANTIATE_TEST_SUITE_P(Searches, EitherSearch, ::testing::Values(Kind::sce, Kind::pse, Kind::opse), nameOf);

class SurrogateSearch : public ::testing::TestWithParam<Kind> {};
INSTANTIATE_TEST_SUITE_P(Searches, SurrogateSearch, ::testing::Values(Kind::sce, Kind::pse), nameOf);

TEST_P(EitherSearch, FindsPublishedOptima) {
  for (const auto& [name, complexes, budget] :
       {std::tuple{"Rosenbrock 2-D", 8, 1800}, {"Griewank 2-D", 8, 1800}, {"Ackley 10-D", 4, 5000}}) {
    for (const int seed : {1, 2, 3}) {
      const auto function = testing::shifted(testing::testFunction(name), seed);
      FunctionEvaluator evaluator([&](const ParameterSet& x) { return resultOf(function.value(x)); });
      const SearchSummary summary = search(GetParam(), complexes, boundsOf(function), budget, evaluator, seed);
      EXPECT_NEAR(summary.bestResult.aggregate, function.optimalValue, 1e-3) << name << ", seed " << seed;
      EXPECT_EQ(function.value(summary.best), summary.bestResult.aggregate);
    }
  }
}

TEST_P(EitherSearch, KeepsToTheBudgetExactly) {
  for (const int budget : {1, 3, 10, 11, 12, 13, 57, 200}) {
    FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(testing::rosenbrock(x)); });
    const SearchSummary summary = search(GetParam(), 2, {{-5, -2}, {5, 8}, {0, 0}}, budget, evaluator, 4);
    EXPECT_EQ(evaluator.evaluationCount, budget);
    EXPECT_EQ(summary.evaluationCount, budget);
    // A population of one has converged as well, and that test is the last one.
    EXPECT_EQ(summary.terminationMessage, budget == 1
                                              ? "Optimisation terminated: Population converged"
                                              : "Optimisation terminated: Maximum number of model evaluations reached");
    ASSERT_EQ(evaluator.settledSizes.size(), 1U);
    EXPECT_EQ(evaluator.settledSizes.front(), std::min<std::size_t>(10, static_cast<std::size_t>(budget)));
  }
}

TEST_P(EitherSearch, NeitherFixedParametersNorFailuresStallItOrMakeANotANumber) {
  const std::vector<std::pair<std::string, FunctionEvaluator::Function>> functions{
      {"smooth", [](const ParameterSet& x) { return resultOf(x[0] * x[0] + x[2] * x[2]); }},
      {"least in a corner", [](const ParameterSet& x) { return resultOf(x[0] - x[2] + 2.0); }},
      {"constant", [](const ParameterSet&) { return resultOf(1.0); }},
      {"half of it not a number", [](const ParameterSet& x) { return resultOf(x[0] < 0.3 ? NAN : x[0]); }},
      {"never a number", [](const ParameterSet&) { return resultOf(NAN); }},
      {"half of it failing", [](const ParameterSet& x) { return x[2] < 0.5 ? failedResult() : resultOf(x[2]); }},
      {"all of it failing", [](const ParameterSet&) { return failedResult(); }},
      {"steps, as of integer parameters",
       [](const ParameterSet& x) { return resultOf(std::abs(std::floor(4 * x[0])) + std::abs(std::floor(4 * x[2]))); }},
  };
  for (const auto& [name, function] : functions) {
    for (const int modelType : {-1, 0, 1}) {  // without, and with a surrogate model
      FunctionEvaluator evaluator(function);
      const SearchBounds bounds{{-1, 0.1, -1}, {1, 0.1, 1}, {0.9, 0.1, 0.9}};
      ProposalSelector selector({50, 20, SurrogateModelType{modelType}, 1}, bounds);
      const int budget = modelType == 1 ? 200 : 1500;
      ProposalSelector* const chooser = modelType < 0 ? nullptr : &selector;
      const SearchSummary summary = search(GetParam(), 2, bounds, budget, evaluator, 6, chooser);
      EXPECT_LE(summary.evaluationCount, budget) << name;
      EXPECT_TRUE(std::isfinite(summary.populationRange)) << name;
      EXPECT_TRUE(std::isfinite(summary.populationSpread)) << name;
      for (const auto& batch : evaluator.batches) {
        for (const ParameterSet& set : batch) {
          ASSERT_EQ(set[1], 0.1) << name;
          ASSERT_TRUE(std::abs(set[0]) <= 1.0 && std::abs(set[2]) <= 1.0) << name;
        }
      }
      if (name == "least in a corner" || name == "steps, as of integer parameters") {
        EXPECT_NEAR(summary.bestResult.aggregate, 0.0, 1e-3) << name << modelType;
      }
    }
  }
}

TEST_P(EitherSearch, StopsWhereNoParameterCanVary) {
  FunctionEvaluator evaluator([](const ParameterSet&) { return resultOf(1.0); });
  const SearchBounds nowhere{{2, 3}, {2, 3}, {2, 3}};
  EXPECT_EQ(search(GetParam(), 2, nowhere, 500, evaluator, 1).terminationMessage,
            "Optimisation terminated: Population converged");
}

TEST_P(EitherSearch, GoesOnUntilThePopulationIsAsNarrowAsTheSettingSays) {
  const auto sphere = [](const ParameterSet& x) { return resultOf(1.0 + x[0] * x[0] + x[1] * x[1]); };
  std::vector<int> evaluations;
  for (const double limit : {1.0e-2, 1.0e-5, 1.0e-7, 0.0}) {
    FunctionEvaluator evaluator(sphere);
    UniformGenerator random(1);
    const StoppingCriteria stopping{4000, 1000000, 0.0, limit};
    const SearchBounds bounds{{-3, -3}, {5, 5}, {0, 0}};
    const SearchSummary summary = runToEnd(*makeSearch(GetParam(), 2, {bounds, stopping, {}, {}, evaluator, random}));
    evaluations.push_back(summary.evaluationCount);
    if (limit == 0.0) break;
    EXPECT_LT(summary.populationRange, limit);
    EXPECT_EQ(summary.terminationMessage, "Optimisation terminated: Population converged");
    EXPECT_THAT(summary.notes, ElementsAre(::testing::HasSubstr("less than Min_Population_Range = ")));
  }
  EXPECT_TRUE(std::ranges::is_sorted(evaluations, std::ranges::less_equal{})) << ::testing::PrintToString(evaluations);
  EXPECT_EQ(evaluations.back(), 4000);
}

TEST_P(EitherSearch, RefusesStepsAndSettingsThatMakeNoSense) {
  FunctionEvaluator evaluator([](const ParameterSet&) { return resultOf(1.0); });
  UniformGenerator random(1);
  const auto status = [&](SearchBounds bounds, int budget) {
    const auto search = makeSearch(GetParam(), 2, {std::move(bounds), onBudget(budget), {}, {}, evaluator, random});
    EXPECT_EQ(search->advance(), kSearchNotInitialised);
    return search->initialise();
  };
  EXPECT_EQ(status({{0}, {1}, {0}}, 0), kSearchSettingsInvalid);
  EXPECT_EQ(status({{1}, {0}, {0}}, 9), kSearchSettingsInvalid);
  EXPECT_EQ(status({{0}, {std::numeric_limits<double>::infinity()}, {0}}, 9), kSearchSettingsInvalid);
  EXPECT_EQ(status({{}, {}, {}}, 9), kSearchSettingsInvalid);
  EXPECT_EQ(evaluator.evaluationCount, 0);
}

TEST_P(SurrogateSearch, IsHelpedByTheSurrogateModelWithinTheSameBudgetAndRules) {
  const SearchBounds bounds{{-5, -2}, {5, 8}, {0, 0}};
  std::map<int, int> successes;  // of ten seeds, by type; -1 alone
  for (const int type : {-1, 0, 1}) {
    for (int seed = 1; seed <= 10; ++seed) {
      FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(testing::rosenbrock(x)); });
      ProposalSelector selector({25, 0, SurrogateModelType{type}, 1}, bounds);
      ProposalSelector* const chooser = type < 0 ? nullptr : &selector;
      const SearchSummary summary = search(GetParam(), 4, bounds, 400, evaluator, seed, chooser);
      EXPECT_LE(evaluator.evaluationCount, 400);
      // What is reported was run, never predicted.
      EXPECT_EQ(summary.bestResult.aggregate, testing::rosenbrock(summary.best));
      successes[type] += summary.bestResult.aggregate < 1.0e-3 ? 1 : 0;
    }
  }
  EXPECT_GE(successes[0], successes[-1] + 3);
  EXPECT_GE(successes[1], successes[-1] + 3);
}

TEST_P(SurrogateSearch, PutsAPredictedMinimumInThePlaceOfThePointThatItRefines) {
  const SearchBounds bounds{{-5, -5}, {5, 5}, {0, 0}};
  const auto bowl = [](const ParameterSet& x) { return 1.0 + (x[0] - 1) * (x[0] - 1) + 2 * (x[1] + 2) * (x[1] + 2); };
  FunctionEvaluator evaluator([&bowl](const ParameterSet& x) { return resultOf(bowl(x)); });
  UniformGenerator random(2);
  ProposalSelector selector({25, 0, SurrogateModelType::quadraticPolynomial, 1},
                            bounds);  // of the polynomial, whose minimum is the function's
  const auto search = makeSearch(GetParam(), 2, {bounds, onBudget(200), {}, {}, evaluator, random, &selector}, 1);
  ASSERT_EQ(search->initialise(), kSearchOk);
  ASSERT_EQ(search->advance(), kSearchOk);
  const Individual before = search->population().front();
  ASSERT_GT(before.value(), 1.01);
  ASSERT_EQ(search->advance(), kSearchOk);
  EXPECT_LT(search->population().front().value(), 1.0001);
  for (const Individual& point : search->population()) EXPECT_NE(point.set, before.set);
}

void advanceBy(PopulationSearch& search, int loops) {
  ASSERT_EQ(search.initialise(), kSearchOk);
  for (int loop = 0; loop < loops; ++loop) ASSERT_EQ(search.advance(), kSearchOk);
}

/// A problem whose sample is (5, 5), (6, 5), (5, 7).
SearchProblem fromThreePoints(Evaluator& evaluator, UniformGenerator& random) {
  InitialSampleSettings fromFile;
  fromFile.includeInitialParameters = false;
  fromFile.generation = SampleGeneration::fromFile;
  return {{{0, 0}, {20, 20}, {0, 0}}, onBudget(100), fromFile, {{5, 5}, {6, 5}, {5, 7}}, evaluator, random};
}

/// One evolution step of one complex: a plane, so that the reflection is always better than the worst point.
TEST(Sce, ReflectsTheWorstPointOfTheSubcomplexFirst) {
  FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(x[0] + x[1]); });
  UniformGenerator random(1);
  Sce sce({1, 3, 1}, {3}, fromThreePoints(evaluator, random));
  advanceBy(sce, 1);
  // g = (5.5, 5), u = (5, 7), a = 1 for two parameters: 2g − u = (6, 3).
  ASSERT_EQ(evaluator.batches.size(), 2U);
  EXPECT_EQ(evaluator.batches[1], (std::vector<ParameterSet>{{6, 3}}));
  EXPECT_EQ(sce.population().front().set, (ParameterSet{6, 3}));
}

TEST(Sce, ContractsWhereTheReflectionIsNoBetterAndElseTakesARandomPoint) {
  for (const bool isPublished : {false, true}) {
    // Every new point is worse than the three of the sample.
    FunctionEvaluator counting([&](const ParameterSet&) { return resultOf(counting.evaluationCount + 1); });
    UniformGenerator random(1);
    Sce sce({1, 3, 1, isPublished}, {3}, fromThreePoints(counting, random));
    advanceBy(sce, 1);
    ASSERT_EQ(counting.batches.size(), 4U);
    EXPECT_THAT(counting.batches[1][0], ElementsAre(6, 3));
    // g + c·(u − g)
    const double c = isPublished ? 0.5 : 0.4;
    EXPECT_THAT(counting.batches[2][0], ElementsAre(DoubleEq(5.5 - 0.5 * c), DoubleEq(5 + 2 * c)));
    EXPECT_EQ(sce.population().back().set, counting.batches[3][0]);
    EXPECT_THAT(counting.batches[3][0],
                ElementsAre(AllOf(::testing::Ge(5), ::testing::Le(6)), AllOf(::testing::Ge(5), ::testing::Le(7))));
  }
}

TEST(Sce, RunsOneProposalOfEveryComplexAtATime) {
  FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(testing::rosenbrock(x)); });
  UniformGenerator random(3);
  Sce sce({6, 5, 5}, {3}, {{{-5, -2}, {5, 8}, {0, 0}}, onBudget(100000), {}, {}, evaluator, random});
  advanceBy(sce, 1);
  ASSERT_GE(evaluator.batches.size(), 6U);
  EXPECT_EQ(evaluator.batches[0].size(), 30U);
  EXPECT_EQ(evaluator.batches[1].size(), 6U);
}

TEST(Pse, RunsAGenerationInOneBatch) {
  FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(testing::rosenbrock(x)); });
  UniformGenerator random(3);
  PseSettings onlyMutations{22, 0.0, 0.0};
  Pse pse(onlyMutations, {3}, {{{-5, -2}, {5, 8}, {0, 0}}, onBudget(100), {}, {}, evaluator, random});
  runToEnd(pse);
  std::vector<std::size_t> sizes;
  for (const auto& batch : evaluator.batches) sizes.push_back(batch.size());
  EXPECT_THAT(sizes, ElementsAre(22, 22, 22, 22, 12));
}

/// Every new point is worse than the sample, so that the step of the worst point goes on from move to move.
TEST(Pse, ReflectsThenContractsAndGivesAStuckPointUp) {
  FunctionEvaluator counting([&](const ParameterSet&) { return resultOf(counting.evaluationCount + 1); });
  UniformGenerator random(1);
  Pse pse({3, 1.0, 0.0}, {3}, fromThreePoints(counting, random));
  advanceBy(pse, 3);
  // The best point stays; its turn goes to the worst one, whose offspring are the last two of a batch.
  ASSERT_EQ(counting.batches.size(), 4U);
  const ParameterSet reflected{5.5 + 1.1 * 0.5, 5 - 1.1 * 2};
  const ParameterSet contracted{5.5 - 0.4 * 0.5, 5 + 0.4 * 2};
  for (const std::size_t offspring : {1U, 2U}) {
    EXPECT_THAT(counting.batches[1][offspring], ::testing::Pointwise(DoubleEq(), reflected));
    EXPECT_THAT(counting.batches[2][offspring], ::testing::Pointwise(DoubleEq(), contracted));
  }
  EXPECT_THAT(pse.population().back().set, Not(ElementsAre(5, 7)));
  EXPECT_THAT(pse.population().front().set, ElementsAre(5, 5));
}

TEST(Pse, GoesFartherInAnExpansionUnlessThatIsOutside) {
  struct Case {
    double lower;
    ParameterSet expected;
  };
  const Case cases[] = {{-20.0, {5.5 + 3 * 0.5, 5 - 3 * 2}}, {0.0, {5.5 + 1.1 * 0.5, 5 - 1.1 * 2}}};
  for (const Case& c : cases) {
    FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(x[0] + x[1]); });
    UniformGenerator random(1);
    SearchProblem problem = fromThreePoints(evaluator, random);
    problem.bounds.lower = {c.lower, c.lower};
    Pse pse({3, 1.0, 0.0, 1.0}, {3}, problem);
    advanceBy(pse, 1);
    EXPECT_THAT(evaluator.batches[1].back(), ::testing::Pointwise(DoubleEq(), c.expected)) << c.lower;
  }
}

/// In four dimensions, where the population is caught in the bend of the valley without expansions.
TEST(Pse, FollowsABentValleyWithExpansions) {
  std::map<double, int> successes;  // of fifteen seeds, by the share of expansions
  for (const double share : {0.0, 0.2}) {
    for (int seed = 1; seed <= 15; ++seed) {
      FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(testing::rosenbrock(x)); });
      UniformGenerator random(seed);
      Pse pse({36, 0.7, 0.0, share}, {5},
              {{ParameterSet(4, -5.0), ParameterSet(4, 5.0), ParameterSet(4, 0.0)},
               onBudget(4000),
               {},
               {},
               evaluator,
               random});
      successes[share] += runToEnd(pse).bestResult.aggregate < 1.0e-3 ? 1 : 0;
    }
  }
  EXPECT_GE(successes[0.2], 14);
  EXPECT_LE(successes[0.0], 12);
}

/// A failed mutation between its moves does not let a point begin again: it is reflected in one generation at most.
TEST(Pse, AMutationLeavesAPointItsPlaceInTheMoves) {
  int reflections = 0;
  for (int seed = 1; seed <= 20; ++seed) {
    FunctionEvaluator counting([&](const ParameterSet&) { return resultOf(counting.evaluationCount + 1); });
    UniformGenerator random(seed);
    Pse pse({3, 0.5, 0.0}, {3}, fromThreePoints(counting, random));
    advanceBy(pse, 6);
    const auto hasReflection = [](const std::vector<ParameterSet>& batch) {
      return std::ranges::any_of(batch, [](const ParameterSet& x) { return std::abs(x[0] - 6.05) < 1e-9; });
    };
    const auto generations = std::ranges::count_if(counting.batches, hasReflection);
    EXPECT_LE(generations, 1) << seed;
    reflections += static_cast<int>(generations);
  }
  EXPECT_GT(reflections, 10);
}

}  // namespace
}  // namespace mirevo

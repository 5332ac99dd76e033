#include "algorithms/searches/cma_es.h"

#include <algorithm>
#include <cmath>
#include <numeric>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/rotated_functions.h"
#include "algorithms/searches/population_search.h"

namespace mirevo {
namespace {

struct CmaTrial {
  SearchSummary summary;
  std::vector<std::vector<ParameterSet>> batches;
};

/// Without the test of the change of the best value, unless it is given.
struct CmaConditions {
  CmaEsSettings settings = {};
  int budget = 1000;
  int seed = 1;
  Feasibility feasibility = {};
  InitialSampleSettings sample = {.includeInitialParameters = false};
  double minChange = 0.0;
};

CmaTrial cmaSearch(const SearchBounds& bounds, const FunctionEvaluator::Function& function, const CmaConditions& c) {
  FunctionEvaluator evaluator(function);
  UniformGenerator random(c.seed);
  SearchProblem problem{bounds, {c.budget, c.minChange > 0.0 ? 10 : 1000000, c.minChange}, c.sample, {}, evaluator,
                        random};
  problem.feasibility = c.feasibility;
  CmaEs cma(c.settings, std::move(problem));
  EXPECT_EQ(cma.advance(), kSearchNotInitialised);
  EXPECT_EQ(cma.initialise(), kSearchOk);
  for (int loop = 0; loop < 100000 && !cma.isTerminated(); ++loop) EXPECT_EQ(cma.advance(), kSearchOk);
  EXPECT_TRUE(cma.isTerminated());
  EXPECT_EQ(cma.summary().evaluationCount, evaluator.evaluationCount);
  EXPECT_EQ(evaluator.settledSizes.size(), 1U);
  return {cma.summary(), std::move(evaluator.batches)};
}

FunctionEvaluator::Function plainly(std::function<double(const std::vector<double>&)> value) {
  return [value = std::move(value)](const ParameterSet& x) { return resultOf(value(x)); };
}

SearchBounds cmaCube(std::size_t n, double lower, double upper) {
  return {std::vector<double>(n, lower), std::vector<double>(n, upper), std::vector<double>(n, 0.5 * (lower + upper))};
}

double sphereFrom(const std::vector<double>& x, double place) {
  double sum = 0.0;
  for (const double value : x) sum += (value - place) * (value - place);
  return sum;
}

/// Table 1 of the tutorial for n = λ = 10, and one update by hand in two dimensions.
TEST(CmaEs, HasTheConstantsAndTheUpdateOfThePublication) {
  const CmaConstants c = cmaConstants(10, cmaPopulationSize(10));
  EXPECT_EQ(c.parents, 5U);
  EXPECT_NEAR(c.muEff, 3.1672992814107026, 1e-14);
  EXPECT_NEAR(c.cSigma, 0.2844285879463675, 1e-15);
  EXPECT_NEAR(c.dSigma, 1.2844285879463675, 1e-14);
  EXPECT_NEAR(c.cc, 0.29499038303562225, 1e-15);
  EXPECT_NEAR(c.c1, 0.015283824524751714, 1e-16);
  EXPECT_NEAR(c.cMu, 0.023551776650417484, 1e-16);
  EXPECT_NEAR(c.weights.front(), 0.45627264690340597, 1e-15);
  EXPECT_NEAR(c.weights.back(), -0.5497499176973852, 1e-14);

  CmaDistribution distribution({0.5, 0.25}, 0.2, 4);
  const std::vector<std::vector<double>> steps{{1.0, 0.5}, {-0.5, 1.0}, {0.25, -1.5}, {-2.0, -0.5}};
  const std::vector<double>* const ranked[] = {&steps[0], &steps[1], &steps[2], &steps[3]};
  distribution.update(ranked);
  EXPECT_THAT(distribution.mean(), ::testing::ElementsAre(::testing::DoubleNear(0.6412488579798189, 1e-14),
                                                          ::testing::DoubleNear(0.36958371400672707, 1e-14)));
  EXPECT_NEAR(distribution.sigma(), 0.1843365063087342, 1e-14);
  EXPECT_NEAR(distribution.variance(0), 0.9004851190612648, 1e-13);
  EXPECT_NEAR(distribution.variance(1), 0.9170263234418831, 1e-13);
  // The axes of C: their squared lengths sum up to its trace, their product is its determinant.
  const auto& axes = distribution.axisLengths();
  EXPECT_NEAR(axes[0] * axes[0] + axes[1] * axes[1], 0.9004851190612648 + 0.9170263234418831, 1e-13);
  EXPECT_NEAR(std::pow(axes[0] * axes[1], 2.0),
              0.9004851190612648 * 0.9170263234418831 - std::pow(0.0781074905259057, 2.0), 1e-13);
}

TEST(CmaEs, FindsPublishedOptima) {
  const std::tuple<testing::TestFunction, int, double> cases[] = {{testing::testFunction("Rosenbrock 2-D"), 1500, 1e-6},
                                                                  {testing::testFunction("Ackley 10-D"), 5000, 1e-6},
                                                                  {testing::rotatedEllipsoid(10, 1), 5000, 1e-6},
                                                                  {testing::ellipsoid(10, 1), 6000, 1e-6},
                                                                  {testing::discus(10, 1), 6000, 1e-6},
                                                                  {testing::bentCigar(10, 1), 9000, 1e-2}};
  for (const auto& [function, budget, tolerance] : cases) {
    int successes = 0;
    for (int seed = 1; seed <= 3; ++seed) {
      const CmaTrial trial =
          cmaSearch(testing::boundsOf(function), plainly(function.value), {.budget = budget, .seed = seed});
      successes += trial.summary.bestResult.aggregate - function.optimalValue < tolerance ? 1 : 0;
      EXPECT_EQ(function.value(trial.summary.best), trial.summary.bestResult.aggregate);
    }
    EXPECT_GE(successes, 2) << function.name;
  }
}

/// Axes that are turned are no harder than axes along the parameters.
TEST(CmaEs, DoesNotDependOnTheDirectionOfTheAxes) {
  const auto evaluations = [](bool isTurned) {
    int sum = 0;
    for (int seed = 1; seed <= 6; ++seed) {
      UniformGenerator random(seed);
      const testing::Matrix rotation = testing::randomRotation(8, random);
      int count = 0;
      int needed = 0;
      const auto value = [&](const std::vector<double>& x) {
        const std::vector<double> z = isTurned ? testing::times(rotation, x) : x;
        double total = 0.0;
        for (std::size_t i = 0; i < z.size(); ++i) total += std::pow(10.0, 6.0 * testing::shareOf(i, 8)) * z[i] * z[i];
        ++count;
        if (needed == 0 && total < 1e-6) needed = count;
        return total;
      };
      cmaSearch(cmaCube(8, -5.0, 4.0), plainly(value), {.budget = 5000, .seed = seed});
      EXPECT_GT(needed, 0);
      sum += needed;
    }
    return static_cast<double>(sum);
  };
  EXPECT_NEAR(evaluations(true) / evaluations(false), 1.0, 0.12);
}

/// Neither the unit of the objective function nor that of the parameters, and no other order-preserving change.
TEST(CmaEs, DependsOnTheOrderOfValuesAlone) {
  const auto function = testing::testFunction("Ackley 10-D");
  const CmaTrial trial = cmaSearch(testing::boundsOf(function), plainly(function.value), {.budget = 1500});
  const auto cubed = [&](const std::vector<double>& x) { return std::pow(function.value(x), 3.0); };
  EXPECT_EQ(cmaSearch(testing::boundsOf(function), plainly(cubed), {.budget = 1500}).batches, trial.batches);
  // A factor that is a power of two changes no digit.
  SearchBounds wide = testing::boundsOf(function);
  for (auto* side : {&wide.lower, &wide.upper, &wide.initial}) {
    for (double& value : *side) value *= 1024.0;
  }
  const auto scaled = [&](std::vector<double> x) {
    for (double& value : x) value /= 1024.0;
    return 4096.0 * function.value(x);
  };
  const CmaTrial other = cmaSearch(wide, plainly(scaled), {.budget = 1500});
  EXPECT_EQ(other.summary.bestResult.aggregate, 4096.0 * trial.summary.bestResult.aggregate);
}

TEST(CmaEs, MakesEveryGenerationOneBatchWithinTheBudget) {
  for (const int budget : {1, 5, 8, 9, 31}) {
    const CmaTrial trial = cmaSearch(cmaCube(3, -1.0, 1.0), plainly([](const auto& x) { return sphereFrom(x, 0.1); }),
                                     {.settings = {.populationSize = 8}, .budget = budget});
    EXPECT_EQ(trial.summary.evaluationCount, budget);
    EXPECT_EQ(trial.summary.terminationMessage, "Optimisation terminated: Maximum number of model evaluations reached");
    for (std::size_t i = 0; i + 1 < trial.batches.size(); ++i) EXPECT_EQ(trial.batches[i].size(), 8U);
    EXPECT_EQ(trial.summary.notes.size(), budget > 8 ? 1U : 0U) << "no run without an evaluation";
  }
}

/// What was run with a budget is run with any larger one, so that a restart may raise it.
TEST(CmaEs, GoesOnWithARaisedBudgetAsIfItHadBeenTheFirst) {
  const auto sets = [](int budget) {
    std::vector<ParameterSet> all;
    for (const auto& batch :
         cmaSearch(cmaCube(4, -3.0, 3.0), plainly(testing::rastrigin), {.budget = budget}).batches) {
      all.insert(all.end(), batch.begin(), batch.end());
    }
    return all;
  };
  const std::vector<ParameterSet> many = sets(3000);
  for (const int budget : {8, 300, 1501}) {
    const std::vector<ParameterSet> few = sets(budget);
    EXPECT_TRUE(std::equal(few.begin(), few.end(), many.begin())) << budget;
  }
}

TEST(CmaEs, FindsOptimaAtBoundsAndRunsNothingBeyondThem) {
  // The optimum of the whole space is at the corner, near it or far beyond it.
  for (const double place : {1.0, 1.2, 3.0, 1000.0}) {
    const CmaTrial trial = cmaSearch(
        cmaCube(6, -1.0, 1.0), plainly([place](const auto& x) { return sphereFrom(x, place); }), {.budget = 2500});
    for (const double value : trial.summary.best) EXPECT_NEAR(value, 1.0, 1e-6) << place;
    for (const auto& batch : trial.batches) {
      for (const ParameterSet& set : batch) {
        for (const double value : set) ASSERT_TRUE(value >= -1.0 && value <= 1.0);
      }
    }
  }
}

/// Steep in the continuous parameters and flat in the integer ones: the distribution is narrower than a step before
/// these are right.
TEST(CmaEs, AMarginKeepsIntegerParametersMoving) {
  const std::vector<double> best{3, -7, 9, 0, 5};
  const auto value = [&best](const std::vector<double>& x) {
    double sum = 0.0;
    for (std::size_t j = 0; j < 5; ++j) {
      sum += std::pow(std::floor(x[j]) - best[j], 2.0) + 1000.0 * std::pow(x[j + 5] - 0.3, 2.0);
    }
    return sum;
  };
  SearchBounds bounds = cmaCube(10, -10.0, 10.0);
  for (std::size_t j = 0; j < 5; ++j) bounds.upper[j] = 11.0 - 1e-9;
  std::vector<int> found;
  for (const bool isTold : {true, false}) {
    bounds.isInteger = std::vector<bool>(isTold ? 10 : 0, false);
    for (std::size_t j = 0; j < 5 && isTold; ++j) bounds.isInteger[j] = true;
    int successes = 0;
    for (int seed = 1; seed <= 10; ++seed) {
      const CmaTrial trial =
          cmaSearch(bounds, plainly(value), {.settings = {.doublings = 0}, .budget = 4000, .seed = seed});
      successes += trial.summary.bestResult.aggregate < 1e-6 ? 1 : 0;
    }
    found.push_back(successes);
  }
  EXPECT_GE(found[0], 9);
  EXPECT_LE(found[1], found[0] - 3);
}

/// The probabilities of section 4 of the publication, of an integer parameter with the values 0 to 9.
TEST(CmaEs, AMarginLeavesNeighboursTheirProbability) {
  const CmaMargin margin({10.0, 0.0});
  const double least = 1.0 / (2.0 * 6.0);
  const auto above = [](double z) { return 0.5 * std::erfc(z / std::sqrt(2.0)); };
  for (const auto& [mean, sigma] : {std::pair{0.55, 1e-6}, {0.501, 1e-3}, {0.55, 0.02}, {0.32, 0.01}}) {
    CmaDistribution distribution({mean, mean}, sigma, 6);
    margin.keepOpen(distribution);
    const double value = std::floor(mean * 10.0);
    const double place = distribution.mean()[0];
    EXPECT_GE(above(((value + 1.0) / 10.0 - place) / distribution.deviation(0)), 0.5 * least - 1e-12) << mean;
    EXPECT_GE(above((place - value / 10.0) / distribution.deviation(0)), 0.5 * least - 1e-12) << mean;
    EXPECT_EQ(std::floor(place * 10.0), value) << "the value of the mean stays";
    EXPECT_EQ(distribution.mean()[1], mean) << "a continuous one is left alone";
    EXPECT_EQ(distribution.deviation(1), sigma);
  }
  // At the first and the last value the mean comes nearer to the only neighbour, and no step is widened.
  for (const double mean : {-0.3, 0.02, 0.98, 1.4}) {
    CmaDistribution distribution({mean, mean}, 0.01, 6);
    margin.keepOpen(distribution);
    const double border = mean < 0.5 ? 0.1 : 0.9;
    EXPECT_NEAR(above(std::abs(distribution.mean()[0] - border) / 0.01), least, 1e-9) << mean;
    EXPECT_EQ(distribution.deviation(0), 0.01);
  }
}

TEST(CmaEs, RestartsFollowBipop) {
  CmaRestarts restarts(10, 0.2, 3);
  UniformGenerator random(1);
  CmaRun run = restarts.first();
  std::vector<std::size_t> large;
  int usedByLarge = 0;
  int usedBySmall = 0;
  int evaluationsOfLarge = 0;
  for (std::optional<CmaRun> next = run; next; next = restarts.next(run, run.isSmall ? 400 : 1000, random)) {
    run = *next;
    if (run.isSmall) {
      EXPECT_LT(usedBySmall, usedByLarge);
      EXPECT_TRUE(run.population >= 10 && run.population <= large.back() / 2) << run.population;
      EXPECT_TRUE(run.sigma >= 0.002 && run.sigma <= 0.2);
      EXPECT_EQ(run.mostEvaluations, evaluationsOfLarge / 2);
      usedBySmall += 400;
    } else {
      EXPECT_GE(usedBySmall, usedByLarge);
      if (!large.empty()) usedByLarge += 1000;
      evaluationsOfLarge = 1000;
      large.push_back(run.population);
    }
  }
  EXPECT_THAT(large, ::testing::ElementsAre(10, 20, 40, 80));
  EXPECT_GE(usedBySmall, 3000);
}

TEST(CmaEs, SaysWhyItsRunsEndAndEndsWithTheLastOne) {
  const auto rugged = plainly(testing::rastrigin);
  const auto lines = [&](const CmaConditions& c) { return cmaSearch(cmaCube(2, -5.12, 5.12), rugged, c).summary; };
  const SearchSummary one = lines({.settings = {.doublings = 0}, .budget = 20000});
  EXPECT_LT(one.evaluationCount, 2000);
  EXPECT_THAT(one.notes, ::testing::ElementsAre(::testing::HasSubstr("Run 1 of CMA-ES: 6 points in a generation")));
  EXPECT_THAT(one.terminationMessage,
              ::testing::HasSubstr("Optimisation terminated: The last run of CMA-ES ended as "));
  const SearchSummary several = lines({.settings = {.doublings = 1}, .budget = 20000});
  EXPECT_GE(several.notes.size(), 3U);
  EXPECT_THAT(several.notes, ::testing::Contains(::testing::HasSubstr(": 12 points in a generation")));
  const SearchSummary change = lines({.settings = {.doublings = 0}, .budget = 20000, .minChange = 0.5});
  EXPECT_THAT(change.terminationMessage, ::testing::HasSubstr("Min_Change"));
  // Whatever the values' sign.
  const auto below = [](const std::vector<double>& x) { return testing::rastrigin(x) - 1.0e6; };
  const CmaConditions untilChange{.settings = {.doublings = 0}, .budget = 20000, .minChange = 1e-12};
  const SearchSummary negative = cmaSearch(cmaCube(2, -5.12, 5.12), plainly(below), untilChange).summary;
  const SearchSummary early = cmaSearch(cmaCube(2, -5.12, 5.12), plainly(testing::rastrigin), untilChange).summary;
  EXPECT_GT(negative.evaluationCount, early.evaluationCount / 2);
  const SearchSummary flat = cmaSearch(cmaCube(2, 0.0, 1.0), plainly([](const auto&) { return 3.0; }),
                                       {.settings = {.doublings = 0}, .budget = 20000})
                                 .summary;
  EXPECT_THAT(flat.terminationMessage, ::testing::HasSubstr("the best values of its last generations are equal"));
}

TEST(CmaEs, FailedRunsRankBehindAllOthersAndNeitherStallItNorMakeANotANumber) {
  const std::pair<const char*, FunctionEvaluator::Function> cases[] = {
      {"cut off beyond the optimum",
       [](const ParameterSet& x) { return x[0] < 0.3 ? failedResult() : resultOf(sphereFrom(x, 0.3)); }},
      {"not a number beyond it", [](const ParameterSet& x) { return resultOf(x[0] < 0.3 ? NAN : sphereFrom(x, 0.3)); }},
      {"most fail",
       [](const ParameterSet& x) { return sphereFrom(x, 0.3) > 0.3 ? failedResult() : resultOf(sphereFrom(x, 0.3)); }},
      {"all fail", [](const ParameterSet&) { return failedResult(); }},
  };
  for (const auto& [name, function] : cases) {
    const CmaTrial trial = cmaSearch(cmaCube(3, -1.0, 1.0), function, {.budget = 1500, .seed = 2});
    EXPECT_TRUE(std::isfinite(trial.summary.populationSpread)) << name;
    for (const auto& batch : trial.batches) {
      for (const ParameterSet& set : batch) {
        for (const double value : set) ASSERT_TRUE(value >= -1.0 && value <= 1.0) << name;
      }
    }
    if (std::string(name) != "all fail") {
      EXPECT_NEAR(trial.summary.bestResult.aggregate, 0.0, 1e-6) << name;
    }
  }
}

TEST(CmaEs, ProposesNothingThatViolatesAConstraint) {
  const auto isAllowed = [](const auto& x) { return x[0] + x[1] <= 0.5; };
  const CmaTrial trial = cmaSearch(cmaCube(4, -1.0, 1.0), plainly([](const auto& x) { return sphereFrom(x, 0.7); }),
                                   {.budget = 1500, .feasibility = feasibleWhere(isAllowed, "sum")});
  EXPECT_GT(trial.summary.replacedCount, 0);
  for (const auto& batch : trial.batches) {
    for (const ParameterSet& set : batch) ASSERT_TRUE(isAllowed(set));
  }
  // On the constraint, at (1/4, 1/4, 0.7, 0.7).
  EXPECT_NEAR(trial.summary.bestResult.aggregate, 2.0 * 0.45 * 0.45, 1e-3);
}

/// A given set that is the best of the sample is where the search starts; else it starts in the middle of good ones.
TEST(CmaEs, StartsAtAGivenSetThatIsGood) {
  for (const auto& [initial, isNear] : {std::pair{0.301, true}, {0.99, false}}) {
    SearchBounds bounds = cmaCube(5, 0.0, 1.0);
    bounds.initial.assign(5, initial);
    const CmaTrial trial = cmaSearch(bounds, plainly([](const auto& x) { return sphereFrom(x, 0.3); }),
                                     {.settings = {.initialStep = 0.001}, .budget = 40, .sample = {}});
    ASSERT_GE(trial.batches.size(), 2U);
    const bool isAround = std::ranges::all_of(trial.batches[1], [&](const ParameterSet& set) {
      return std::ranges::all_of(set, [&](double value) { return std::abs(value - initial) < 0.01; });
    });
    EXPECT_EQ(isAround, isNear);
  }
}

}  // namespace
}  // namespace mirevo

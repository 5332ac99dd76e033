#include "algorithms/searches/dds.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <tuple>
#include <utility>

#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/test_functions.h"

namespace mirevo {
namespace {

/// The given deviates in order; running past their end fails the test.
DeviateSource scripted(std::vector<double> deviates) {
  return [deviates = std::move(deviates), next = std::size_t{0}]() mutable {
    EXPECT_LT(next, deviates.size());
    return next < deviates.size() ? deviates[next++] : 0.25;
  };
}

SearchBounds box(std::size_t n, double lower, double upper) {
  return {std::vector<double>(n, lower), std::vector<double>(n, upper), std::vector<double>(n, lower)};
}

void run(Dds& dds) {
  ASSERT_EQ(dds.initialise(), kSearchOk);
  for (int guard = 0; !dds.isTerminated() && guard < 100000; ++guard) ASSERT_EQ(dds.advance(), kSearchOk);
}

TEST(DdsSteps, StartPointCountNeverExceedsTheBudget) {
  const std::pair<int, int> table[] = {
      {1, 1}, {4, 4}, {5, 5}, {100, 5}, {1000, 5}, {1100, 5}, {1101, 6}, {3000, 15}, {2147483647, 10737418}};
  for (const auto& [budget, count] : table) EXPECT_EQ(ddsStartPointCount(budget), count) << budget;
}

TEST(DdsSteps, ReflectsAtTheBoundViolatedFirst) {
  for (const auto& [value, lower, upper, expected] : std::initializer_list<std::array<double, 4>>{
           {-0.3, 0, 1, 0.3}, {-1.5, 0, 1, 0}, {1.25, 0, 1, 0.75}, {2.5, 0, 1, 1}, {0.4, 0, 1, 0.4}, {3, 2, 2, 2}})
    EXPECT_DOUBLE_EQ(ddsReflect(value, lower, upper), expected) << value;
}

TEST(DdsSteps, NormalDeviateRejectsAndChooses) {
  // (0.95, 0.95) lies outside the circle and (0.5, 0.5) in its centre; (0.75, 0.625) gives u = (0.5, 0.25).
  const double f = std::sqrt(-2.0 * std::log(0.3125) / 0.3125);
  EXPECT_DOUBLE_EQ(ddsNormalDeviate(scripted({0.95, 0.95, 0.5, 0.5, 0.75, 0.625, 0.49})), f * 0.5);
  EXPECT_DOUBLE_EQ(ddsNormalDeviate(scripted({0.75, 0.625, 0.5})), f * 0.25);
}

TEST(DdsSteps, CandidatePerturbsTheChosenParametersOnlyUntilItCanBeRun) {
  const SearchBounds bounds = box(3, 0.0, 10.0);
  const std::vector<double> best = {5.0, 5.0, 5.0};
  const double f = std::sqrt(-2.0 * std::log(0.3125) / 0.3125);
  FeasiblePoints all;
  // The deviates that choose come first, all of them; 0.3 is not below a probability of 0.3.
  EXPECT_EQ(ddsCandidate(best, bounds, 0.2, 0.3, scripted({0.3, 0.29, 0.9, 0.75, 0.625, 0.1}), all),
            (ParameterSet{5.0, 5.0 + 0.2 * 10.0 * (f * 0.5), 5.0}));
  const std::pair<double, std::size_t> single[] = {{0.0, 0}, {1.0 / 3, 0}, {0.34, 1}, {0.67, 2}, {0.999999, 2}};
  for (const auto& [deviate, index] : single) {
    const ParameterSet candidate =
        ddsCandidate(best, bounds, 0.2, 0.0, scripted({0.0, 0.0, 0.0, deviate, 0.75, 0.625, 0.1}), all);
    for (std::size_t j = 0; j < 3; ++j) EXPECT_EQ(candidate[j] != 5.0, j == index) << deviate << " " << j;
  }
  // One that cannot be run is perturbed again in the same parameter: first upwards, then by u = (-0.5, 0.25).
  FeasiblePoints below(feasibleWhere([](const auto& set) { return set[1] < 5.0; }, "too large"));
  EXPECT_EQ(ddsCandidate(best, bounds, 0.2, 0.3, scripted({0.3, 0.29, 0.9, 0.75, 0.625, 0.1, 0.25, 0.625, 0.1}), below),
            (ParameterSet{5.0, 5.0 - 0.2 * 10.0 * (f * 0.5), 5.0}));
}

TEST(Dds, EvaluatesStartPointsInOneBatchThenOneByOne) {
  for (const bool fromInitial : {false, true}) {
    FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(x[0] + x[1]); });
    UniformGenerator random(7);
    SearchBounds bounds = box(2, -1.0, 3.0);
    bounds.initial = {2.0, 2.5};
    Dds dds({}, 12, fromInitial, bounds, evaluator, random);
    run(dds);
    const std::size_t starts = fromInitial ? 1 : 5;
    ASSERT_EQ(evaluator.batches.size(), 1 + 12 - starts);
    EXPECT_EQ(evaluator.batches[0].size(), starts);
    EXPECT_EQ(evaluator.settledSizes, std::vector<std::size_t>{starts});
    if (fromInitial) {
      EXPECT_EQ(evaluator.batches[0][0], bounds.initial);
    }
    EXPECT_EQ(dds.summary().evaluationCount, 12);
    EXPECT_EQ(dds.summary().loopCount, static_cast<int>(12 - starts));
    EXPECT_EQ(dds.summary().terminationMessage, "Optimisation terminated: Maximum number of model evaluations reached");
    EXPECT_EQ(dds.advance(), kSearchOk);
    EXPECT_EQ(evaluator.evaluationCount, 12);
  }
}

TEST(Dds, PerturbsAsManyParametersAsTheNumberOfTheEvaluationSays) {
  FunctionEvaluator evaluator([&](const ParameterSet&) { return resultOf(evaluator.evaluationCount); });  // none better
  UniformGenerator random(1);
  const SearchBounds bounds = box(1000, 0.0, 1.0);
  Dds dds({}, 4, true, bounds, evaluator, random);
  run(dds);
  // P = 1 - ln(i) / ln(4) at the evaluations 2, 3 and 4, and at least one parameter.
  for (const auto& [batch, expected, tolerance] : {std::tuple{1U, 500, 60}, {2U, 207, 50}, {3U, 1, 0}}) {
    const ParameterSet& candidate = evaluator.batches.at(batch).front();
    const auto perturbed = std::ranges::count_if(candidate, [](double x) { return x != 0.0; });
    EXPECT_LE(std::abs(perturbed - expected), tolerance) << perturbed;
  }
}

TEST(Dds, EqualReplacesAndNaNNeverDoes) {
  const std::tuple<double, double, bool> cases[] = {{1.0, 1.0, true},  {1.0, 1.5, false},
                                                    {1.0, NAN, false}, {NAN, 1.0, true},
                                                    {NAN, NAN, false}, {kFailedRunValue, kFailedRunValue, true}};
  for (const auto& [start, candidate, isReplaced] : cases) {
    FunctionEvaluator evaluator([&, value = start, later = candidate](const ParameterSet&) mutable {
      return resultOf(std::exchange(value, later));
    });
    UniformGenerator random(1);
    Dds dds({}, 2, true, box(1, 0.0, 1.0), evaluator, random);
    run(dds);
    EXPECT_EQ(dds.summary().best == evaluator.batches[1][0], isReplaced) << start << " " << candidate;
    EXPECT_EQ(dds.summary().bestResult.number, isReplaced ? 2 : 1);
  }
  FunctionEvaluator third([&](const ParameterSet&) { return resultOf(third.evaluationCount == 2 ? 9.0 : NAN); });
  UniformGenerator random(1);
  Dds dds({}, 5, false, box(2, 0.0, 1.0), third, random);
  run(dds);
  EXPECT_EQ(dds.summary().bestResult.number, 3);
}

TEST(Dds, StaysInsideTheBoundsAndOnAFixedParameter) {
  FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(-std::abs(x[0]) + x[1]); });
  UniformGenerator random(3);
  Dds dds({5.0}, 400, false, {{-1.0, 0.1}, {2.0, 0.1}, {0.0, 0.1}}, evaluator, random);
  run(dds);
  for (const auto& batch : evaluator.batches) {
    for (const ParameterSet& x : batch) {
      EXPECT_GE(x[0], -1.0);
      EXPECT_LE(x[0], 2.0);
      EXPECT_EQ(x[1], 0.1);
    }
  }
  EXPECT_EQ(dds.summary().best[0], 2.0);  // reached by a point that was reflected past the other bound
}

TEST(Dds, NamesParametersThatConstraintsHold) {
  using Set = std::span<const double>;
  const std::tuple<bool (*)(Set), std::vector<std::size_t>> cases[] = {
      {[](Set x) { return x[0] <= x[1] && x[0] >= x[1]; }, {0, 1}},
      {[](Set x) { return std::abs(x[0] - x[2]) <= 1e-4; }, {0, 2}},
      {[](Set x) { return std::abs(x[0] - x[2]) <= 0.1; }, {}},
      {[](Set x) { return x[0] + x[1] + x[2] >= 3.0; }, {}},  // the optimum is on it
      {[](Set) { return true; }, {}},
  };
  for (const auto& [holds, held] : cases) {
    FunctionEvaluator evaluator(
        [](const ParameterSet& x) { return resultOf(x[0] * x[0] + x[1] * x[1] + x[2] * x[2]); });
    UniformGenerator random(1);
    SearchBounds bounds = box(3, -5.0, 5.0);
    bounds.initial.assign(3, 2.0);
    Dds dds({}, 150, true, bounds, evaluator, random,
            feasibleWhere([&holds](const auto& set) { return holds(set); }, "held"));
    run(dds);
    EXPECT_EQ(dds.summary().heldParameters, held) << &holds - &std::get<0>(cases[0]);
  }
}

TEST(Dds, RefusesImpossibleInputWithAStatus) {
  FunctionEvaluator evaluator([](const ParameterSet&) { return resultOf(0.0); });
  UniformGenerator random(1);
  const double huge = std::numeric_limits<double>::max();
  const std::pair<SearchBounds, int> cases[] = {{{}, 10},
                                                {box(2, 0, 1), 0},
                                                {{{0.0}, {1.0, 2.0}, {0.0}}, 10},
                                                {box(1, 1, 0), 10},
                                                {box(1, NAN, 1), 10},
                                                {box(1, -huge, huge), 10},
                                                {{{0.0}, {1.0}, {}}, 10}};
  for (const auto& [bounds, budget] : cases) {
    Dds dds({}, budget, true, bounds, evaluator, random);
    EXPECT_NE(dds.initialise(), kSearchOk);
    EXPECT_NE(dds.advance(), kSearchOk);
  }
  EXPECT_EQ(evaluator.evaluationCount, 0);
}

// A search with one solution gets stuck now and then, so the tolerance is one for the median of eleven seeds; it leaves
// a factor of about three.
TEST(Dds, FindsPublishedOptima) {
  const std::tuple<const char*, int, double> problems[] = {
      {"Rosenbrock 2-D", 2000, 0.5}, {"Ackley 10-D", 5000, 1.0}, {"Rastrigin 10-D", 5000, 0.5}};
  for (const auto& [name, budget, tolerance] : problems) {
    std::vector<double> errors;
    for (std::int32_t seed = 1; seed <= 11; ++seed) {
      const auto function = testing::shifted(testing::testFunction(name), seed);
      FunctionEvaluator evaluator([&](const ParameterSet& x) { return resultOf(function.value(x)); });
      UniformGenerator random(seed);
      Dds dds({}, budget, false, testing::boundsOf(function), evaluator, random);
      run(dds);
      errors.push_back(dds.summary().bestResult.aggregate - function.optimalValue);
    }
    std::ranges::sort(errors);
    EXPECT_LE(errors[5], tolerance) << name;
  }
}

}  // namespace
}  // namespace mirevo

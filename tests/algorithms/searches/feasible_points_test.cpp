#include "algorithms/searches/feasible_points.h"

#include <algorithm>
#include <memory>
#include <numeric>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/searches/dds.h"
#include "algorithms/searches/opse.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "matchers.h"
#include "refusal.h"

namespace mirevo {
namespace {

/// Sets whose sum is below the limit can be run.
Feasibility sumBelow(double limit) {
  return feasibleWhere([limit](const auto& set) { return std::accumulate(set.begin(), set.end(), 0.0) < limit; },
                       "sum too large");
}

const SearchBounds kBounds{{0, 0}, {10, 10}, {1, 1}};

TEST(FeasiblePoints, ReplaceOnlyWhatWasDrawnAndCannotBeRun) {
  UniformGenerator random(3);
  FeasiblePoints points(sumBelow(5));
  std::vector<ParameterSet> sample{{9, 9}, {1, 2}, {8, 1}, {0, 4}, {5, 5}};
  points.replaceInSample(sample, 1, kBounds, random);
  EXPECT_EQ(sample[0], (ParameterSet{9, 9})) << "a given set";
  EXPECT_EQ(sample[1], (ParameterSet{1, 2}));
  EXPECT_EQ(sample[3], (ParameterSet{0, 4}));
  for (const std::size_t i : {2U, 4U}) EXPECT_TRUE(sumBelow(5).holds(sample[i]));
  EXPECT_EQ(points.replacedCount(), 2);

  // All that is left of the stream where nothing is replaced: all of it.
  UniformGenerator unused(3);
  UniformGenerator fresh(3);
  std::vector<ParameterSet> allowed{{9, 9}, {1, 2}};
  FeasiblePoints(sumBelow(20)).replaceInSample(allowed, 0, kBounds, unused);
  EXPECT_EQ(FeasiblePoints(sumBelow(20)).draw([&] { return ParameterSet{unused.next()}; }, {}),
            ParameterSet{fresh.next()});
}

TEST(FeasiblePoints, AreDrawnBackTowardsTheFirstOriginThatCanBeRun) {
  FeasiblePoints points(sumBelow(5));
  const ParameterSet inside{0, 2};
  const ParameterSet outside{6, 0};
  EXPECT_EQ(points.drawnBack({1, 1}, {inside}), (ParameterSet{1, 1}));
  EXPECT_EQ(points.drawnBack({8, 2}, {outside, inside}), (ParameterSet{2, 2})) << "half of the way twice";
  EXPECT_EQ(points.shortened({8, 2}, inside, 2), (ParameterSet{2, 2}));
  EXPECT_EQ(points.shortened({8, 2}, inside, 1), std::nullopt);
  EXPECT_EQ(points.drawnBack({8, 2}, {outside}), (ParameterSet{8, 2})) << "nothing is known yet";
  UniformGenerator random(1);
  std::vector<ParameterSet> sample{{0, 0}};
  points.replaceInSample(sample, 0, kBounds, random);
  EXPECT_EQ(points.drawnBack({8, 8}, {outside}), (ParameterSet{2, 2})) << "towards the set of the sample";
  EXPECT_EQ(points.draw([] { return ParameterSet{9, 3}; }, inside), (ParameterSet{2.25, 2.25}));
  // Nothing on the way can be run.
  FeasiblePoints single(feasibleWhere([](const auto& set) { return set[0] == 0.0; }, "not 0"));
  EXPECT_EQ(points.returnedCount(), 0);
  EXPECT_EQ(single.drawnBack({8, 8}, {inside}), inside);
  EXPECT_EQ(single.returnedCount(), 1);
}

TEST(FeasiblePoints, RefuseASampleBeforeItIsEvaluatedWhereNoneCanBeFound) {
  UniformGenerator random(1);
  std::vector<ParameterSet> sample{{9, 9}, {8, 8}};
  EXPECT_EQ(
      refusalOf([&] { FeasiblePoints(sumBelow(-1)).replaceInSample(sample, 0, kBounds, random); }),
      "Error: No parameter set found that satisfies the constraints\n"
      "1000002 sets drawn between the bounds cannot be run, nor can the initial values; one of them: sum too large");
  EXPECT_THAT(refusalOf([&] {
                FeasiblePoints(sumBelow(-1)).replaceInSample(sample, 0, {{0, 0}, {10, 10}, {}}, random);
              }),
              ::testing::EndsWith("1000002 sets drawn between the bounds cannot be run; one of them: sum too large"));
  // The initial set, although it is not in the sample, is the only one known.
  FeasiblePoints tiny(sumBelow(1e-9));
  SearchBounds bounds = kBounds;
  bounds.initial = {0, 0};
  tiny.replaceInSample(sample, 0, bounds, random);
  for (const ParameterSet& set : sample) EXPECT_EQ(set, bounds.initial);
}

/// The searches, by their names; each takes this problem with a small population.
std::unique_ptr<SearchAlgorithm> makeSearch(const std::string& name, const SearchProblem& problem) {
  if (name == "SCE") return std::make_unique<Sce>(SceSettings{2, 5, 5}, SimplexSettings{3}, problem);
  if (name == "PSE") return std::make_unique<Pse>(PseSettings{20}, SimplexSettings{3}, problem);
  if (name == "OPSE") return std::make_unique<Opse>(OpseSettings{{20}, 10}, SimplexSettings{3}, problem);
  return std::make_unique<Dds>(DdsSettings{}, problem.stopping.maxEvaluations,
                               problem.initialSample.includeInitialParameters, problem.bounds, problem.evaluator,
                               problem.random, problem.feasibility);
}

double bowl(const ParameterSet& x) {
  return (x[0] - 6) * (x[0] - 6) + (x[1] - 4) * (x[1] - 4);
}

/// The bowl, searched with the constraint; returns the best set. All sets evaluated are in `evaluated`.
ParameterSet search(const std::string& name, bool usesSurrogate, const Feasibility& feasibility,
                    const SearchBounds& bounds, const InitialSampleSettings& sample,
                    std::vector<ParameterSet>& evaluated) {
  FunctionEvaluator evaluator([&](const ParameterSet& x) {
    evaluated.push_back(x);
    if (!feasibility.holds(x)) return failedResult();
    return resultOf(bowl(x));
  });
  UniformGenerator random(5);
  ProposalSelector selector({25, 0, SurrogateModelType::quadraticPolynomial, 1}, bounds, feasibility);
  SearchProblem problem{bounds, {300, 1000000, 0.0}, sample, {}, evaluator, random};
  problem.feasibility = feasibility;
  if (usesSurrogate) problem.selector = &selector;
  const auto algorithm = makeSearch(name, problem);
  EXPECT_EQ(algorithm->initialise(), kSearchOk);
  while (!algorithm->isTerminated()) EXPECT_EQ(algorithm->advance(), kSearchOk);
  return algorithm->summary().best;
}

class SearchWithConstraint : public ::testing::TestWithParam<std::pair<const char*, bool>> {};
INSTANTIATE_TEST_SUITE_P(Searches, SearchWithConstraint,
                         ::testing::Values(std::pair{"SCE", false}, std::pair{"SCE", true}, std::pair{"PSE", false},
                                           std::pair{"PSE", true}, std::pair{"OPSE", false}, std::pair{"DDS", false}),
                         [](const auto& instance) {
                           return std::string(instance.param.first) + (instance.param.second ? "Surrogate" : "");
                         });

TEST_P(SearchWithConstraint, FindsTheOptimumOnItAndEvaluatesNothingBeyond) {
  const auto [name, usesSurrogate] = GetParam();
  // The constraint cuts the optimum off: the best set that can be run is (5.5, 3.5), whose value is 0.5.
  for (int generation = 0; generation <= 3; ++generation) {
    std::vector<ParameterSet> evaluated;
    const ParameterSet best = search(name, usesSurrogate, sumBelow(9), kBounds,
                                     {generation == 0, SampleGeneration{generation}, ""}, evaluated);
    const auto unrunnable = std::ranges::count_if(evaluated, [](const auto& x) { return !sumBelow(9).holds(x); });
    EXPECT_EQ(unrunnable, 0) << generation;
    // DDS, which changes single parameters in the end, creeps along a constraint on the sum of two.
    EXPECT_LT(bowl(best), 0.5 + (std::string(name) == "DDS" ? 1.0 : 1e-3)) << generation;
  }
}

TEST_P(SearchWithConstraint, ThatIsNeverViolatedIsTheSearchWithoutOne) {
  const auto [name, usesSurrogate] = GetParam();
  std::vector<ParameterSet> without;
  std::vector<ParameterSet> with;
  search(name, usesSurrogate, {}, kBounds, {}, without);
  search(name, usesSurrogate, sumBelow(30), kBounds, {}, with);
  EXPECT_EQ(with, without);
}

TEST_P(SearchWithConstraint, EvaluatesTheInitialSetThatViolatesItAndNoOther) {
  const auto [name, usesSurrogate] = GetParam();
  SearchBounds bounds = kBounds;
  bounds.initial = {9, 9};
  std::vector<ParameterSet> evaluated;
  const ParameterSet best = search(name, usesSurrogate, sumBelow(9), bounds, {}, evaluated);
  EXPECT_EQ(evaluated.front(), bounds.initial);
  EXPECT_EQ(std::ranges::count_if(evaluated, [](const auto& x) { return !sumBelow(9).holds(x); }), 1);
  EXPECT_TRUE(sumBelow(9).holds(best));
  std::vector<ParameterSet> none;
  EXPECT_THAT(refusalOf([&] { search(name, usesSurrogate, sumBelow(-1), bounds, {}, none); }),
              StartsWith("Error: No parameter set found that satisfies the constraints\n"));
  EXPECT_THAT(none, IsEmpty());
}

}  // namespace
}  // namespace mirevo

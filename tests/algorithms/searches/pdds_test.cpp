#include "algorithms/searches/pdds.h"

#include <algorithm>
#include <deque>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/test_functions.h"

namespace mirevo {
namespace {

/// Notes when sets are submitted and taken: "+3" and "-1" by their numbers.
class WindowEvaluator final : public Evaluator {
 public:
  using Function = std::function<double(const ParameterSet&)>;
  explicit WindowEvaluator(Function function) : function_(std::move(function)) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> batch, DispatchMode) override {
    std::vector<EvaluationResult> results;
    for (const ParameterSet& set : batch) results.push_back(evaluate(set));
    return results;
  }
  void submit(std::span<const ParameterSet> batch) override {
    for (const ParameterSet& set : batch) {
      open_.push_back(evaluate(set));
      events += fmt::format("+{} ", open_.back().number);
    }
  }
  EvaluationResult awaitFirst() override {
    EvaluationResult first = std::move(open_.front());
    open_.pop_front();
    events += fmt::format("-{} ", first.number);
    return first;
  }

  std::vector<ParameterSet> sets;  ///< in the order of their numbers
  std::string events;

 private:
  EvaluationResult evaluate(const ParameterSet& set) {
    sets.push_back(set);
    EvaluationResult result = resultOf(function_(set));
    result.number = static_cast<int>(sets.size());
    return result;
  }

  Function function_;
  std::deque<EvaluationResult> open_;
};

SearchBounds boxFrom(std::size_t n, double lower, double upper, double initial) {
  return {std::vector<double>(n, lower), std::vector<double>(n, upper), std::vector<double>(n, initial)};
}

void runToEnd(Dds& dds) {
  ASSERT_EQ(dds.initialise(), kSearchOk);
  for (int guard = 0; !dds.isTerminated() && guard < 100000; ++guard) ASSERT_EQ(dds.advance(), kSearchOk);
}

TEST(Pdds, KeepsAsManyCandidatesUnderWayAsTheSetupSaysAndTakesThemInTheirOrder) {
  const std::tuple<int, bool, int, const char*> cases[] = {
      {1, false, 4, "+2 -2 +3 -3 +4 -4 "},
      {3, false, 6, "+2 +3 +4 -2 +5 -3 +6 -4 -5 -6 "},
      {3, true, 6, "+2 +3 +4 -2 -3 -4 +5 +6 -5 -6 "},
      {9, true, 3, "+2 +3 -2 -3 "},
  };
  for (const auto& [candidates, waitsForAll, budget, events] : cases) {
    WindowEvaluator evaluator([](const ParameterSet& x) { return x[0] * x[0]; });
    UniformGenerator random(1);
    Dds dds({.candidates = candidates, .waitsForAll = waitsForAll}, budget, true, boxFrom(2, -1.0, 1.0, 0.5), evaluator,
            random);
    runToEnd(dds);
    EXPECT_EQ(evaluator.events, events);
    EXPECT_EQ(dds.summary().evaluationCount, budget);
  }
}

TEST(Pdds, OneCandidateAtATimeIsTheSerialSearch) {
  const auto function = testing::testFunction("Rastrigin 10-D");
  std::vector<std::vector<ParameterSet>> searches;
  for (const bool waitsForAll : {true, false}) {
    WindowEvaluator evaluator(function.value);
    UniformGenerator random(5);
    Dds dds({.waitsForAll = waitsForAll}, 200, false, testing::boundsOf(function), evaluator, random);
    runToEnd(dds);
    searches.push_back(evaluator.sets);
  }
  EXPECT_EQ(searches[0], searches[1]);
}

/// The value is the number of parameters that have not been changed, so that every first change is an improvement.
TEST(Pdds, UnitesImprovementsOfTheSameSet) {
  const auto unchanged = [](const ParameterSet& x) { return static_cast<double>(std::ranges::count(x, 0.5)); };
  WindowEvaluator evaluator(unchanged);
  UniformGenerator random(1);
  constexpr int kParameters = 50;
  // The inclusion probability of the second to fourth of five evaluations is 0.57, 0.32 and 0.14.
  Dds dds({.perturbation = 0.01, .candidates = 3}, 5, true, boxFrom(kParameters, 0.0, 1.0, 0.5), evaluator, random);
  runToEnd(dds);
  ASSERT_EQ(evaluator.sets.size(), 5U);
  const ParameterSet& best =
      *std::min_element(evaluator.sets.begin() + 1, evaluator.sets.begin() + 4,
                        [&](const auto& a, const auto& b) { return unchanged(a) < unchanged(b); });
  ParameterSet united = best;
  for (std::size_t number = 2; number <= 4; ++number) {
    const ParameterSet& other = evaluator.sets[number - 1];
    for (std::size_t j = 0; j < united.size(); ++j) {
      if (united[j] == 0.5) united[j] = other[j];
    }
  }
  EXPECT_LT(unchanged(united), unchanged(best));
  EXPECT_EQ(evaluator.sets[4], united);
  EXPECT_EQ(dds.summary().bestResult.number, 5);
}

TEST(Pdds, UnitesNothingThatCannotBeRun) {
  WindowEvaluator evaluator([](const ParameterSet& x) { return static_cast<double>(std::ranges::count(x, 0.5)); });
  UniformGenerator random(1);
  const auto fewChanges = [](const auto& x) { return std::ranges::count(x, 0.5) >= 40; };
  Dds dds({.perturbation = 0.01, .candidates = 8, .waitsForAll = false}, 200, true, boxFrom(50, 0.0, 1.0, 0.5),
          evaluator, random, feasibleWhere(fewChanges, "too many"));
  runToEnd(dds);
  EXPECT_GT(dds.summary().replacedCount, 0);
  for (const ParameterSet& set : evaluator.sets) EXPECT_TRUE(fewChanges(set));
}

TEST(Pdds, AFailedCandidateIsRejectedAndCounts) {
  int calls = 0;
  FunctionEvaluator evaluator(
      [&](const ParameterSet& x) { return ++calls % 3 == 0 ? failedResult() : resultOf(x[0]); });
  UniformGenerator random(2);
  Dds dds({.candidates = 4, .waitsForAll = false}, 61, true, boxFrom(3, 0.0, 1.0, 0.9), evaluator, random);
  runToEnd(dds);
  EXPECT_EQ(dds.summary().evaluationCount, 61);
  EXPECT_LT(dds.summary().bestResult.aggregate, 0.1);
}

/// With a raised budget a new search starts from the best set of what was evaluated without a gap.
TEST(Pdds, ARaisedBudgetKeepsWhatWasEvaluatedAndCountsOn) {
  PddsMethod method;
  method.settings.candidates = 4;
  const InitialSampleSettings sample{true, SampleGeneration::uniformRandom, ""};
  const RaisedBudget raised = method.raiseBudget({40, 22, {}}, {90, 5, 0.0}, sample);
  EXPECT_EQ(raised.earlier->lastEvaluation, 22);
  EXPECT_EQ(raised.keptEvaluations, 22) << "later ones were under way when it was interrupted";
  EXPECT_THAT(raised.note, ::testing::HasSubstr("Parallel Dynamically Dimensioned Search"));

  const auto square = [](const ParameterSet& x) { return x[0] * x[0] + x[1] * x[1]; };
  const auto sets = [&](int budget, const std::vector<EarlierSearch>& earlier) {
    WindowEvaluator evaluator(square);
    UniformGenerator random(3);
    SearchProblem problem{boxFrom(2, -1.0, 1.0, 0.7), {budget, 5, 0.0}, sample, {}, evaluator, random};
    problem.earlierSearches = earlier;
    const SearchSummary summary = method.run(std::move(problem), {});
    EXPECT_EQ(std::ssize(evaluator.sets), budget);
    return evaluator.sets;
  };
  std::vector<ParameterSet> first = sets(40, {});
  const std::vector<ParameterSet> both = sets(90, {*raised.earlier});
  first.resize(22);
  EXPECT_TRUE(std::equal(first.begin(), first.end(), both.begin())) << "none beyond the last one that is kept";
  EXPECT_EQ(both[22], *std::ranges::min_element(first, {}, square));
}

/// The serial search needs 8 times as long for the same number of evaluations.
TEST(Pdds, LosesLittleByItsEightCandidatesAtATime) {
  for (const char* name : {"Ackley 10-D", "Rastrigin 10-D"}) {
    std::vector<double> medians;
    for (const int candidates : {1, 8}) {
      std::vector<double> errors;
      for (std::int32_t seed = 1; seed <= 25; ++seed) {
        const auto function = testing::shifted(testing::testFunction(name), seed);
        FunctionEvaluator evaluator([&](const ParameterSet& x) { return resultOf(function.value(x)); });
        UniformGenerator random(seed);
        Dds dds({.candidates = candidates, .waitsForAll = false}, 1000, false, testing::boundsOf(function), evaluator,
                random);
        runToEnd(dds);
        errors.push_back(dds.summary().bestResult.aggregate - function.optimalValue);
      }
      std::ranges::sort(errors);
      medians.push_back(errors[12]);
    }
    EXPECT_LE(medians[1], 1.4 * medians[0]) << name;
  }
}

}  // namespace
}  // namespace mirevo

#include "algorithms/searches/opse.h"

#include <algorithm>
#include <deque>
#include <map>
#include <optional>
#include <random>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/test_functions.h"
#include "matchers.h"

namespace mirevo {
namespace {

constexpr StoppingCriteria budgetOf(int evaluations) {
  return {evaluations, 1000000, 0.0};
}

/// Model runs in several slots that end in a random order.
class SlotEvaluator final : public Evaluator {
 public:
  SlotEvaluator(FunctionEvaluator::Function function, std::size_t slots, unsigned seed)
      : function_(std::move(function)), slots_(slots), order_(seed) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode) override {
    EXPECT_TRUE(open_.empty()) << "a batch beside sets in flight";
    submit(sets);
    std::vector<EvaluationResult> results(sets.size());
    for (EvaluationResult& result : results) result = awaitFirst();
    takenAtSubmission.clear();
    mostInFlight = 0;
    return results;
  }
  void submit(std::span<const ParameterSet> sets) override {
    for (const ParameterSet& set : sets) {
      submitted.push_back(set);
      takenAtSubmission.push_back(taken_);
      open_.push_back(std::nullopt);
      mostInFlight = std::max(mostInFlight, open_.size());
    }
  }
  EvaluationResult awaitFirst() override {
    while (!open_.front()) endOne();
    EvaluationResult result = *std::move(open_.front());
    open_.pop_front();
    ++taken_;
    return result;
  }

  std::vector<ParameterSet> submitted;
  std::vector<std::size_t> takenAtSubmission;  ///< of each set after the sample: results taken before
  std::size_t mostInFlight = 0;
  std::vector<std::size_t> ended;  ///< indices in `submitted`, in the order of their ends
  bool isIdle() const { return open_.empty(); }

 private:
  /// Ends one of the model runs under way: those first in line, one a slot.
  void endOne() {
    std::vector<std::size_t> running;
    for (std::size_t i = 0; i < open_.size() && running.size() < slots_; ++i) {
      if (!open_[i]) running.push_back(i);
    }
    const std::size_t place = running[order_() % running.size()];
    open_[place] = function_(submitted[taken_ + place]);
    open_[place]->number = static_cast<int>(taken_ + place) + 1;
    ended.push_back(taken_ + place);
  }

  FunctionEvaluator::Function function_;
  std::size_t slots_;
  std::minstd_rand order_;
  std::deque<std::optional<EvaluationResult>> open_;  ///< those not taken; empty until the run has ended
  std::size_t taken_ = 0;
};

constexpr int kOpsePoints = 20;

SearchSummary search(SlotEvaluator& evaluator, int setsInFlight, StoppingCriteria stopping) {
  UniformGenerator random(7);
  const SearchBounds bounds{{-5, -2}, {5, 8}, {0, 0}};
  Opse opse({{kOpsePoints}, setsInFlight}, {3}, {bounds, stopping, {}, {}, evaluator, random});
  EXPECT_EQ(opse.initialise(), kSearchOk);
  while (!opse.isTerminated()) EXPECT_EQ(opse.advance(), kSearchOk);
  EXPECT_TRUE(std::ranges::is_sorted(opse.population(), {}, &Individual::value));
  return opse.summary();
}

EvaluationResult valley(const ParameterSet& x) {
  return resultOf(testing::rosenbrock(x));
}

/// The same sets and results, whichever runs end first, and every set from all results but those of the last ones.
TEST(Opse, DependsOnTheOrderOfSubmissionAlone) {
  for (const int setsInFlight : {1, 7, 10, 33}) {
    SlotEvaluator inOrder(valley, 1, 1);
    const SearchSummary expected = search(inOrder, setsInFlight, budgetOf(300));
    EXPECT_EQ(inOrder.submitted.size(), 300U);
    EXPECT_EQ(inOrder.mostInFlight, static_cast<std::size_t>(setsInFlight));
    for (std::size_t i = 0; i < inOrder.takenAtSubmission.size(); ++i) {
      const int before = kOpsePoints + static_cast<int>(i);
      ASSERT_EQ(inOrder.takenAtSubmission[i], std::max(kOpsePoints, before + 1 - setsInFlight)) << i;
    }
    for (const auto& [slots, seed] : {std::pair{3U, 1U}, {8U, 2U}, {8U, 3U}, {100U, 4U}}) {
      SlotEvaluator evaluator(valley, slots, seed);
      const SearchSummary summary = search(evaluator, setsInFlight, budgetOf(300));
      ASSERT_EQ(evaluator.submitted, inOrder.submitted) << setsInFlight << ", " << slots << " slots";
      EXPECT_EQ(std::ranges::is_sorted(evaluator.ended), false);
      EXPECT_EQ(summary.best, expected.best);
      EXPECT_EQ(summary.loopCount, expected.loopCount);
    }
  }
}

TEST(Opse, BeginsAsOneWithALargerBudget) {
  SlotEvaluator larger(valley, 4, 1);
  search(larger, 12, budgetOf(400));
  for (const int budget : {20, 21, 32, 33, 157}) {
    SlotEvaluator evaluator(valley, 4, 2);
    EXPECT_EQ(search(evaluator, 12, budgetOf(budget)).evaluationCount, budget);
    ASSERT_EQ(evaluator.submitted.size(), static_cast<std::size_t>(budget));
    EXPECT_TRUE(std::ranges::equal(evaluator.submitted, std::span(larger.submitted).first(evaluator.submitted.size())));
  }
}

TEST(Opse, TakesWhatIsInFlightWhenItHasConverged) {
  for (const int setsInFlight : {5, 30}) {
    SlotEvaluator evaluator(valley, 4, 1);
    const SearchSummary summary = search(evaluator, setsInFlight, {5000, 4, 0.05});
    EXPECT_EQ(summary.terminationMessage, "Optimisation terminated: Objective function convergence criterion met");
    EXPECT_TRUE(evaluator.isIdle());
    EXPECT_EQ(static_cast<std::size_t>(summary.evaluationCount), evaluator.submitted.size());
    EXPECT_EQ(summary.evaluationCount, kOpsePoints * (1 + summary.loopCount) + setsInFlight - 1);
    double best = valley(evaluator.submitted.front()).aggregate;
    for (const ParameterSet& set : evaluator.submitted) best = std::min(best, valley(set).aggregate);
    EXPECT_EQ(summary.bestResult.aggregate, best) << "one of those in flight may be the best";
  }
}

/// A problem whose sample is (5, 5), (6, 5), (5, 7); the worst of three points has two offspring in a row.
SearchProblem fromThreePoints(Evaluator& evaluator, UniformGenerator& random, int budget) {
  InitialSampleSettings fromFile;
  fromFile.includeInitialParameters = false;
  fromFile.generation = SampleGeneration::fromFile;
  return {{{0, 0}, {20, 20}, {0, 0}}, budgetOf(budget), fromFile, {{5, 5}, {6, 5}, {5, 7}}, evaluator, random};
}

/// With one set in flight the second offspring knows that the first has failed; with three it is made beside it.
TEST(Opse, AnOffspringIsMadeFromTheResultsTakenSoFar) {
  const ParameterSet reflected{5.5 + 1.1 * 0.5, 5 - 1.1 * 2};
  const ParameterSet contracted{5.5 - 0.4 * 0.5, 5 + 0.4 * 2};
  for (const auto& [setsInFlight, second] : {std::pair{1, contracted}, {3, reflected}}) {
    FunctionEvaluator worseAndWorse([&](const ParameterSet&) { return resultOf(worseAndWorse.evaluationCount + 1); });
    UniformGenerator random(1);
    Opse opse({{3, 1.0, 0.0}, setsInFlight}, {3}, fromThreePoints(worseAndWorse, random, 6));
    ASSERT_EQ(opse.initialise(), kSearchOk);
    ASSERT_EQ(opse.advance(), kSearchOk);
    ASSERT_EQ(worseAndWorse.batches.size(), 4U);
    EXPECT_THAT(worseAndWorse.batches[2][0], ::testing::Pointwise(DoubleEq(), reflected));
    EXPECT_THAT(worseAndWorse.batches[3][0], ::testing::Pointwise(DoubleEq(), second)) << setsInFlight;
  }
}

/// Both offspring of the worst point are the same reflection, which becomes the best point while the second is in
/// flight; that finds its parent replaced, at another place, and is no better.
TEST(Opse, AnOffspringIsComparedWithWhatHasReplacedItsParent) {
  FunctionEvaluator plane([](const ParameterSet& x) { return resultOf(x[0] + x[1]); });
  UniformGenerator random(1);
  Opse opse({{3, 1.0, 0.0}, 3}, {3}, fromThreePoints(plane, random, 6));
  ASSERT_EQ(opse.initialise(), kSearchOk);
  ASSERT_EQ(opse.advance(), kSearchOk);
  std::vector<double> values;
  for (const Individual& point : opse.population()) values.push_back(point.value());
  EXPECT_THAT(values, ElementsAre(DoubleEq(8.85), DoubleEq(10), DoubleEq(11)));
  EXPECT_EQ(opse.population().front().failedMoves, 0);
}

}  // namespace
}  // namespace mirevo

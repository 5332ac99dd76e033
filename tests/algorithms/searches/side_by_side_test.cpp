#include "algorithms/searches/side_by_side.h"

#include <deque>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "refusal.h"

namespace mirevo {
namespace {

struct Unwound {
  int& count;
  ~Unwound() { ++count; }
};

/// Notes the first value of each set when it is submitted and taken, "+3 -3"; can fail at a call of awaitFirst().
class NotingEvaluator final : public Evaluator {
 public:
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> /*sets*/, DispatchMode) override {
    ADD_FAILURE() << "a batch, beside which nothing is under way";
    return {};
  }
  void submit(std::span<const ParameterSet> sets) override {
    for (const ParameterSet& set : sets) {
      events += fmt::format("+{} ", set.front());
      open_.push_back(set.front());
    }
  }
  EvaluationResult awaitFirst() override {
    if (++taken == failsAt) throw RunCancelled();
    EvaluationResult result = resultOf(open_.front());
    result.number = taken;
    open_.pop_front();
    events += fmt::format("-{} ", result.aggregate);
    return result;
  }
  void settleAggregates(std::span<EvaluationResult> sample) override {
    events += fmt::format("settled {} ", sample.size());
    if (settlingFails) fatalError("no scale");
    for (EvaluationResult& result : sample) result.aggregate += 0.5;
  }

  std::string events;
  int taken = 0;
  int failsAt = 0;
  bool settlingFails = false;

 private:
  std::deque<double> open_;
};

/// A batch of `size` sets `rounds` times, numbered from 10 times `name` on.
SearchRun batchSearch(int name, int size, int rounds, int* unwound = nullptr) {
  return [=](Evaluator& evaluator, const PeriodicStep& step) {
    static int ignored = 0;
    const Unwound mark{unwound == nullptr ? ignored : *unwound};
    SearchSummary summary;
    double next = 10.0 * name;
    for (int round = 0; round < rounds; ++round) {
      std::vector<ParameterSet> sets;
      for (int i = 0; i < size; ++i) sets.push_back({next++});
      const auto results = evaluator.evaluateParameterSets(sets, DispatchMode::task);
      EXPECT_EQ(results.size(), sets.size());
      for (std::size_t i = 0; i < sets.size(); ++i) EXPECT_EQ(results[i].aggregate, sets[i].front());
      step(fmt::format("{}.{}", name, round));
    }
    summary.evaluationCount = size * rounds;
    return summary;
  };
}

TEST(SideBySide, EachGoesOnAsSoonAsItHasItsResultsWhichComeInTheOrderOfTheSets) {
  NotingEvaluator evaluator;
  // The third has two sets under way and takes them one by one.
  const SearchRun window = [](Evaluator& inner, const PeriodicStep&) {
    const ParameterSet sets[] = {{30.0}, {31.0}, {32.0}};
    inner.submit({sets, 2});
    EXPECT_EQ(inner.awaitFirst().aggregate, 30.0);
    inner.submit({sets + 2, 1});
    EXPECT_EQ(inner.awaitFirst().aggregate, 31.0);
    EXPECT_EQ(inner.awaitFirst().aggregate, 32.0);
    return SearchSummary{};
  };
  const SearchRun none = [](Evaluator& inner, const PeriodicStep&) {
    EXPECT_TRUE(inner.evaluateParameterSets({}, DispatchMode::task).empty());
    return SearchSummary{};
  };
  std::string lines;
  std::string ends;
  runSideBySide(
      evaluator, {batchSearch(1, 1, 3), batchSearch(2, 2, 2), window, none},
      [&](std::string_view line) { lines += fmt::format("{} ", line); },
      [&](std::size_t search, const SearchSummary& summary) {
        ends += fmt::format("{}:{} ", search, summary.evaluationCount);
      });
  EXPECT_EQ(evaluator.events, "+10 +20 +21 +30 +31 -10 +11 -20 -21 +22 +23 -30 +32 -31 -11 +12 -22 -23 -32 -12 ");
  EXPECT_EQ(lines, "1.0 2.0 1.1 2.1 1.2 ");
  EXPECT_EQ(ends, "3:0 1:4 2:0 0:3 ");
}

TEST(SideBySide, TheAggregatesOfASampleAreSettledByTheEvaluatorItself) {
  NotingEvaluator evaluator;
  const SearchRun search = [](Evaluator& inner, const PeriodicStep&) {
    const std::vector<ParameterSet> sets{{1.0}, {2.0}};
    auto results = inner.evaluateParameterSets(sets, DispatchMode::task);
    inner.settleAggregates(results);
    SearchSummary summary;
    summary.bestResult = results[1];
    return summary;
  };
  double found = 0.0;
  runSideBySide(evaluator, {search}, {}, [&](std::size_t, const SearchSummary& s) { found = s.bestResult.aggregate; });
  EXPECT_EQ(evaluator.events, "+1 +2 -1 -2 settled 2 ");
  EXPECT_EQ(found, 2.5);
}

TEST(SideBySide, WhateverEndsARunAllSearchesAreUnwound) {
  const PeriodicStep silent = [](std::string_view) {};
  const SearchEnd ignored = [](std::size_t, const SearchSummary&) {};
  for (int failsAt = 1; failsAt <= 12; ++failsAt) {  // the evaluator, at each of its results
    int unwound = 0;
    NotingEvaluator evaluator;
    evaluator.failsAt = failsAt;
    const std::vector<SearchRun> searches{batchSearch(1, 1, 4, &unwound), batchSearch(2, 2, 2, &unwound),
                                          batchSearch(3, 1, 4, &unwound)};
    EXPECT_THROW(runSideBySide(evaluator, searches, silent, ignored), RunCancelled);
    EXPECT_EQ(evaluator.taken, failsAt);
    EXPECT_EQ(unwound, 3) << failsAt;
  }
  int unwound = 0;
  const SearchRun settling = [&](Evaluator& inner, const PeriodicStep&) {
    const Unwound mark{unwound};
    const std::vector<ParameterSet> sets{{1.0}};
    auto results = inner.evaluateParameterSets(sets, DispatchMode::task);
    inner.settleAggregates(results);
    ADD_FAILURE() << "it went on";
    return SearchSummary{};
  };
  const SearchRun failing = [&](Evaluator& inner, const PeriodicStep&) -> SearchSummary {
    const Unwound mark{unwound};
    const std::vector<ParameterSet> sets{{1.0}};
    inner.evaluateParameterSets(sets, DispatchMode::task);
    fatalError("its own");
  };
  const SearchRun endless = batchSearch(5, 1, 1000000, &unwound);
  const PeriodicStep fullDisk = [](std::string_view) { fatalError("disk full"); };
  const SearchEnd failsAtEnd = [](std::size_t, const SearchSummary&) { fatalError("at the end"); };
  for (const auto& [searches, step, end, wanted] :
       {std::tuple(std::vector{settling, endless}, silent, ignored, "no scale"),
        std::tuple(std::vector{endless, failing}, silent, ignored, "its own"),
        std::tuple(std::vector{endless, endless}, fullDisk, ignored, "disk full"),
        std::tuple(std::vector{batchSearch(1, 1, 2, &unwound), endless}, silent, failsAtEnd, "at the end")}) {
    unwound = 0;
    NotingEvaluator evaluator;
    evaluator.settlingFails = true;
    EXPECT_EQ(refusalOf([&, &searches = searches, &step = step, &end = end] {
                runSideBySide(evaluator, searches, step, end);
              }),
              wanted);
    EXPECT_EQ(unwound, 2) << wanted;
  }
}

}  // namespace
}  // namespace mirevo

#include "algorithms/searches/optimisation_driver.h"

#include <algorithm>
#include <new>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "matchers.h"
#include "refusal.h"

namespace mirevo {
namespace {

/// Ends after some loops, or with a status, or out of memory.
class ScriptedSearch final : public SearchAlgorithm {
 public:
  ScriptedSearch(SearchStatus first, SearchStatus later, int loops) : first_(first), later_(later), loops_(loops) {}

  SearchStatus initialise() override {
    if (loops_ < 0) throw std::bad_alloc();
    return first_;
  }
  SearchStatus advance() override {
    ++summary_.loopCount;
    return later_;
  }
  bool isTerminated() const override { return summary_.loopCount >= loops_; }
  const SearchSummary& summary() const override { return summary_; }

 private:
  SearchStatus first_;
  SearchStatus later_;
  int loops_;
  SearchSummary summary_;
};

TEST(OptimisationDriver, ReportsEveryTenthLoopAndTheLast) {
  for (const auto& [loops, reports] : {std::pair{9, 1}, {10, 1}, {11, 2}, {35, 4}}) {
    ScriptedSearch search(0, 0, loops);
    std::vector<std::string> lines;
    runSearch(search, "SCE", [&](std::string_view line) { lines.emplace_back(line); });
    EXPECT_EQ(lines.size(), static_cast<std::size_t>(reports)) << loops;
    EXPECT_THAT(lines.back(), StartsWith("Loop " + std::to_string(loops) + ": 0 model evaluations"));
  }
}

TEST(OptimisationDriver, EndsTheRunForAStatusOtherThanZeroInEitherStep) {
  const auto messageOf = [](ScriptedSearch search, std::string_view name) {
    return refusalMessageOf([&] { runSearch(search, name, {}); });
  };
  EXPECT_EQ(messageOf({1, 0, 3}, "SCE"), "Error: Invalid operation in SCE algorithm");
  EXPECT_EQ(messageOf({0, -4, 3}, "PSE"), "Error: Invalid operation in PSE algorithm");
  EXPECT_EQ(messageOf({0, 0, -1}, "DDS"), "Error: Unable to allocate memory");
}

TEST(OptimisationDriver, WarnsOnceOfANegativeBestValueOfTheSample) {
  for (const auto& [shift, warnings] : {std::pair{0.0, 0}, {-2.0, 1}}) {
    FunctionEvaluator evaluator([offset = shift](const ParameterSet& x) { return resultOf(x[0] * x[0] + offset); });
    UniformGenerator random(1);
    std::vector<std::string> lines;
    SceMethod().run({{{-1}, {1}, {0.7}}, {400, 1000, 0.0}, {}, {}, evaluator, random},
                    [&](std::string_view line) { lines.emplace_back(line); });
    EXPECT_EQ(std::count_if(lines.begin(), lines.end(),
                            [](const std::string& line) {
                              return line.starts_with("Warning: The best objective value is negative.");
                            }),
              warnings);
  }
}

TEST(OptimisationDriver, SendsWhatTheSurrogateModelChoseInItsOwnMode) {
  FunctionEvaluator evaluator([](const ParameterSet& x) { return resultOf(x[0] * x[0]); });
  UniformGenerator random(1);
  PseMethod method;
  method.settings.populationSize = 8;
  const SearchBounds bounds{{-1}, {1}, {0.7}};
  ProposalSelector selector({.initialGenerations = 1}, bounds);
  const SearchSummary summary = method.run({bounds, {24, 1000, 0.0}, {}, {}, evaluator, random, &selector}, {});
  EXPECT_EQ(summary.evaluationCount, 24);
  using enum DispatchMode;
  EXPECT_THAT(evaluator.modes, ElementsAre(task, task, surrogateSelected));
}

}  // namespace
}  // namespace mirevo

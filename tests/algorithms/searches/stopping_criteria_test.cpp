#include "algorithms/searches/stopping_criteria.h"

#include <cmath>
#include <string>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

constexpr std::string_view kBudget = "Optimisation terminated: Maximum number of model evaluations reached";
constexpr std::string_view kObjective = "Optimisation terminated: Objective function convergence criterion met";
constexpr std::string_view kPopulation = "Optimisation terminated: Population converged";

struct Loop {
  double best;
  int evaluations;
  double range;
  std::string_view message;
};

TEST(StoppingTests, StopWithTheMessageOfTheLastTestThatHolds) {
  const std::vector<std::tuple<std::string, StoppingCriteria, std::vector<Loop>>> cases{
      {"budget reached exactly", {100, 10, 0.001}, {{1, 99, 1, ""}, {1, 100, 1, kBudget}}},
      {"history not filled", {100, 3, 0.5}, {{1, 1, 1, ""}, {1, 2, 1, ""}, {1, 3, 1, kObjective}}},
      // 2·|3 − 1|/(3 + 1) = 1: strictly smaller than the smallest change only in the second case.
      {"change equal to the smallest", {100, 2, 1.0}, {{3, 1, 1, ""}, {1, 2, 1, ""}}},
      {"change below the smallest", {100, 2, 1.0 + 1e-12}, {{3, 1, 1, ""}, {1, 2, 1, kObjective}}},
      {"negative values make the change negative", {100, 2, 0.0}, {{-1, 1, 1, ""}, {-3, 2, 1, kObjective}}},
      {"opposite signs, negative sum", {100, 2, 0.0}, {{1, 1, 1, ""}, {-3, 2, 1, kObjective}}},
      {"equal values with a smallest change of 0", {100, 2, 0.0}, {{2, 1, 1, ""}, {2, 2, 1, ""}}},
      {"two zeros have no relative change", {100, 2, 0.1}, {{0, 1, 1, ""}, {0, 2, 1, ""}}},
      {"not a number never converges", {100, 2, 0.1}, {{NAN, 1, 1, ""}, {NAN, 2, 1, ""}}},
      {"range at the threshold", {100, 10, 0.0}, {{1, 1, 1.0e-5, ""}, {1, 2, 0.99e-5, kPopulation}}},
      {"budget and population", {100, 10, 0.0}, {{1, 100, 0.0, kPopulation}}},
      {"budget and objective", {3, 3, 0.5}, {{1, 1, 1, ""}, {1, 2, 1, ""}, {1, 3, 1, kObjective}}},
      {"the oldest entry is dropped", {100, 2, 0.5}, {{9, 1, 1, ""}, {1, 2, 1, ""}, {0.9, 3, 1, kObjective}}},
      {"a history of one compares a value with itself", {100, 1, 0.001}, {{5, 1, 1, kObjective}}},
  };
  for (const auto& [name, criteria, loops] : cases) {
    StoppingTests tests(criteria);
    EXPECT_EQ(tests.relativeChange(), 2.0 * criteria.minChange) << name;
    for (const Loop& loop : loops) {
      tests.update(loop.best, loop.evaluations, loop.range);
      EXPECT_EQ(tests.message(), loop.message) << name << ", evaluation " << loop.evaluations;
    }
  }
}

}  // namespace
}  // namespace mirevo

#include "algorithms/searches/stopping_criteria.h"

#include <cmath>
#include <string>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace mirevo {
namespace {

constexpr std::string_view kBudget = "Optimisation terminated: Maximum number of model evaluations reached";
constexpr std::string_view kObjective = "Optimisation terminated: Objective function convergence criterion met";
constexpr std::string_view kPopulation = "Optimisation terminated: Population converged";

/// The best value, the evaluations so far, the population's range and the message.
using Loop = std::tuple<double, int, double, std::string_view>;

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
      {"range at a threshold of its own", {100, 10, 0.0, 1.0e-3}, {{1, 1, 1.0e-3, ""}, {1, 2, 0.99e-3, kPopulation}}},
      {"no range without a threshold", {100, 10, 0.0, 0.0}, {{1, 1, 0.0, ""}, {1, 100, 0.0, kBudget}}},
      {"budget and population", {100, 10, 0.0}, {{1, 100, 0.0, kPopulation}}},
      {"budget and objective", {3, 3, 0.5}, {{1, 1, 1, ""}, {1, 2, 1, ""}, {1, 3, 1, kObjective}}},
      {"the oldest entry is dropped", {100, 2, 0.5}, {{9, 1, 1, ""}, {1, 2, 1, ""}, {0.9, 3, 1, kObjective}}},
      {"a history of one compares a value with itself", {100, 1, 0.001}, {{5, 1, 1, kObjective}}},
  };
  for (const auto& [name, criteria, loops] : cases) {
    StoppingTests tests(criteria);
    EXPECT_EQ(tests.relativeChange(), 2.0 * criteria.minChange) << name;
    for (const auto& [best, evaluations, range, message] : loops) {
      tests.update(best, evaluations, range);
      EXPECT_EQ(tests.message(), message) << name << ", evaluation " << evaluations;
    }
  }
}

TEST(StoppingTests, SayWhichLimitIsMet) {
  StoppingTests tests({100, 2, 0.25, 1.0e-3});
  tests.update(3.0, 1, 0.5);
  EXPECT_THAT(tests.reasons(), ::testing::IsEmpty());
  tests.update(2.5, 2, 2.5e-4);  // 2·0.5/5.5
  EXPECT_THAT(tests.reasons(),
              ::testing::ElementsAre(
                  ::testing::MatchesRegex("Relative change of the best objective value over 2 loops: 0\\.1818.*, "
                                          "less than Min_Change = 0\\.25"),
                  "Range of the population, of the bounds: 0.00025, less than Min_Population_Range = 0.001"));
}

}  // namespace
}  // namespace mirevo

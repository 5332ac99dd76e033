#include "algorithms/searches/repetitions.h"

#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/uniform_generator.h"
#include "matchers.h"

namespace mirevo {
namespace {

constexpr std::int32_t kLargestSeed = std::numeric_limits<std::int32_t>::max();

TEST(Repetitions, TheirSeedsFollowThatOfTheRunAndHaveStreamsOfTheirOwn) {
  for (const auto& [seed, index, expected] :
       {std::tuple(7, 0, 7), std::tuple(7, 2, 9), std::tuple(0, 1, 1), std::tuple(-1, 1, -2), std::tuple(-7, 3, -10),
        std::tuple(kLargestSeed, 0, kLargestSeed), std::tuple(kLargestSeed, 1, kLargestSeed - 259199),
        std::tuple(-kLargestSeed - 1, 0, -kLargestSeed - 1)}) {
    EXPECT_EQ(repetitionSeed(seed, index), expected) << seed;
  }
  EXPECT_EQ(seedsText(-3, 4), "seeds -3 to -6");
  for (const std::int32_t seed : {-3, 0, kLargestSeed - 5, -kLargestSeed - 1}) {
    std::set<double> firstNumbers;
    for (std::int32_t i = 0; i < 40; ++i) {
      UniformGenerator random(repetitionSeed(seed, i));
      firstNumbers.insert(random.next());
    }
    EXPECT_EQ(firstNumbers.size(), 40U) << seed;
  }
}

SearchSpace repeatedSpace() {
  SearchSpace space;
  space.names = {"a", "k"};
  space.lower = {0.0, -2.0};  // k from 0.135 to 7.39, on a logarithmic scale
  space.upper = {10.0, 2.0};
  space.transformation = {TransformationType::none, TransformationType::logarithmic};
  return space;
}

/// With evaluations 10, 20, ... as the best ones.
std::vector<Repetition> repetitionsOf(const std::vector<std::pair<double, ParameterSet>>& best) {
  std::vector<Repetition> all;
  for (const auto& [aggregate, set] : best) {
    const auto number = static_cast<int>(all.size()) + 1;
    all.push_back({number, 100, 10 * number, aggregate, set, 9, "Optimisation terminated: Population converged"});
  }
  return all;
}

std::string spreadText(const std::vector<Repetition>& all) {
  std::string text;
  for (const std::string& line : repetitionLines(all, repeatedSpace(), static_cast<std::int32_t>(all.size()))) {
    text += line + "\n";
  }
  return text;
}

TEST(Repetitions, TheirSpreadIsToldInWords) {
  // Three within 1 % of the least, over which a has a third of its range and k little of it; a fourth is far above.
  const std::string text =
      spreadText(repetitionsOf({{2.0, {1.0, 0.0}}, {2.02, {4.5, 0.1}}, {2.01, {2.0, 0.2}}, {3.0, {9.0, 1.0}}}));
  EXPECT_THAT(text, HasSubstr("The 4 repetitions of the search:\n"));
  EXPECT_THAT(text, ::testing::ContainsRegex("\n +2 +2 +100 +2.02 +20  Population converged\n"));
  EXPECT_THAT(text, HasSubstr("Best values: least 2, median 2.015, greatest 3; 3 of 4 repetitions ended within 1 %"));
  EXPECT_THAT(text, ::testing::ContainsRegex("\n   a +1 +3.25 +9 +80 +35\n"));
  EXPECT_THAT(text, ::testing::ContainsRegex("\n   k +1 +1.16[0-9]* +2.71828 +25 +5\n"));
  EXPECT_THAT(text, HasSubstr("not found the same minimum each time: 3 of 4 repetitions ended within 1 % of the least "
                              "value, and the worst 50 % above it. For a single search"));
  EXPECT_THAT(text, EndsWith("identifies them poorly: a (35 %)\n"));

  const std::string same = spreadText(repetitionsOf({{-2.0, {1.0, 0.0}}, {-1.99, {1.5, 0.1}}}));
  EXPECT_THAT(same, HasSubstr("2 of 2 repetitions ended within 1 %"));
  EXPECT_THAT(same, EndsWith("ended at nearly the same value, with every parameter within 10 % of its range\n"));
  EXPECT_THAT(same, Not(HasSubstr("same minimum each time")));

  const std::string apart = spreadText(repetitionsOf({{0.0, {1.0, 0.0}}, {0.1, {1.0, 0.1}}}));
  EXPECT_THAT(apart, HasSubstr("1 of 2 repetitions ended within 1 % of the least value. As no other came near it"));
  EXPECT_THAT(apart, Not(HasSubstr("poorly")));
}

TEST(Repetitions, OneThatHasNotEndedOrHasNoResultHasItsRowAndNoShareInTheSpread) {
  std::vector<Repetition> all = repetitionsOf({{2.0, {1.0, 0.0}}, {1.0, {9.0, 1.0}}, {2.0, {1.0, 0.0}}});
  all[1].termination.clear();
  all[1].loops = 0;
  all[2] = {3, 12, 0, std::numeric_limits<double>::quiet_NaN(), {}, 4, "Optimisation terminated: it failed"};
  const std::vector<std::string> lines = repetitionLines(all, repeatedSpace(), 5);
  ASSERT_EQ(lines.size(), 5U) << "one that has ended has no spread";
  EXPECT_EQ(lines[0], "The 3 of 5 repetitions of the search that had begun:");
  EXPECT_THAT(lines[3], EndsWith("  has not ended"));
  EXPECT_THAT(lines[4], ::testing::ContainsRegex("^ +3 +3 +12 +none +it failed$"));
  EXPECT_THAT(dataTableText(repetitionTable(all, repeatedSpace())),
              EndsWith("Repetition\tSeed\tEvaluations\tBest_Evaluation\tAggregate\tLoops\ta\tk\tTermination\n"
                       "1\t1\t100\t10\t2\t9\t1\t1\tOptimisation terminated: Population converged\n"
                       "2\t2\t100\t20\t1\t0\t9\t2.718281828459045\t\n"
                       "3\t3\t12\t0\tNaN\t4\tNaN\tNaN\tOptimisation terminated: it failed\n"));
}

}  // namespace
}  // namespace mirevo

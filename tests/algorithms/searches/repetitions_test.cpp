#include "algorithms/searches/repetitions.h"

#include <set>

#include <fmt/ranges.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/searches/repeated_fronts.h"
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

/// With evaluations 10, 20, ... as the best ones, which began with `start`.
std::vector<Repetition> repetitionsOf(const std::vector<std::pair<double, ParameterSet>>& best, double start = 5.0) {
  std::vector<Repetition> all;
  for (const auto& [aggregate, set] : best) {
    const auto number = static_cast<int>(all.size()) + 1;
    all.push_back({number,
                   100,
                   10 * number,
                   aggregate,
                   set,
                   9,
                   "Optimisation terminated: Population converged",
                   start,
                   {4.0, 1.5}});
  }
  return all;
}

std::string spreadText(const std::vector<Repetition>& all) {
  std::string text;
  const std::string objectives[] = {"low", "high"};
  for (const std::string& line :
       repetitionLines(all, repeatedSpace(), objectives, static_cast<std::int32_t>(all.size()))) {
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

  const std::string same = spreadText(repetitionsOf({{2.0, {1.0, 0.0}}, {2.01, {1.5, 0.1}}}));
  EXPECT_THAT(same, HasSubstr("2 of 2 repetitions ended within 1 %"));
  EXPECT_THAT(same, EndsWith("ended at nearly the same value, with every parameter within 10 % of its range\n"));
  EXPECT_THAT(same, Not(HasSubstr("same minimum each time")));

  const std::string apart = spreadText(repetitionsOf({{0.0, {1.0, 0.0}}, {0.1, {1.0, 0.1}}}));
  EXPECT_THAT(apart,
              HasSubstr("1 of 2 repetitions ended within 5e-07 of the least value, and the worst 0.1 above it. As "
                        "no other came near it"));
  EXPECT_THAT(apart, Not(HasSubstr("poorly")));
}

TEST(Repetitions, WhatCountsAsEqualToTheLeastValueHoldsNearZeroAndBelowIt) {
  const double none = std::numeric_limits<double>::quiet_NaN();
  const struct {
    double least;
    std::vector<double> starts;
    double tolerance;
    const char* text;
  } cases[] = {{2.0, {5.0, 9.0, 12.0}, 0.02, "1 % of the least"},
               {2.0, {none, none}, 0.02, "1 % of the least"},
               // A poor start makes neither 957 and 276 nor 0.27 and 1e-5 equal.
               {276.0, {9.0e5, 9.0e5}, 2.76, "1 % of the least"},
               {1.0e-5, {9.0e5 + 1.0e-5, 8.0e6, 1.0}, 0.09, "0.09 of the least"},
               {0.0, {4.0, 6.0}, 5.0e-7, "5e-07 of the least"},
               {0.0, {none}, 0.0, "0 of the least"},
               // -0.899 is as good as -0.9, wherever the search began.
               {-0.9, {0.1, 0.7}, 0.009, "0.009 of the least"},
               {-0.9, {9.0e3}, 0.009, "0.009 of the least"},
               {-0.9, {none}, 0.009, "0.009 of the least"},
               {-12000.0, {-8000.0, none}, 40.0, "40 of the least"},
               {-5.0e5, {9.0e5}, 5000.0, "5000 of the least"},
               {-3.0, {-3.0, -3.0}, 0.0, "0 of the least"}};
  for (const auto& one : cases) {
    const NearlyEqual nearly = nearlyEqual(one.least, one.starts);
    EXPECT_NEAR(nearly.tolerance, one.tolerance, 1e-12);
    EXPECT_EQ(nearly.text(), one.text);
  }
}

TEST(Repetitions, ThatTheyHaveTheirStartInCommonIsNoMinimumThatAllHaveFound) {
  std::vector<Repetition> all = repetitionsOf({{5.0, {4.0, 1.5}}, {5.0, {4.0, 1.5}}, {5.0, {3.0, 1.5}}});
  EXPECT_THAT(
      spreadText(all),
      AllOf(HasSubstr("greatest 5\nNone of the 3 repetitions found anything better than the set that all of them "
                      "began with, which says nothing of a minimum"),
            HasSubstr("Include_Initial_Parameters = 0"), Not(HasSubstr("Whatever the seed"))));
  all[1].start = {1.0, 1.0};
  EXPECT_THAT(spreadText(all), HasSubstr("better than the sets that they began with"));
  all[2].aggregate = 4.99;
  EXPECT_THAT(spreadText(all), HasSubstr("\n2 of 3 repetitions found nothing better than what they began with\n"));
}

/// Of a function whose least value is 0, from a start with the value 4.
TEST(Repetitions, ThatTheyHardlyGotAwayFromTheirStartsIsNoMinimumEither) {
  const auto textOf = [](std::vector<double> values, std::vector<double> starts) {
    std::vector<Repetition> all;
    for (const double value : values) all.push_back(repetitionsOf({{value, {4.0, 1.5}}}).front());
    for (std::size_t i = 0; i < all.size(); ++i) all[i].startAggregate = starts[i];
    return spreadText(all);
  };
  const double none = std::numeric_limits<double>::quiet_NaN();
  EXPECT_THAT(textOf({4.0, 3.97919, 4.0}, {4.0, 4.0, 4.0}),
              AllOf(HasSubstr("\n2 of 3 repetitions found nothing better than what they began with\n3 of 3 repetitions "
                              "began with a value within 1 % of the least already, so that best values near each other "
                              "say nothing of a minimum"),
                    HasSubstr("Include_Initial_Parameters = 0"), Not(HasSubstr("Whatever the seed"))));
  EXPECT_THAT(textOf({2.0, 2.01}, {2.011, 50.0}),
              AllOf(HasSubstr("\n1 of 2 repetitions began with a value within"), Not(HasSubstr("Whatever the seed"))));
  // Most came from elsewhere.
  for (const double other : {50.0, none}) {
    EXPECT_THAT(textOf({2.0, 2.01, 2.0}, {2.011, other, 50.0}),
                AllOf(Not(HasSubstr("began with a value")), HasSubstr("Whatever the seed")));
  }
}

TEST(Repetitions, ThoseThatStartedFromTheSameSetsCountOnce) {
  std::vector<Repetition> all = repetitionsOf({{2.0, {1.0, 0.0}},
                                               {3.0, {4.0, 0.1}},
                                               {2.0, {1.0, 0.0}},
                                               {2.0, {1.0, 0.0}},
                                               {3.0, {4.0, 0.1}},
                                               {2.5, {2.0, 0.1}}});
  const std::vector<ParameterSet> first{{1.5, 0.5}, {2.5, 0.5}};
  const std::vector<ParameterSet> second{{1.5, 0.5}};
  for (const std::size_t i : {0U, 2U, 3U}) all[i].starts = first;
  for (const std::size_t i : {1U, 4U}) all[i].starts = second;
  EXPECT_THAT(sameSearches(all), ElementsAre(0, 0, 1, 1, 2, 0)) << "one that tells no starts is no other's search";
  const std::string text = spreadText(all);
  EXPECT_THAT(text, HasSubstr("\nWarning: Repetitions 1, 3 and 4, and 2 and 5 started from the same sets and are the "
                              "same search, which counts once"));
  EXPECT_THAT(text, HasSubstr("least 2, median 2.5, greatest 3; 1 of 3 repetitions ended within 1 %"));
  const DataTable table = repetitionTable(all, repeatedSpace());
  EXPECT_EQ(table.columns[7], "Same_As");
  EXPECT_EQ(table.rows[4][7], DataTable::Cell(std::int64_t{2}));

  all.resize(1);
  all.push_back(all[0]);
  EXPECT_THAT(spreadText(all), AllOf(EndsWith("\nWith a single search there is nothing to compare\n"),
                                     Not(HasSubstr("Whatever the seed"))));
}

TEST(Repetitions, AParameterWithTheNameOfAColumnHasAHeadingOfItsOwn) {
  SearchSpace space = repeatedSpace();
  for (const auto& [names, headings] :
       {std::pair<std::vector<std::string>, std::vector<std::string>>({"Seed", "Termination"},
                                                                      {"Seed (2)", "Termination (2)"}),
        {{"Start_Aggregate", "Start_Aggregate (2)"}, {"Start_Aggregate (2)", "Start_Aggregate (2) (2)"}},
        {{" a\tb", "a b"}, {"a b", "a b (2)"}}}) {
    space.names = names;
    std::vector<std::string> columns = repetitionTable(repetitionsOf({{2.0, {1.0, 0.0}}}), space).columns;
    EXPECT_EQ(std::vector(columns.end() - 3, columns.end() - 1), headings);
    EXPECT_EQ(columns.back(), "Termination");
    EXPECT_EQ(std::set(columns.begin(), columns.end()).size(), columns.size());
  }
}

TEST(Repetitions, AnIntegerParameterTakesUpWhatItsRunsHad) {
  SearchSpace space = repeatedSpace();
  space.upper[0] = 5.0;  // whole numbers from 0 to 4
  space.transformation[0] = TransformationType::integer;
  const auto text = [&space](double a) {
    return fmt::format(
        "{}", fmt::join(repetitionLines(repetitionsOf({{2.0, {2.01, 0.0}}, {2.01, {a, 0.1}}}), space, {}, 2), "\n"));
  };
  EXPECT_THAT(text(2.99),
              AllOf(::testing::ContainsRegex("\n   a +2 +2 +2 +0\n"), HasSubstr("within 10 % of its range")));
  EXPECT_THAT(text(3.0), EndsWith("identifies them poorly: a (25 %)"));
}

/// Two repetitions with fronts of two objectives, worked out by hand: (0, 1) and (1, 0), and (0.5, 0.5) with a set
/// behind the first. The reference point is (1.1, 1.1) on the scale of all.
TEST(Repetitions, TheirFrontsAreComparedOnTheScaleOfThatOfAll) {
  RepeatedFronts fronts(3);
  ParetoArchive ofAll;
  const std::tuple<std::size_t, int, ParameterSet, std::vector<double>> sets[] = {{0, 1, {1.0, 0.0}, {0.0, 1.0}},
                                                                                  {1, 2, {5.0, 0.0}, {0.1, 1.1}},
                                                                                  {0, 3, {2.0, 0.0}, {1.0, 0.0}},
                                                                                  {1, 4, {6.0, 0.4}, {0.5, 0.5}},
                                                                                  {1, 5, {7.0, 0.4}, {0.5, 0.5}}};
  EvaluationResult result;
  for (const auto& [index, number, set, values] : sets) {
    result.number = number;
    result.objectiveValues = values;
    addToArchive(fronts.problem(index).archive, set, result);
    addToArchive(ofAll, set, result);
  }
  result.failure.emplace();
  addToArchive(fronts.problem(2).archive, {9.0, 0.0}, result);
  EXPECT_EQ(fronts.problem(2).archive.evaluationCount(), 1);
  EXPECT_EQ(ofAll.members().size(), 3U);

  std::vector<Repetition> all(3);
  for (std::size_t i = 0; i < 3; ++i) all[i] = {static_cast<std::int32_t>(i) + 1, 3, 0, 0.0, {}, 7, "it was enough"};
  const auto sum = [](std::span<const double> values) { return values[0] + 2.0 * values[1]; };
  fronts.describe(ofAll, {}, sum, all);
  constexpr double kBox = 1.21;
  EXPECT_NEAR(all[0].front->hypervolume, 0.21 / kBox, 1e-12);
  EXPECT_NEAR(all[1].front->hypervolume, (0.36 + 0.0) / kBox, 1e-12);
  EXPECT_NEAR(all[1].front->hypervolumeOfAll, 0.46 / kBox, 1e-12);
  EXPECT_EQ(all[1].front->size, 2U) << "with the set behind that of the other";
  EXPECT_EQ(all[1].front->sharedSize, 1U);
  EXPECT_EQ(all[0].bestEvaluation, 1) << "of equal distances the first";
  EXPECT_EQ(all[1].bestEvaluation, 4);
  EXPECT_EQ(all[1].aggregate, 1.5);
  EXPECT_EQ(all[2].bestEvaluation, 0);
  // A set of the other repetition with values that are on the front already.
  std::vector<Repetition> others = all;
  RepeatedFronts equal = fronts;
  result.failure.reset();
  result.number = 6;
  result.objectiveValues = {1.0, 0.0};
  addToArchive(equal.problem(1).archive, {2.0, 0.1}, result);
  addToArchive(ofAll, {2.0, 0.1}, result);
  equal.describe(ofAll, {}, sum, others);
  EXPECT_EQ(others[1].front->sharedSize, 2U) << "though the front of all has the first of them alone";

  const std::string text = spreadText(all);
  EXPECT_THAT(text, ::testing::ContainsRegex("\n +2 +2 +3 +2 +1 +0.297521 +No. 4  it was enough\n"));
  EXPECT_THAT(text, ::testing::ContainsRegex("\n +3 +3 +3 +0 +0 +none +it was enough\n"));
  EXPECT_THAT(text, HasSubstr("least 0.173554, median 0.235537, greatest 0.297521; of all 0.380165"));
  EXPECT_THAT(text, ::testing::ContainsRegex("\n   high +0 +0.25 +0.5\n"));
  EXPECT_THAT(text, ::testing::ContainsRegex("\n   high +0.5 +0.75 +1\n"));
  EXPECT_THAT(text, ::testing::ContainsRegex("\n   a +1 +3.5 +6 +50\n"));
  EXPECT_THAT(text,
              HasSubstr("0 of 2 repetitions come within 1 % of the hypervolume of all, and the least is 54.3 % "));
  EXPECT_THAT(dataTableText(repetitionTable(all, repeatedSpace())),
              HasSubstr("\tLoops\tStart_Aggregate\tHypervolume\ta\tk\tTermination\n1\t1\t3\t1\t2\t7\tNaN\t0.17355"));

  all[1].front->hypervolume = 0.0;
  EXPECT_THAT(spreadText(all), HasSubstr("of all, and one lies behind the reference point altogether. For a single"));
  fronts.describe(ofAll, std::vector<double>{2.0, 2.0}, sum, all);
  EXPECT_NEAR(all[0].front->hypervolume, 3.0 / 4.0, 1e-12) << "up to the point that is given";
  all[2].front.reset();
  all.resize(2);
  all[0].front->hypervolume = all[1].front->hypervolume = 0.9999 * all[0].front->hypervolumeOfAll;
  EXPECT_THAT(spreadText(all), EndsWith("nearly the same front: each hypervolume is within 1 % of that of all\n"));
}

/// Fronts of one set each, of which only the front of all says whether they are the same one.
TEST(Repetitions, ThatTheirFrontsAreSingleSetsDoesNotMakeThemTheSame) {
  using Verdict = FrontAgreement::Verdict;
  const struct {
    std::vector<double> hypervolumes;
    double ofAll;
    std::size_t sizeOfAll;
    Verdict verdict;
    const char* text;
    int loops = 9;
  } cases[] = {{{0.0, 0.091, 0.091}, 0.174, 2, Verdict::differ, "not found the same front each time: 0 of 3"},
               {{0.34, 0.94, 1.0}, 1.0, 1, Verdict::differ, "1 of 3 repetitions come within 1 % of the hypervolume"},
               {{0.995, 1.0}, 1.0, 1, Verdict::oneSet, "found nearly the same single set, within 1 %"},
               {{0.995, 1.0}, 1.0, 3, Verdict::agree, "Whatever the seed, the search found nearly the same front:"},
               {{1.0, 1.0}, 1.0, 0, Verdict::agree, "nearly the same front:"},
               {{0.0, 0.0}, 0.0, 1, Verdict::none, "of all 0\n"},
               {{1.0}, 1.0, 1, Verdict::none, "why it stopped"},
               {{1.0, 1.0}, 1.0, 3, Verdict::noSearch, "so that no search was made", 0}};
  for (const auto& one : cases) {
    EXPECT_EQ(frontAgreement(one.hypervolumes, one.ofAll, one.sizeOfAll, one.loops).verdict, one.verdict) << one.text;
    std::vector<std::pair<double, ParameterSet>> best(one.hypervolumes.size(), {1.0, {1.0, 0.0}});
    std::vector<Repetition> all = repetitionsOf(best);
    for (std::size_t i = 0; i < all.size(); ++i) {
      all[i].loops = one.loops;
      all[i].front = {one.hypervolumes[i], 1, 0, {0.0, 0.0}, {0.0, 0.0}, one.ofAll, one.sizeOfAll};
    }
    const std::string text = spreadText(all);
    EXPECT_THAT(text, HasSubstr(one.text));
    const bool isSame = one.verdict == Verdict::agree || one.verdict == Verdict::oneSet;
    EXPECT_EQ(text.find("Whatever the seed") != std::string::npos, isSame) << text;
    EXPECT_EQ(text.find("no trade-off") != std::string::npos, one.verdict == Verdict::oneSet) << text;
  }
}

/// Sets with smaller sums of squares than where they began, and greater aggregates.
TEST(Repetitions, ThatAreJudgedBySumsOfSquaresAreComparedByThem) {
  std::vector<Repetition> all = repetitionsOf({{0.4, {1.0, 0.0}}, {0.5, {1.0, 0.0}}, {0.2, {4.0, 0.0}}}, 0.3);
  for (std::size_t i = 0; i < all.size(); ++i) {
    all[i].sumOfSquares = i < 2 ? 0.0620 : 0.0701;
    all[i].startSum = i < 2 ? 0.09 : 0.0701;
  }
  const std::string text = spreadText(all);
  EXPECT_THAT(text, AllOf(HasSubstr("evaluations sum of squares      aggregate   found by No."),
                          HasSubstr("        100          0.062            0.4             10"),
                          HasSubstr("Sums of squares: least 0.062, median 0.062, greatest 0.0701; 2 of 3 repetitions"),
                          HasSubstr("1 of 3 repetitions found nothing better than what they began with"),
                          Not(HasSubstr("Best values"))));
  all.back().termination.clear();
  all.back().sumOfSquares = all.back().startSum = std::nan("");
  const std::string table = dataTableText(repetitionTable(all, repeatedSpace()));
  EXPECT_THAT(table, AllOf(HasSubstr("\tStart_Aggregate\tSum_of_Squares\tStart_Sum_of_Squares\ta\tk\t"),
                           HasSubstr("\t0.3\t0.062\t0.09\t1\t1\t"), HasSubstr("\t0.3\tNaN\tNaN\t4\t1\t\n")));
}

TEST(Repetitions, OneThatHasNotEndedOrHasNoResultHasItsRowAndNoShareInTheSpread) {
  std::vector<Repetition> all = repetitionsOf({{2.0, {1.0, 0.0}}, {1.0, {9.0, 1.0}}, {2.0, {1.0, 0.0}}});
  all[1].termination.clear();
  all[1].loops = 0;
  all[2] = {3, 12, 0, std::numeric_limits<double>::quiet_NaN(), {}, 4, "Optimisation terminated: it failed"};
  const std::vector<std::string> lines = repetitionLines(all, repeatedSpace(), {}, 5);
  ASSERT_EQ(lines.size(), 6U) << "one that has ended has no spread";
  EXPECT_EQ(lines[0], "The 3 of 5 repetitions of the search that had begun:");
  EXPECT_THAT(lines[3], EndsWith("  has not ended"));
  EXPECT_THAT(lines[4], ::testing::ContainsRegex("^ +3 +3 +12 +none +it failed$"));
  EXPECT_EQ(lines[5],
            "Warning: 1 of 3 repetitions ended without a successful run and is left out of what is said of all: No. 3");
  EXPECT_THAT(dataTableText(repetitionTable(all, repeatedSpace())),
              EndsWith("Repetition\tSeed\tEvaluations\tBest_Evaluation\tAggregate\tLoops\tStart_Aggregate\ta\tk\t"
                       "Termination\n"
                       "1\t1\t100\t10\t2\t9\t5\t1\t1\tOptimisation terminated: Population converged\n"
                       "2\t2\t100\t20\t1\t0\t5\t9\t2.718281828459045\t\n"
                       "3\t3\t12\t0\tNaN\t4\tNaN\tNaN\tNaN\tOptimisation terminated: it failed\n"));
}

}  // namespace
}  // namespace mirevo

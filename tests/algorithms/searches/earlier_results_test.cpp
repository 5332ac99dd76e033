#include "algorithms/searches/earlier_results.h"

#include <cmath>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/searches/dds.h"
#include "algorithms/searches/initial_sample.h"
#include "matchers.h"

namespace mirevo {
namespace {

SearchSpace namedSpace(std::vector<std::string> names) {
  SearchSpace space;
  for (std::string& name : names) {
    space.names.push_back(std::move(name));
    space.initial.push_back(1.0);
    space.lower.push_back(0.0);
    space.upper.push_back(10.0);
    space.transformation.push_back(TransformationType::none);
  }
  return space;
}

constexpr const char* kEarlierResults =
    "# A run\n"
    "Evaluation\tStatus\tb\ta\tflow\tbalance\tAggregate\n"
    "1\tOK\t1\t1\t9\t9\t9\n"
    "2\tFAILED\t2\t2\t1e+30\t1e+30\t1e+30\n"
    "4\tOK\t4\t3\t5\t5\t5\n"
    "3\tOK\t3\t3\t7\t7\t7\n"
    "5\tOK\t11\t3\t1\t1\t1\n"
    "6\tOK\t4\t3\t5\t5\t5\n"
    "7\tOK\t5\t4\t6\t6\tNaN\n"
    "# Ended\n"
    "8\tOK\t0.5\t0.";  // under way

EarlierSets earlierSetsOf(EarlierOrder order, std::size_t most, bool leavesOutInitial = true) {
  std::string reason;
  const SearchSpace space = namedSpace({"a", "b"});
  const auto sets = readEarlierSets("e.dat", kEarlierResults, "", order, most, space,
                                    leavesOutInitial ? std::optional(space.initial) : std::nullopt, reason);
  EXPECT_TRUE(sets) << reason;
  return sets.value_or(EarlierSets());
}

TEST(EarlierResults, GiveTheBestOrTheFirstSetsThatDifferAndLieWithinTheBounds) {
  const EarlierSets best = earlierSetsOf(EarlierOrder::best, 9);
  EXPECT_THAT(best.sets, ElementsAre(ParameterSet{3, 4}, ParameterSet{3, 3}));
  EXPECT_EQ(best.sets, best.modelScale);
  EXPECT_EQ(best.successCount, 6U);
  EXPECT_EQ(best.outsideCount, 1U);
  EXPECT_EQ(best.firstOutside, "e.dat:7: b = 11");
  EXPECT_THAT(earlierSetsOf(EarlierOrder::best, 1).sets, ElementsAre(ParameterSet{3, 4}));
  EXPECT_THAT(earlierSetsOf(EarlierOrder::best, 9, false).sets,
              ElementsAre(ParameterSet{3, 4}, ParameterSet{3, 3}, ParameterSet{1, 1}));
  EXPECT_THAT(earlierSetsOf(EarlierOrder::first, 2, false).sets, ElementsAre(ParameterSet{1, 1}, ParameterSet{3, 3}));
  EXPECT_THAT(earlierSetsOf(EarlierOrder::first, 9).sets,
              ElementsAre(ParameterSet{3, 3}, ParameterSet{3, 4}, ParameterSet{4, 5}));
}

TEST(EarlierResults, OtherParametersAndOtherFilesAreRefused) {
  const std::string head = "Evaluation\tStatus\ta\tb\tflow\tAggregate\n";
  const std::string row = "1\tOK\t1\t2\t3\t4\n";
  const auto setting = [](int number, const char* name, const char* type) {
    return fmt::format(
        "Setting\tMODEL_PARAMETERS/PARAMETER_{0}\tParameter_Type\t{2}\n"
        "Setting\tMODEL_PARAMETERS/PARAMETER_{0}\tParameter_Name\t'{1}'\n",
        number, name, type);
  };
  const std::string two = setting(1, "a", "0") + setting(2, "b", "0") + setting(3, "c", "1");
  using Names = std::vector<std::string>;
  // The parameters of this setup, the file, the settings of its run, and why it is refused.
  const std::tuple<Names, std::string, std::string, const char*> cases[] = {
      {{"b", "a"}, head + row, two, ""},
      {{"a", "b"}, head + row, "", ""},
      {{"a", "b"}, "\r\n" + head + "\r\n" + row, "# damaged\nSetting\tx\n", ""},
      {{"a"}, head + row, two, "e.dat:1: expected the variable parameters of this setup, found \"b\", too"},
      {{"a", "c"},
       head + row,
       two,
       "expected the variable parameters of this setup, found no \"c\" and in their place \"b\""},
      {{"a", "b", "c"}, head + row, two, "expected the variable parameters of this setup, found no \"c\""},
      {{"b"}, head + row, "", "found no \"b\" and in their place \"a\""},  // it is no measure
      {{"a", "b", "Status"}, "Evaluation\tStatus\ta\tb\tStatus (2)\tAggregate\n" + row, "", ""},
      {{"Status", "Status (2)"}, "Evaluation\tStatus\tStatus (2)\tStatus (2) (2)\tflow\tAggregate\n" + row, "", ""},
      {{"a", "b"}, "", "", "e.dat:1: expected a result file, with a header row that begins with Evaluation"},
      {{"a", "b"}, "a\tb\n1\t2\n", "", "e.dat:1: expected the header row of a result file"},
      {{"a", "b"}, "# x\nEvaluation\tStatus\ta\tb\n", "", "e.dat:2: expected the header row of a result file"},
      {{"a", "b"}, head, "", "e.dat: it has no successful evaluation"},
      {{"a", "b"}, head + "1\tFAILED\t1\t2\t3\t4\n", "", "e.dat: it has no successful evaluation"},
      {{"a", "b"}, head + "1\tOK\t1\t2\t3\tNaN\n", "", "none of its evaluations has an aggregate"},
      {{"a", "b"}, head + row + "2\tOK\t1\t2\t3\n", "", "e.dat:3: expected 6 cells as in the header row, found 5"},
      {{"a", "b"}, head + "1\tOK\t1\tx\t3\t4\n", "", "e.dat:2: expected a number, found \"x\""},
      {{"a", "b"}, head + "1\tO\t1\t2\t3\t4\n", "", "e.dat:2: expected a number and OK or FAILED"},
      {{"a", "b"},
       head + "1\tOK\t1\t-2\t3\t4\n1\tOK\t1\t12\t3\t4\n",
       "",
       "e.dat: no set lies within the bounds; the first: e.dat:2: b = -2"},
  };
  for (const auto& [names, text, settings, expected] : cases) {
    std::string reason;
    const auto sets = readEarlierSets("e.dat", text, settings, EarlierOrder::best, 9, namedSpace(names), {}, reason);
    EXPECT_EQ(sets.has_value(), *expected == 0) << text << reason;
    EXPECT_THAT(reason, HasSubstr(expected));
  }
}

TEST(EarlierResults, ComeBehindTheInitialSetAndBeforeThoseThatAreDrawn) {
  const SearchBounds bounds{{0, 0}, {10, 10}, {1, 1}};
  const std::vector<ParameterSet> earlier = earlierSetsOf(EarlierOrder::best, 9).sets;
  for (const bool includesInitial : {true, false}) {
    const InitialSampleSettings settings{includesInitial, SampleGeneration::latinHypercube, ""};
    UniformGenerator random(3);
    std::vector<ParameterSet> sample = drawInitialSample(settings, earlier, bounds, 6, random);
    const std::size_t given = givenSetCount(settings, earlier.size(), 6);
    ASSERT_EQ(given, includesInitial ? 3U : 2U);
    ASSERT_EQ(sample.size(), 6U);
    std::vector<ParameterSet> front(sample.begin(), sample.begin() + static_cast<std::ptrdiff_t>(given));
    if (includesInitial) {
      EXPECT_EQ(front.front(), bounds.initial);
      front.erase(front.begin());
    }
    EXPECT_EQ(front, earlier);
    UniformGenerator again(3);
    const UnitPoints drawn = latinHypercube(6 - given, 2, again);
    for (std::size_t i = 0; i < drawn.size(); ++i) EXPECT_EQ(sample[given + i][0], 10.0 * drawn[i][0]);
    EXPECT_EQ(drawInitialSample(settings, earlier, bounds, given, random).size(), given);
    EXPECT_EQ(givenSetCount(settings, earlier.size(), 1), 1U);
  }
}

/// Random start points take no part, and the number of start sets decides whether they give a scale.
TEST(EarlierResults, AreWhatDdsStartsFrom) {
  const auto firstBatch = [](bool includesInitial, std::size_t earlier, int budget) {
    const DdsMethod method;
    InitialSampleSettings sample{includesInitial, SampleGeneration::uniformRandom, ""};
    sample.earlierSetCount = earlier;
    return std::pair(method.sampleSize(sample, budget), method.evaluatesSample(sample));
  };
  EXPECT_EQ(firstBatch(true, 0, 40), std::pair(std::int64_t{1}, false));
  EXPECT_EQ(firstBatch(false, 0, 40), std::pair(std::int64_t{5}, true));
  EXPECT_EQ(firstBatch(false, 1, 40), std::pair(std::int64_t{1}, false));
  EXPECT_EQ(firstBatch(true, 1, 40), std::pair(std::int64_t{2}, true));
  EXPECT_EQ(firstBatch(true, 3, 2), std::pair(std::int64_t{2}, true));
}

}  // namespace
}  // namespace mirevo

#include "algorithms/searches/initial_sample.h"

#include <algorithm>
#include <cmath>
#include <set>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/numbers/sobol.h"
#include "matchers.h"
#include "refusal.h"

namespace mirevo {
namespace {

/// Whether each of the `count` strata of every coordinate holds one of the first `count` points.
void expectOnePointAStratum(const UnitPoints& points, std::size_t count) {
  for (std::size_t j = 0; j < points.front().size(); ++j) {
    std::set<int> strata;
    for (std::size_t i = 0; i < count; ++i) {
      ASSERT_GE(points[i][j], 0.0);
      ASSERT_LT(points[i][j], 1.0);
      strata.insert(static_cast<int>(points[i][j] * static_cast<double>(count)));
    }
    EXPECT_EQ(strata.size(), count) << "coordinate " << j;
  }
}

double nearestDistance(const UnitPoints& points) {
  double nearest = 1.0e9;
  for (std::size_t i = 0; i < points.size(); ++i) {
    for (std::size_t k = 0; k < i; ++k) {
      nearest = std::min(nearest, std::hypot(points[i][0] - points[k][0], points[i][1] - points[k][1]));
    }
  }
  return nearest;
}

TEST(InitialSample, StratifiedMethodsFillEveryStratum) {
  UniformGenerator random(3);
  expectOnePointAStratum(latinHypercube(17, 5, random), 17);
  expectOnePointAStratum(maximinLatinHypercube(17, 5, 50, random), 17);
  const UnitPoints sobol = scrambledSobol(64, 20, random);
  for (const std::size_t count : {2U, 16U, 64U}) expectOnePointAStratum(sobol, count);
}

TEST(InitialSample, MaximinTakesTheBestOfItsTries) {
  UniformGenerator random(5);
  double best = 0.0;
  for (int i = 0; i < 50; ++i) best = std::max(best, nearestDistance(latinHypercube(10, 2, random)));
  UniformGenerator again(5);
  EXPECT_EQ(nearestDistance(maximinLatinHypercube(10, 2, 50, again)), best);
}

TEST(InitialSample, DrawsWithinBoundsTheInitialSetFirst) {
  const SearchBounds bounds{{-1, 2, 5}, {1, 2, 9}, {0.25, 2, 8}};
  for (int generation = 0; generation <= 3; ++generation) {
    for (const bool isIncluded : {true, false}) {
      UniformGenerator random(7);
      const auto sample = drawInitialSample({isIncluded, SampleGeneration{generation}, ""}, {}, bounds, 9, random);
      ASSERT_EQ(sample.size(), 9U);
      EXPECT_EQ(sample.front() == bounds.initial, isIncluded) << generation;
      for (const ParameterSet& set : sample) {
        EXPECT_THAT(
            set, ElementsAre(AllOf(::testing::Ge(-1), ::testing::Le(1)), 2, AllOf(::testing::Ge(5), ::testing::Le(9))));
      }
      UniformGenerator again(-7);
      EXPECT_EQ(drawInitialSample({isIncluded, SampleGeneration{generation}, ""}, {}, bounds, 9, again), sample)
          << generation;
    }
  }
}

TEST(InitialSample, AnIntegerParameterNeverReachesTheIntegerBeyondItsBound) {
  const SearchSpace space{{"layers"}, {3}, {1}, {6}, {TransformationType::integer}};
  EXPECT_THAT(ToModelScale(space, searchBounds(space).upper), ElementsAre(5));
}

const SearchSpace kSpace{{"k", "layers", "n"},
                         {0, 2, 0.5},
                         {std::log(0.1), 1, 0},
                         {std::log(10.0), 5, 1},
                         {TransformationType::logarithmic, TransformationType::integer, TransformationType::none}};

TEST(InitialSample, ReadsASampleOnTheModelScaleWithColumnsInAnyOrder) {
  for (const std::string text :
       {"# made by hand\n\nn layers k\n0.5 4 1\n 1\t1  0.1 \n", "\xEF\xBB\xBFn,layers,k\r\n0.5,4,1\r\n1,1,0.1",
        "\"n\";layers; \"k\"\n0.5; 4; 1\n1;1;0.1\n", "n\tlayers\tk\n5D-1\t4\t1\n1\t1\t0.1\n"}) {
    const auto sample = readInitialSample("s.txt", text, kSpace);
    ASSERT_EQ(sample.sets.size(), 2U) << text;
    EXPECT_THAT(sample.sets[0], ElementsAre(DoubleEq(0.0), 4, 0.5)) << text;
    EXPECT_THAT(sample.sets[1], ElementsAre(std::log(0.1), 1, 1)) << text;
    EXPECT_THAT(sample.modelScale, ElementsAre(ParameterSet{1, 4, 0.5}, ParameterSet{0.1, 1, 1})) << text;
  }
}

TEST(InitialSample, NamesTheLineOfWhatIsWrongInAFile) {
  const std::vector<std::pair<std::string, std::string>> cases{
      {"", "s.txt: expected a header of parameter names and one set a row, found nothing"},
      {"\xFF\xFEk", "s.txt: the file is UTF-16 text; save it as UTF-8"},
      {"k layers n\n", "found a header alone"},
      {"1 2 3\n", "s.txt:1: \"1\" is not the name of a variable parameter; the names are expected in a row above"},
      {"k layer n\n", "s.txt:1: \"layer\" is not the name of a variable parameter; did you mean \"layers\"?"},
      {"#\nk layers\n1 1\n", "s.txt:2: no column for parameter \"n\""},
      {"k layers n k\n", "s.txt:1: parameter \"k\" has a second column"},
      {"k layers n\n1 1\n", "s.txt:2: found 2 values, expected 3, one for each name in the header"},
      {"k,layers,n\n1,,0\n", "s.txt:2: found \"\", expected a number for parameter \"layers\""},
      {"k layers n\n1 1 nan\n", "s.txt:2: found \"nan\", expected a number for parameter \"n\""},
      {"k layers n\n1 1 0\n0.09 1 0\n", "s.txt:3: value 0.09 of parameter \"k\" lies outside its bounds"},
      {"k layers n\n-1 1 0\n", "value -1 of parameter \"k\" lies outside its bounds"},
      {"k layers n\n1 5 0\n", "value 5 of parameter \"layers\" lies outside its bounds"},
      {"k layers n\n1 0.5 0\n", "value 0.5 of parameter \"layers\" lies outside its bounds"},
  };
  for (const auto& [text, detail] : cases) {
    EXPECT_THAT(refusalOf([&, &content = text] { readInitialSample("s.txt", content, kSpace); }),
                AllOf(StartsWith("Error: Initial sample file invalid\n"), HasSubstr(detail)))
        << text;
  }
}

TEST(InitialSample, TakesTheFirstSetsOfAFileAndRefusesOneThatHoldsTooFew) {
  const SearchBounds bounds{{0}, {1}, {0.5}};
  const std::vector<ParameterSet> given{{0.1}, {0.2}, {0.3}};
  UniformGenerator random(1);
  EXPECT_THAT(drawInitialSample({true, SampleGeneration::fromFile, "s.txt"}, given, bounds, 3, random),
              ElementsAre(ParameterSet{0.5}, ParameterSet{0.1}, ParameterSet{0.2}));
  EXPECT_THROW(drawInitialSample({false, SampleGeneration::fromFile, "s.txt"}, given, bounds, 4, random), FatalError);
}

}  // namespace
}  // namespace mirevo

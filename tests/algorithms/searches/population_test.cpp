#include "algorithms/searches/population.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"

namespace mirevo {
namespace {

Individual individual(ParameterSet set, double value = 0.0) {
  Individual result{std::move(set), {}};
  result.result.aggregate = value;
  return result;
}

TEST(Population, SortsBestFirstAndNotANumberLastKeepingTheOrderOfEquals) {
  Population population{individual({0}, NAN), individual({1}, 2), individual({2}, kFailedRunValue),
                        individual({3}, NAN), individual({4}, 2), individual({5}, -1)};
  sortBestFirst(population);
  std::vector<double> order;
  for (const Individual& member : population) order.push_back(member.set[0]);
  EXPECT_THAT(order, ElementsAre(5, 1, 4, 2, 0, 3));
}

TEST(Population, SpreadIsTheMeanStandardDeviationWithDivisorM) {
  const Population population{individual({1, 7}), individual({3, 7}), individual({5, 7}), individual({7, 7})};
  EXPECT_DOUBLE_EQ(populationSpread(population, 2), std::sqrt(5.0) / 2.0);
  EXPECT_TRUE(std::isnan(populationSpread(population, 0)));
  // Rounding must not turn a spread of nothing into the root of a negative number.
  EXPECT_EQ(populationSpread({individual({0.1}), individual({0.1}), individual({0.1})}, 1), 0.0);
}

TEST(Population, RangeIsRelativeToTheBoundsAndAFixedParameterCountsAsNothing) {
  const Population population{individual({1, 4, -2}), individual({2, 4, 0})};
  const SearchBounds bounds{{0, 4, -4}, {10, 4, 0}, {0, 4, 0}};
  EXPECT_DOUBLE_EQ(normalisedPopulationRange(population, bounds), (0.1 + 0.0 + 0.5) / 3.0);
}

TEST(Population, SimplexMoves) {
  const Population population{individual({0.1, 0}), individual({0.1, 1}), individual({0.1, 5})};
  const std::vector<std::size_t> places{0, 1, 2};
  const std::vector<double> g = centroid(population, places);
  EXPECT_THAT(g, ElementsAre(0.1, 2.0));  // exactly 0.1: a fixed parameter stays where it is
  EXPECT_THAT(pointOnRay(g, ParameterSet{0.1, 5}, -1.0), ElementsAre(0.1, -1.0));
  EXPECT_THAT(pointOnRay(g, ParameterSet{0.1, 5}, 0.5), ElementsAre(0.1, 3.5));
  const Box box = boundingBox(population, std::vector<std::size_t>{1, 2});
  EXPECT_THAT(box.lower, ElementsAre(0.1, 1));
  EXPECT_THAT(box.upper, ElementsAre(0.1, 5));
}

}  // namespace
}  // namespace mirevo

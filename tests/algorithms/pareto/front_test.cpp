#include <algorithm>
#include <cmath>
#include <limits>
#include <numbers>
#include <numeric>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/pareto/dominance.h"
#include "algorithms/pareto/front_scale.h"
#include "algorithms/pareto/hypervolume.h"
#include "algorithms/pareto/pareto_archive.h"

namespace mirevo {
namespace {

using ::testing::DoubleNear;
using ::testing::ElementsAre;
using Points = std::vector<std::vector<double>>;

constexpr double kInfinite = std::numeric_limits<double>::infinity();

/// Points on a grid of so many values, so that many are equal in some objectives or in all.
Points gridPoints(std::size_t count, std::size_t objectives, int values, int seed) {
  UniformGenerator random(seed);
  Points points(count, std::vector<double>(objectives));
  for (auto& point : points) {
    for (double& value : point) value = std::floor(random.next() * values) / values;
  }
  return points;
}

Points frontOf(const Points& points) {
  ParetoArchive archive;
  for (const auto& point : points) archive.add(0, {}, point);
  return archive.front();
}

/// By inclusion and exclusion of the boxes of all subsets.
double volumeByBoxes(const Points& points, const std::vector<double>& reference) {
  double sum = 0.0;
  for (unsigned subset = 1; subset < 1U << points.size(); ++subset) {
    std::vector<double> corner(reference.size(), -kInfinite);
    int members = 0;
    for (std::size_t i = 0; i < points.size(); ++i) {
      if ((subset >> i & 1U) == 0) continue;
      ++members;
      for (std::size_t j = 0; j < corner.size(); ++j) corner[j] = std::max(corner[j], points[i][j]);
    }
    double box = members % 2 == 1 ? 1.0 : -1.0;
    for (std::size_t j = 0; j < corner.size(); ++j) box *= std::max(0.0, reference[j] - corner[j]);
    sum += box;
  }
  return sum;
}

TEST(Dominance, RanksAreThoseOfRepeatedRemovalOfTheFront) {
  for (const std::size_t objectives : {2U, 3U, 4U}) {
    const Points values = gridPoints(60, objectives, 6, static_cast<int>(objectives));
    std::vector<ObjectivePoint> points;
    for (const auto& value : values) points.push_back({value, points.size() % 7 == 3 ? 0.5 : 0.0});
    points[5].violation = points[6].violation = kInfinite;
    std::vector<int> expected(points.size(), 0);
    for (int rank = 1; std::ranges::count(expected, 0) > 0; ++rank) {
      std::vector<std::size_t> front;
      for (std::size_t i = 0; i < points.size(); ++i) {
        bool isDominated = expected[i] != 0;
        for (std::size_t k = 0; k < points.size() && !isDominated; ++k) {
          isDominated = expected[k] == 0 && isConstraintDominated(points[i], points[k]);
        }
        if (!isDominated) front.push_back(i);
      }
      for (const std::size_t i : front) expected[i] = rank;
    }
    EXPECT_EQ(nondominationRanks(points), expected);
    EXPECT_EQ(std::ranges::max(expected), expected[5]) << "failed runs are the last";
    EXPECT_EQ(expected[5], expected[6]);
    EXPECT_LT(expected[3], expected[5]) << "behind those that violate constraints";
  }
}

TEST(Dominance, CrowdingIsTheSumOfTheScaledDistancesBetweenNeighbours) {
  const Points points{{0.0, 10.0}, {1.0, 6.0}, {4.0, 2.0}, {5.0, 0.0}};
  EXPECT_THAT(crowdingDistances(points), ElementsAre(kInfinite, DoubleNear(4.0 / 5.0 + 8.0 / 10.0, 1e-15),
                                                     DoubleNear(4.0 / 5.0 + 6.0 / 10.0, 1e-15), kInfinite));
  EXPECT_THAT(crowdingDistances(Points{{1.0, 2.0}}), ElementsAre(kInfinite));
  EXPECT_THAT(crowdingDistances(Points{{1.0, 2.0}, {1.0, 2.0}, {1.0, 2.0}}), ElementsAre(0.0, 0.0, 0.0));
  EXPECT_THAT(crowdingDistances(Points{{-1.5e308, 1.0}, {0.0, 1.0}, {1.5e308, 1.0}}),
              ElementsAre(kInfinite, 0.0, kInfinite))
      << "a range beyond all numbers";
  EXPECT_THAT(spreadOver(points, 3), ElementsAre(0, 1, 3));
}

// Sorted anew for each share that is left out, many points being equal in some objectives.
TEST(Dominance, WhatIsSpreadOverPointsIsLeftWhenTheMostCrowdedAreTakenAway) {
  for (const std::size_t objectives : {2U, 3U, 4U}) {
    const Points points = gridPoints(300, objectives, 40, 7);
    std::vector<std::size_t> expected(points.size());
    std::iota(expected.begin(), expected.end(), std::size_t{0});
    while (expected.size() > 25) {
      Points left;
      for (const std::size_t i : expected) left.push_back(points[i]);
      const std::vector<double> distances = crowdingDistances(left);
      for (std::size_t j = 0; j < objectives; ++j) {
        const auto least = std::ranges::min_element(left, {}, [j](const auto& point) { return point[j]; });
        EXPECT_EQ(distances[static_cast<std::size_t>(least - left.begin())], kInfinite) << "an end";
      }
      std::vector<std::size_t> places(left.size());
      std::iota(places.begin(), places.end(), std::size_t{0});
      std::ranges::stable_sort(places, std::ranges::greater{}, [&](std::size_t i) { return distances[i]; });
      places.resize(left.size() - std::max<std::size_t>(1, (left.size() - 25) / 8));
      std::ranges::sort(places);
      for (std::size_t& place : places) place = expected[place];
      expected = places;
    }
    EXPECT_EQ(spreadOver(points, 25), expected) << objectives << " objectives";
  }
}

TEST(Dominance, AWantedPointTakesThePlaceOfTheMostCrowdedOneAndOfNoEnd) {
  // In the order in which they were found: the ends are the first and the last.
  const Points points{{0.0, 10.0}, {1.0, 6.0}, {2.0, 5.0}, {3.0, 3.0}, {5.0, 0.0}};
  using Indices = std::vector<std::size_t>;
  const std::tuple<Indices, std::size_t, Indices> cases[] = {{{0, 1, 3, 4}, 2, {0, 2, 3, 4}},
                                                             {{0, 2, 4}, 3, {0, 3, 4}},
                                                             {{0, 2, 4}, 2, {0, 2, 4}},
                                                             {{0, 4}, 2, {0, 2}},
                                                             {{0}, 2, {2}},
                                                             {Indices{}, 2, Indices{}}};
  for (const auto& [given, wanted, expected] : cases) {
    Indices indices = given;
    includeInSpread(indices, wanted, points);
    EXPECT_EQ(indices, expected);
  }
}

TEST(Hypervolume, IsThatOfAllBoxesTogether) {
  for (const std::size_t objectives : {1U, 2U, 3U, 4U, 5U}) {
    for (int seed = 1; seed <= 12; ++seed) {
      const Points points = gridPoints(11, objectives, seed % 2 == 0 ? 4 : 1000, seed);
      const std::vector<double> reference(objectives, 0.8);  // some points are not below it
      EXPECT_NEAR(hypervolume(points, reference), volumeByBoxes(points, reference), 1e-12)
          << objectives << " objectives, seed " << seed;
      const Points front = frontOf(points);
      const std::vector<double> contributions = hypervolumeContributions(PointTable(front), reference);
      for (std::size_t i = 0; i < front.size(); ++i) {
        Points others = front;
        others.erase(others.begin() + static_cast<std::ptrdiff_t>(i));
        EXPECT_NEAR(contributions[i], volumeByBoxes(front, reference) - volumeByBoxes(others, reference), 1e-12);
      }
    }
  }
}

TEST(Hypervolume, OfManyPointsOfAKnownFrontIsNearlyThatOfTheFront) {
  Points line;
  for (int i = 0; i <= 1000; ++i) line.push_back({i / 1000.0, 1.0 - std::sqrt(i / 1000.0)});
  EXPECT_NEAR(hypervolume(line, std::vector{1.0, 1.0}), 2.0 / 3.0, 1e-3);
  Points sphere;
  for (int i = 0; i <= 60; ++i) {
    for (int k = 0; k <= 60; ++k) {
      const double a = 0.5 * std::numbers::pi * i / 60.0;
      const double b = 0.5 * std::numbers::pi * k / 60.0;
      sphere.push_back({std::cos(a) * std::cos(b), std::cos(a) * std::sin(b), std::sin(a)});
    }
  }
  EXPECT_NEAR(hypervolume(sphere, std::vector{1.0, 1.0, 1.0}), 1.0 - std::numbers::pi / 6.0, 0.03);
}

TEST(ParetoArchive, HoldsWhatNothingDominatesAndRemembersHowItCameAbout) {
  ParetoArchive archive;
  const Points points = gridPoints(200, 3, 8, 5);
  std::vector<Points> fronts;
  for (std::size_t i = 0; i < points.size(); ++i) {
    if (i == 20) archive.addFailed();
    archive.add(static_cast<int>(i), {static_cast<double>(i)}, points[i]);
    fronts.push_back(archive.front());
  }
  EXPECT_EQ(archive.evaluationCount(), 201);
  for (const FrontMember& member : archive.members()) {
    const auto isBehind = [&](const auto& other) { return dominates(other, member.values); };
    EXPECT_TRUE(std::ranges::none_of(points, isBehind));
    const auto first = std::ranges::find(points, member.values);
    EXPECT_EQ(member.number, first - points.begin()) << "of equal values the first";
  }
  for (const std::size_t i : {3U, 19U, 50U, 199U}) {
    const Points then = archive.frontAfter(static_cast<int>(i) + (i < 20 ? 1 : 2));
    EXPECT_THAT(then, ::testing::ElementsAreArray(fronts[i])) << i;
  }
}

/// Two evaluations, of which the second is on the front alone: what it added does not depend on the unit.
TEST(FrontScale, AFrontOfOneSetHasAScaleWhateverItsUnit) {
  for (const double unit : {1.0e-6, 1.0, 1.0e6}) {
    const std::vector<std::vector<double>> front{{2.0 * unit, -3.0 * unit}};
    const FrontScale scale(front);
    EXPECT_NEAR(scale.hypervolumeShare(front), 1.0, 1e-12);
    const std::vector<std::vector<double>> before{{2.1 * unit, -3.0 * unit}};
    EXPECT_NEAR(scale.hypervolumeShare(before), (1.1 - 0.05) / 1.1, 1e-9) << unit;
  }
}

TEST(FrontScale, OfAFrontOfOneSetNoCourseIsTold) {
  ParetoArchive archive;
  for (int i = 1; i <= 40; ++i) archive.add(i, {1.0}, {i < 30 ? 9.0 : 2.0, i < 30 ? 9.0 : 3.0});
  for (const bool isRepetition : {false, true}) {
    EXPECT_THAT(frontCourseLines(archive, {}, true, isRepetition),
                ::testing::ElementsAre(::testing::AllOf(
                    ::testing::HasSubstr("the front is a single set, "),
                    ::testing::HasSubstr("evaluation 30 of 40, so that the growth of its hypervolume says nothing"))));
    EXPECT_EQ(frontCourseLines(archive, {}, false, isRepetition).size(), 2U) << "that it ended by itself stays";
  }
  archive.add(41, {1.0}, {1.0, 4.0});
  EXPECT_THAT(frontCourseLines(archive, {}, true).front(), ::testing::HasSubstr("in the second half"));
}

TEST(FrontScale, SuggestsTheSetNearestToTheIdealPointAndMeasuresTheCourse) {
  ParetoArchive archive;
  archive.add(1, {1.0}, {100.0, 0.02});
  archive.add(2, {2.0}, {200.0, 0.0});
  archive.add(3, {3.0}, {0.0, 0.1});
  archive.addFailed();
  archive.add(5, {5.0}, {40.0, 0.03});
  EXPECT_EQ(archive.members()[*nearestToIdeal(archive.members())].number, 5);
  const FrontScale scale(archive.front());
  EXPECT_NEAR(scale.distance(std::vector{40.0, 0.03}), std::hypot(0.2, 0.3), 1e-15);
  const std::vector<FrontStage> course = frontCourse(archive, {}, 100);
  ASSERT_EQ(course.size(), 5U);
  EXPECT_EQ(course[4].frontSize, 4U);
  EXPECT_NEAR(course[0].hypervolume, 0.6 * 0.9 / 1.21, 1e-12);
  EXPECT_NEAR(course[1].hypervolume, (0.6 * 0.9 + 0.1 * 0.2) / 1.21, 1e-12);
  EXPECT_EQ(course[3].hypervolume, course[2].hypervolume);
  // The share of the box up to a reference point, beyond which sets do not count.
  const std::vector<double> reference{100.0, 0.1};
  EXPECT_NEAR(frontCourse(archive, reference, 1).front().hypervolume, 0.6 * 0.7, 1e-12);
  EXPECT_EQ(frontCourse(archive, std::vector{-1.0, 1.0}, 1).front().hypervolume, 0.0);
}

}  // namespace
}  // namespace mirevo

#include "algorithms/surrogate/surrogate_model.h"

#include <cmath>
#include <limits>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/surrogate/gaussian_process.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "algorithms/surrogate/quadratic_surrogate.h"
#include "algorithms/surrogate/quasi_newton.h"
#include "matchers.h"

namespace mirevo {
namespace {

using Surface = double (*)(const std::vector<double>&);

std::vector<double> valuesOf(const UnitPoints& points, Surface function) {
  std::vector<double> values;
  for (const auto& point : points) values.push_back(function(point));
  return values;
}

void expectPredictions(const SurrogateModel& model, Surface function, UniformGenerator& random, std::size_t size,
                       double tolerance) {
  for (const auto& point : latinHypercube(10, size, random))
    EXPECT_NEAR(model.predict(point), function(point), tolerance);
}

double quadratic(const std::vector<double>& x) {
  return 3.0 + x[0] - 2.0 * x[1] * x[2] + 5.0 * x[2] * x[2];
}
double wave(const std::vector<double>& x) {
  return std::sin(5.0 * x[0]) + 0.01 * x[1];
}

TEST(QuadraticSurrogate, ReproducesAQuadraticPolynomial) {
  UniformGenerator random(1);
  const UnitPoints points = latinHypercube(30, 3, random);
  QuadraticSurrogate model;
  ASSERT_TRUE(model.fit(points, valuesOf(points, quadratic)));
  expectPredictions(model, quadratic, random, 3, 1.0e-5);
}

TEST(QuadraticSurrogate, StaysFiniteWhereThePointsDoNotDetermineIt) {
  QuadraticSurrogate model;
  EXPECT_FALSE(model.fit({}, {}));
  const UnitPoints same(4, {0.5, 0.5});
  ASSERT_TRUE(model.fit(same, std::vector<double>{1, 1, 1, 1}));
  EXPECT_NEAR(model.predict(std::vector<double>{0.7, 0.2}), 1.0, 1.0e-6);
  const UnitPoints line{{0.0, 0.3}, {0.5, 0.3}, {1.0, 0.3}};
  ASSERT_TRUE(model.fit(line, std::vector<double>{0, 1, 2}));
  EXPECT_NEAR(model.predict(line[1]), 1.0, 1.0e-3);
}

TEST(GaussianProcess, TakesACoordinateThatDoesNotVaryAsOneThatDoesNotMatter) {
  GaussianProcess model;
  UnitPoints points;
  for (int i = 0; i < 12; ++i) points.push_back({0.5, i / 12.0});
  const auto exponential = [](const std::vector<double>& x) { return std::exp(3.0 * x[1]); };
  ASSERT_TRUE(model.fit(points, valuesOf(points, exponential)));
  EXPECT_NEAR(model.predict(std::vector<double>{0.7, 0.3}), exponential({0.5, 0.3}), 0.1);
}

TEST(GaussianProcess, LearnsAWaveAndThatACoordinateHardlyMattersWhereverAnEarlierFitHasEnded) {
  UniformGenerator random(4);
  const UnitPoints points = latinHypercube(40, 2, random);
  GaussianProcess model;
  UnitPoints narrow = points;
  for (auto& point : narrow) point = {0.5 + 1.0e-5 * point[0], 0.5 + 1.0e-5 * point[1]};
  std::vector<double> noise;
  for (std::size_t i = 0; i < narrow.size(); ++i) noise.push_back(random.next());
  ASSERT_TRUE(model.fit(narrow, noise));
  ASSERT_TRUE(model.fit(points, valuesOf(points, wave)));
  expectPredictions(model, wave, random, 2, 0.02);
  EXPECT_GT(model.lengths()[1], 3.0 * model.lengths()[0]);
}

TEST(GaussianProcess, KnowsTheSlopeOfItsDeviance) {
  UniformGenerator random(3);
  const UnitPoints points = latinHypercube(25, 3, random);
  GaussianProcess model;
  ASSERT_TRUE(model.fit(points, valuesOf(points, quadratic)));
  const std::vector<double> at{-1.0, 0.5, -0.3, -6.0};
  ASSERT_TRUE(std::isfinite(model.deviance(at)));
  const std::vector<double> slope = model.devianceSlope();
  for (std::size_t k = 0; k < at.size(); ++k) {
    std::vector<double> above = at;
    std::vector<double> below = at;
    above[k] += 1.0e-4;
    below[k] -= 1.0e-4;
    const double difference = (model.deviance(above) - model.deviance(below)) / 2.0e-4;
    EXPECT_NEAR(slope[k], difference, 1.0e-4 * (1.0 + std::abs(difference))) << k;
  }
}

TEST(QuasiNewtonSearch, GoesDownAValleyAndStopsAtABound) {
  std::vector<double> last;
  const SmoothFunction function{[&last](const std::vector<double>& x) {
                                  last = x;
                                  const double a = x[1] - x[0] * x[0];
                                  return 100.0 * a * a + (1.0 - x[0]) * (1.0 - x[0]);
                                },
                                [&last] {
                                  const double a = last[1] - last[0] * last[0];
                                  return std::vector<double>{-400.0 * a * last[0] - 2.0 * (1.0 - last[0]), 200.0 * a};
                                }};
  EXPECT_LT(quasiNewtonSearch(function, {-1.2, 1.0}, {{-5, -5}, {5, 5}}, {0.5, 1.0e-12, 100}).value, 1.0e-6);
  // Also from the bound itself, where each coordinate's slope depends on the other's value.
  for (const std::vector<double>& start : {std::vector{-1.2, 1.0}, {0.5, 4.0}}) {
    const LowPoint bounded = quasiNewtonSearch(function, start, {{-5, -5}, {0.5, 5}}, {0.5, 1.0e-12, 100});
    EXPECT_THAT(bounded.point, ElementsAre(0.5, DoubleNear(0.25, 1.0e-6)));
  }
}

TEST(QuasiNewtonSearch, ComesBackFromWhereItsLastMovesFailed) {
  std::vector<double> last;
  const SmoothFunction wall{[&last](const std::vector<double>& x) {
                              last = x;
                              return x[0] < 0.3 ? std::numeric_limits<double>::infinity() : x[0];
                            },
                            [] { return std::vector<double>{1.0}; }};
  const LowPoint found = quasiNewtonSearch(wall, {1.0}, {{-5}, {5}}, {0.5, 0.0, 100});
  EXPECT_NEAR(found.value, 0.3, 0.01);
  EXPECT_EQ(last, found.point);
}

TEST(GaussianProcess, RefusesOrSurvivesDegeneratePoints) {
  GaussianProcess model;
  EXPECT_FALSE(model.fit(UnitPoints(1, {0.5}), std::vector<double>{1}));
  EXPECT_FALSE(model.fit(UnitPoints{{0.1}, {0.9}}, std::vector<double>{1, 1}));  // constant: nothing to learn
  const UnitPoints twins{{0.1}, {0.1}, {0.9}, {0.5}};
  ASSERT_TRUE(model.fit(twins, std::vector<double>{1, 1.1, 3, 2}));
  EXPECT_TRUE(std::isfinite(model.predict(std::vector<double>{0.3})));
}

TEST(ProposalSelector, RanksByPredictionAndLeavesFailuresOut) {
  const SearchBounds bounds{{-10}, {10}, {0}};
  for (const int type : {0, 1}) {
    ProposalSelector selector({40, 100, SurrogateModelType{type}, 2}, bounds);
    EXPECT_EQ(selector.proposalsPerRun(), 3U);
    for (int i = -5; i <= 5; ++i) {
      selector.note({static_cast<double>(i)}, i == 2 ? failedResult() : resultOf((i - 2.0) * (i - 2.0)));
    }
    EXPECT_FALSE(selector.isActive(1));
    EXPECT_TRUE(selector.isActive(2));
    const std::vector<ParameterSet> proposals{{-4.5}, {2.6}, {0.5}, {3.5}, {7}};
    EXPECT_THAT(selector.select(proposals, 2), ElementsAre(1, 3)) << type;
    EXPECT_THAT(selector.select(proposals, 9), ElementsAre(0, 1, 2, 3, 4)) << type;
  }
}

TEST(ProposalSelector, LeavesEveryNthLoopAfterTheInitialOnesToTheModel) {
  for (const auto& [interval, expected] : {std::pair{0, "--SSSSSSS"}, {2, "--S-S-S-S"}, {3, "--SS-SS-S"}}) {
    const SurrogateSettings settings{
        .modelType = SurrogateModelType::quadraticPolynomial, .initialGenerations = 2, .checkInterval = interval};
    ProposalSelector selector(settings, {{0}, {1}, {0}});
    for (const double x : {0.0, 0.3, 0.9}) selector.note({x}, resultOf(x));
    std::string loops;
    for (int loop = 0; loop < 9; ++loop) loops += selector.isActive(loop) ? 'S' : '-';
    EXPECT_EQ(loops, expected);
  }
}

TEST(ProposalSelector, FindsTheModelsMinimumInItsNeighbourhoodOnce) {
  const SearchBounds bounds{{-10, 3, -10}, {10, 3, 10}, {0, 3, 0}};
  const auto at = [](double x, double y) {
    return resultOf((x - 2.0) * (x - 2.0) + (x - 2.0) * (y + 1.0) + 3.0 * (y + 1.0) * (y + 1.0));
  };
  for (const int type : {0, 1}) {
    ProposalSelector selector({50, 30, SurrogateModelType{type}, 1}, bounds);
    EXPECT_TRUE(selector.minima(std::vector<ParameterSet>{{0, 3, 0}}).empty());
    UniformGenerator random(5);
    for (const auto& point : latinHypercube(30, 2, random)) {
      const double x = 12.0 * point[0] - 6.0;
      const double y = 12.0 * point[1] - 6.0;
      selector.note({x, 3, y}, at(x, y));
    }
    for (int i = 0; i < 40; ++i) selector.note({1, 3, 1}, at(1, 1));  // must not crowd the others out
    const std::vector<ParameterSet> centres(3, {0, 3, 0});
    const std::vector<PredictedMinimum> minima = selector.minima(centres);
    ASSERT_FALSE(minima.empty());
    EXPECT_EQ(minima.size(), 1u) << "one place for all centres";
    EXPECT_EQ(minima.front().centre, 0u);
    const ParameterSet found = minima.front().set;
    EXPECT_THAT(found, ElementsAre(DoubleNear(2.0, 0.1), 3.0, DoubleNear(-1.0, 0.1)));
    selector.note(found, at(found[0], found[2]));
    // The polynomial is exact, so that its minimum stays there.
    if (type == 0) {
      EXPECT_TRUE(selector.minima(std::vector<ParameterSet>{found}).empty());
    }
  }
}

TEST(ProposalSelector, MovesAnIntegerParameterOfFewValuesEitherWay) {
  for (const auto& [type, values, wanted] :
       {std::tuple{0, 2, 0}, {0, 2, 1}, {0, 3, 0}, {0, 3, 2}, {1, 2, 0}, {1, 2, 1}, {1, 3, 0}, {1, 3, 2}}) {
    const SearchBounds bounds{{0, 0}, {static_cast<double>(values), 1}, {0, 0}, {true, false}};
    ProposalSelector selector({25, 18, SurrogateModelType{type}, 1}, bounds);
    UniformGenerator random(1);
    for (const auto& point : latinHypercube(18, 2, random)) {
      const ParameterSet set{values * point[0], point[1]};
      selector.note(set, resultOf(10.0 * std::abs(std::floor(set[0]) - wanted) + std::pow(set[1] - 0.3, 2)));
    }
    const auto minima = selector.minima(std::vector<ParameterSet>{{values - 1.0 - wanted + 0.2, 0.8}});
    ASSERT_EQ(minima.size(), 1u);
    EXPECT_EQ(std::floor(minima.front().set[0]), wanted) << "type " << type << ", " << values << " values";
  }
}

TEST(ProposalSelector, StaysAwayFromWhereARunFailed) {
  const SearchBounds bounds{{1, 1}, {13, 13}, {1, 1}, {true, false}};
  ProposalSelector selector({25, 0, SurrogateModelType::quadraticPolynomial, 1}, bounds);
  const auto note = [&selector](double x, double y) {
    const bool hasFailed = std::floor(x) == 7 && std::abs(y - 5) < 0.5;
    selector.note({x, y}, hasFailed ? failedResult() : resultOf(std::pow(std::floor(x) - 7, 2) + (y - 5) * (y - 5)));
  };
  for (double x = 2; x <= 12; x += 2) {
    for (double y = 2; y <= 12; y += 2) note(x, y);
  }
  const std::vector<ParameterSet> centre{{6, 6}};
  ASSERT_EQ(selector.minima(centre).size(), 1u);
  note(7.5, 5.0);
  for (const PredictedMinimum& minimum : selector.minima(centre)) {
    EXPECT_TRUE(std::floor(minimum.set[0]) != 7 || std::abs(minimum.set[1] - 5) > 0.99) << minimum.set[1];
  }
  // The failed one itself, one that is nearer to it than to any other, and one far away.
  const std::vector<ParameterSet> proposals{{7.1, 5.0}, {7.9, 5.4}, {11, 1}};
  EXPECT_THAT(selector.select(proposals, 1), ElementsAre(2));
  EXPECT_THAT(selector.select(std::span(proposals).first(2), 1), ElementsAre(1));
}

TEST(ProposalSelector, TakesIntegerParametersAsTheModelDoes) {
  const SearchBounds bounds{{1, 0}, {7, 1}, {1, 0}, {true, false}};
  for (const int type : {0, 1}) {
    ProposalSelector selector({25, 0, SurrogateModelType{type}, 1}, bounds);
    const auto note = [&](double x, double y) {
      selector.note({x, y}, resultOf(std::abs(std::floor(x) - 4.0) + y * y));
    };
    for (const double x : {1.2, 1.7, 2.5, 3.0, 3.9, 5.1, 6.3, 6.6}) {
      for (const double y : {0.0, 0.4, 0.9}) note(x, y);
    }
    const std::vector<PredictedMinimum> minima = selector.minima(std::vector<ParameterSet>{{3.1, 0.4}});
    ASSERT_EQ(minima.size(), 1u) << type;
    EXPECT_EQ(std::floor(minima.front().set[0]), 4.0) << type;
    // The first makes the run of (5.1, 0) again.
    EXPECT_THAT(selector.select(std::vector<ParameterSet>{{5.9, 0.0}, {6.2, 0.8}}, 1), ElementsAre(1)) << type;
    note(minima.front().set[0], minima.front().set[1]);
    for (const PredictedMinimum& next : selector.minima(std::vector<ParameterSet>{{4.9, 0.0}})) {
      EXPECT_NE(next.set, minima.front().set) << type;
    }
  }
}

}  // namespace
}  // namespace mirevo

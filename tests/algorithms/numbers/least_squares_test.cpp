#include "algorithms/numbers/least_squares.h"

#include <algorithm>
#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {
namespace {

using ::testing::DoubleNear;
using ::testing::Pointwise;

using Columns = std::vector<std::vector<double>>;

Columns randomColumns(std::size_t m, std::size_t n, UniformGenerator& random) {
  Columns columns(n, std::vector<double>(m));
  for (auto& column : columns) {
    for (double& value : column) value = 2.0 * random.next() - 1.0;
  }
  return columns;
}

double squaredRest(const Columns& columns, const std::vector<double>& x, std::vector<double> b) {
  for (std::size_t j = 0; j < columns.size(); ++j) {
    for (std::size_t i = 0; i < columns[j].size(); ++i) b[i] -= columns[j][i] * x[j];
  }
  double sum = 0.0;
  for (const double value : b) sum += value * value;
  return sum;
}

/// Läuchli's matrix (1 1; e 0; 0 e): singular values √(2 + e²) and e. Products of its columns lose the second one.
TEST(LeastSquares, KeepsTheDigitsOfSmallSingularValues) {
  for (const double e : {1e-3, 1e-9, 1e-14}) {
    SingularValues found = singularValues({{1.0, e, 0.0}, {1.0, 0.0, e}}, std::vector<double>{2.0, e, e});
    std::vector<double> values = found.values;
    std::ranges::sort(values);
    EXPECT_NEAR(values[0] / e, 1.0, 1e-12) << e;
    EXPECT_NEAR(values[1], std::sqrt(2.0 + e * e), 1e-15) << e;
    EXPECT_THAT(found.solve(0.0, 0.1 * e), Pointwise(DoubleNear(1e-9), {1.0, 1.0})) << e;
    EXPECT_THAT(found.solve(0.0, 0.5), Pointwise(DoubleNear(1e-9), {1.0, 1.0})) << "of least length";
  }
}

/// The normal equations of the damped problem hold, and those of the undamped one give the step back.
TEST(LeastSquares, ADampedStepSolvesItsNormalEquations) {
  UniformGenerator random(3);
  for (const std::size_t n : {1, 2, 6, 15}) {
    const Columns columns = randomColumns(n + 4, n, random);
    const std::vector<double> b = randomColumns(n + 4, 1, random).front();
    const SingularValues found = singularValues(columns, b);
    for (const double lambda : {0.0, 1e-3, 1.0, 1e6}) {
      const std::vector<double> x = found.solve(lambda, 0.0);
      std::vector<double> left = b;
      for (std::size_t j = 0; j < n; ++j) {
        for (std::size_t i = 0; i < left.size(); ++i) left[i] -= columns[j][i] * x[j];
      }
      for (std::size_t j = 0; j < n; ++j) {
        double gradient = -lambda * x[j];
        for (std::size_t i = 0; i < left.size(); ++i) gradient += columns[j][i] * left[i];
        EXPECT_NEAR(gradient, 0.0, 1e-12) << n << " " << lambda;
      }
    }
  }
}

/// For any step, also with fewer rows than columns and with a column of zeros.
TEST(LeastSquares, ATriangleHasTheSumOfSquaresOfItsMatrix) {
  UniformGenerator random(8);
  for (const auto& [m, n] : {std::pair{1, 1}, {9, 4}, {40, 12}, {3, 5}}) {
    Columns columns = randomColumns(static_cast<std::size_t>(m), static_cast<std::size_t>(n), random);
    if (n > 3) std::ranges::fill(columns[2], 0.0);
    const std::vector<double> b = randomColumns(static_cast<std::size_t>(m), 1, random).front();
    const TriangularSystem system = reduceToTriangle(columns, b);
    ASSERT_EQ(system.columns.size(), static_cast<std::size_t>(n));
    for (std::size_t j = 0; j < system.columns.size(); ++j) {
      for (std::size_t i = j + 1; i < system.columns.size(); ++i) EXPECT_EQ(system.columns[j][i], 0.0);
    }
    for (int trial = 0; trial < 3; ++trial) {
      const std::vector<double> x = randomColumns(static_cast<std::size_t>(n), 1, random).front();
      const double expected = squaredRest(columns, x, b);
      EXPECT_NEAR(squaredRest(system.columns, x, system.rightSide) + system.rest, expected, 1e-13 * (1.0 + expected));
    }
  }
}

/// A fitted polynomial of degree 5 through exact values, whose columns are nearly dependent.
TEST(LeastSquares, FindsThePolynomialBehindItsValues) {
  constexpr std::size_t kPoints = 30;
  Columns columns(6, std::vector<double>(kPoints));
  std::vector<double> b(kPoints, 0.0);
  for (std::size_t i = 0; i < kPoints; ++i) {
    double power = 1.0;
    for (auto& column : columns) {
      column[i] = power;
      b[i] += power;
      power *= 1.0 + static_cast<double>(i) / kPoints;
    }
  }
  const TriangularSystem system = reduceToTriangle(columns, b);
  const std::vector<double> x = singularValues(system.columns, system.rightSide).solve(0.0, 1e-15);
  EXPECT_THAT(x, Pointwise(DoubleNear(1e-8), std::vector<double>(6, 1.0)));
}

}  // namespace
}  // namespace mirevo

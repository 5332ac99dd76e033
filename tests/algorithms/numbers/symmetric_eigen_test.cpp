#include "algorithms/numbers/symmetric_eigen.h"

#include <algorithm>
#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/rotated_functions.h"

namespace mirevo {
namespace {

/// Bᵀ·D·B with the rows of a rotation as eigenvectors.
std::vector<double> matrixOf(const testing::Matrix& rotation, const std::vector<double>& values) {
  const std::size_t n = values.size();
  std::vector<double> matrix(n * n, 0.0);
  for (std::size_t k = 0; k < n; ++k) {
    for (std::size_t i = 0; i < n; ++i) {
      for (std::size_t j = 0; j < n; ++j) matrix[i * n + j] += values[k] * rotation[k][i] * rotation[k][j];
    }
  }
  return matrix;
}

TEST(SymmetricEigen, GivesBackTheValuesAndAxesOfWhichAMatrixIsMade) {
  UniformGenerator random(5);
  for (const std::size_t n : {1, 2, 3, 7, 40}) {
    for (const double decades : {0.0, 2.0, 8.0}) {
      std::vector<double> values(n);
      for (std::size_t k = 0; k < n; ++k) values[k] = std::pow(10.0, decades * testing::shareOf(k, n));
      const std::vector<double> matrix = matrixOf(testing::randomRotation(n, random), values);
      const SymmetricEigen eigen = decomposeSymmetric(matrix, n);
      // Every axis: A·v = λ·v.
      for (std::size_t k = 0; k < n; ++k) {
        for (std::size_t i = 0; i < n; ++i) {
          double product = 0.0;
          for (std::size_t j = 0; j < n; ++j) product += matrix[i * n + j] * eigen.vectors[k * n + j];
          EXPECT_NEAR(product, eigen.values[k] * eigen.vectors[k * n + i],
                      1e-13 * values.back() * static_cast<double>(n));
        }
      }
      std::vector<double> found = eigen.values;
      std::ranges::sort(found);
      for (std::size_t k = 0; k < n; ++k) EXPECT_NEAR(found[k] / values[k], 1.0, 1e-15 * std::pow(10.0, decades) * 1e2);
    }
  }
}

/// Methods that first make the matrix tridiagonal lose the small values of such a matrix.
TEST(SymmetricEigen, KeepsTheDigitsOfSmallValuesOfABadlyScaledMatrix) {
  // Scales 1, 1e-8 and 1e-16 around the matrix of 2 in the diagonal and 1 elsewhere, whose determinant is 4.
  const std::vector<double> scales{1.0, 1.0e-8, 1.0e-16};
  std::vector<double> matrix(9);
  for (std::size_t i = 0; i < 3; ++i) {
    for (std::size_t j = 0; j < 3; ++j) matrix[i * 3 + j] = (i == j ? 2.0 : 1.0) * scales[i] * scales[j];
  }
  std::vector<double> values = decomposeSymmetric(matrix, 3).values;
  std::ranges::sort(values);
  // To the leading order: the Schur complements 2, 3/2 and 4/3.
  EXPECT_NEAR(values[0] / 1.0e-32, 4.0 / 3.0, 1e-12);
  EXPECT_NEAR(values[1] / 1.0e-16, 1.5, 1e-12);
  EXPECT_NEAR(values[2], 2.0, 1e-12);
}

}  // namespace
}  // namespace mirevo

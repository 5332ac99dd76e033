#pragma once

#include <cstddef>
#include <span>
#include <vector>

namespace mirevo {

/// Singular values of a matrix A of n rows and k columns, k <= n, with what a least-squares step for A·x = b needs.
struct SingularValues {
  std::vector<double> values;        ///< k, in no order
  std::vector<double> vectors;       ///< k right singular vectors of k entries, one behind another
  std::vector<double> coefficients;  ///< of b on the left singular vectors, k

  /// x that minimises |A·x - b|^2 + lambda·|x|^2 in the space of the singular values that are more than
  /// `smallestShare` of the largest.
  std::vector<double> solve(double lambda, double smallestShare) const;
};

/// By one-sided Jacobi rotations of the columns (Hestenes 1958, doi:10.1137/0106005), which give small singular values
/// of a matrix with columns of like length with nearly all their digits, and the same bits whatever linear algebra a
/// machine has installed. `columns` of equal length.
SingularValues singularValues(std::vector<std::vector<double>> columns, std::span<const double> b);

/// min |A·x - b| for A of m rows and n columns, reduced to a triangle by Householder reflections: R is n by n, and
/// |A·x - b|^2 = |R·x - q|^2 + rest.
struct TriangularSystem {
  std::vector<std::vector<double>> columns;  ///< of R, n entries each
  std::vector<double> rightSide;             ///< q, n
  double rest = 0.0;
};

TriangularSystem reduceToTriangle(std::vector<std::vector<double>> columns, std::vector<double> rightSide);

}  // namespace mirevo

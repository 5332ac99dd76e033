#pragma once

#include <cstddef>
#include <span>
#include <vector>

namespace mirevo {

/// The eigenvalues of a symmetric matrix, and row by row the unit eigenvectors that belong to them, in the same order.
struct SymmetricEigen {
  std::vector<double> values;   ///< n
  std::vector<double> vectors;  ///< n · n; eigenvector k begins at k · n
};

/// Decomposes a symmetric matrix (n · n, both triangles filled) by cyclic Jacobi rotations: Golub and Van Loan (2013),
/// Matrix Computations, section 8.5. It takes longer than LAPACK's tridiagonal methods, but gives small eigenvalues of
/// a badly scaled matrix with all their digits, and the same bits with whatever linear algebra a machine has installed.
SymmetricEigen decomposeSymmetric(std::span<const double> matrix, std::size_t n);

}  // namespace mirevo

#pragma once

#include "algorithms/numbers/lapack_functions.h"

namespace mirevo {

/// Replaces the symmetric matrix (n·n entries) by its lower Cholesky factor; false when it is not positive definite.
inline bool choleskyFactor(double* matrix, int n) {
  int info = 0;
  lapack().dpotrf("L", &n, matrix, &n, &info);
  return info == 0;
}

/// Solves for one right-hand side, in place, with the factor of choleskyFactor().
inline void choleskySolve(const double* factor, int n, double* rightSide) {
  const int one = 1;
  int info = 0;
  lapack().dpotrs("L", &n, &one, factor, &n, rightSide, &n, &info);
}

/// Replaces the factor of choleskyFactor() by the inverse of the matrix, in the lower triangle.
inline void choleskyInverse(double* factor, int n) {
  int info = 0;
  lapack().dpotri("L", &n, factor, &n, &info);
}

}  // namespace mirevo

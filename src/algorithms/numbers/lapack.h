#pragma once

/// The LAPACK routines in use, as Fortran declares them: arguments by reference, matrices column by column.
extern "C" {
/// Cholesky factor of the symmetric positive definite `a` (n by n); info > 0 when it is not positive definite.
void dpotrf_(const char* uplo, const int* n, double* a, const int* lda, int* info);
/// Solves a·x = b for `rightSides` columns of b, with the factor of dpotrf.
void dpotrs_(const char* uplo, const int* n, const int* rightSides, const double* a, const int* lda, double* b,
             const int* ldb, int* info);
/// Overwrites the factor of dpotrf with the inverse, in the same triangle.
void dpotri_(const char* uplo, const int* n, double* a, const int* lda, int* info);
/// Exists only where OpenBLAS provides LAPACK.
void openblas_set_num_threads(int count) __attribute__((weak));
}

namespace mirevo {

/// Limits LAPACK to one thread: its results must not depend on the number of cores, and the cores are for the model.
inline void useOneLapackThread() {
  if (openblas_set_num_threads != nullptr) openblas_set_num_threads(1);
}

/// Replaces the symmetric matrix (n·n entries) by its lower Cholesky factor; false when it is not positive definite.
inline bool choleskyFactor(double* matrix, int n) {
  useOneLapackThread();
  int info = 0;
  dpotrf_("L", &n, matrix, &n, &info);
  return info == 0;
}

/// Solves for one right-hand side, in place, with the factor of choleskyFactor().
inline void choleskySolve(const double* factor, int n, double* rightSide) {
  const int one = 1;
  int info = 0;
  dpotrs_("L", &n, &one, factor, &n, rightSide, &n, &info);
}

/// Replaces the factor of choleskyFactor() by the inverse of the matrix, in the lower triangle.
inline void choleskyInverse(double* factor, int n) {
  int info = 0;
  dpotri_("L", &n, factor, &n, &info);
}

}  // namespace mirevo

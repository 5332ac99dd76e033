#pragma once

namespace mirevo {

/// The LAPACK routines in use, as Fortran declares them: arguments by reference, matrices column by column. They are in
/// a module of its own, algorithms/numbers/lapack, as LAPACK takes longer to load than the rest of the program.
struct LapackFunctions {
  /// Cholesky factor of the symmetric positive definite `a` (n by n); info > 0 when it is not positive definite.
  void (*dpotrf)(const char* uplo, const int* n, double* a, const int* lda, int* info);
  /// Solves a·x = b for `rightSides` columns of b, with the factor of dpotrf.
  void (*dpotrs)(const char* uplo, const int* n, const int* rightSides, const double* a, const int* lda, double* b,
                 const int* ldb, int* info);
  /// Overwrites the factor of dpotrf with the inverse, in the same triangle.
  void (*dpotri)(const char* uplo, const int* n, double* a, const int* lda, int* info);
  /// The version; null where LAPACK does not tell it.
  void (*ilaver)(int* major, int* minor, int* patch);
  /// Null where OpenBLAS is not what provides LAPACK.
  char* (*openblasConfiguration)();
  void (*setOpenblasThreads)(int count);
};

inline constexpr const char* kLapackFunctionsName = "mirevoLapackFunctions";

/// Loads the module at the first call, and limits LAPACK to one thread: its results must not depend on the number of
/// cores, and the cores are for the model. Throws FatalError if it cannot be loaded.
const LapackFunctions& lapack();

}  // namespace mirevo

#include "algorithms/numbers/lapack_functions.h"

extern "C" {

void dpotrf_(const char* uplo, const int* n, double* a, const int* lda, int* info);
void dpotrs_(const char* uplo, const int* n, const int* rightSides, const double* a, const int* lda, double* b,
             const int* ldb, int* info);
void dpotri_(const char* uplo, const int* n, double* a, const int* lda, int* info);
void ilaver_(int* major, int* minor, int* patch) __attribute__((weak));
char* openblas_get_config() __attribute__((weak));
void openblas_set_num_threads(int count) __attribute__((weak));

const char* mirevoModuleVersion() {
  return MIREVO_MODULE_VERSION;
}

extern const mirevo::LapackFunctions mirevoLapackFunctions;
const mirevo::LapackFunctions mirevoLapackFunctions = {
    .dpotrf = &dpotrf_,
    .dpotrs = &dpotrs_,
    .dpotri = &dpotri_,
    .ilaver = &ilaver_,
    .openblasConfiguration = &openblas_get_config,
    .setOpenblasThreads = &openblas_set_num_threads,
};
}

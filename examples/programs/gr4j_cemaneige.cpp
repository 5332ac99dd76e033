// A daily rainfall-runoff model, a program like any other that could be calibrated. models/model_programs.h describes
// its files. The simulated file gets its name only when it is complete. Exit code: 0, or 1 with one line of explanation
// on standard error.

#include <cstdio>
#include <exception>

#include "models/model_programs.h"

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fputs("Usage: gr4j_cemaneige PARAMETER_FILE FORCING_CSV SIMULATED_CSV\n", stderr);
    return 1;
  }
  try {
    models::runCatchment(argv[1], argv[2], argv[3]);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "gr4j_cemaneige: %s\n", error.what());
    return 1;
  }
  return 0;
}

// A daily rainfall-runoff model, a program like any other that could be calibrated. models/model_programs.h describes
// its files. The simulated file gets its name only when it is complete. Exit code: 0, or 1 with one line of explanation
// on standard error.

#include <cstdio>
#include <exception>

#include "models/model_programs.h"
#include "tools/program_questions.h"

namespace {

constexpr mirevo::examples::ProgramHelp kHelp = {"gr4j_cemaneige", "PARAMETER_FILE FORCING_CSV SIMULATED_CSV",
                                                 "GR4J with the CemaNeige snow module: computes the daily discharge of "
                                                 "a catchment from its parameters and weather."};

}  // namespace

int main(int argc, char** argv) {
  if (mirevo::examples::answersQuestion(argc, argv, kHelp)) return 0;
  if (argc != 4) return mirevo::examples::refuseArguments(kHelp);
  try {
    models::runCatchment(argv[1], argv[2], argv[3]);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "gr4j_cemaneige: %s\n", error.what());
    return 1;
  }
  return 0;
}

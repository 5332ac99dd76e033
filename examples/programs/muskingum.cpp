// Muskingum routing between two gauges, a program like any other that could be calibrated. models/model_programs.h
// describes its files. The simulated file gets its name only when it is complete. Exit code: 0, or 1 with one line of
// explanation on standard error.

#include <cstdio>
#include <exception>

#include "models/model_programs.h"
#include "tools/program_questions.h"

namespace {

constexpr mirevo::examples::ProgramHelp kHelp = {
    "muskingum", "PARAMETER_FILE UPSTREAM_CSV LATERAL_CSV SIMULATED_CSV",
    "Routes the discharge of an upper gauge, with lateral inflow, to a lower one by the Muskingum method."};

}  // namespace

int main(int argc, char** argv) {
  if (mirevo::examples::answersQuestion(argc, argv, kHelp)) return 0;
  if (argc != 5) return mirevo::examples::refuseArguments(kHelp);
  try {
    models::runRiver(argv[1], argv[2], argv[3], argv[4]);
  } catch (const std::exception& error) {
    std::fprintf(stderr, "muskingum: %s\n", error.what());
    return 1;
  }
  return 0;
}

#pragma once

#include <cstdlib>
#include <string>
#include <vector>

#include "integration/program_runner.h"

namespace mirevo::testing {

inline bool mpirunIsInstalled() {
  return std::system("mpirun --version >/dev/null 2>&1") == 0;
}

/// The arguments of mpirun that start the built program on this machine alone, more processes than cores.
inline std::vector<std::string> mpirunArguments(int processes, const std::vector<std::string>& arguments) {
  std::vector<std::string> words{"--oversubscribe",         "--allow-run-as-root", "--bind-to", "none", "-n",
                                 std::to_string(processes), MIREVO_PROGRAM};
  words.insert(words.end(), arguments.begin(), arguments.end());
  return words;
}

/// Shared memory only. What MPI itself does not release at its end is no fault of the program.
inline RunningProgram::Environment mpirunEnvironment() {
  return {{"OMPI_MCA_btl", "self,vader"},
          {"OMPI_MCA_btl_vader_single_copy_mechanism", "none"},
          {"ASAN_OPTIONS", "detect_leaks=0"}};
}

}  // namespace mirevo::testing

#pragma once

#include <cstdlib>
#include <string>
#include <vector>

#include "integration/program_runner.h"

namespace mirevo::testing {

inline bool mpirunIsInstalled() {
  return std::system("mpirun --version >/dev/null 2>&1") == 0;
}

/// The built program as an MPI job on this machine alone, more processes than cores, by shared memory. What MPI itself
/// does not release at its end is no fault of the program. An abnormal end of the job takes mpirun that many seconds,
/// in which its ranks may end by themselves. `outlivesRanks`: a rank that is lost does not end the job.
inline RunningProgram startJob(int processes, const std::vector<std::string>& arguments, int secondsToEnd = 1,
                               bool outlivesRanks = false) {
  std::vector<std::string> words{"--oversubscribe",         "--allow-run-as-root", "--bind-to", "none", "-n",
                                 std::to_string(processes), MIREVO_PROGRAM};
  words.insert(words.end(), arguments.begin(), arguments.end());
  return RunningProgram(words,
                        {{"OMPI_MCA_btl", "self,vader"},
                         {"OMPI_MCA_btl_vader_single_copy_mechanism", "none"},
                         {"OMPI_MCA_odls_base_sigkill_timeout", std::to_string(secondsToEnd)},
                         {"OMPI_MCA_orte_enable_recovery", outlivesRanks ? "1" : "0"},
                         {"ASAN_OPTIONS", "detect_leaks=0"}},
                        "mpirun");
}

}  // namespace mirevo::testing

#pragma once

#include <cstdlib>
#include <string>
#include <vector>

#include "integration/program_runner.h"
#include "temporary_folder.h"

namespace mirevo::testing {

inline bool mpirunIsInstalled() {
  return std::system("mpirun --version >/dev/null 2>&1") == 0;
}

/// mpirun's arguments before the program, for more processes than cores.
inline std::vector<std::string> jobArguments(int processes) {
  return {"--oversubscribe", "--allow-run-as-root", "--bind-to", "none", "-n", std::to_string(processes)};
}

/// mpirun's environment for a job on this machine alone, by shared memory. What MPI itself does not release at its end
/// is no fault of the program. An abnormal end of the job takes mpirun that many seconds, in which its ranks may end by
/// themselves. `outlivesRanks`: a rank that is lost does not end the job.
/// What MPI keeps on disk and in memory lies in a folder of the test: that which all jobs of a user share is removed by
/// each that finds it empty, also while another one starts in it.
inline RunningProgram::Environment jobEnvironment(int secondsToEnd = 1, bool outlivesRanks = false) {
  static const TemporaryFolder sessions;
  return {{"OMPI_MCA_btl", "self,vader"},
          {"OMPI_MCA_btl_vader_single_copy_mechanism", "none"},
          {"OMPI_MCA_orte_tmpdir_base", sessions.path()},
          {"OMPI_MCA_btl_vader_backing_directory", sessions.path()},
          {"OMPI_MCA_odls_base_sigkill_timeout", std::to_string(secondsToEnd)},
          {"OMPI_MCA_orte_enable_recovery", outlivesRanks ? "1" : "0"},
          {"ASAN_OPTIONS", "detect_leaks=0"}};
}

/// The built program as an MPI job.
inline RunningProgram startJob(int processes, const std::vector<std::string>& arguments, int secondsToEnd = 1,
                               bool outlivesRanks = false) {
  std::vector<std::string> words = jobArguments(processes);
  words.emplace_back(MIREVO_PROGRAM);
  words.insert(words.end(), arguments.begin(), arguments.end());
  return RunningProgram(words, jobEnvironment(secondsToEnd, outlivesRanks), "mpirun");
}

}  // namespace mirevo::testing

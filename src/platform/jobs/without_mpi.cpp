#include "common/fatal_error.h"
#include "platform/jobs/job_launcher.h"
#include "platform/jobs/mpi_job.h"

namespace mirevo {

std::unique_ptr<Job> joinMpiJob() {
  const int rank = launcherRank();
  const auto launched = launchedProcessCount();
  if (launched.value_or(1) > 1 || rank > 0) {
    fatalError("Error: This Mirevo was built without MPI",
               "A job launcher started several processes of it, which would all do the same run. Start one, or build "
               "Mirevo with MIREVO_MPI=ON.");
  }
  if (launched || rank >= 0) hideJobFromModels();
  return nullptr;
}

}  // namespace mirevo

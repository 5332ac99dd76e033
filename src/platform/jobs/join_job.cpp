#include "platform/jobs/job.h"
#include "platform/jobs/job_launcher.h"
#include "platform/jobs/mpi_module.h"
#include "platform/jobs/single_process.h"

namespace mirevo {

std::unique_ptr<Job> joinJob() {
  const auto launched = launchedProcessCount();
  // Without a launcher, variables that the user has set for a model's own MPI are kept.
  const bool isLaunched = launched || launcherRank() >= 0;
  std::unique_ptr<Job> job;
  // MPI is loaded only under a launcher that does not say that it started a single process, so that a plain run pays
  // nothing for it.
  if (isLaunched && launched.value_or(2) > 1) job = joinMpiJob();
  if (isLaunched) hideJobFromModels();
  if (!job) job = std::make_unique<SingleProcess>();
  return job;
}

}  // namespace mirevo

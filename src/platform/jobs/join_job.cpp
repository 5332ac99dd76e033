#include "platform/jobs/job.h"
#include "platform/jobs/mpi_job.h"
#include "platform/jobs/single_process.h"

namespace mirevo {

std::unique_ptr<Job> joinJob() {
  if (auto job = joinMpiJob()) return job;
  return std::make_unique<SingleProcess>();
}

}  // namespace mirevo

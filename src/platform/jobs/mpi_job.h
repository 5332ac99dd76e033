#pragma once

#include <memory>

#include "platform/jobs/job.h"

namespace mirevo {

/// Joins the MPI job that a launcher has started; null if this process is alone. MPI is initialised only under a
/// launcher that does not say that it started a single process, so that a plain run pays nothing for it. Throws
/// FatalError like joinJob(). In a build without MPI it refuses jobs of several processes.
std::unique_ptr<Job> joinMpiJob();

}  // namespace mirevo

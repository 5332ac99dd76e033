#pragma once

#include <memory>

#include "platform/jobs/job.h"

namespace mirevo {

/// The part of this process in the MPI job that a launcher has started; null where it is alone. MPI is touched only
/// when a job launcher has started this process together with others, so that a plain run pays nothing for it. Throws
/// FatalError as joinJob() does. A build without MPI has it too: it refuses the jobs that would need MPI.
std::unique_ptr<Job> joinMpiJob();

}  // namespace mirevo

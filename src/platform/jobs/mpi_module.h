#pragma once

#include <memory>
#include <string>

#include "platform/jobs/job.h"

namespace mirevo {

// MPI is in a module of its own (common/program_module.h), platform/jobs/mpi, which only a process of an MPI job loads:
// the program itself needs no MPI library. What both use is the program's (platform/jobs/mpi/exported_symbols): no
// state and no type twice.

/// What the module exports, under the names below.
using JoinMpiJob = Job*();
inline constexpr const char* kJoinMpiJobName = "mirevoJoinMpiJob";

/// The module's entry: initialises MPI and returns the job, to be deleted by the caller; null if this process finds
/// itself alone in it. Throws FatalError when `mirevo::launchedProcessCount()` says that it should not be.
extern "C" Job* mirevoJoinMpiJob();

/// For people: whether the module is there, and its file.
std::string mpiSupport();

/// Loads the module and joins the MPI job that a launcher has started; null if this process finds itself alone. Throws
/// FatalError like joinJob(), and when there is no module.
std::unique_ptr<Job> joinMpiJob();

}  // namespace mirevo

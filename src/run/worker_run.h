#pragma once

#include "platform/jobs/job.h"

namespace mirevo {

/// The whole life of a worker of a job: it waits for the master's setup, makes its process folder, runs models until
/// the master says stop, and leaves the job. It writes no log and no results: what goes wrong is told to the master.
/// Returns the exit code, 0 even after an error: the job's exit code is the master's, and a launcher that saw a worker
/// fail would end the master in the middle of its own end.
int runWorker(Job& job);

}  // namespace mirevo

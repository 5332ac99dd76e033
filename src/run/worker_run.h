#pragma once

#include "platform/jobs/job.h"

namespace mirevo {

/// Runs a worker of a job: it waits for the master's setup, makes its process folder, runs models until the master
/// sends stop, and leaves the job. It writes no log and no results; errors are reported to the master. Returns the exit
/// code, 0 even after an error: the exit code of the job is that of the master, and a launcher that sees a worker fail
/// would kill the master before it has ended in order.
int runWorker(Job& job);

}  // namespace mirevo

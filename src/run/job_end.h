#pragma once

#include "run/run_state.h"

namespace mirevo {

/// Tells the workers of the job, the first time that it is called, to end their models and to come to leaveJob(). To be
/// called as soon as it is certain that no more is evaluated: the workers end while the master closes its files, and
/// know that it can still answer.
void stopWorkersOf(RunState& state);

/// Ends the job on the master: waits for the workers and leaves the job with them. If one of them does not come in
/// time, the master is still in the job, which stopRun() then aborts. `exitCode`: the run's. Does nothing in a job of
/// one process.
void leaveJob(RunState& state, int exitCode);

}  // namespace mirevo

#pragma once

#include "run/run_state.h"

namespace mirevo {

/// Settles the run's place among the processes of its job: a plain local run, rank -1. Throws FatalError when a job
/// launcher started more than one process, as they would all write the same files.
void startMpi(RunState& state);

}  // namespace mirevo

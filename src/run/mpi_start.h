#pragma once

#include "run/run_state.h"

namespace mirevo {

/// Settles the run's place among the processes of its job: rank -1 and a plain local run without MPI or alone in its
/// job. Throws FatalError when a job launcher started several processes that MPI cannot bring together, as they would
/// all write the same files.
void startMpi(RunState& state);

}  // namespace mirevo

#pragma once

#include <string_view>

#include "run/run_state.h"

namespace mirevo {

/// Ends the job on the master: stops the workers and leaves the job. If that is not possible, writes `ending` as the
/// end of the progress and aborts the job. Does nothing in a job of one process.
void leaveJob(RunState& state, int exitCode, std::string_view ending);

}  // namespace mirevo

#pragma once

#include <string_view>

#include "run/run_state.h"

namespace mirevo {

/// The master's end of the run's job: stops the workers and leaves the job; ends the whole job where that is not
/// possible, with `ending` as the last of the progress. A job of one process has nothing to end.
void leaveJob(RunState& state, int exitCode, std::string_view ending);

}  // namespace mirevo

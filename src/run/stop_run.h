#pragma once

#include <string>

#include "platform/jobs/job.h"

namespace mirevo {

/// Sets the descriptor to which stopRun() and the signal handlers write their completion line; none is written while it
/// is 0 or less.
void setTerminationLogUnit(int unit);

/// Creates the termination log of a run, empty until the run ends, replacing that of an earlier run; does nothing if
/// one is set already. Returns a problem as one line; empty when all is well. The run goes on in any case. `kept`: what
/// a file that is no such log of a run was renamed to.
std::string openTerminationLog(const std::string& path, std::string* kept = nullptr);

/// Writes the completion line to the termination log and ends the process with the exit code; of a job, if there is
/// one, all processes that have not left it.
[[noreturn]] void stopRun(int exitCode = 0, Job* job = nullptr);

}  // namespace mirevo

#pragma once

#include <string>

namespace mirevo {

/// Sets the descriptor to which stopRun() and the signal handlers write their completion line; nowhere while it is 0 or
/// less.
void setTerminationLogUnit(int unit);

/// Makes the termination log of a run, empty until the run ends, in place of an earlier run's; one that is set already
/// stays. Returns what there is to report, one line; empty when all is well. The run goes on in any case.
std::string openTerminationLog(const std::string& path);

/// Writes the completion line to the termination log and ends the process with the exit code.
[[noreturn]] void stopRun(int exitCode = 0);

}  // namespace mirevo

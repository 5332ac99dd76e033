#pragma once

namespace mirevo {

/// Sets the descriptor to which stopRun() and the signal handlers write their completion line. The program leaves it at
/// 0 (nowhere), as its log and exit code say the same; it is for whoever starts the run from other code.
void setTerminationLogUnit(int unit);

/// Writes the completion line to the termination log and ends the process with the exit code.
[[noreturn]] void stopRun(int exitCode = 0);

}  // namespace mirevo

#pragma once

#include <string>
#include <sys/types.h>

namespace mirevo {

/// fork() with all signals blocked, so that no handler of the program ever runs in the child, where they stay blocked.
pid_t forkWithSignalsBlocked();

/// How a process came to its end: "was ended by signal 11 (Segmentation fault)".
std::string endedBySignal(int signal);

}  // namespace mirevo

#pragma once

#include "faults/fault_report.h"

namespace mirevo::testing {

/// Makes the program's system calls fail one after the other: in the long form all of them on files that are rarely
/// used and a spread of those on the others, each with the errors that it may meet; in the short form one call a kind
/// of file.
void tryInjectedFaults(bool isLong, FaultReport& report);

}  // namespace mirevo::testing

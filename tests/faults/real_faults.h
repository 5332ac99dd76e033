#pragma once

#include "faults/fault_report.h"

namespace mirevo::testing {

/// Faults as the system itself makes them: full disks, forbidden files, limits of a process, files removed during the
/// run. What needs rights that this process does not have is reported as skipped.
void tryRealFaults(bool isLong, FaultReport& report);

}  // namespace mirevo::testing

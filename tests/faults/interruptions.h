#pragma once

#include "faults/fault_report.h"

namespace mirevo::testing {

/// Runs that are stopped, killed, or see the clock move.
void tryInterruptions(bool isLong, FaultReport& report);

}  // namespace mirevo::testing

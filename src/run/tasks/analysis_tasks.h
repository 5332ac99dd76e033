#pragma once

#include <string>
#include <vector>

#include "run/tasks/tasks.h"

namespace mirevo {

/// The analyses: each evaluates its sets in one batch, logs what it found, and returns the same lines for the result
/// file. Both throw FatalError and RunCancelled.

/// Uncertainty analysis; also writes the band of every simulated series beside the results.
std::vector<std::string> runUncertainty(const TaskContext& context);

/// Local sensitivity analysis, with the covariance of the parameters where the setup asks for it.
std::vector<std::string> runSensitivity(const TaskContext& context);

}  // namespace mirevo

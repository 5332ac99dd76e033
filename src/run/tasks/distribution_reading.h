#pragma once

#include "algorithms/distributions/parameter_distributions.h"
#include "run/tasks/task.h"

namespace mirevo {

/// The distributions that `section` gives to the variable parameters; without them each is uniform between its bounds.
/// Throws FatalError.
ParameterDistributions readDistributions(const TaskReading& reading, const SetupSection& section);

}  // namespace mirevo

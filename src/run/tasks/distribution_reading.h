#pragma once

#include <cstddef>
#include <string_view>
#include <vector>

#include "algorithms/distributions/distribution_settings.h"
#include "algorithms/distributions/parameter_distributions.h"
#include "run/tasks/task.h"

namespace mirevo {

/// What a parameter without a section has.
enum class MissingDistribution {
  isUniform,  ///< between its bounds
  isRefused,
};

/// The distributions that `section` gives to the variable parameters, in its sections PARAMETER_n and CORRELATIONS.
/// Throws FatalError.
ParameterDistributions readDistributions(const TaskReading& reading, const SetupSection& section,
                                         MissingDistribution missing = MissingDistribution::isUniform);

/// The same sections for the schema of setups, of the task with the section `task`: "UNCERTAINTY_ESTIMATION".
std::vector<const SectionRow*> distributionSections(std::string_view task);

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <optional>
#include <string>
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

/// The first section with a distribution of one of `count` parameters that `section` holds, "PARAMETER_2"; empty: none.
std::optional<std::string> firstDistribution(const SetupSection& section, std::size_t count);

/// The same sections for the schema of setups, of the task with the section `task`: "UNCERTAINTY_ESTIMATION".
std::vector<const SectionRow*> distributionSections(std::string_view task);

}  // namespace mirevo

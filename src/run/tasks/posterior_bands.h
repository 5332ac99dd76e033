#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "run/tasks/dream_target.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Adds the bands of the observed series to `files`: that of the simulated values over states of the posterior, and,
/// for a series with an error model, that of what would be observed, with errors drawn from it. Returns lines on them
/// for the report.
std::vector<std::string> reportPosteriorBands(const TaskContext& context, const DreamTarget& target,
                                              const DreamSampler& sampler, bool hasSteps, std::int32_t seed,
                                              std::vector<TaskFile>& files);

}  // namespace mirevo

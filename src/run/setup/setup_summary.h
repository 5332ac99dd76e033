#pragma once

#include <span>
#include <string>
#include <string_view>

#include "parameters/search_space.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The description of how a measure is computed: "root mean square", "written by the model".
std::string statisticName(const OutputMeasure& measure);
/// The same, with the best value of a criterion: "Kling-Gupta efficiency (2009), best 1".
std::string statisticWithBest(const OutputMeasure& measure);

/// A summary of the setup for the log, in several lines without a final line end: task, parameters with their bounds on
/// the model and search scales, measures, objective functions, evaluations, slots. `evaluationOrder` holds the 1-based
/// numbers of all parameters in the order in which they are evaluated.
std::string setupSummary(const RunConfig& config, const SearchSpace& space, std::span<const int> evaluationOrder);

}  // namespace mirevo

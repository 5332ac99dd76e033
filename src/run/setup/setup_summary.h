#pragma once

#include <span>
#include <string>
#include <string_view>

#include "parameters/search_space.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// How a measure comes about: "root mean square", "written by the model".
std::string_view statisticName(const OutputMeasure& measure);

/// What the run is about to do, for the log, several lines without a line end behind the last: task, parameters with
/// their bounds on the model's and the search's scale, measures, objective functions, evaluations, slots.
/// `evaluationOrder` holds the 1-based numbers of all parameters in the order in which they get their values.
std::string setupSummary(const RunConfig& config, const SearchSpace& space, std::span<const int> evaluationOrder);

}  // namespace mirevo

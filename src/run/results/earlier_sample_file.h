#pragma once

#include <span>
#include <string>

#include "algorithms/analyses/evaluated_sample.h"
#include "measures/observed_series.h"
#include "parameters/feasibility.h"
#include "parameters/search_space.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The evaluations in the result file of an earlier run of any task, with what stands beside it: the simulated values
/// where they are kept and are of `observed`, the observations of this run. Nothing is written there. Throws FatalError
/// if the file has other columns than this run would have, has rows that were changed, or was judged by other
/// observations, measures or objective functions, and if it has no successful evaluation.
EarlierSample readEarlierSample(const std::string& resultFile, const RunConfig& config, const SearchSpace& space,
                                const Feasibility& feasibility, std::span<const ObservedSeries> observed);

}  // namespace mirevo

#pragma once

#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/search_algorithm.h"
#include "common/parameter_set.h"
#include "evaluation/evaluator.h"
#include "parameters/search_space.h"
#include "run/run_config.h"
#include "run/run_log.h"

namespace mirevo {

/// What a task works with.
struct TaskContext {
  const RunConfig& config;
  const SearchSpace& space;
  Evaluator& evaluator;
  RunLog& log;
  /// Told what a search has found, before the final model run repeats its best set. May be empty.
  std::function<void(const SearchSummary&)> searchEnded = {};
};

/// Runs the task that the setup chooses; one that does not exist runs nothing. Returns why it ended, for the result
/// file. Throws FatalError and RunCancelled.
std::string runTask(const TaskContext& context);

/// The ending of the task's result file, behind the setup's name; empty for a task without one.
std::string_view resultFileEnding(const RunConfig& config);

/// The sets of the multiple runs: of each run's values (model scale, one a model parameter) those of the variable
/// parameters, transformed. Mapping them back yields the given values to within the rounding of exp(ln(x)) for a
/// logarithmic parameter, exactly for an untransformed one, and the grid value for an integer one. Throws FatalError
/// naming run and parameter where a value cannot be transformed.
std::vector<ParameterSet> scenarioSets(const RunConfig& config);

}  // namespace mirevo

#pragma once

#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/searches/search_algorithm.h"
#include "common/data_table.h"
#include "common/parameter_set.h"
#include "evaluation/evaluator.h"
#include "measures/observed_series.h"
#include "parameters/search_space.h"
#include "run/progress/run_log.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// What a task works with.
struct TaskContext {
  const RunConfig& config;
  const SearchSpace& space;
  Evaluator& evaluator;
  RunLog& log;
  /// Told what a search has found, before the final model run repeats its best set. May be empty.
  std::function<void(const SearchSummary&)> searchEnded = {};
  std::string filePrefix = {};  ///< folder and name of the setup: files beside the result file begin with it
  /// The observations whose simulated values the results hold; needed where keepsSimulatedValues().
  std::span<const ObservedSeries> observedSeries = {};
};

/// How a task ended.
struct TaskOutcome {
  std::string terminationMessage;
  std::vector<std::string> report;  ///< what it found, for the end of the result file; the log has it already
  std::vector<DataTable> tables;    ///< the same for programs
};

/// Runs the task that the setup chooses; one that does not exist runs nothing. Throws FatalError and RunCancelled.
TaskOutcome runTask(const TaskContext& context);

/// The sets of the multiple runs: of each run's values (model scale, one a model parameter) those of the variable
/// parameters, transformed. Mapping them back yields the given values to within the rounding of exp(ln(x)) for a
/// logarithmic parameter, exactly for an untransformed one, and the grid value for an integer one. Throws FatalError
/// naming run and parameter where a value cannot be transformed.
std::vector<ParameterSet> scenarioSets(const RunConfig& config);

}  // namespace mirevo

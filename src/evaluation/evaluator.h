#pragma once

#include <span>
#include <vector>

#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"

namespace mirevo {

/// What a batch is for: the sets of a task, points that a surrogate model has selected, or sets whose model run itself
/// is wanted for the folder that it leaves, even where an earlier run has its result.
enum class DispatchMode : int { task = 0, surrogateSelected = 1, finalRun = 2 };

/// The one way in which any task has parameter sets evaluated.
class Evaluator {
 public:
  Evaluator() = default;
  Evaluator(const Evaluator&) = delete;
  Evaluator& operator=(const Evaluator&) = delete;
  virtual ~Evaluator() = default;

  /// Evaluates a batch. The results stand in the order of the sets, whatever the order in which model runs ended.
  /// Throws FatalError past the failed-run limit and RunCancelled when the run is cancelled from outside.
  virtual std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets,
                                                              DispatchMode mode) = 0;

  /// Called once by a search when its initial sample is evaluated: settles the transformation of the objective
  /// functions where the setup leaves it to the sample, and fills in the aggregates of `sample`.
  virtual void settleAggregates(std::span<EvaluationResult> sample) { static_cast<void>(sample); }
};

}  // namespace mirevo

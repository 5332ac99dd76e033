#pragma once

#include <span>
#include <vector>

#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"

namespace mirevo {

/// What a batch is for: the sets of a task, points that a surrogate model has selected, or sets whose model run is
/// needed for the process folder that it leaves, even if an earlier run has its result.
enum class DispatchMode : int { task = 0, surrogateSelected = 1, finalRun = 2 };

/// What was evaluated of a batch that did not come to its end, in the order of its sets.
struct UnfinishedBatch {
  std::vector<ParameterSet> sets;
  std::vector<EvaluationResult> results;  ///< one per set
};

/// Evaluates parameter sets for the tasks; nothing else runs a model.
class Evaluator {
 public:
  Evaluator() = default;
  Evaluator(const Evaluator&) = delete;
  Evaluator& operator=(const Evaluator&) = delete;
  virtual ~Evaluator() = default;

  /// Evaluates a batch. The results are in the order of the sets, whatever the order in which model runs end. Throws
  /// FatalError when the failed-run limit is exceeded and RunCancelled when the run is cancelled from outside.
  virtual std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets,
                                                              DispatchMode mode) = 0;

  /// After evaluateParameterSets() has thrown: hands over what was evaluated of its batch; empty after a complete one.
  virtual UnfinishedBatch takeUnfinished() { return {}; }

  /// Called once by a search when its initial sample is evaluated: determines the transformation of the objective
  /// functions if the setup leaves it to the sample, and fills in the aggregates of `sample`.
  virtual void settleAggregates(std::span<EvaluationResult> sample) { static_cast<void>(sample); }
};

}  // namespace mirevo

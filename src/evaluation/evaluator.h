#pragma once

#include <cassert>
#include <deque>
#include <span>
#include <utility>
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

  /// Hands over sets that are evaluated beside those that were submitted before and are not taken yet; their numbers
  /// in the run follow on. evaluateParameterSets() must not be called before all are taken. Throws what it throws.
  /// Here: evaluates them at once.
  virtual void submit(std::span<const ParameterSet> sets) {
    for (EvaluationResult& result : evaluateParameterSets(sets, DispatchMode::task)) {
      submitted_.push_back(std::move(result));
    }
  }
  /// Takes the result of the set that was submitted first of those not taken yet, when it has ended: results come in
  /// the order of the sets, whatever the order in which model runs end. Throws what evaluateParameterSets() throws.
  virtual EvaluationResult awaitFirst() {
    assert(!submitted_.empty());
    EvaluationResult first = std::move(submitted_.front());
    submitted_.pop_front();
    return first;
  }

  /// After one of these has thrown: hands over what was evaluated of the batch, or of the sets submitted and not taken;
  /// empty after a complete one.
  virtual UnfinishedBatch takeUnfinished() { return {}; }

  /// Called once by a search when its initial sample is evaluated: determines the transformation of the objective
  /// functions if the setup leaves it to the sample, and fills in the aggregates of `sample`.
  virtual void settleAggregates(std::span<EvaluationResult> sample) { static_cast<void>(sample); }

 private:
  std::deque<EvaluationResult> submitted_;  ///< of submit() as it is here
};

}  // namespace mirevo

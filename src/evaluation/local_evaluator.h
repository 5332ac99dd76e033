#pragma once

#include <optional>
#include <vector>

#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"

namespace mirevo {

/// Longest time between two looks at the running batches and at the cancellation; a batch that ends ends the wait.
inline constexpr double kPollSeconds = 3.0;

/// Runs the model in local slots, several at once.
class LocalEvaluator final : public Evaluator {
 public:
  LocalEvaluator(ModelRunner& runner, EvaluationObserver& observer, FailedRunPolicy& failedRuns, int slotCount);

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override;
  void settleAggregates(std::span<EvaluationResult> sample) override;

 private:
  /// One call of evaluateParameterSets(): the sets in their order, from which the slots take the next.
  struct Batch {
    std::span<const ParameterSet> sets;
    std::vector<EvaluationResult> results;
    std::size_t next = 0;      ///< first set that no slot has taken
    std::size_t finished = 0;  ///< sets that have a result
  };

  /// Starts the next set on the free slot; sets that cannot be run get their result at once and the one after is taken.
  void startNext(Batch& batch, int slot);
  /// Takes the results of slots whose batch has ended and starts the next set there; false when none has ended.
  bool takeFinished(Batch& batch);
  void finish(Batch& batch, std::size_t set, EvaluationResult result);
  void stopIfCancelled();
  int numberOf(std::size_t set) const { return evaluationCount_ + static_cast<int>(set) + 1; }

  ModelRunner& runner_;
  EvaluationObserver& observer_;
  FailedRunPolicy& failedRuns_;
  std::vector<std::optional<std::size_t>> slots_;  ///< the set that runs in each slot, by its place in the batch
  int evaluationCount_ = 0;                        ///< sets of the batches before this one
};

}  // namespace mirevo

#pragma once

#include <optional>
#include <vector>

#include "evaluation/evaluation_ledger.h"
#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"

namespace mirevo {

/// Longest time between two looks at the running batches and at the cancellation; a batch that ends ends the wait.
/// Short enough for a cancelled run to be over within 3 seconds, the grace time of models that ignore SIGTERM included.
inline constexpr double kPollSeconds = 0.5;

/// Runs the model in local slots, several at once.
class LocalEvaluator final : public Evaluator {
 public:
  /// `earlier`: evaluations that are not to be made again; may be null. All must outlive this.
  LocalEvaluator(ModelRunner& runner, EvaluationObserver& observer, FailedRunPolicy& failedRuns, int slotCount,
                 EarlierEvaluations* earlier = nullptr);

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override;
  void settleAggregates(std::span<EvaluationResult> sample) override;

 private:
  /// Starts the next set on the free slot; sets that cannot be run get their result at once and the one after is taken.
  void startNext(int slot);
  /// Takes the results of slots whose batch has ended and starts the next set there; false when none has ended.
  bool takeFinished();
  void stopIfCancelled();

  ModelRunner& runner_;
  EvaluationObserver& observer_;
  EvaluationLedger ledger_;
  std::vector<std::optional<std::size_t>> slots_;  ///< the set that runs in each slot, by its place in the batch
};

}  // namespace mirevo

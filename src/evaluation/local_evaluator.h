#pragma once

#include <optional>
#include <vector>

#include "evaluation/evaluation_ledger.h"
#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"

namespace mirevo {

/// Longest time between two checks of the running batches and of the kill file; the end of a batch ends the wait. Short
/// enough for a cancelled run to end within 3 seconds, including the grace time of models that ignore SIGTERM.
inline constexpr double kPollSeconds = 0.5;

/// Runs the model in local slots, several at once.
class LocalEvaluator final : public Evaluator {
 public:
  /// `earlier`: evaluations that are not repeated; may be null, as `slotUse`. All must outlive the object.
  LocalEvaluator(ModelRunner& runner, EvaluationObserver& observer, FailedRunPolicy& failedRuns, int slotCount,
                 EarlierEvaluations* earlier = nullptr, SlotUse* slotUse = nullptr);

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override;
  void submit(std::span<const ParameterSet> sets) override;
  EvaluationResult awaitFirst() override;
  UnfinishedBatch takeUnfinished() override;
  void settleAggregates(std::span<EvaluationResult> sample) override;

 private:
  /// A model run in a slot.
  struct Running {
    std::size_t place = 0;                  ///< of its set in the ledger
    bool hasEnded = false;                  ///< its batch; its results may be being read
    std::optional<EvaluationResult> ended;  ///< waits for the first successful run, see EvaluationLedger::judge()
  };
  struct Slot {
    std::optional<Running> running;
    bool isGivenUp = false;  ///< its process folder cannot be used any more
  };

  /// Waits until something may have ended, takes what has, and starts the next sets.
  void goOn();
  void startInFreeSlots();
  /// Starts the next set on the free slot; sets that cannot be run get their result at once and are skipped.
  void startNext(int slot);
  /// False if the slot is given up from now on. Throws FatalError if it was the last one.
  bool isUsable(int slot);
  /// Takes the results of slots whose batch has ended and starts the next sets there; false when none has ended.
  bool takeFinished();
  /// Whether the slot's model run has ended and its results have been read.
  bool isRead(int slot, Running& running);
  bool isOnlyOne(int slot) const;
  void stopIfCancelled();

  ModelRunner& runner_;
  EvaluationObserver& observer_;
  EvaluationLedger ledger_;
  std::vector<Slot> slots_;
};

}  // namespace mirevo

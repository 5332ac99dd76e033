#pragma once

#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "evaluation/evaluation_ledger.h"
#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"
#include "evaluation/ranks/rank_messages.h"
#include "evaluation/ranks/worker_watch.h"
#include "platform/jobs/job.h"

namespace mirevo {

/// The master of a job with workers: hands one set at a time to each free worker, the lowest rank first. The set of a
/// worker that is lost goes to the next free one, before all others; the first result counts.
class RankEvaluator final : public Evaluator {
 public:
  /// `runner` has no slots here; it tells which sets cannot be run. beginWorkers() must have been called. `earlier`:
  /// evaluations that are not repeated; may be null, as `slotUse`. All must outlive the object.
  RankEvaluator(ModelRunner& runner, Job& job, WorkerWatch& watch, EvaluationObserver& observer,
                FailedRunPolicy& failedRuns, EarlierEvaluations* earlier = nullptr, SlotUse* slotUse = nullptr);

  /// Also throws FatalError, with the worker's own message, after a fatal error on a worker, and when all workers are
  /// lost.
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override;
  void submit(std::span<const ParameterSet> sets) override;
  EvaluationResult awaitFirst() override;
  UnfinishedBatch takeUnfinished() override { return ledger_.takeUnfinished(); }
  void settleAggregates(std::span<EvaluationResult> sample) override;

 private:
  struct Worker {
    std::optional<ReadyMessage> place;  ///< host and process folder; empty until it is ready
    std::optional<std::size_t> set;     ///< place in the ledger of the set that it runs, unless another's result counts
    std::optional<ResultMessage> answer;  ///< waits for the first successful run, see EvaluationLedger::judge()
    bool isGivenUp = false;               ///< its process folder cannot be used any more
    bool isLate = false;                  ///< its set was put back
    std::optional<std::size_t> running;   ///< place of the set whose model it runs, as far as is known
  };

  /// Waits for a message, takes the results that can be judged, and sends the next sets.
  void goOn();
  void startOnFreeWorkers();
  /// To be called when the state of the worker has changed.
  void noteWhetherFree(int rank);
  /// Sends the next set; sets that cannot be run get their result at once and are skipped. False when there is none.
  bool startNext(int rank);
  void handle(const Message& message);
  void takeResult(int rank, ResultMessage message);
  /// The model run of the worker has ended, or `isLost`: nobody will hear of its end.
  void noteEnd(int rank, bool isLost);
  /// The set that the worker has answered. Throws FatalError if it has none.
  WorkerWatch::Held takeHeld(int rank);
  /// Whether the result of the worker counts. If it was taken for lost: only one that `isWhole` and comes before that
  /// of another, whose own then does not count any more.
  bool isFirst(int rank, bool isWhole);
  /// Puts the sets of workers that are lost back. Throws FatalError when no worker is left.
  void passOnLost();
  /// Whether a worker can still be given a set.
  bool isAnyLeft() const;
  /// Throws FatalError unless the set of the worker is another's by now and others are left: it then runs no more.
  void takeFailure(int rank, const FailureMessage& failure);
  void loseWorker(int rank);
  /// Throws FatalError.
  [[noreturn]] void failWithoutWorkers() const;
  /// Finishes the answers that can be judged.
  void finishAnswered();
  void finish(Worker& worker, int rank);
  /// Throws FatalError if it was the last one.
  void giveUp(int rank, const GivenUpMessage& message);
  /// If no worker is left for the set that another has given back, as all answers wait for its run: makes one of them
  /// run it, and its own set again after it.
  void freeOneThatWaits();
  std::string nameOf(int rank) const;
  [[noreturn]] void failWith(int rank, const FailureMessage& failure) const;
  void stopIfCancelled();
  Worker& worker(int rank) { return workers_.at(static_cast<std::size_t>(rank - 1)); }

  ModelRunner& runner_;
  Job& job_;
  WorkerWatch& watch_;
  EvaluationObserver& observer_;
  EvaluationLedger ledger_;
  std::vector<Worker> workers_;  ///< of ranks 1, 2, ...
  std::set<int> free_;           ///< ranks that can be given a set
  std::set<int> answered_;       ///< ranks with an answer that waits
  std::set<int> late_;           ///< ranks whose set was put back
  std::set<std::string> warningsOfFolders_;
};

/// Sends `message` to every worker, in rank order. A job of one process has none.
void beginWorkers(Job& job, const BeginMessage& message);

/// Tells every worker but those, in rank order, to stop.
void stopWorkers(Job& job, const std::set<int>& lost = {});

/// Waits for the farewells of all workers but those that are lost, at most until `isEnough`, which is called several
/// times a second, and returns the ranks of those that have said none, the lost ones among them. A worker may fail
/// after the last result, while it still copies the base folder; `warn` is called for each such failure. Other messages
/// are dropped.
std::set<int> awaitFarewells(Job& job, const std::set<int>& lost, const std::function<bool()>& isEnough,
                             const std::function<void(const std::string&)>& warn);

/// Ends the part of all workers but those in a job that outlives losses, when they have said their farewells.
void dismissWorkers(Job& job, const std::set<int>& missing);

}  // namespace mirevo

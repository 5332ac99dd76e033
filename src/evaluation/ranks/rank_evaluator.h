#pragma once

#include <functional>
#include <optional>
#include <vector>

#include "evaluation/evaluation_ledger.h"
#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"
#include "evaluation/ranks/rank_messages.h"
#include "platform/jobs/job.h"

namespace mirevo {

/// The master of a job with workers: hands one set at a time to whichever worker is free, the one of lowest rank first.
class RankEvaluator final : public Evaluator {
 public:
  /// `runner` has no slots here; it knows which sets cannot be run. The workers have been told to begin.
  /// `earlier`: evaluations that are not to be made again; may be null. All must outlive this.
  RankEvaluator(ModelRunner& runner, Job& job, EvaluationObserver& observer, FailedRunPolicy& failedRuns,
                EarlierEvaluations* earlier = nullptr);

  /// Throws FatalError with the worker's own message when one of them has met a fatal error.
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override;
  void settleAggregates(std::span<EvaluationResult> sample) override;

 private:
  struct Worker {
    std::optional<ReadyMessage> place;  ///< nothing while it is not ready
    std::optional<std::size_t> set;     ///< that it runs, by its place in the batch
  };

  void startOnFreeWorkers();
  /// Sends the next set; sets that cannot be run get their result at once and the one after is taken.
  void startNext(int rank);
  void handle(const Message& message);
  void takeResult(int rank, ResultMessage message);
  [[noreturn]] void failWith(int rank, const FailureMessage& failure) const;
  void stopIfCancelled();
  Worker& worker(int rank) { return workers_.at(static_cast<std::size_t>(rank - 1)); }

  ModelRunner& runner_;
  Job& job_;
  EvaluationObserver& observer_;
  EvaluationLedger ledger_;
  std::vector<Worker> workers_;  ///< of rank 1, 2, ...
};

/// Tells every worker, in rank order, to begin with the setup. A job of one process has none.
void beginWorkers(Job& job, const BeginMessage& message);

/// Tells every worker, in rank order, to stop, and waits for their farewells. False when one has not answered within
/// `seconds`. A worker may meet a fatal error after the last result was in, its base folder still being copied; `warn`
/// is given a text for each. What else they still have to say is dropped.
bool stopWorkers(Job& job, double seconds, const std::function<void(const std::string&)>& warn);

}  // namespace mirevo

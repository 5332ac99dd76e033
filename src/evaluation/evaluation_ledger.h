#pragma once

#include <cstddef>
#include <map>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "common/parameter_set.h"
#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluation_result.h"
#include "evaluation/failed_run_policy.h"
#include "measures/objective_functions.h"

namespace mirevo {

/// The bookkeeping of an evaluation loop, whoever runs the model: which set comes next, its number in the run, what is
/// said and recorded about it, what counts as failed, and the results in the order of the sets.
class EvaluationLedger final {
 public:
  EvaluationLedger(EvaluationObserver& observer, FailedRunPolicy& failedRuns)
      : observer_(observer), failedRuns_(failedRuns) {}

  /// Opens the next batch of the run; its sets are known by their 0-based place in it. `sets` must outlive the batch.
  void begin(std::span<const ParameterSet> sets);
  /// The next set in their order, nothing when all are taken.
  std::optional<std::size_t> takeNext();
  const ParameterSet& set(std::size_t place) const { return sets_[place]; }
  /// The set's number in the run, from 1.
  int numberOf(std::size_t place) const { return evaluationCount_ + static_cast<int>(place) + 1; }
  /// The set's model run has started.
  void markInitiated(std::size_t place);
  /// The set has its result, whose number is filled in here. `leftBehind`: what the launcher says of processes that
  /// had to be ended, or empty. Throws FatalError past the failed-run limit.
  void finish(std::size_t place, EvaluationResult result, std::string_view leftBehind = {});
  bool isComplete() const { return finishedCount_ == sets_.size(); }
  /// Closes a complete batch: one result a set, in their order.
  std::vector<EvaluationResult> end();

 private:
  /// A warning for each measure that a run judged by fewer observations than any run before it.
  void warnOfUnusedObservations(const EvaluationResult& result);

  EvaluationObserver& observer_;
  FailedRunPolicy& failedRuns_;
  std::span<const ParameterSet> sets_;
  std::vector<EvaluationResult> results_;
  std::size_t next_ = 0;                           ///< first set that was not taken
  std::size_t finishedCount_ = 0;                  ///< sets that have a result
  int evaluationCount_ = 0;                        ///< sets of the batches before this one
  std::map<std::size_t, std::size_t> fewestUsed_;  ///< observations that a warning was given for, by measure
};

/// Evaluator::settleAggregates() of the evaluators that run models.
void settleAggregates(ObjectiveAggregator& aggregator, std::span<EvaluationResult> sample);

}  // namespace mirevo

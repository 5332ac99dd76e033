#pragma once

#include <cstddef>
#include <map>
#include <optional>
#include <set>
#include <span>
#include <string_view>
#include <utility>
#include <vector>

#include "common/parameter_set.h"
#include "evaluation/earlier_evaluations.h"
#include "evaluation/equal_measures.h"
#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluation_result.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/run_comparison.h"
#include "measures/objective_functions.h"

namespace mirevo {

/// The bookkeeping of an evaluation loop, whoever runs the model: which set comes next, its number in the run, what is
/// reported and recorded about it, what counts as failed, and the results in the order of the sets.
class EvaluationLedger final {
 public:
  /// `earlier`: evaluations that are not repeated; may be null.
  EvaluationLedger(EvaluationObserver& observer, FailedRunPolicy& failedRuns, EarlierEvaluations* earlier = nullptr,
                   EqualMeasures equalMeasures = {}, RunComparison runComparison = {})
      : observer_(observer),
        failedRuns_(failedRuns),
        earlier_(earlier),
        equalMeasures_(std::move(equalMeasures)),
        runComparison_(std::move(runComparison)) {}

  /// Opens the next batch of the run, when none is open; `place` below is the 0-based index of a set in it.
  /// Sets that an earlier run has evaluated get their results at once, unless `mode` requires their model runs; the
  /// model is run for the output files of those that are EarlierEvaluations::isRunAgain(). Throws
  /// FatalError when the failed-run limit is exceeded, and if an earlier evaluation was of another set.
  void begin(std::span<const ParameterSet> sets, DispatchMode mode);
  /// The next set, in order, that has no result yet; empty when all are taken, and as long as a model run may become
  /// the first successful one, by which the next ones are judged.
  std::optional<std::size_t> takeNext();
  /// Takes a set back that could not be run where it was to be; it is the next one again.
  void putBack(std::size_t place);
  /// Takes a set again that was put back, as its result has come after all; false if it was taken by takeNext() since.
  bool takeAgain(std::size_t place);
  const ParameterSet& set(std::size_t place) const { return sets_[place]; }
  /// The set's number in the run, from 1.
  int numberOf(std::size_t place) const { return evaluationCount_ + static_cast<int>(place) + 1; }
  /// By what the model run of the set taken last is judged.
  RunStandard standard() const { return runComparison_.standard(); }
  /// To be called when the model run of the set has started.
  void markInitiated(std::size_t place);
  /// Whether the result of a set can be taken; if not, the first successful run must end first, whose set has been
  /// taken before. Makes it a failed one if it is cut off. To be called before finish().
  bool judge(std::size_t place, EvaluationResult& result) const {
    return runComparison_.judge(numberOf(place), result);
  }
  /// Takes the result of a set; its number is filled in here. `leftBehind`: what the launcher says of processes that
  /// had to be ended, or empty. Throws FatalError when the failed-run limit is exceeded.
  void finish(std::size_t place, EvaluationResult result, std::string_view leftBehind = {});
  /// Whether the process folder of this model run is to be kept; to be asked before finish().
  bool isFolderWanted(std::size_t place, const EvaluationResult& result) const {
    return !result.ok() && failedRuns_.isFolderWanted(*result.failure) && repeatedMeasures(place).empty();
  }
  /// The output measures of the row that the evaluation of this set has already, if its model is run again beside it;
  /// otherwise empty.
  std::vector<double> repeatedMeasures(std::size_t place) const;
  bool isComplete() const { return finishedCount_ == sets_.size() && runAgain_.empty(); }
  /// Closes a complete batch and returns one result per set, in order. Warns if no model run so far depends on the
  /// parameters.
  std::vector<EvaluationResult> end();
  /// Evaluator::takeUnfinished(); no batch is open afterwards.
  UnfinishedBatch takeUnfinished();

 private:
  /// Warns of each measure for which this run has values for fewer observations than any run before.
  void warnOfUnusedObservations(const EvaluationResult& result);
  void tell(ComparisonFindings found);
  void replay(std::size_t place, EvaluationResult result);
  void store(std::size_t place, EvaluationResult result);
  void tellOfRun(const EvaluationResult& result, std::string_view leftBehind);
  void noteUnkeptFiles(std::size_t place, const EvaluationResult& result);
  void finishRepeated(std::size_t place, EvaluationResult known, EvaluationResult result);
  void finishAgain(std::size_t place, const EvaluationResult& result);
  std::vector<EvaluationResult> close();

  EvaluationObserver& observer_;
  FailedRunPolicy& failedRuns_;
  EarlierEvaluations* earlier_;
  EqualMeasures equalMeasures_;
  RunComparison runComparison_;
  bool isFinalRun_ = false;
  std::vector<ParameterSet> sets_;  ///< the ledger's own: an unfinished batch outlives its caller
  std::vector<EvaluationResult> results_;
  std::vector<bool> isFinished_;    ///< whether a set has its result
  std::size_t next_ = 0;            ///< first set that was not taken
  std::set<std::size_t> returned_;  ///< sets that were taken and put back, and those of runAgain_
  std::set<std::size_t> runAgain_;  ///< sets that have a result, whose model is run for its output files alone
  std::size_t finishedCount_ = 0;   ///< sets that have a result
  std::size_t openCount_ = 0;       ///< sets that were taken and have no result
  int evaluationCount_ = 0;         ///< sets of the batches before this one
  std::set<std::pair<int, std::size_t>> warnedOf_;  ///< evaluations and measures with unused observations
  std::map<std::size_t, std::size_t> fewestUsed_;   ///< by measure, the fewest observations used of which a warning was
                                                    ///< given
};

/// Evaluator::settleAggregates() of the evaluators that run models; reports the scales found as messages.
void settleAggregates(ObjectiveAggregator& aggregator, std::span<EvaluationResult> sample,
                      EvaluationObserver& observer);

}  // namespace mirevo

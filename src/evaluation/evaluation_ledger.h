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
#include "evaluation/known_results.h"
#include "evaluation/run_comparison.h"
#include "evaluation/run_times.h"
#include "evaluation/slot_use.h"
#include "measures/objective_functions.h"

namespace mirevo {

/// The bookkeeping of an evaluation loop, whoever runs the model: which set comes next, its number in the run, what is
/// reported and recorded about it, what counts as failed, and the results in the order of the sets.
class EvaluationLedger final {
 public:
  /// `earlier`: evaluations that are not repeated; may be null. `slotUse` is told of the model runs; may be null.
  EvaluationLedger(EvaluationObserver& observer, FailedRunPolicy& failedRuns, EarlierEvaluations* earlier = nullptr,
                   EqualMeasures equalMeasures = {}, RunComparison runComparison = {}, KnownResults known = {},
                   SlotUse* slotUse = nullptr)
      : observer_(observer),
        failedRuns_(failedRuns),
        earlier_(earlier),
        equalMeasures_(std::move(equalMeasures)),
        runComparison_(std::move(runComparison)),
        known_(std::move(known)),
        slotUse_(slotUse) {}

  /// Opens the next sets of the run; `place` below is the 0-based index of a set in the run. Sets that an earlier run
  /// has evaluated get their results at once, unless `mode` requires their model runs; the model is run for the output
  /// files of those that are EarlierEvaluations::isRunAgain(). Throws FatalError when the failed-run limit is exceeded,
  /// and if an earlier evaluation was of another set. A batch, which end() closes, is opened when nothing is open; sets
  /// that takeFirst() takes may be opened beside others. `slotCount`: of a batch, how many of its sets can be run side
  /// by side, if takeNext() may take its last ones in another order than theirs.
  void open(std::span<const ParameterSet> sets, DispatchMode mode, std::size_t slotCount = 1);
  /// The next set, in order, that has no result yet and is to be run; empty when all are taken, as long as a model run
  /// may become the first successful one, by which the next ones are judged, and when the run was cancelled. Sets that
  /// have been run get their results on the way, and one that equals a set that is being run waits for it. Of the last
  /// sets of a batch those come first that are likely to take longest, so that no slot is left with one of them when
  /// the others have nothing to do.
  std::optional<std::size_t> takeNext();
  /// Takes a set back that could not be run where it was to be; it is the next one again.
  void putBack(std::size_t place);
  /// Takes a set again that was put back, as its result has come after all; false if it was taken by takeNext() since.
  bool takeAgain(std::size_t place);
  const ParameterSet& set(std::size_t place) const { return sets_[indexOf(place)]; }
  /// The set's number in the run, from 1.
  static int numberOf(std::size_t place) { return static_cast<int>(place) + 1; }
  /// Whether the open set is the one with which a search ends, run once more.
  bool isFinalRun() const { return isFinalRun_; }
  /// By what the model run of the set taken last is judged.
  RunStandard standard() const { return runComparison_.standard(); }
  /// To be called when the model run of the set has started; `now`: runTimeClock().
  void markInitiated(std::size_t place, double now);
  /// To be called when it has ended, once for each of those; `isLost`: nobody knows when, or it was given up.
  void markEnded(std::size_t place, double now, bool isLost = false);
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
  bool isOpen() const { return closedCount_ < endPlace(); }
  /// To be called before a batch is opened. Throws FatalError if sets are open: their results would count as the
  /// batch's.
  void requireClosed() const;
  bool isComplete() const { return finishedCount_ == endPlace() - closedCount_ && runAgain_.empty(); }
  /// Closes a complete batch and returns one result per set, in order. Warns if no model run so far depends on the
  /// parameters.
  std::vector<EvaluationResult> end();
  /// Whether the first of the open sets has its result and no model run is made for it.
  bool isFirstComplete() const { return isFinished_[indexOf(closedCount_)] && !runAgain_.contains(closedCount_); }
  /// Then closes this set alone and returns its result. Warns as end() does.
  EvaluationResult takeFirst();
  /// Evaluator::takeUnfinished(); nothing is open afterwards.
  UnfinishedBatch takeUnfinished();

 private:
  /// Warns of each measure for which this run has values for fewer observations than any run before.
  void warnOfUnusedObservations(const EvaluationResult& result);
  void tell(ComparisonFindings found);
  void replay(std::size_t place, EvaluationResult result);
  std::optional<std::size_t> placeOfNext();
  /// Takes the sets that are left of a batch into `longestFirst_` as soon as there are few, and orders them.
  void orderLast();
  /// Of sets that are the same for the model the one with the smallest number comes first, whose result the others
  /// have.
  void keepOrderOfEqual(std::vector<std::size_t>& places) const;
  /// Whether the set's result is that of evaluation No. `original`, which it then has.
  bool repeat(std::size_t place, int original);
  void store(std::size_t place, EvaluationResult result);
  void tellOfRun(const EvaluationResult& result, std::string_view leftBehind);
  void noteUnkeptFiles(std::size_t place, const EvaluationResult& result);
  void finishRepeated(std::size_t place, EvaluationResult known, EvaluationResult result);
  void finishAgain(std::size_t place, const EvaluationResult& result);
  std::vector<EvaluationResult> close();
  std::set<std::size_t> repeatsAmong(std::size_t count) const;
  static std::size_t placeOf(int number) { return static_cast<std::size_t>(number) - 1; }
  std::size_t indexOf(std::size_t place) const { return place - start_; }
  std::size_t endPlace() const { return start_ + sets_.size(); }

  EvaluationObserver& observer_;
  FailedRunPolicy& failedRuns_;
  EarlierEvaluations* earlier_;
  EqualMeasures equalMeasures_;
  RunComparison runComparison_;
  KnownResults known_;
  SlotUse* slotUse_;
  bool isFinalRun_ = false;
  std::vector<ParameterSet> sets_;  ///< the ledger's own: an unfinished batch outlives its caller
  std::vector<EvaluationResult> results_;
  std::vector<bool> isFinished_;  ///< whether a set has its result
  std::size_t start_ = 0;         ///< place of the first of these; some of them may be closed already
  std::size_t closedCount_ = 0;   ///< sets of the run that are closed: the place of the first open one
  std::size_t next_ = 0;          ///< first set that was not taken
  /// Sets that were taken and put back, those that have waited for an equal one, and those of runAgain_.
  std::set<std::size_t> returned_;
  std::size_t slotCount_ = 1;              ///< of open()
  std::vector<std::size_t> longestFirst_;  ///< the last sets of a batch that were not taken, the next one at the end
  std::size_t orderedBy_ = 0;              ///< model runs that were known when these were put in order
  RunTimes runTimes_;
  std::map<std::size_t, double> startedAt_;  ///< by place, of those that are running
  std::set<std::size_t> runAgain_;           ///< sets that have a result, whose model is run for its output files alone
  std::set<std::size_t> repeats_;            ///< open sets whose result is that of an earlier model run
  std::size_t finishedCount_ = 0;            ///< open sets that have a result
  std::size_t runningCount_ = 0;             ///< sets that were taken and have no result
  std::set<std::pair<std::size_t, std::size_t>> toldDoubts_;  ///< by file and place, see FileDoubt
  std::set<std::pair<int, std::size_t>> warnedOf_;            ///< evaluations and measures with unused observations
  std::map<std::size_t, std::size_t> fewestUsed_;  ///< by measure, the fewest observations used of which a warning was
                                                   ///< given
};

/// Evaluator::settleAggregates() of the evaluators that run models; reports the scales found as messages.
void settleAggregates(ObjectiveAggregator& aggregator, std::span<EvaluationResult> sample,
                      EvaluationObserver& observer);

}  // namespace mirevo

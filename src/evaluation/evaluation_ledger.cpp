#include "evaluation/evaluation_ledger.h"

#include <utility>

#include <fmt/core.h>

#include "common/progress_messages.h"

namespace mirevo {
namespace {

std::string completedText(const EvaluationResult& result) {
  std::string_view outcome = progress::kOk;
  if (!result.ok()) {
    // A set that cannot be run is no model run error, even if it is an equation that has no finite value.
    outcome = result.failure->isOfConstraints() ? progress::kConstraintsViolated : progress::kModelRunError;
  }
  return progress::completedMessage(result.number, outcome);
}

}  // namespace

void EvaluationLedger::begin(std::span<const ParameterSet> sets, DispatchMode mode) {
  sets_.assign(sets.begin(), sets.end());
  results_.assign(sets.size(), {});
  isFinished_.assign(sets.size(), false);
  isFinalRun_ = mode == DispatchMode::finalRun;
  if (earlier_ == nullptr || isFinalRun_) return;
  for (std::size_t place = 0; place < sets.size(); ++place) {
    if (earlier_->repeatsRun(numberOf(place))) continue;
    auto result = earlier_->take(numberOf(place), sets[place]);
    if (!result) continue;
    replay(place, std::move(*result));
    if (!earlier_->isRunAgain(numberOf(place))) continue;
    runAgain_.insert(place);
    returned_.insert(place);
  }
}

void EvaluationLedger::replay(std::size_t place, EvaluationResult result) {
  ComparisonFindings found = runComparison_.take(result, isFinalRun_);
  observer_.evaluationReplayed(sets_[place], result);
  tell(std::move(found));
  store(place, std::move(result));
}

/// Stores and counts a result that has been reported.
void EvaluationLedger::store(std::size_t place, EvaluationResult result) {
  // Not needed any more; the batch keeps its results until it is complete.
  result.shownSeries = {};
  if (observer_.readsSimulatedValues()) result.simulatedValues = std::vector<double>();  // {} would keep its memory
  const EvaluationResult& stored = results_[place] = std::move(result);
  isFinished_[place] = true;
  ++finishedCount_;
  if (!stored.ok()) failedRuns_.countFailure(stored.number, *stored.failure);
}

std::optional<std::size_t> EvaluationLedger::takeNext() {
  while (next_ < sets_.size() && isFinished_[next_]) ++next_;
  if (next_ == sets_.size() && returned_.empty()) return std::nullopt;
  if (openCount_ > 0 && runComparison_.isAwaited()) return std::nullopt;
  ++openCount_;
  // In their order: a result may wait for that of a set before it.
  if (returned_.empty() || (next_ < sets_.size() && next_ < *returned_.begin())) return next_++;
  const std::size_t first = *returned_.begin();
  returned_.erase(returned_.begin());
  return first;
}

void EvaluationLedger::putBack(std::size_t place) {
  returned_.insert(place);
  --openCount_;
}

bool EvaluationLedger::takeAgain(std::size_t place) {
  if (returned_.erase(place) == 0) return false;
  ++openCount_;
  return true;
}

std::vector<double> EvaluationLedger::repeatedMeasures(std::size_t place) const {
  if (runAgain_.contains(place)) return results_[place].measureValues;
  if (earlier_ == nullptr) return {};
  const auto* measures = earlier_->measuresOf(numberOf(place));
  return measures == nullptr ? std::vector<double>() : *measures;
}

void EvaluationLedger::markInitiated(std::size_t place) {
  observer_.message(progress::initiatedMessage(numberOf(place)));
}

void EvaluationLedger::finish(std::size_t place, EvaluationResult result, std::string_view leftBehind) {
  result.number = numberOf(place);
  --openCount_;
  tellOfRun(result, leftBehind);
  if (runAgain_.erase(place) > 0) {
    observer_.message(completedText(result));
    return finishAgain(place, result);
  }
  noteUnkeptFiles(place, result);
  if (auto known = earlier_ == nullptr ? std::nullopt : earlier_->take(result.number, sets_[place])) {
    observer_.message(completedText(result));
    return finishRepeated(place, std::move(*known), std::move(result));
  }
  ComparisonFindings found = runComparison_.take(result, isFinalRun_);
  observer_.recordEvaluation(sets_[place], result);
  observer_.message(completedText(result));
  observer_.evaluationFinished(sets_[place], result);
  tell(std::move(found));
  store(place, std::move(result));
}

void EvaluationLedger::tellOfRun(const EvaluationResult& result, std::string_view leftBehind) {
  const std::string front = progress::nameOfEvaluation(result.number) + ": ";
  if (!leftBehind.empty()) observer_.processesLeft(std::string(front).append(leftBehind));
  warnOfUnusedObservations(result);
  for (const std::string& text : result.warnings) observer_.warning(front + text);
  for (const UnkeptFile& file : result.absentFiles) observer_.fileAbsent(file.name, front + file.reason);
}

/// Of a run beside a row only if it is the run that the row describes.
void EvaluationLedger::noteUnkeptFiles(std::size_t place, const EvaluationResult& result) {
  const std::vector<double> repeated = repeatedMeasures(place);
  const bool isNews = !result.unkeptFiles.empty() || (earlier_ != nullptr && earlier_->isRunAgain(result.number));
  if (result.ok() && isNews && (repeated.empty() || repeated == result.measureValues))
    observer_.recordUnkeptFiles(result.number, result.unkeptFiles);
}

/// Its model was run for its pairs, or as the final run, beside its row, which is kept.
void EvaluationLedger::finishRepeated(std::size_t place, EvaluationResult known, EvaluationResult result) {
  known.shownSeries = std::move(result.shownSeries);
  if (result.ok()) known.pairs = std::move(result.pairs);
  if (!result.ok() && known.ok()) {
    observer_.warning(
        fmt::format("{} was made again{}: the model run failed: {}", progress::nameOfEvaluation(result.number),
                    isFinalRun_ ? "" : " for its pairs, and further runs are compared with the next successful one",
                    result.failure->reason));
  }
  replay(place, std::move(known));
}

/// Its result is known from an earlier run, whose output files could not all be kept.
void EvaluationLedger::finishAgain(std::size_t place, const EvaluationResult& result) {
  const std::string again = progress::nameOfEvaluation(result.number) + " was made again for its output files: ";
  if (!result.ok()) return observer_.warning(again + "the model run failed: " + result.failure->reason);
  if (result.measureValues != results_[place].measureValues) {
    return observer_.warning(again + "the model run has other results than before, and its files are not kept");
  }
  observer_.recordUnkeptFiles(result.number, result.unkeptFiles);
}

void EvaluationLedger::tell(ComparisonFindings found) {
  if (found.isEmpty()) return;
  for (RunDifference& difference : found.differences) {
    difference.isTold = difference.kind == RunDifference::Kind::fewerPairs &&
                        warnedOf_.contains({difference.number, difference.measure});
  }
  observer_.runCompared(found);
}

void EvaluationLedger::warnOfUnusedObservations(const EvaluationResult& result) {
  for (const UnusedObservations& unused : result.unusedObservations) {
    const auto [fewest, isFirst] = fewestUsed_.try_emplace(unused.measure, unused.usedCount);
    if (!isFirst && fewest->second <= unused.usedCount) continue;
    fewest->second = unused.usedCount;
    warnedOf_.emplace(result.number, unused.measure);
    observer_.warning(progress::nameOfEvaluation(result.number) + ": " + unused.text);
  }
}

std::vector<EvaluationResult> EvaluationLedger::end() {
  if (const auto text = equalMeasures_.findIn(sets_, results_, isFinalRun_)) observer_.urgentWarning(*text);
  return close();
}

std::vector<EvaluationResult> EvaluationLedger::close() {
  evaluationCount_ += static_cast<int>(sets_.size());
  sets_ = {};
  isFinished_.clear();
  next_ = 0;
  returned_.clear();
  runAgain_.clear();
  finishedCount_ = 0;
  openCount_ = 0;
  return std::exchange(results_, {});
}

UnfinishedBatch EvaluationLedger::takeUnfinished() {
  UnfinishedBatch unfinished;
  for (std::size_t place = 0; place < sets_.size(); ++place) {
    if (!isFinished_[place]) continue;
    unfinished.sets.push_back(std::move(sets_[place]));
    unfinished.results.push_back(std::move(results_[place]));
  }
  close();
  return unfinished;
}

void settleAggregates(ObjectiveAggregator& aggregator, std::span<EvaluationResult> sample,
                      EvaluationObserver& observer) {
  if (aggregator.isSettled()) return;
  std::vector<std::vector<double>> succeeded;
  for (const EvaluationResult& result : sample) {
    if (result.ok()) succeeded.push_back(result.objectiveValues);
  }
  aggregator.fit(succeeded);
  for (const std::string& line : aggregator.scaleLines()) observer.message(line);
  for (EvaluationResult& result : sample) {
    if (result.ok()) result.aggregate = aggregator.aggregate(result.objectiveValues);
  }
}

}  // namespace mirevo

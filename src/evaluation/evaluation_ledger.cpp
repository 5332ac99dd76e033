#include "evaluation/evaluation_ledger.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <iterator>
#include <unordered_map>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/progress_messages.h"

namespace mirevo {
namespace {

/// So many sets for each slot are the last ones of a batch. The others are started in their order, so that those that
/// a run has made when it is cut off are not the ones that take long: statistics of a sample would be biased.
constexpr std::size_t kLastSetsPerSlot = 8;

std::string completedText(const EvaluationResult& result) {
  std::string_view outcome = progress::kOk;
  if (!result.ok()) {
    // A set that cannot be run is no model run error, even if it is an equation that has no finite value.
    outcome = result.failure->isOfConstraints() ? progress::kConstraintsViolated : progress::kModelRunError;
  }
  return progress::completedMessage(result.number, outcome);
}

}  // namespace

void EvaluationLedger::open(std::span<const ParameterSet> sets, DispatchMode mode, std::size_t slotCount) {
  const std::size_t first = endPlace();
  slotCount_ = slotCount;
  sets_.insert(sets_.end(), sets.begin(), sets.end());
  results_.resize(sets_.size());
  isFinished_.resize(sets_.size(), false);
  isFinalRun_ = mode == DispatchMode::finalRun;
  if (earlier_ == nullptr || isFinalRun_) return;
  for (std::size_t place = first; place < endPlace(); ++place) {
    if (earlier_->repeatsRun(numberOf(place))) continue;
    const bool isRepeat = earlier_->isRepeat(numberOf(place));
    auto result = earlier_->take(numberOf(place), set(place));
    if (!result) continue;
    if (isRepeat) repeats_.insert(place);
    replay(place, std::move(*result));
    if (!earlier_->isRunAgain(numberOf(place))) continue;
    runAgain_.insert(place);
    returned_.insert(place);
  }
}

void EvaluationLedger::requireClosed() const {
  if (!isOpen()) return;
  fatalError("Error: Evaluations left open by a search",
             fmt::format("evaluation No. {} was not taken before a batch was begun. This is a fault of Mirevo: please "
                         "report it with the setup",
                         numberOf(closedCount_)));
}

void EvaluationLedger::replay(std::size_t place, EvaluationResult result) {
  ComparisonFindings found = runComparison_.take(result, isFinalRun_);
  observer_.evaluationReplayed(set(place), result);
  tell(std::move(found));
  store(place, std::move(result));
}

/// Stores and counts a result that has been reported.
void EvaluationLedger::store(std::size_t place, EvaluationResult result) {
  // Not needed any more; the batch keeps its results until it is complete.
  result.shownSeries = {};
  if (observer_.readsSimulatedValues()) result.simulatedValues = std::vector<double>();  // {} would keep its memory
  const EvaluationResult& stored = results_[indexOf(place)] = std::move(result);
  isFinished_[indexOf(place)] = true;
  ++finishedCount_;
  for (const int waiting : known_.ended(stored.number, set(place), stored.ok())) {
    returned_.insert(placeOf(waiting));
  }
  if (!stored.ok()) failedRuns_.countFailure(stored.number, *stored.failure);
}

std::optional<std::size_t> EvaluationLedger::takeNext() {
  while (const auto place = placeOfNext()) {
    const bool isNeeded = isFinalRun_ || runAgain_.contains(*place) || !repeatedMeasures(*place).empty();
    const auto step = isNeeded ? KnownResults::Step{} : known_.next(numberOf(*place), set(*place));
    if (step.kind == KnownResults::Step::Kind::wait) continue;
    if (step.kind == KnownResults::Step::Kind::repeat) {
      if (observer_.isCancelled()) {  // a search may go on for long without a model run
        returned_.insert(*place);
        return std::nullopt;
      }
      if (repeat(*place, step.original)) continue;
    }
    known_.run(numberOf(*place), set(*place));
    ++runningCount_;
    return place;
  }
  return std::nullopt;
}

std::optional<std::size_t> EvaluationLedger::placeOfNext() {
  while (next_ < endPlace() && isFinished_[indexOf(next_)]) ++next_;
  if (next_ == endPlace() && returned_.empty() && longestFirst_.empty()) return std::nullopt;
  if (runningCount_ > 0 && runComparison_.isAwaited()) return std::nullopt;
  if (slotCount_ > 1) orderLast();
  if (returned_.empty() && !longestFirst_.empty()) {
    const std::size_t longest = longestFirst_.back();
    longestFirst_.pop_back();
    return longest;
  }
  // In their order: a result may wait for that of a set before it.
  if (returned_.empty() || (next_ < endPlace() && next_ < *returned_.begin())) return next_++;
  const std::size_t first = *returned_.begin();
  returned_.erase(returned_.begin());
  return first;
}

/// As a model run would be reported, counted and compared that had the same outcome.
bool EvaluationLedger::repeat(std::size_t place, int original) {
  EvaluationResult result;
  if (!observer_.recall(original, set(place), result)) return false;
  result.number = numberOf(place);
  result.aggregate = known_.aggregateOf(result);
  repeats_.insert(place);
  ComparisonFindings found = runComparison_.take(result, isFinalRun_);
  observer_.recordRepeat(set(place), result, original);
  observer_.message(progress::repeatMessage(result.number, original));
  observer_.message(completedText(result));
  observer_.evaluationFinished(set(place), result);
  tell(std::move(found));
  store(place, std::move(result));
  return true;
}

void EvaluationLedger::putBack(std::size_t place) {
  known_.putBack(numberOf(place), set(place));
  returned_.insert(place);
  --runningCount_;
}

bool EvaluationLedger::takeAgain(std::size_t place) {
  if (returned_.erase(place) == 0) return false;
  known_.run(numberOf(place), set(place));  // others may wait for it
  ++runningCount_;
  return true;
}

std::vector<double> EvaluationLedger::repeatedMeasures(std::size_t place) const {
  if (runAgain_.contains(place)) return results_[indexOf(place)].measureValues;
  return earlier_ == nullptr ? std::vector<double>() : earlier_->measuresOf(numberOf(place));
}

void EvaluationLedger::orderLast() {
  // A result may wait for that of a set before it until the first successful run is known.
  if (runComparison_.firstNumber() == 0 || runTimes_.count() < RunTimes::kFewest) return;
  if (next_ < endPlace()) {
    if (endPlace() - next_ > kLastSetsPerSlot * slotCount_) return;
    for (; next_ < endPlace(); ++next_) {
      if (!isFinished_[indexOf(next_)]) longestFirst_.push_back(next_);
    }
    orderedBy_ = 0;
  }
  // Again when there is more to judge by.
  if (longestFirst_.size() < 2 || 2 * runTimes_.count() < 3 * orderedBy_) return;
  orderedBy_ = runTimes_.count();
  std::ranges::sort(longestFirst_);
  if (const std::vector<RunTimes::Effect> effects = runTimes_.effects(); !effects.empty()) {
    std::vector<std::pair<double, std::size_t>> expected;
    for (const std::size_t place : longestFirst_) expected.emplace_back(-expectedLog(effects, set(place)), place);
    std::ranges::sort(expected);
    std::ranges::transform(expected, longestFirst_.begin(), [](const auto& each) { return each.second; });
    keepOrderOfEqual(longestFirst_);
  }
  std::ranges::reverse(longestFirst_);
}

void EvaluationLedger::keepOrderOfEqual(std::vector<std::size_t>& places) const {
  if (isFinalRun_ || !known_.isKnowing()) return;
  std::unordered_map<std::uint64_t, std::vector<std::size_t>> equal;
  for (const std::size_t place : places) equal[known_.hashOf(set(place))].push_back(place);
  for (auto& [hash, group] : equal) std::ranges::sort(group, std::greater());
  for (std::size_t& place : places) {
    std::vector<std::size_t>& group = equal.at(known_.hashOf(set(place)));
    place = group.back();
    group.pop_back();
  }
}

void EvaluationLedger::markInitiated(std::size_t place, double now) {
  observer_.message(progress::initiatedMessage(numberOf(place)));
  if (slotUse_ != nullptr && !isFinalRun_) slotUse_->runStarted(now);
  startedAt_[place] = now;
}

void EvaluationLedger::markEnded(std::size_t place, double now, bool isLost) {
  if (slotUse_ != nullptr && !isFinalRun_) slotUse_->runEnded(now);
  const auto started = startedAt_.extract(place);
  if (!started.empty() && !isLost && slotCount_ > 1) runTimes_.add(set(place), now - started.mapped());
}

void EvaluationLedger::finish(std::size_t place, EvaluationResult result, std::string_view leftBehind) {
  result.number = numberOf(place);
  --runningCount_;
  tellOfRun(result, leftBehind);
  if (runAgain_.erase(place) > 0) {
    observer_.message(completedText(result));
    return finishAgain(place, result);
  }
  noteUnkeptFiles(place, result);
  if (auto known = earlier_ == nullptr ? std::nullopt : earlier_->take(result.number, set(place))) {
    observer_.message(completedText(result));
    return finishRepeated(place, std::move(*known), std::move(result));
  }
  ComparisonFindings found = runComparison_.take(result, isFinalRun_);
  observer_.recordEvaluation(set(place), result);
  observer_.message(completedText(result));
  observer_.evaluationFinished(set(place), result);
  tell(std::move(found));
  store(place, std::move(result));
}

void EvaluationLedger::tellOfRun(const EvaluationResult& result, std::string_view leftBehind) {
  const std::string front = progress::nameOfEvaluation(result.number) + ": ";
  if (!leftBehind.empty()) observer_.processesLeft(std::string(front).append(leftBehind));
  warnOfUnusedObservations(result);
  for (const std::string& text : result.warnings) observer_.warning(front + text);
  for (const FileDoubt& doubt : result.doubts) {
    if (toldDoubts_.emplace(doubt.file, doubt.place).second) observer_.warning(front + doubt.text);
  }
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
  if (!result.ok() && (known.ok() || isFinalRun_)) {
    observer_.warning(
        fmt::format("{} was made again{}: the model run failed: {}", progress::nameOfEvaluation(result.number),
                    isFinalRun_ ? "" : " for its pairs, and further runs are compared with the next successful one",
                    result.failure->reason));
  }
  if (isFinalRun_ && result.ok() && known.ok() && result.measureValues != known.measureValues) {
    observer_.urgentWarning(
        fmt::format("{}, the final model run, was made again and has other results than in its row, "
                    "which is kept: the model depends on more than its parameters",
                    progress::nameOfEvaluation(result.number)));
  }
  if (isFinalRun_ && result.ok() && !known.ok()) {
    observer_.warning(fmt::format(
        "{}, the final model run, was made again and has succeeded. Its row, which is kept, has it as failed; "
        "its process folder has the results",
        progress::nameOfEvaluation(result.number)));
  }
  replay(place, std::move(known));
}

/// Its result is known from an earlier run, whose output files could not all be kept.
void EvaluationLedger::finishAgain(std::size_t place, const EvaluationResult& result) {
  const std::string again = progress::nameOfEvaluation(result.number) + " was made again for its output files: ";
  if (!result.ok()) return observer_.warning(again + "the model run failed: " + result.failure->reason);
  if (result.measureValues != results_[indexOf(place)].measureValues) {
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
  if (const auto text = equalMeasures_.findIn(sets_, results_, isFinalRun_, repeatsAmong(sets_.size())))
    observer_.urgentWarning(*text);
  if (slotUse_ != nullptr && !isFinalRun_) slotUse_->endBatch();
  return close();
}

/// Their indices in the first `count` of the open sets.
std::set<std::size_t> EvaluationLedger::repeatsAmong(std::size_t count) const {
  std::set<std::size_t> indices;
  for (const std::size_t place : repeats_) {
    if (place < closedCount_ + count) indices.insert(place - closedCount_);
  }
  return indices;
}

EvaluationResult EvaluationLedger::takeFirst() {
  const std::size_t first = indexOf(closedCount_);
  // One at a time, so that what it finds does not depend on what else has ended.
  const auto text = equalMeasures_.findIn({&sets_[first], 1}, {&results_[first], 1}, isFinalRun_, repeatsAmong(1));
  repeats_.erase(closedCount_);
  if (text) observer_.urgentWarning(*text);
  if (slotUse_ != nullptr) slotUse_->endPart();
  EvaluationResult result = std::move(results_[first]);
  sets_[first] = {};
  ++closedCount_;
  --finishedCount_;
  next_ = std::max(next_, closedCount_);
  // The sets closed are dropped together, so that each of many costs the same.
  if (const auto count = static_cast<std::ptrdiff_t>(first + 1); 2 * count > std::ssize(sets_)) {
    sets_.erase(sets_.begin(), sets_.begin() + count);
    results_.erase(results_.begin(), results_.begin() + count);
    isFinished_.erase(isFinished_.begin(), isFinished_.begin() + count);
    start_ = closedCount_;
  }
  return result;
}

std::vector<EvaluationResult> EvaluationLedger::close() {
  start_ = closedCount_ = next_ = endPlace();
  sets_ = {};
  isFinished_.clear();
  returned_.clear();
  longestFirst_.clear();
  startedAt_.clear();
  runAgain_.clear();
  repeats_.clear();
  known_.closeBatch();
  finishedCount_ = 0;
  runningCount_ = 0;
  return std::exchange(results_, {});
}

UnfinishedBatch EvaluationLedger::takeUnfinished() {
  UnfinishedBatch unfinished;
  for (std::size_t place = closedCount_; place < endPlace(); ++place) {
    if (!isFinished_[indexOf(place)]) continue;
    unfinished.sets.push_back(std::move(sets_[indexOf(place)]));
    unfinished.results.push_back(std::move(results_[indexOf(place)]));
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

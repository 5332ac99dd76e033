#include "run/run_reporter.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/progress_messages.h"
#include "common/run_files.h"

namespace mirevo {
namespace {

/// Of each kind in the result file; as warnings in the log, behind which the others are plain lines.
constexpr int kMostDifferencesShown = 20;

const DifferenceTexts& textsOf(RunDifference::Kind kind) {
  const std::span<const DifferenceTexts> all = differenceTexts();
  return *std::find_if(all.begin(), all.end(), [kind](const DifferenceTexts& texts) { return texts.kind == kind; });
}

}  // namespace

RunReporter::RunReporter(RunState& state, ResultFile& results, FailedRunFile& failedRuns, const SearchSpace& space,
                         SimulatedValuesFile* simulatedValues, PairsFile* pairs)
    : state_(state),
      results_(results),
      failedRuns_(failedRuns),
      space_(space),
      simulatedValues_(simulatedValues),
      pairs_(pairs),
      initial_(ToModelScale(space, space.initial)) {}

void RunReporter::message(std::string_view text) {
  state_.log.line(text);
  state_.progress.writeMessage(text);
}

void RunReporter::warning(std::string_view text) {
  state_.log.warning(text);
}

void RunReporter::recordEvaluation(std::span<const double> set, const EvaluationResult& result) {
  const std::vector<double> values = ToModelScale(space_, set);
  // The row is written last: if it is on disk, all that belongs to it is, too, whenever the program ends.
  if (!result.ok()) failedRuns_.add(values, result);
  if (result.ok() && simulatedValues_ != nullptr) simulatedValues_->add(result);
  if (!result.pairs.empty() && pairs_ != nullptr) pairs_->add(result.number, result.pairs);
  results_.addRow(resultRow(values, result));
}

void RunReporter::evaluationFinished(std::span<const double> set, const EvaluationResult& result) {
  if (!result.ok()) state_.log.line("   " + result.failure->reason);  // follows the message that it failed
  const std::vector<double> values = ToModelScale(space_, set);
  count(values, result, dateAndTimeWithZone());
  recordSeries(values, result);
  state_.progress.progressStep();
  if (const std::string problem = state_.progress.takeProblem(); !problem.empty()) state_.log.warning(problem);
  requireLogWritten();
}

void RunReporter::evaluationReplayed(std::span<const double> set, const EvaluationResult& result) {
  ++replayedCount_;
  state_.progress.progressReplayed(result.number, result.ok());
  const std::vector<double> values = ToModelScale(space_, set);
  count(values, result, {});
  if (!result.shownSeries.empty()) {
    recordSeries(values, result);
  } else if (result.ok() && recorder_ != nullptr) {
    recorder_->evaluationPassed(result.number, values);
  }
}

void RunReporter::runCompared(const RunComparison& found) {
  if (found.initialNumber != 0) initialRun_ = found.initialNumber;
  for (const std::string& line : found.initialLines) state_.log.line(line);
  for (const RunDifference& difference : found.differences) {
    const std::string text = fmt::format("{}: {}", progress::nameOfEvaluation(difference.number), difference.text);
    const bool isWarning = textsOf(difference.kind).isWarnedOf && differencesWarnedOf_ < kMostDifferencesShown;
    if (isWarning) {
      ++differencesWarnedOf_;
      state_.log.warning(text);
    } else {
      state_.log.line("   " + text);
    }
    differences_.insert_or_assign({difference.number, difference.measure, difference.kind}, difference);
  }
  if (!found.doubtOfInitial.empty()) state_.log.warning(found.doubtOfInitial);
}

std::vector<std::string> RunReporter::differenceLines() const {
  std::vector<std::string> lines;
  for (const DifferenceTexts& texts : differenceTexts()) {
    std::set<int> shown;
    std::set<int> all;
    int count = 0;
    for (const auto& [key, difference] : differences_) {
      if (difference.kind != texts.kind) continue;
      all.insert(difference.number);
      if (count == kMostDifferencesShown) continue;
      ++count;
      shown.insert(difference.number);
      lines.push_back(fmt::format("{}: evaluation {}: {}", texts.title, difference.number, difference.text));
    }
    if (all.size() == shown.size()) continue;
    lines.push_back(fmt::format("{}: {} more evaluations{}", texts.title, all.size() - shown.size(),
                                pairs_ == nullptr ? "" : ", see " + fileNameOf(pairs_->path())));
  }
  return lines;
}

std::vector<std::string> RunReporter::differenceCounts(std::string_view where) const {
  std::vector<std::string> sentences;
  for (const DifferenceTexts& texts : differenceTexts()) {
    std::set<int> numbers;
    for (const auto& [key, difference] : differences_) {
      if (difference.kind == texts.kind) numbers.insert(difference.number);
    }
    if (numbers.empty()) continue;
    const bool isOne = numbers.size() == 1;
    sentences.push_back(fmt::format("{} {}: {} names {}",
                                    isOne ? "1 evaluation" : fmt::format("{} evaluations", numbers.size()),
                                    isOne ? texts.ofOne : texts.ofSeveral, where, isOne ? "it" : "them"));
  }
  return sentences;
}

std::vector<std::string> RunReporter::differencesOfBest() const {
  if (!best()) return {};
  std::vector<RunDifference> ofBest;
  for (const auto& [key, difference] : differences_) {
    if (difference.number == best()->number) ofBest.push_back(difference);
  }
  return sentencesOnBest(best()->number, ofBest);
}

std::set<int> RunReporter::numbersWithPairs() const {
  if (initialRun_ == 0) return {};
  std::set<int> numbers{initialRun_};
  for (const auto& [key, difference] : differences_) numbers.insert(difference.number);
  return numbers;
}

void RunReporter::count(const std::vector<double>& parameterValues, const EvaluationResult& result,
                        std::string_view foundAt) {
  ++evaluationCount_;
  state_.objectiveValues = result.objectiveValues;
  if (!result.ok()) {
    ++failedCount_;
    failures_.add(result.number, *result.failure);
    return;
  }
  initial_.consider(result.number, parameterValues);
  if (std::isnan(result.aggregate)) {
    unsettled_.push_back({result.number, parameterValues, result.objectiveValues});
  } else if (!result.objectiveValues.empty()) {
    considerAsBest(result.number, result.aggregate, parameterValues, foundAt);
  }
}

void RunReporter::recordSeries(const std::vector<double>& values, const EvaluationResult& result) {
  if (recorder_ != nullptr) recorder_->evaluationFinished(result, values, best());
}

void RunReporter::requireLogWritten() const {
  if (state_.log.writeError().empty()) return;
  fatalError("Error: Unable to write to " + state_.log.path(), state_.log.writeError());
}

void RunReporter::takeBestOf(const SearchSummary& search) {
  if (search.best.empty() || !search.bestResult.ok()) return;
  best_.takeOfSearch({search.bestResult.number, search.bestResult.aggregate, ToModelScale(space_, search.best)});
}

void RunReporter::considerAsBest(int number, double aggregate, const std::vector<double>& parameterValues,
                                 std::string_view foundAt) {
  if (best_.consider(number, aggregate, parameterValues)) state_.progress.progressBest(number, aggregate, foundAt);
}

void RunReporter::settle(const ObjectiveAggregator& aggregator) {
  if (!aggregator.isSettled()) return;
  for (const Unsettled& evaluation : unsettled_) {
    const double aggregate = aggregator.aggregate(evaluation.objectiveValues);
    results_.replaceAggregate(evaluation.number, aggregate);
    if (recorder_ != nullptr) recorder_->aggregateSettled(evaluation.number, aggregate);
    considerAsBest(evaluation.number, aggregate, evaluation.parameterValues, dateAndTimeWithZone());
  }
  unsettled_.clear();
}

}  // namespace mirevo

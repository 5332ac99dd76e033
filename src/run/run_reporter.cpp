#include "run/run_reporter.h"

#include <cmath>

#include "common/clock.h"
#include "common/fatal_error.h"

namespace mirevo {

RunReporter::RunReporter(RunState& state, ResultFile& results, FailedRunFile& failedRuns, const SearchSpace& space,
                         SimulatedValuesFile* simulatedValues)
    : state_(state),
      results_(results),
      failedRuns_(failedRuns),
      space_(space),
      simulatedValues_(simulatedValues),
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

#include "run/run_reporter.h"

#include <algorithm>
#include <cmath>

#include "common/fatal_error.h"

namespace mirevo {

RunReporter::RunReporter(RunState& state, ResultFile& results, FailedRunFile& failedRuns, const SearchSpace& space)
    : state_(state), results_(results), failedRuns_(failedRuns), space_(space) {}

void RunReporter::message(std::string_view text) {
  state_.log.line(text);
  state_.progress.writeMessage(text);
}

void RunReporter::warning(std::string_view text) {
  state_.log.warning(text);
}

void RunReporter::evaluationFinished(std::span<const double> set, const EvaluationResult& result) {
  const std::vector<double> values = ToModelScale(space_, set);
  results_.addRow(values, result);
  ++evaluationCount_;
  state_.objectiveValues = result.objectiveValues;
  if (!result.ok()) {
    ++failedCount_;
    failedRuns_.add(values, result);
    state_.log.line("   " + result.failure->reason);  // below the message that it failed
  } else if (std::isnan(result.aggregate)) {
    unsettled_.push_back({result.number, values, result.objectiveValues});
  } else if (!result.objectiveValues.empty()) {
    considerAsBest(result.number, result.aggregate, values);
  }
  if (recorder_ != nullptr) {
    const bool isInitial = std::equal(set.begin(), set.end(), space_.initial.begin(), space_.initial.end());
    recorder_->evaluationFinished(result, values, isInitial, best_);
  }
  state_.progress.progressStep();
  if (!state_.log.writeError().empty()) {
    fatalError("Error: Unable to write to " + state_.log.path(), state_.log.writeError());
  }
}

void RunReporter::takeBestOf(const SearchSummary& search) {
  if (search.best.empty() || !search.bestResult.ok()) return;
  best_ = Best{search.bestResult.number, search.bestResult.aggregate, ToModelScale(space_, search.best)};
  isBestOfSearch_ = true;
}

void RunReporter::considerAsBest(int number, double aggregate, const std::vector<double>& parameterValues) {
  if (isBestOfSearch_) return;
  const bool isBetter =
      !best_ || aggregate < best_->aggregate || (aggregate == best_->aggregate && number < best_->number);
  if (!isBetter) return;
  best_ = Best{number, aggregate, parameterValues};
  state_.progress.progressBest(number, aggregate, dateAndTimeWithZone());
}

void RunReporter::settle(const ObjectiveAggregator& aggregator) {
  if (!aggregator.isSettled()) return;
  for (const Unsettled& evaluation : unsettled_) {
    const double aggregate = aggregator.aggregate(evaluation.objectiveValues);
    results_.replaceAggregate(evaluation.number, aggregate);
    considerAsBest(evaluation.number, aggregate, evaluation.parameterValues);
  }
  unsettled_.clear();
}

}  // namespace mirevo

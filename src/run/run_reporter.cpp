#include "run/run_reporter.h"

#include <fmt/format.h>

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
  std::vector<double> values = ToModelScale(space_, set);
  results_.addRow(values, result);
  ++evaluationCount_;
  state_.objectiveValues = result.objectiveValues;
  if (!result.ok()) {
    ++failedCount_;
    lastFailureReason_ = result.failure->reason;
    failedRuns_.add(values, result);
    state_.log.line(fmt::format("   Evaluation No. {}: {}", result.number, lastFailureReason_));
  } else if (!result.objectiveValues.empty() && (!best_ || result.aggregate < best_->aggregate)) {
    // A NaN, while the objective transformation is not settled, is never the best.
    if (result.aggregate == result.aggregate) best_ = Best{result.number, result.aggregate, std::move(values)};
  }
  state_.progress.progressStep();
  if (!state_.log.writeError().empty()) {
    fatalError("Error: Unable to write to " + state_.log.path(), state_.log.writeError());
  }
}

}  // namespace mirevo

#include "evaluation/local_evaluator.h"

#include <cassert>
#include <utility>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {

LocalEvaluator::LocalEvaluator(ModelRunner& runner, EvaluationObserver& observer, FailedRunPolicy& failedRuns,
                               int slotCount)
    : runner_(runner), observer_(observer), failedRuns_(failedRuns), slots_(static_cast<std::size_t>(slotCount)) {
  assert(slotCount > 0);
}

std::vector<EvaluationResult> LocalEvaluator::evaluateParameterSets(std::span<const ParameterSet> sets,
                                                                    DispatchMode mode) {
  static_cast<void>(mode);  // a set is run the same way, whatever it is for
  Batch batch{sets, std::vector<EvaluationResult>(sets.size())};
  for (int slot = 1; slot <= static_cast<int>(slots_.size()); ++slot) startNext(batch, slot);
  while (batch.finished < sets.size()) {
    if (!takeFinished(batch)) runner_.launcher().waitForChange(kPollSeconds);
    stopIfCancelled();
  }
  evaluationCount_ += static_cast<int>(sets.size());
  return std::move(batch.results);
}

void LocalEvaluator::startNext(Batch& batch, int slot) {
  while (batch.next < batch.sets.size()) {
    stopIfCancelled();
    const std::size_t set = batch.next++;
    auto failure = runner_.prepareModelRun(batch.sets[set], slot);
    if (!failure) {
      observer_.message(withNumber("Evaluation of parameter set No. % initiated", numberOf(set)));
      slots_[static_cast<std::size_t>(slot - 1)] = set;
      return;
    }
    finish(batch, set, runner_.failedResult(std::move(*failure)));
  }
}

bool LocalEvaluator::takeFinished(Batch& batch) {
  bool any = false;
  for (int slot = 1; slot <= static_cast<int>(slots_.size()); ++slot) {
    auto& running = slots_[static_cast<std::size_t>(slot - 1)];
    if (!running) continue;
    std::int32_t executing = 0;
    std::int32_t status = 0;
    runner_.launcher().isExecuting(slot, executing, status);
    if (executing != 0) continue;
    any = true;
    const std::size_t set = *running;
    running.reset();
    if (const std::string left = runner_.launcher().leftBehind(slot); !left.empty()) {
      observer_.warning(withNumber("Evaluation of parameter set No. %: ", numberOf(set)) + left);
    }
    EvaluationResult result = runner_.collect(slot);
    runner_.keepOutputFiles(slot, numberOf(set), result);
    finish(batch, set, std::move(result));
    startNext(batch, slot);
  }
  return any;
}

void LocalEvaluator::finish(Batch& batch, std::size_t set, EvaluationResult result) {
  result.number = numberOf(set);
  std::string_view outcome = "Evaluation of parameter set No. % completed: OK";
  if (!result.ok()) {
    outcome = result.failure->kind == EvaluationFailure::Kind::constraintsViolated
                  ? "Evaluation of parameter set No. % completed: FAILED - parameter constraints violated"
                  : "Evaluation of parameter set No. % completed: FAILED - model run error";
  }
  for (const std::string& text : result.warnings) {
    observer_.warning(withNumber("Evaluation of parameter set No. %: ", result.number) + text);
  }
  observer_.message(withNumber(outcome, result.number));
  observer_.evaluationFinished(batch.sets[set], result);
  if (!result.ok()) failedRuns_.countFailure(result.number, *result.failure);
  batch.results[set] = std::move(result);
  ++batch.finished;
}

void LocalEvaluator::stopIfCancelled() {
  if (!observer_.isCancelled()) return;
  observer_.message("Simulation cancelled");
  runner_.launcher().haltProcesses();
  throw RunCancelled();
}

void LocalEvaluator::settleAggregates(std::span<EvaluationResult> sample) {
  ObjectiveAggregator& aggregator = runner_.aggregator();
  if (aggregator.isSettled()) return;
  std::vector<std::vector<double>> succeeded;
  for (const EvaluationResult& result : sample) {
    if (result.ok()) succeeded.push_back(result.objectiveValues);
  }
  aggregator.fit(succeeded);
  for (EvaluationResult& result : sample) {
    if (result.ok()) result.aggregate = aggregator.aggregate(result.objectiveValues);
  }
}

}  // namespace mirevo

#pragma once

#include "evaluation/evaluation_observer.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"

namespace mirevo {

/// Runs the model in local slots, several at once.
class LocalEvaluator final : public Evaluator {
 public:
  LocalEvaluator(ModelRunner& runner, EvaluationObserver& observer, FailedRunPolicy& failedRuns, int slotCount);

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override;
  void settleAggregates(std::span<EvaluationResult> sample) override;

 private:
  ModelRunner& runner_;
  EvaluationObserver& observer_;
  FailedRunPolicy& failedRuns_;
  int slotCount_;
  int evaluationCount_ = 0;  ///< sets numbered so far in the run
};

}  // namespace mirevo

#pragma once

#include <functional>
#include <optional>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "evaluation/evaluator.h"
#include "parameters/feasibility.h"

namespace mirevo {

/// Evaluates a function instead of a model, and keeps every batch for the test to look at.
class FunctionEvaluator final : public Evaluator {
 public:
  using Function = std::function<EvaluationResult(const ParameterSet&)>;

  explicit FunctionEvaluator(Function function) : function_(std::move(function)) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override {
    batches.emplace_back(sets.begin(), sets.end());
    modes.push_back(mode);
    std::vector<EvaluationResult> results;
    for (const ParameterSet& set : sets) {
      results.push_back(function_(set));
      results.back().number = ++evaluationCount;
    }
    return results;
  }
  void settleAggregates(std::span<EvaluationResult> sample) override { settledSizes.push_back(sample.size()); }

  std::vector<std::vector<ParameterSet>> batches;
  std::vector<DispatchMode> modes;  ///< of the batches
  std::vector<std::size_t> settledSizes;
  int evaluationCount = 0;

 private:
  Function function_;
};

/// A result that holds one value as measure, objective function and aggregate.
inline EvaluationResult resultOf(double value) {
  return {.measureValues = {value}, .objectiveValues = {value}, .aggregate = value};
}

/// The result of a run that failed.
inline EvaluationResult failedResult() {
  EvaluationResult result = resultOf(kFailedRunValue);
  result.failure.emplace();
  return result;
}

/// Only sets that meet the condition can be run.
template <typename Condition>
Feasibility feasibleWhere(Condition isMet, const std::string& reason) {
  return Feasibility([=](std::span<const double> set) { return isMet(set) ? std::nullopt : std::optional(reason); });
}

}  // namespace mirevo

#include "glm_trials.h"

#include <utility>

#include <fmt/format.h>

namespace mirevo::bench {
namespace {

/// The target evaluator with the residuals where a model run has its simulated values.
class ResidualEvaluator final : public Evaluator {
 public:
  ResidualEvaluator(TargetEvaluator& target, const Residuals& residuals) : target_(target), residuals_(residuals) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override {
    std::vector<EvaluationResult> results = target_.evaluateParameterSets(sets, mode);
    for (std::size_t i = 0; i < sets.size(); ++i) results[i].simulatedValues = residuals_(sets[i]);
    return results;
  }

 private:
  TargetEvaluator& target_;
  const Residuals& residuals_;
};

}  // namespace

Outcome runGlmTrial(const TestFunction& function, const Residuals& residuals, const GlmSettings& settings,
                    const Setting& setting, int seed) {
  ResidualProblem fitting;
  SearchBounds bounds{function.lower, function.upper, {}};
  for (std::size_t j = 0; j < function.size(); ++j) {
    bounds.initial.push_back(0.5 * (function.lower[j] + function.upper[j]));
    fitting.space.names.push_back(fmt::format("x{}", j + 1));
    fitting.space.transformation.push_back(TransformationType::none);
  }
  fitting.space.lower = function.lower;
  fitting.space.upper = function.upper;
  fitting.space.initial = bounds.initial;
  fitting.residualsOf = [](const EvaluationResult& result) {
    return ResidualRows{result.simulatedValues, std::vector<double>(result.simulatedValues.size(), 0.0)};
  };
  TargetEvaluator target(function, setting, seed);
  ResidualEvaluator evaluator(target, residuals);
  UniformGenerator random(seed);
  InitialSampleSettings sample;
  sample.includeInitialParameters = false;
  SearchProblem problem{bounds, {setting.budget, 10, 0.001}, sample, {}, evaluator, random};
  problem.residuals = &fitting;
  Glm search(settings, std::move(problem));
  search.initialise();
  while (!search.isTerminated() && !(setting.stopsAtTarget && target.hasHitTarget())) search.advance();
  target.bestAfter.resize(setting.checkpoints.size(), target.bestInTime);  // it may end before
  return {target.hasHitTarget(), target.evaluationsToTarget, target.bestInTime, std::move(target.bestAfter)};
}

}  // namespace mirevo::bench

#include "algorithms/searches/stopping_criteria.h"

#include <algorithm>
#include <cmath>

namespace mirevo {

const SettingSection<StoppingCriteria>& stoppingSection() {
  static const SettingSection<StoppingCriteria> section{
      {"OPTIMISATION_ALGORITHM/STOPPING_CRITERIA",
       "when `Option` is 2",
       "When the search stops; the first criterion that is met.",
       {setting<&StoppingCriteria::maxEvaluations>({.name = kBudgetKeyword,
                                                    .range = from(1),
                                                    .refusal = "Error: Maximum No. of model evaluations invalid",
                                                    .unit = "model runs",
                                                    .meaning = "Budget of the search."}),
        setting<&StoppingCriteria::loopsConvergence>(
            {.name = "No_Loops_Convergence",
             .defaultValue = "10",
             .range = from(1),
             .refusal = "Error: No. of loops for evaluation of convergence criterion invalid",
             .unit = "loops",
             .meaning = "Number of loops over which the change of the best objective value is evaluated."}),
        setting<&StoppingCriteria::minChange>(
            {.name = "Min_Change",
             .defaultValue = "0.001",
             .range = kNonNegative,
             .refusal = "Error: Minimum change convergence criterion invalid",
             .meaning = "Relative change of the best objective value below which the search has converged."})}}};
  return section;
}

StoppingTests::StoppingTests(const StoppingCriteria& criteria)
    : criteria_(criteria), relativeChange_(criteria.minChange + criteria.minChange) {}

void StoppingTests::update(double bestValue, int evaluationCount, double populationRange) {
  const auto length = static_cast<std::size_t>(std::max(1, criteria_.loopsConvergence));
  history_.push_front(bestValue);
  if (history_.size() > length) history_.pop_back();
  if (history_.size() == length) {
    const double earlier = history_.back();
    // Deliberately without an absolute value in the denominator: negative values give a negative change, with which the
    // search counts as converged.
    relativeChange_ = 2.0 * std::abs(earlier - bestValue) / (bestValue + earlier);
  }

  if (evaluationCount >= criteria_.maxEvaluations) {
    message_ = kBudgetUsedMessage;
  }
  if (criteria_.minChange > relativeChange_) {
    message_ = "Optimisation terminated: Objective function convergence criterion met";
  }
  if (kConvergedPopulationRange > populationRange) {
    message_ = "Optimisation terminated: Population converged";
  }
}

}  // namespace mirevo

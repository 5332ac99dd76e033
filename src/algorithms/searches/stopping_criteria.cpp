#include "algorithms/searches/stopping_criteria.h"

#include <algorithm>
#include <cmath>

#include <fmt/format.h>

#include "common/text.h"

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
            {.name = kLoopsKeyword,
             .defaultValue = "10",
             .range = from(1),
             .refusal = "Error: No. of loops for evaluation of convergence criterion invalid",
             .unit = "loops",
             .meaning = "Number of loops over which the change of the best objective value is evaluated."}),
        setting<&StoppingCriteria::minChange>(
            {.name = kChangeKeyword,
             .defaultValue = "0.001",
             .range = kNonNegative,
             .refusal = "Error: Minimum change convergence criterion invalid",
             .meaning = "Relative change of the best objective value below which the search has converged."}),
        setting<&StoppingCriteria::minPopulationRange>(
            {.name = kRangeKeyword,
             .defaultValue = "1e-5",
             .range = kFraction,
             .refusal = "Error: Minimum population range convergence criterion invalid",
             .unit = "of the bounds",
             .meaning = "Of SCE, PSE and OPSE: range of the population, as a mean over the parameters, below which it "
                        "has converged. 0: it never has."})}}};
  return section;
}

StoppingTests::StoppingTests(const StoppingCriteria& criteria, Divisor divisor)
    : criteria_(criteria), divisor_(divisor), relativeChange_(criteria.minChange + criteria.minChange) {}

void StoppingTests::update(double bestValue, int evaluationCount, double populationRange) {
  const auto length = static_cast<std::size_t>(std::max(1, criteria_.loopsConvergence));
  history_.push_front(bestValue);
  if (history_.size() > length) history_.pop_back();
  if (history_.size() == length) {
    const double earlier = history_.back();
    // Divisor::values is deliberately without an absolute value: negative values give a negative change, with which the
    // search counts as converged.
    const double sum = divisor_ == Divisor::values ? bestValue + earlier : std::abs(bestValue) + std::abs(earlier);
    relativeChange_ = 2.0 * std::abs(earlier - bestValue) / sum;
  }

  populationRange_ = populationRange;
  if (evaluationCount >= criteria_.maxEvaluations) {
    message_ = kBudgetUsedMessage;
  }
  if (isChangeSmall()) {
    message_ = "Optimisation terminated: Objective function convergence criterion met";
  }
  if (isRangeSmall()) {
    message_ = "Optimisation terminated: Population converged";
  }
}

std::vector<std::string> StoppingTests::reasons() const {
  std::vector<std::string> lines;
  if (isChangeSmall()) {
    lines.push_back(fmt::format("Relative change of the best objective value over {} loops: {:.6g}, less than {} = {}",
                                criteria_.loopsConvergence, relativeChange_, kChangeKeyword,
                                formatReal(criteria_.minChange)));
  }
  if (isRangeSmall()) {
    lines.push_back(fmt::format("Range of the population, of the bounds: {:.6g}, less than {} = {}", populationRange_,
                                kRangeKeyword, formatReal(criteria_.minPopulationRange)));
  }
  return lines;
}

}  // namespace mirevo

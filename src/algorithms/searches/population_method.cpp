#include "algorithms/searches/population_method.h"

#include <fmt/format.h>

namespace mirevo {

std::optional<SettingRefusal> validateSimplex(const SimplexSettings& simplex, std::int32_t available,
                                              std::string_view source, std::string_view keyword,
                                              std::string_view refusal) {
  if (simplex.pointCount <= available) return std::nullopt;
  return SettingRefusal{
      std::string(refusal), keyword,
      fmt::format("expected at most the {} points of {}, found {}", available, source, simplex.pointCount)};
}

bool PopulationMethod::evaluatesSample(const InitialSampleSettings& /*sample*/) const {
  return true;
}

RaisedBudget PopulationMethod::raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                                           const InitialSampleSettings& /*sample*/) const {
  RaisedBudget raised;
  if (history.budget < populationSize()) {
    raised.refusal = fmt::format(
        "Max_No_Evaluations: {} then, {} now: only a search whose budget held its initial sample of {} "
        "sets can be taken further",
        history.budget, stopping.maxEvaluations, populationSize());
    return raised;
  }
  // An evaluation beyond the earlier budget is the final model run of the search that used the budget up.
  raised.keptEvaluations = history.budget;
  raised.note = fmt::format("Max_No_Evaluations was raised from {} to {}: the search goes on where it ended",
                            history.budget, stopping.maxEvaluations);
  return raised;
}

}  // namespace mirevo

#include "evaluation/earlier_evaluations.h"

#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {

EarlierEvaluations::EarlierEvaluations(SearchSpace space, const ObjectiveAggregator& aggregator,
                                       std::map<int, Record> records)
    : space_(std::move(space)), aggregator_(aggregator), records_(std::move(records)) {}

std::optional<EvaluationResult> EarlierEvaluations::take(int number, std::span<const double> set) {
  const auto found = records_.find(number);
  if (found == records_.end()) return std::nullopt;
  requireSameValues(number, found->second.parameterValues, set);
  EvaluationResult result = std::move(found->second.result);
  records_.erase(found);
  result.number = number;
  // The transformation may have become known only after the evaluation was recorded, or may be determined again.
  result.aggregate = result.ok() ? aggregator_.aggregate(result.objectiveValues) : kFailedRunValue;
  return result;
}

bool EarlierEvaluations::repeatsRun(int number) const {
  const auto found = records_.find(number);
  return found != records_.end() && found->second.repeatsRun;
}

bool EarlierEvaluations::isRepeat(int number) const {
  const auto found = records_.find(number);
  return found != records_.end() && found->second.isRepeat;
}

const std::vector<double>* EarlierEvaluations::measuresOf(int number) const {
  const auto found = records_.find(number);
  return found == records_.end() ? nullptr : &found->second.result.measureValues;
}

void EarlierEvaluations::requireSameValues(int number, std::span<const double> earlier,
                                           std::span<const double> set) const {
  const auto other = findOtherValue(space_, set, earlier);
  if (!other) return;
  fatalError("Error: Unable to continue the earlier run",
             fmt::format("evaluation No. {} has {} = {} in the earlier results, and {} now, though the settings are "
                         "the same.\nEither the results were changed, or they were written by another version of the "
                         "program, or on a machine that rounds otherwise.\nRestart = 0 starts afresh and keeps them "
                         "under a numbered name.",
                         number, space_.names[*other], formatReal(earlier[*other]),
                         formatReal(toModelScale(space_, *other, set[*other]))));
}

}  // namespace mirevo

#include "evaluation/earlier_evaluations.h"

#include <bit>
#include <cstdint>
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

bool EarlierEvaluations::isSame(double earlier, double value, std::size_t k, double searched) const {
  const auto equals = [&](double other) {
    // A difference in the last digit is a sign of another sequence of random numbers.
    return std::bit_cast<std::uint64_t>(other) == std::bit_cast<std::uint64_t>(earlier);
  };
  if (equals(value)) return true;
  bool failed = false;  // earlier versions had exp(ln x) for a given value, too
  return equals(TransformParameterValue(searched, space_.lower[k], space_.transformation[k],
                                        TransformDirection::backward, failed));
}

void EarlierEvaluations::requireSameValues(int number, std::span<const double> earlier,
                                           std::span<const double> set) const {
  const std::vector<double> values = ToModelScale(space_, set);
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (isSame(earlier[i], values[i], i, set[i])) continue;
    fatalError("Error: Unable to continue the earlier run",
               fmt::format("evaluation No. {} has {} = {} in the earlier results, and {} now, though the settings are "
                           "the same.\nEither the results were changed, or they were written by another version of the "
                           "program, or on a machine that rounds otherwise.\nRestart = 0 starts afresh and keeps them "
                           "under a numbered name.",
                           number, space_.names[i], formatReal(earlier[i]), formatReal(values[i])));
  }
}

}  // namespace mirevo

#include "evaluation/chosen_evaluations.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace mirevo {

bool BestChoice::consider(int number, double aggregate, std::span<const double> parameterValues) {
  if (isOfSearch_ || std::isnan(aggregate)) return false;
  const bool isBetter =
      !best_ || aggregate < best_->aggregate || (aggregate == best_->aggregate && number < best_->number);
  if (isBetter) best_ = {number, aggregate, {parameterValues.begin(), parameterValues.end()}};
  return isBetter;
}

void BestChoice::takeOfSearch(BestEvaluation best) {
  best_ = std::move(best);
  isOfSearch_ = true;
}

bool InitialChoice::isOfSetup(std::span<const double> parameterValues) const {
  return std::equal(setupValues_.begin(), setupValues_.end(), parameterValues.begin());
}

bool InitialChoice::wouldBeInitial(int number, std::span<const double> parameterValues) const {
  const bool hasThem = isOfSetup(parameterValues);
  return !number_ || (hasThem && !hasSetupValues_) || (hasThem == hasSetupValues_ && number < *number_);
}

bool InitialChoice::consider(int number, std::span<const double> parameterValues) {
  const bool isInitial = wouldBeInitial(number, parameterValues);
  if (isInitial) resume(number, isOfSetup(parameterValues));
  return isInitial;
}

void InitialChoice::resume(int number, bool hasSetupValues) {
  number_ = number;
  hasSetupValues_ = hasSetupValues;
}

}  // namespace mirevo

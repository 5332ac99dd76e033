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

bool InitialChoice::consider(int number, std::span<const double> parameterValues) {
  const bool isOfSetup = std::equal(setupValues_.begin(), setupValues_.end(), parameterValues.begin());
  const bool isInitial =
      !number_ || (isOfSetup && !hasSetupValues_) || (isOfSetup == hasSetupValues_ && number < *number_);
  if (isInitial) resume(number, isOfSetup);
  return isInitial;
}

void InitialChoice::resume(int number, bool hasSetupValues) {
  number_ = number;
  hasSetupValues_ = hasSetupValues;
}

}  // namespace mirevo

#include "evaluation/shown_runs.h"

#include <cmath>

namespace mirevo {

void ShownRuns::begin(int slot, std::vector<double> parameterValues) {
  runs_[slot] = {++begun_, std::move(parameterValues)};
}

bool ShownRuns::mayBeShown(int slot, double aggregate) {
  const Run& run = runs_[slot];
  const bool isInitial = initial_.consider(run.order, run.parameterValues);
  const bool mayBeBest = std::isnan(aggregate) || aggregate <= best_;
  if (aggregate < best_) best_ = aggregate;
  return isInitial || mayBeBest || run.order <= firstRuns_;
}

}  // namespace mirevo

#include "evaluation/shown_runs.h"

#include <cmath>

namespace mirevo {

void ShownRuns::begin(int slot, int number, std::vector<double> parameterValues) {
  runs_[slot] = {number, std::move(parameterValues)};
}

bool ShownRuns::mayBeShown(int slot, double aggregate) {
  const Run& run = runs_[slot];
  const bool isInitial = initial_.consider(run.number, run.parameterValues);
  const bool mayBeBest = std::isnan(aggregate) || aggregate <= best_;
  if (aggregate < best_) best_ = aggregate;
  return isInitial || mayBeBest || run.number <= firstRuns_;
}

}  // namespace mirevo

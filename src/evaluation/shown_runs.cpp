#include "evaluation/shown_runs.h"

#include <cmath>

namespace mirevo {

void ShownRuns::begin(int slot, int number, std::vector<double> parameterValues, bool isFinal) {
  runs_[slot] = {number, std::move(parameterValues), isFinal};
}

bool ShownRuns::isShownAnyhow(const Run& run, double aggregate) const {
  return run.isFinal || std::isnan(aggregate) || aggregate <= best_ || run.number <= firstRuns_;
}

bool ShownRuns::wouldBeShown(int slot, double aggregate) const {
  const Run& run = runs_.at(slot);
  return initial_.wouldBeInitial(run.number, run.parameterValues) || isShownAnyhow(run, aggregate);
}

bool ShownRuns::mayBeShown(int slot, double aggregate) {
  const Run& run = runs_.at(slot);
  const bool isShown = isShownAnyhow(run, aggregate);
  const bool isInitial = initial_.consider(run.number, run.parameterValues);
  if (aggregate < best_) best_ = aggregate;
  return isInitial || isShown;
}

}  // namespace mirevo

#include "evaluation/shown_runs.h"

#include <algorithm>
#include <cmath>

namespace mirevo {

void ShownRuns::begin(int slot, std::span<const double> set) {
  runs_[slot] = {++begun_, std::equal(set.begin(), set.end(), initialSet_.begin(), initialSet_.end())};
}

bool ShownRuns::mayBeShown(int slot, double aggregate) {
  const Run run = runs_[slot];
  const bool isEarliest = run.order < earliest_;
  const bool mayBeBest = std::isnan(aggregate) || aggregate <= best_;
  if (isEarliest) earliest_ = run.order;
  if (aggregate < best_) best_ = aggregate;
  return run.hasInitialSet || isEarliest || mayBeBest;
}

}  // namespace mirevo

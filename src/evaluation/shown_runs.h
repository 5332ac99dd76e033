#pragma once

#include <limits>
#include <map>
#include <utility>

#include "evaluation/chosen_evaluations.h"

namespace mirevo {

/// Decides which model runs of a process pass on their series for display: those that may turn out to be the initial or
/// the best evaluation of the whole run. They are few: a model run that is worse than an earlier one of its process is
/// not the best of all.
class ShownRuns final {
 public:
  /// `setupValues`: the initial values of the variable parameters, model scale.
  /// `firstRuns`: so many of the process's first ones pass on theirs, whatever their results.
  explicit ShownRuns(std::vector<double> setupValues, int firstRuns = 0)
      : initial_(std::move(setupValues)), firstRuns_(firstRuns) {}

  /// A model run with these values (model scale) begins in the slot. To be called in the order of the evaluation
  /// numbers.
  void begin(int slot, std::vector<double> parameterValues);

  /// Whether the slot's run, which has succeeded with this aggregate, may be shown: if it is the initial one of this
  /// process so far, or not worse than any before (of equals a search may take any). A run whose aggregate is not known
  /// yet (NaN) may become the best.
  bool mayBeShown(int slot, double aggregate);
  /// Whether mayBeShown() would be true now; where it would not, it will not be later either.
  bool wouldBeShown(int slot, double aggregate) const;

 private:
  struct Run {
    int order = 0;
    std::vector<double> parameterValues;
  };
  /// Of the initial evaluation nothing is asked here.
  bool isShownAnyhow(const Run& run, double aggregate) const;

  InitialChoice initial_;
  std::map<int, Run> runs_;  ///< by slot
  int begun_ = 0;
  int firstRuns_ = 0;
  double best_ = std::numeric_limits<double>::infinity();
};

}  // namespace mirevo

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
  /// `firstRuns`: so many of the first ones of the whole run pass on theirs, whatever their results.
  explicit ShownRuns(std::vector<double> setupValues, int firstRuns = 0)
      : initial_(std::move(setupValues)), firstRuns_(firstRuns) {}

  /// The model run of an evaluation with these values (model scale) begins in the slot. They may begin in any order. A
  /// final model run is shown in any case: it has the set that the search took, which need not be the one with the
  /// least aggregate.
  void begin(int slot, int number, std::vector<double> parameterValues, bool isFinal = false);

  /// Whether the slot's run, which has succeeded with this aggregate, may be shown: if it is the initial one of this
  /// process so far, or not worse than any before (of equals a search may take any). A run whose aggregate is not known
  /// yet (NaN) may become the best.
  bool mayBeShown(int slot, double aggregate);
  /// Whether mayBeShown() would be true now; where it would not, it will not be later either.
  bool wouldBeShown(int slot, double aggregate) const;

 private:
  struct Run {
    int number = 0;
    std::vector<double> parameterValues;
    bool isFinal = false;
  };
  /// Of the initial evaluation nothing is asked here.
  bool isShownAnyhow(const Run& run, double aggregate) const;

  InitialChoice initial_;
  std::map<int, Run> runs_;  ///< by slot
  int firstRuns_ = 0;
  double best_ = std::numeric_limits<double>::infinity();
};

}  // namespace mirevo

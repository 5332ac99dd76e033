#pragma once

#include <limits>
#include <map>
#include <utility>

#include "evaluation/chosen_evaluations.h"

namespace mirevo {

/// Of which of a process's model runs the series are handed on, so that they can be shown: those that may turn out to
/// be the initial or the best evaluation of the whole run. They are few: a run that is not better than one before it in
/// its own process is not the best of all.
class ShownRuns final {
 public:
  /// `setupValues`: the initial values of the variable parameters, model scale.
  explicit ShownRuns(std::vector<double> setupValues) : initial_(std::move(setupValues)) {}

  /// A model run with these values (model scale) has begun in the slot; runs begin in the order of their evaluations'
  /// numbers.
  void begin(int slot, std::vector<double> parameterValues);

  /// Whether the slot's run, which has succeeded with this aggregate, may be shown: it is the initial one of those of
  /// this process so far, or not worse than any before: of equals a search may take any. An aggregate that is not known
  /// yet (NaN) may come to be the best.
  bool mayBeShown(int slot, double aggregate);

 private:
  struct Run {
    int order = 0;
    std::vector<double> parameterValues;
  };
  InitialChoice initial_;
  std::map<int, Run> runs_;  ///< by slot
  int begun_ = 0;
  double best_ = std::numeric_limits<double>::infinity();
};

}  // namespace mirevo

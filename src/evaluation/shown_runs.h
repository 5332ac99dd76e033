#pragma once

#include <cstdint>
#include <limits>
#include <map>
#include <span>
#include <utility>

#include "common/parameter_set.h"

namespace mirevo {

/// Of which of a process's model runs the series are handed on, so that they can be shown: those that may turn out to
/// be the initial or the best evaluation of the whole run. They are few: a run that is not better than one before it in
/// its own process is not the best of all.
class ShownRuns final {
 public:
  explicit ShownRuns(ParameterSet initialSet) : initialSet_(std::move(initialSet)) {}

  /// A model run with this set has begun in the slot; runs begin in the order of their evaluations' numbers.
  void begin(int slot, std::span<const double> set);

  /// Whether the slot's run, which has succeeded with this aggregate, may be shown: it has the initial parameters, is
  /// the earliest that succeeded so far, or is not worse than any before. An aggregate that is not known yet (NaN) may
  /// come to be the best.
  bool mayBeShown(int slot, double aggregate);

 private:
  struct Run {
    std::int64_t order = 0;
    bool hasInitialSet = false;
  };
  ParameterSet initialSet_;
  std::map<int, Run> runs_;  ///< by slot
  std::int64_t begun_ = 0;
  std::int64_t earliest_ = std::numeric_limits<std::int64_t>::max();  ///< of the runs that succeeded
  double best_ = std::numeric_limits<double>::infinity();
};

}  // namespace mirevo

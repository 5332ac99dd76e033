#pragma once

#include <cstddef>
#include <deque>
#include <span>
#include <utility>
#include <vector>

#include "common/parameter_set.h"

namespace mirevo {

/// How long the model takes with a set, judged by the latest model runs: an additive model of the logarithm of the run
/// time, to which a parameter contributes if the times depend on it beyond chance. What it costs is bounded, whatever
/// the numbers of parameters and runs. It decides in which order model runs are started, and nothing else.
class RunTimes final {
 public:
  /// A model run with the set (search scale) has taken so long, whatever its outcome.
  void add(std::span<const double> set, double seconds);
  /// How many have been added, also those that are forgotten.
  std::size_t count() const { return count_; }
  /// Fewer say nothing.
  static constexpr std::size_t kFewest = 24;

  /// What a parameter contributes to the logarithm of the run time: a line through points.
  struct Effect {
    std::size_t parameter = 0;
    std::vector<double> values;  ///< ascending
    std::vector<double> logs;    ///< at these; from the first and the last two the line goes on
    double at(double value) const;
  };
  /// Those of the runs that are known now; none if the times do not depend on the parameters, as far as is known.
  std::vector<Effect> effects() const;

 private:
  struct Run {
    ParameterSet set;
    double log = 0.0;
  };
  std::deque<Run> runs_;
  std::size_t count_ = 0;
};

/// Larger for sets that take longer.
double expectedLog(std::span<const RunTimes::Effect> effects, std::span<const double> set);

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <functional>
#include <initializer_list>
#include <optional>
#include <span>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/numbers/uniform_generator.h"
#include "common/parameter_set.h"
#include "parameters/feasibility.h"

namespace mirevo {

/// A uniformly random point of a box: one deviate for each parameter.
ParameterSet drawUniformly(std::span<const double> lower, std::span<const double> upper, UniformGenerator& random);

/// Replaces points of a search that cannot be run before they are evaluated. Points that can are never changed, and
/// random numbers are drawn for the others only, so that a search that proposes none of those is not affected.
class FeasiblePoints final {
 public:
  explicit FeasiblePoints(Feasibility feasibility = {}) : feasibility_(std::move(feasibility)) {}

  /// Replaces the sets of an initial sample from index `first` on, those before being given; a set is drawn again
  /// uniformly within the bounds, at most kMostSampleDraws times, and then drawn back towards a point that can be run.
  /// Throws FatalError with noSetMessage() if no such point is known: not in the sample, not the initial set and not
  /// among a million drawn.
  void replaceInSample(std::vector<ParameterSet>& sample, std::size_t first, const SearchBounds& bounds,
                       UniformGenerator& random);

  /// The first of up to 1 + kMostRedraws points drawn that can be run; else the last one, drawn back towards `origin`.
  ParameterSet draw(const std::function<ParameterSet()>& drawPoint, std::span<const double> origin);

  /// The point; if it cannot be run, the first one that can when its distance to `origin` is halved up to
  /// `mostHalvings` times; else none.
  std::optional<ParameterSet> shortened(ParameterSet point, std::span<const double> origin, int mostHalvings);

  /// The point; if it cannot be run, the first one that can on the way to the first of `origins` that can be run, the
  /// way being halved each time, and that origin itself after kMostHalvings. Where no origin can be run, the way is to
  /// the point that replaceInSample() knows.
  ParameterSet drawnBack(ParameterSet point, std::initializer_list<std::span<const double>> origins);

  /// Points that were replaced; one that was drawn or shortened many times counts once.
  int replacedCount() const { return replacedCount_; }

  /// Those of them that ended at the point towards which they were drawn back, a set evaluated or to be evaluated.
  int returnedCount() const { return returnedCount_; }

  static constexpr int kMostSampleDraws = 10'000;
  static constexpr int kMostRedraws = 100;
  static constexpr int kMostHalvings = 20;

 private:
  bool contain(std::span<const double> point) const { return feasibility_.holds(point); }
  std::optional<ParameterSet> drawWithin(const SearchBounds& bounds, UniformGenerator& random);
  /// Halves the distance of the point to `origin` until it can be run; false if it still cannot.
  bool halve(ParameterSet& point, std::span<const double> origin, int mostHalvings) const;
  ParameterSet towards(ParameterSet point, std::span<const double> origin);
  void noteAsKnown(const ParameterSet& point);

  Feasibility feasibility_;
  std::optional<ParameterSet> known_;  ///< a point that can be run
  int drawsLeft_ = 1'000'000;          ///< for initial samples, so that a large one does not draw for hours
  int replacedCount_ = 0;
  int returnedCount_ = 0;
};

}  // namespace mirevo

#pragma once

#include <functional>
#include <vector>

#include "algorithms/numbers/search_bounds.h"

namespace mirevo {

/// A function of n coordinates to be minimised, whose value may be infinite, and its derivatives.
struct SmoothFunction {
  std::function<double(const std::vector<double>&)> value;
  /// The derivatives at the point of the last call of value(), which must have been finite.
  std::function<std::vector<double>()> slope;
};

struct QuasiNewtonSettings {
  double longestMove = 1.0;  ///< in any coordinate
  double leastGain = 0.0;    ///< a move that gains less ends the search
  int mostMoves = 100;
};

struct LowPoint {
  std::vector<double> point;
  double value = 0.0;
};

/// The best point that the quasi-Newton method of Broyden, Fletcher, Goldfarb and Shanno (Nocedal and Wright 2006,
/// Numerical Optimization, chapter 6) reaches from `start` within the bounds; value() is called last at this point. A
/// coordinate at a bound whose step would leave the bounds is held there for that move.
LowPoint quasiNewtonSearch(const SmoothFunction& function, std::vector<double> start, const Box& bounds,
                           const QuasiNewtonSettings& settings);

}  // namespace mirevo

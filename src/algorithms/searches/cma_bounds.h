#pragma once

#include <cstddef>
#include <deque>
#include <span>
#include <vector>

#include "algorithms/searches/cma_distribution.h"

namespace mirevo {

/// How CMA-ES keeps to the unit cube: a point outside is run at the nearest point of the cube, and ranked by its value
/// there plus a penalty that grows with the square of the distance. The weights of the penalty follow the spread of
/// the values, so that scaling the objective makes no difference: Hansen, Niederberger, Guzzella and Koumoutsakos
/// (2009), doi:10.1109/TEVC.2008.924423, section IV B.
class CmaBounds final {
 public:
  explicit CmaBounds(std::size_t n) : weights_(n, 0.0) {}

  /// The nearest point of the cube.
  static std::vector<double> repaired(std::vector<double> point);

  /// After a generation, with the values of its successful points: sets weights once the mean has left the cube, and
  /// raises those of coordinates in which it is far outside.
  void adapt(const CmaDistribution& distribution, std::vector<double> values);
  /// What is added to the value of a point.
  double penalty(std::span<const double> point, const CmaDistribution& distribution) const;

 private:
  double typicalSpread() const;

  std::vector<double> weights_;  ///< γ; 0 until the mean leaves the cube
  bool areSet_ = false;
  std::deque<double> spreads_;  ///< of the values of the last generations, in units of the variance
};

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "common/parameter_set.h"
#include "parameters/search_space.h"

namespace mirevo {

/// The joint distribution of the p variable parameters, on the search scale: what samples are drawn from, and the prior
/// of a Bayesian analysis.
class ParameterDistributions final {
 public:
  /// Independent, each uniform between its bounds; all values of an integer parameter are equally likely.
  static ParameterDistributions uniform(const SearchSpace& space);

  std::size_t size() const { return lower_.size(); }
  /// The set, on the search scale, at a point of the open unit cube (p coordinates): the inverse of the distribution
  /// functions, the k-th coordinate being that of the k-th parameter given those before it.
  ParameterSet setAt(std::span<const double> point) const;
  /// The natural logarithm of the density at a set of the search scale, normalised; -infinity where it is 0.
  double logDensity(std::span<const double> set) const;

 private:
  std::vector<double> lower_;
  std::vector<double> upper_;
};

}  // namespace mirevo

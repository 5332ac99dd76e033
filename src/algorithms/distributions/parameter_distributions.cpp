#include "algorithms/distributions/parameter_distributions.h"

#include <cmath>
#include <limits>

namespace mirevo {

ParameterDistributions ParameterDistributions::uniform(const SearchSpace& space) {
  ParameterDistributions made;
  made.lower_ = space.lower;
  made.upper_ = space.upper;
  return made;
}

ParameterSet ParameterDistributions::setAt(std::span<const double> point) const {
  ParameterSet set(size());
  for (std::size_t j = 0; j < set.size(); ++j) set[j] = lower_[j] + point[j] * (upper_[j] - lower_[j]);
  return set;
}

double ParameterDistributions::logDensity(std::span<const double> set) const {
  double sum = 0.0;
  for (std::size_t j = 0; j < size(); ++j) {
    if (set[j] < lower_[j] || set[j] > upper_[j]) return -std::numeric_limits<double>::infinity();
    sum -= std::log(upper_[j] - lower_[j]);
  }
  return sum;
}

}  // namespace mirevo

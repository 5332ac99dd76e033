#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/distributions/parameter_distributions.h"
#include "common/parameter_set.h"
#include "parameters/search_space.h"

namespace mirevo {

/// What the log says of the distributions before the run: which one each parameter has, on the search scale and on the
/// model scale, and which mean centres an integer parameter on a value. `section` has them. Of many parameters those of
/// the first are told, and how many there are more.
std::vector<std::string> distributionLines(const ParameterDistributions& distributions, const SearchSpace& space,
                                           std::string_view section);

/// One warning per distribution whose mean, that of a normal distribution, is outside the search bounds, or most of
/// whose values are. Of many the first are told, and how many there are more.
std::vector<std::string> distributionWarnings(const ParameterDistributions& distributions, const SearchSpace& space);

/// Counts the sets that leave the bounds, and with which parameters. What counts is the value that the model gets.
class BoundsCount final {
 public:
  /// `space` must outlive the object.
  explicit BoundsCount(const SearchSpace& space) : space_(space), ofParameters_(space.size()) {}
  void add(std::span<const double> set);
  /// "Sets outside the bounds of a parameter: 3 of 4 (a in 3, b in 1)"
  std::string line() const;

 private:
  const SearchSpace& space_;
  std::vector<std::size_t> ofParameters_;
  std::size_t outside_ = 0;
  std::size_t sets_ = 0;
};

/// The line of a sample.
std::string setsOutsideBounds(std::span<const ParameterSet> sample, const SearchSpace& space);

}  // namespace mirevo

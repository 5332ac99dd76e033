#pragma once

#include <cstddef>
#include <vector>

#include "algorithms/searches/cma_distribution.h"

namespace mirevo {

/// Keeps an integer parameter from being caught in one of its values once the distribution is narrower than a step: its
/// neighbours always keep a probability of 1/(nλ) together. Hamano, Saito, Nomura and Shirakawa (2022), CMA-ES with
/// margin, doi:10.1145/3512290.3528827, section 4.
class CmaMargin final {
 public:
  /// The number of values of each parameter in the unit interval, `steps` in the search scale long; 0 for one that is
  /// continuous.
  explicit CmaMargin(std::vector<double> stepCounts) : stepCounts_(std::move(stepCounts)) {}

  bool isInteger(std::size_t j) const { return stepCounts_[j] > 0.0; }
  /// To be called after each update.
  void keepOpen(CmaDistribution& distribution) const;

 private:
  std::vector<double> stepCounts_;  ///< unit interval / step; need not be a whole number
};

}  // namespace mirevo

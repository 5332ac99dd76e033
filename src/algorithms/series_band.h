#pragma once

#include <cstddef>
#include <span>
#include <vector>

namespace mirevo {

/// The 5-95 % band of a simulated series at the times of its observations, from one series an evaluation. Exact, though
/// it keeps only the values that may still be a bound: about a tenth of them. The order of the evaluations does not
/// matter.
class SeriesBand final {
 public:
  struct Bounds {
    std::vector<double> lower;         ///< 5 % quantile (type 7), one an observation; NaN without a simulated value
    std::vector<double> upper;         ///< 95 % quantile
    std::size_t observationCount = 0;  ///< observations that have a value and a band
    double shareInside = 0.0;          ///< of those, bounds included; NaN when there is none
  };

  /// `observed` holds one value an observation, NaN for a missing one; at most `largestCount` series will be added.
  SeriesBand(std::vector<double> observed, std::size_t largestCount);

  /// Takes in the simulated values of one successful evaluation, one an observation; values that are not finite are
  /// left out.
  void add(std::span<const double> simulated);

  Bounds bounds() const;

 private:
  std::vector<double> observed_;
  std::size_t keep_;                                 ///< values kept at either end
  std::vector<std::size_t> counts_;                  ///< values seen, one an observation
  std::vector<std::vector<double>> smallest_;        ///< one max-heap of the smallest values an observation
  std::vector<std::vector<double>> negatedLargest_;  ///< likewise, of the largest values negated
};

}  // namespace mirevo

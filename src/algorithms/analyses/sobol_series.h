#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/analyses/series_band.h"
#include "algorithms/analyses/sobol_design.h"
#include "algorithms/analyses/sobol_indices.h"
#include "measures/observed_series.h"

namespace mirevo {

/// The indices of a simulated series, one after another in time.
struct SobolSeries {
  /// A time-series file: the columns time, observed, mean, standard deviation, blocks, and for every factor its
  /// first-order and total index with their limits.
  std::string text;
  std::size_t timeCount = 0;               ///< times at which the total indices of all factors have limits
  std::vector<std::size_t> largestCounts;  ///< one per factor: those of them at which its total index is the largest
  std::size_t constantCount = 0;           ///< times at which all runs have the same value
};

/// The columns of a series file behind the time and before those of the factors, and how many each factor has.
inline constexpr std::size_t kSobolSeriesColumns = 4;
inline constexpr std::size_t kSobolColumnsPerFactor = 6;

/// `sets`: the 0-based sets of the design, ascending, whose values `read` gives side by side; the others failed. Reads
/// the values of a few times at a time, so that what it needs of memory does not grow with the length of the series.
SobolSeries sobolSeries(std::string_view title, const ObservedSeries& observed, const SobolDesign& design,
                        std::span<const SobolFactor> factors, std::span<const std::size_t> sets,
                        const ReadColumns& read, const ReplicateBootstrap& bootstrap);

}  // namespace mirevo

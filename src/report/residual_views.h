#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "algorithms/numbers/sample_summary.h"
#include "report/shown_pairs.h"

namespace mirevo {

/// The residuals of the pairs, simulated less observed value.
struct ResidualViews {
  SampleSummary all;
  std::vector<std::int64_t> months;           ///< the beginning of each month that has pairs
  std::vector<double> monthMeans;             ///< one per month
  std::array<SampleSummary, 12> byMonth;      ///< January first, of all years together
  std::vector<float> flows;                   ///< simulated values, thinned: of those that nearly coincide one is left
  std::vector<float> ofFlows;                 ///< their residuals
  double autocorrelationLimit = 0.0;          ///< 1.96 / sqrt(n)
  std::vector<double> autocorrelation;        ///< of lags 1, 2, ... usual steps
  std::vector<double> normalQuantiles;        ///< of the standard normal distribution, ascending
  std::vector<double> standardisedResiduals;  ///< at them: less their mean, over their standard deviation
};

/// Without pairs all vectors are empty.
///
/// Autocorrelation: the sum of the products of the deviations from the mean of residuals that are `lag` steps apart,
/// over the sum of all squared deviations (Box and Jenkins 1970), for lags up to 60 steps and a quarter of the pairs;
/// NaN if fewer than half of the residuals have another so far behind them. The limits are those of uncorrelated
/// residuals. Normal quantiles: of (i - 3/8) / (n + 1/4) for the residual of rank i, the plotting positions of Blom
/// (1958).
ResidualViews residualViews(const ShownPairs& pairs);

}  // namespace mirevo

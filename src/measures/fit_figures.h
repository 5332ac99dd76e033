#pragma once

#include <cstddef>
#include <span>

namespace mirevo {

/// Goodness-of-fit figures of a simulated against an observed series. NaN if a figure cannot be computed: without
/// pairs; NSE and alpha if the observations do not vary; r if either series does not; beta and the percent bias if the
/// observations sum to 0; the KGE if one of its components is NaN.
struct FitFigures {
  std::size_t count = 0;     ///< pairs of a simulated and an observed value
  double nse = 0.0;          ///< Nash and Sutcliffe (1970), doi:10.1016/0022-1694(70)90255-6; 1 is perfect
  double kge = 0.0;          ///< Gupta et al. (2009), doi:10.1016/j.jhydrol.2009.08.003; 1 is perfect
  double correlation = 0.0;  ///< r, the first component of the KGE: Pearson's
  double variability = 0.0;  ///< alpha: standard deviation of the simulated over that of the observed values
  double meanRatio = 0.0;    ///< beta: mean of the simulated over that of the observed values
  double percentBias = 0.0;  ///< 100 (sum of simulated - sum of observed) / sum of observed: positive is too much
  double rmse = 0.0;         ///< in the unit of the values
  double rSquared = 0.0;     ///< square of the correlation
};

/// The figures of the pairs in which both values are finite; shape n each.
FitFigures fitFigures(std::span<const float> simulated, std::span<const float> observed);

}  // namespace mirevo

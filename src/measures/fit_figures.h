#pragma once

#include <cstddef>
#include <span>

namespace mirevo {

/// How well a simulated series fits an observed one, by the figures that hydrologists quote. NaN for what cannot be
/// computed: all but the RMSE need observations that differ, the percent bias a sum of them that is not 0.
struct FitFigures {
  std::size_t count = 0;     ///< pairs of a simulated and an observed value
  double nse = 0.0;          ///< Nash and Sutcliffe (1970), doi:10.1016/0022-1694(70)90255-6; 1 is perfect
  double kge = 0.0;          ///< Gupta et al. (2009), doi:10.1016/j.jhydrol.2009.08.003; 1 is perfect
  double correlation = 0.0;  ///< r, the first component of the KGE: Pearson's
  double variability = 0.0;  ///< alpha: standard deviation of the simulated over that of the observed values
  double meanRatio = 0.0;    ///< beta: mean of the simulated over that of the observed values
  double percentBias = 0.0;  ///< 100 (sum of simulated - sum of observed) / sum of observed: positive is too much
  double rmse = 0.0;         ///< in the unit of the values
  double rSquared = 0.0;     ///< the correlation's square
};

/// The figures of the pairs in which both values are finite; shape n each.
FitFigures fitFigures(std::span<const float> simulated, std::span<const float> observed);

}  // namespace mirevo

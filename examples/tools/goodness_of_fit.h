#pragma once

#include <span>

namespace mirevo::examples {

struct GoodnessOfFit {
  double nse = 0.0;         ///< Nash and Sutcliffe (1970), doi:10.1016/0022-1694(70)90255-6; 1 is perfect
  double kge = 0.0;         ///< Gupta et al. (2009), doi:10.1016/j.jhydrol.2009.08.003; 1 is perfect
  double rmse = 0.0;        ///< in the unit of the values
  double volumeBias = 0.0;  ///< mean of the simulated over mean of the observed values, minus 1
};

/// Goodness of fit of n >= 2 pairs of values. Not finite if the observed values are all the same or have the mean 0.
GoodnessOfFit goodnessOfFit(std::span<const double> simulated, std::span<const double> observed);

}  // namespace mirevo::examples

#pragma once

#include <span>
#include <vector>

namespace mirevo {

/// The pairs of simulated and observed values that a criterion judges, n of each and all finite. Criteria are computed
/// in double precision, in two passes where means are needed. A criterion is NaN where it is undefined: always without
/// pairs, else as its comment says.
struct ValuePairs {
  std::span<const double> simulated;
  std::span<const double> observed;
  /// Of the differences, n or none. A pair of weight w counts as w*w pairs, in means as in sums and moments, so that a
  /// sum of squared errors is that of the weighted ones (Hill and Tiedeman 2007, Effective Groundwater Model
  /// Calibration, Wiley); without weights each pair counts once. Ranks, extremes, volumes and duration curves
  /// do not use them.
  std::span<const double> weights = {};
};

/// Mean of a series; NaN if it is empty. `weights` as of ValuePairs.
double meanOf(std::span<const double> values, std::span<const double> weights = {});

/// Nash and Sutcliffe (1970), doi:10.1016/0022-1694(70)90255-6: 1 - sum of squared errors over that of the deviations
/// of the observations from their mean. Undefined if the observations do not vary.
double nashSutcliffe(ValuePairs pairs);

/// The components of the Kling-Gupta efficiencies and what they are made of.
struct KlingGupta {
  double correlation = 0.0;     ///< r, Pearson's; undefined if either series does not vary
  double variability = 0.0;     ///< alpha: standard deviation of the simulated over that of the observed values
  double meanRatio = 0.0;       ///< beta: mean of the simulated over that of the observed values
  double variationRatio = 0.0;  ///< gamma: coefficient of variation of the simulated over that of the observed values
  double efficiency2009 = 0.0;  ///< from r, alpha, beta: Gupta et al. (2009), doi:10.1016/j.jhydrol.2009.08.003
  double efficiency2012 = 0.0;  ///< from r, gamma, beta: Kling et al. (2012), doi:10.1016/j.jhydrol.2012.01.011
};
KlingGupta klingGupta(ValuePairs pairs);

/// Pool, Vis and Seibert (2018), doi:10.1080/02626667.2018.1552002: the mean ratio, the likeness of the normalised flow
/// duration curves, and Spearman's rank correlation, of tied values by their mean rank. Undefined if either mean is 0
/// or either series does not vary.
double klingGuptaNonParametric(ValuePairs pairs);

/// 100 times the sum of the errors over the sum of the observations: positive is too much (Gupta et al. 1999,
/// doi:10.1061/(ASCE)1084-0699(1999)4:2(135), with the other sign). Undefined if the observations sum to 0.
double percentBias(ValuePairs pairs);

/// The mean of the errors' absolute values, in the unit of the series.
double meanAbsoluteError(ValuePairs pairs);

/// Root mean square error, in the unit of the series.
double rootMeanSquareError(ValuePairs pairs);

/// The root mean square error over the standard deviation of the observations (Moriasi et al. 2007,
/// doi:10.13031/2013.23153). Undefined if the observations do not vary.
double standardisedRootMeanSquareError(ValuePairs pairs);

/// The sum of the squared errors, in the squared unit of the series.
double sumOfSquaredErrors(ValuePairs pairs);

/// Willmott (1981), doi:10.1080/02723646.1981.10642213: 1 - sum of squared errors over the largest that it could be.
/// Undefined if all values of both series are the same.
double indexOfAgreement(ValuePairs pairs);

/// 100 (largest simulated - largest observed) over the largest observed value. Undefined if that is 0.
double peakError(ValuePairs pairs);

/// Time of the largest simulated value less that of the largest observed one, in the unit of `times`: of equal values
/// the first counts. Shape n.
double peakTimeError(ValuePairs pairs, std::span<const double> times);

/// 100 (simulated - observed volume) over the observed one; a volume is the integral of the values over `times`, linear
/// between them, but not over what is before each of the pairs `breaks` (ascending). Undefined with fewer than two
/// pairs, or if the observed volume is 0.
double volumeError(ValuePairs pairs, std::span<const double> times, std::span<const std::size_t> breaks = {});

// Three segments of the flow duration curve, each curve of its own series in descending order, the value in place i of
// n having the exceedance probability i/(n + 1): Yilmaz, Gupta and Wagener (2008), doi:10.1029/2007WR006716. In per
// cent of the observed one. `epsilon` is added to the values before a logarithm.

/// Bias of the volume of the values exceeded with a probability below 0.02, at least of the largest. Undefined if the
/// observed ones sum to 0.
double highFlowBias(ValuePairs pairs);
/// Bias of the slope of the logarithms between the exceedance probabilities 0.2 and 0.7, values between two places
/// being interpolated linearly. Undefined if the observed slope is 0, or a value plus epsilon is not positive.
double middleSlopeBias(ValuePairs pairs, double epsilon);
/// Bias of the volume under the logarithms of the values exceeded with a probability above 0.7, each less the logarithm
/// of the smallest; positive if the simulated one is too small, as published. Undefined if the observed volume is 0, or
/// a value plus epsilon is not positive.
double lowFlowBias(ValuePairs pairs, double epsilon);

/// The ranks of values, from 1 for the smallest; those of ties are their mean. Shape n.
std::vector<double> ranksOf(std::span<const double> values);

}  // namespace mirevo

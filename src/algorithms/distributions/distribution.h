#pragma once

#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The distribution of one quantity.
class Distribution {
 public:
  Distribution() = default;
  Distribution(const Distribution&) = delete;
  Distribution& operator=(const Distribution&) = delete;
  virtual ~Distribution() = default;

  /// As in setups: "truncated normal".
  virtual std::string_view name() const = 0;
  /// Its parameters, for people: "mean 3, standard deviation 0.5, from 2 to 4".
  virtual std::string text() const = 0;
  /// Whether name and parameters are those of a quantity on the model scale, and the distribution is on the search
  /// scale.
  virtual bool isGivenOnModelScale() const { return false; }

  /// F(x), the probability of a value not above x.
  virtual double cumulative(double x) const = 0;
  /// 1 - F(x), exact where F(x) is nearly 1.
  virtual double upperTail(double x) const { return 1.0 - cumulative(x); }
  /// The smallest x with F(x) >= p, for p in (0, 1).
  virtual double quantile(double p) const = 0;
  /// The natural logarithm of the density; of one that is not continuous, of the probability of x. -infinity for 0.
  virtual double logDensity(double x) const = 0;
  /// Whether it has a density: single values have no probability.
  virtual bool isContinuous() const { return true; }
  /// The values of one that is not continuous, on the scale on which they were given; none of a continuous one.
  virtual std::span<const double> singleValues() const { return {}; }

  /// The value whose probability is that of the score z of the standard normal distribution: quantile(Phi(z)).
  virtual double atScore(double z) const;
  /// The score of a value, Phi^-1(F(x)); finite, at most 38 from 0.
  virtual double scoreOf(double x) const;
};

using DistributionPointer = std::shared_ptr<const Distribution>;

/// Phi(z), exact in its lower tail.
double normalProbability(double z);

/// A deviation of 0 is that of a constant, which has no density.
DistributionPointer normalDistribution(double mean, double standardDeviation);
/// A normal distribution under the condition that the value is between the limits; null if that has no probability.
DistributionPointer truncatedNormal(double mean, double standardDeviation, double minimum, double maximum);
/// The exponential of a normal distribution.
DistributionPointer lognormal(double logMean, double logStandardDeviation);
DistributionPointer uniformDistribution(double minimum, double maximum);
/// The exponential of a uniform distribution, 0 < minimum < maximum.
DistributionPointer logUniform(double minimum, double maximum);
/// minimum <= mode <= maximum, minimum < maximum.
DistributionPointer triangular(double minimum, double mode, double maximum);
/// The beta distribution, of the density t^(alpha - 1) (1 - t)^(beta - 1) / B(alpha, beta), stretched from [0, 1] to
/// the limits.
DistributionPointer betaDistribution(double alpha, double beta, double minimum, double maximum);
/// Values with weights, which need not sum to 1. Equal values are one.
DistributionPointer discreteDistribution(std::span<const double> values, std::span<const double> weights);

/// That of a sample of n values: the distribution function is linear between quantiles of the sample (type 7 of Hyndman
/// and Fan, sortedQuantile()) at equal steps of the probability. There are 2 n^(2/5) steps, which grow with n as the
/// classes of tests of fit do (Mann and Wald 1942, doi:10.1214/aoms/1177731569), but at most n - 1. Null if two of the
/// quantiles are equal, as of values that are repeated: it then has no density.
DistributionPointer sampledDistribution(std::vector<double> values);

/// The distribution of ln x, of a quantity that is above 0: the density counts the derivative of the transformation.
DistributionPointer ofLogarithm(DistributionPointer distribution);
/// The search-scale distribution of an integer parameter: value v of its grid (`lowest` + k) stands for the unit
/// interval [v, v + 1), where the density is the probability with which v is the value of the grid that is nearest to
/// the quantity. Below `lowest`, where the model gets the value that is next above, intervals are (v - 1, v].
DistributionPointer onGridOf(double lowest, DistributionPointer distribution);

}  // namespace mirevo

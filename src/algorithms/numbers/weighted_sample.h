#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/numbers/sample_summary.h"

namespace mirevo {

/// Quantiles of a sample whose values have weights: at a probability p the least value such that it and those below it
/// have at least the share p of the weight. It is the inverse of the weighted distribution function, without
/// interpolation: always one of the values, the same if a value is split into several that share its weight, and not
/// moved by values without weight. With equal weights it is type 1 of Hyndman and Fan (1996),
/// doi:10.1080/00031305.1996.10473566.
class WeightedQuantiles final {
 public:
  /// Takes the next sample: a weight, 0 or more, per value. Values that are not finite and those without weight are
  /// left out.
  void take(std::span<const double> values, std::span<const double> weights);

  std::size_t count() const { return values_.size(); }  ///< values taken
  /// NaN without a value.
  double at(double probability) const;
  /// The share of the weight of values that are not above `limit`; NaN without a value.
  double shareUpTo(double limit) const;

 private:
  struct Value {
    double value;
    double weight;  ///< and, once all are taken, that of the values before it
    std::size_t index;
  };
  std::vector<Value> values_;  ///< ascending
};

/// Statistics of a weighted sample; values that are not finite and those without weight are left out. The variance is
/// divided by 1 - (sum of the squared weights), of weights whose sum is 1: with equal weights that of a sample.
SampleSummary summariseWeighted(std::span<const double> values, std::span<const double> weights);

/// The correlation matrix of the columns of a weighted sample, as correlationMatrix(); NaN for a constant column.
std::vector<std::vector<double>> weightedCorrelations(std::span<const std::vector<double>> columns,
                                                      std::span<const double> weights);
/// The largest of them, as largestCorrelations(), without the matrix: kMostLargeCorrelations.
std::vector<PairCorrelation> largestWeightedCorrelations(std::span<const std::vector<double>> columns,
                                                         std::span<const double> weights);

/// How many values of equal weight tell as much of a mean as these: 1 / sum of the squared weights, whose sum is 1
/// (Kish 1965); 0 if all weights are 0.
double effectiveCount(std::span<const double> weights);

/// The largest distance between the distribution function of a weighted sample and that of another sample, `drawn`, of
/// equal weights; NaN where one of them has no value.
double distributionDistance(std::span<const double> values, std::span<const double> weights,
                            std::span<const double> drawn);

/// The distance that one of twenty pairs of samples of the same distribution exceeds, of `effective` and of `count`
/// values of equal weight: 1.358 (1/n + 1/N)^(1/2) (Smirnov 1948, doi:10.1214/aoms/1177730256).
double chanceDistance(double effective, std::size_t count);

}  // namespace mirevo

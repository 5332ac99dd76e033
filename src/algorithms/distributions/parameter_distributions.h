#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <vector>

#include "algorithms/distributions/distribution.h"
#include "algorithms/distributions/gaussian_copula.h"
#include "common/parameter_set.h"
#include "parameters/search_space.h"

namespace mirevo {

/// The joint distribution of the p variable parameters, on the search scale: what samples are drawn from, and the prior
/// of a Bayesian analysis.
class ParameterDistributions final {
 public:
  ParameterDistributions() = default;
  /// One distribution for each parameter, on the search scale, independent or with the correlations of a copula.
  explicit ParameterDistributions(std::vector<DistributionPointer> ofParameters,
                                  std::optional<GaussianCopula> copula = std::nullopt);
  /// Independent, each uniform between its bounds; all values of an integer parameter are equally likely.
  static ParameterDistributions uniform(const SearchSpace& space);

  std::size_t size() const { return ofParameters_.size(); }
  /// The set, on the search scale, at a point of the open unit cube (p coordinates): the inverse of the distribution
  /// functions, the k-th coordinate being that of the k-th parameter given those before it.
  ParameterSet setAt(std::span<const double> point) const;
  /// The value of parameter j in that set.
  double valueAt(std::size_t j, std::span<const double> point) const;
  /// Makes of the set at another point, which differs in coordinate j alone, that at this one.
  void move(ParameterSet& set, std::size_t j, std::span<const double> point) const;
  /// The natural logarithm of the density at a set of the search scale, normalised; -infinity where it is 0. Of a
  /// parameter without a density its probability is taken; a correlated one must have a density.
  double logDensity(std::span<const double> set) const;

  /// The distribution of parameter j by itself, on the search scale.
  const Distribution& operator[](std::size_t j) const { return *ofParameters_[j]; }
  /// The first parameter that has no density, as single values of it have probabilities: it cannot be moved in small
  /// steps, as a Markov chain does.
  std::optional<std::size_t> firstWithoutDensity() const;
  /// The correlations of the normal scores; none if all are independent.
  const std::optional<GaussianCopula>& copula() const { return copula_; }

 private:
  /// The independent scores of the correlated coordinates up to `last`; of others 0.
  std::vector<double> scoresOf(std::span<const double> point, std::size_t last) const;

  std::vector<DistributionPointer> ofParameters_;
  std::optional<GaussianCopula> copula_;
};

}  // namespace mirevo

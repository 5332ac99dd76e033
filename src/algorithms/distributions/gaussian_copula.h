#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <vector>

namespace mirevo {

/// Correlates p quantities whatever their distributions: their normal scores z, of which each has the standard normal
/// distribution, are jointly normal with the correlation matrix R. Nelsen (2006), An Introduction to Copulas,
/// doi:10.1007/0-387-28678-0; Nataf (1962) transformed so.
class GaussianCopula final {
 public:
  /// `correlations`: R, p by p, symmetric, with 1 on the diagonal; `names` are those of its rows, for refusals. Throws
  /// FatalError unless all eigenvalues of R are above 1e-8.
  GaussianCopula(std::vector<std::vector<double>> correlations, std::span<const std::string> names);

  std::size_t size() const { return correlations_.size(); }
  const std::vector<std::vector<double>>& correlations() const { return correlations_; }
  /// Whether quantity j is correlated with another.
  bool isCorrelated(std::size_t j) const { return isCorrelated_[j]; }
  /// The quantities that are correlated with another, in ascending order.
  std::span<const std::size_t> correlatedOnes() const { return correlatedOnes_; }

  /// L e with R = L L': from p independent scores e those with the correlations, each by itself and those before it.
  std::vector<double> correlated(std::span<const double> independent) const;
  /// The i-th of them, of which `independent` needs to have no others than the correlated ones up to it.
  double correlatedAt(std::size_t i, std::span<const double> independent) const;
  /// The logarithm of the density of the copula, -(ln det R + z'(R^-1 - I)z) / 2.
  double logDensity(std::span<const double> scores) const;

 private:
  std::vector<std::vector<double>> correlations_;
  std::vector<bool> isCorrelated_;
  std::vector<std::size_t> correlatedOnes_;  ///< what is not among them has a 1 in L, on the diagonal
  std::vector<double> factor_;               ///< L, the rows of its lower triangle one after another
  double logOfRoot_ = 0.0;                   ///< ln det L
};

/// The smallest eigenvalue of a symmetric matrix with 1 on the diagonal, to 1e-6: the largest shift s for which R - sI
/// is positive definite, found by bisection.
double smallestEigenvalue(std::span<const std::vector<double>> correlations);

/// The correlation of the normal scores of two quantities whose rank correlation (Spearman) is given: 2 sin(pi r / 6),
/// Pearson (1907).
double ofRankCorrelation(double rankCorrelation);
/// Its inverse.
double rankCorrelationOf(double correlation);

}  // namespace mirevo

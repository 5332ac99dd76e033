#pragma once

#include "algorithms/surrogate/surrogate_model.h"

namespace mirevo {

/// A Gaussian process with constant mean and the anisotropic squared exponential kernel
///   k(x, x') = s²·(exp(−½ Σ_j ((x_j − x'_j)/l_j)²) + ν·[x = x']),
/// after Rasmussen and Williams (2006), Gaussian Processes for Machine Learning. Mean and s² are profiled out of the
/// likelihood; the lengths l_j and the noise ratio ν maximise the remaining likelihood by a quasi-Newton search in
/// their logarithms, which starts from the previous fit or, if that is more likely, from one of a few sets of equal
/// lengths.
class GaussianProcess final : public SurrogateModel {
 public:
  bool fit(std::span<const std::vector<double>> points, std::span<const double> values) override;
  double predict(std::span<const double> point) const override;

  const std::vector<double>& lengths() const { return lengths_; }

  /// −2·log likelihood, up to a constant; `parameters` are the logarithms of the n lengths and of ν. Infinity when the
  /// kernel matrix is not positive definite or the values do not vary. May be called after fit() only; afterwards
  /// predictions use these hyperparameters.
  double deviance(const std::vector<double>& parameters);
  /// The derivatives of deviance() at its last argument, where it must have been finite.
  std::vector<double> devianceSlope();

 private:
  /// Squared differences of every pair of points, one coordinate after another; the pairs in the order of the lower
  /// triangle of a matrix, column by column.
  void notePairs();
  void startSearch(std::span<const double> spread);

  std::vector<std::vector<double>> points_;
  std::vector<double> values_;
  std::vector<double> parameters_;  ///< as deviance() takes them; empty before the first fit
  std::vector<double> lengths_;     ///< n
  double noise_ = 0.0;              ///< ν
  double mean_ = 0.0;
  double variance_ = 0.0;        ///< s²
  std::vector<double> weights_;  ///< K⁻¹(y − mean), one per point
  std::vector<double> squares_;  ///< notePairs(), n·m(m−1)/2
  std::vector<double> kernels_;  ///< of every pair
  std::vector<double> matrix_;   ///< m·m, the Cholesky factor in its lower triangle
};

}  // namespace mirevo

#pragma once

#include "algorithms/surrogate_model.h"

namespace mirevo {

/// A Gaussian process with constant mean and the anisotropic squared exponential kernel
/// k(x, x') = s²·(exp(−½ Σ_j ((x_j − x'_j)/l_j)²) + ν·[x = x']), after Rasmussen and Williams (2006), Gaussian
/// Processes for Machine Learning. Mean and s² are profiled out of the likelihood; the lengths l_j and the noise ratio
/// ν maximise what is left by a compass search on their logarithms, which starts where the previous fit ended.
class GaussianProcess final : public SurrogateModel {
 public:
  bool fit(std::span<const std::vector<double>> points, std::span<const double> values) override;
  double predict(std::span<const double> point) const override;

  const std::vector<double>& lengths() const { return lengths_; }

 private:
  /// Logarithms of the n lengths and of ν.
  using Hyperparameters = std::vector<double>;

  double kernel(std::span<const double> a, std::span<const double> b, std::span<const double> lengths) const;
  /// Factors the kernel matrix and fills mean and weights. Returns −2·log likelihood up to a constant, infinity when
  /// the matrix is not positive definite.
  double solve(const Hyperparameters& parameters);
  void startSearch(std::size_t n, std::span<const double> spread);
  void search();

  std::vector<std::vector<double>> points_;
  std::vector<double> values_;
  Hyperparameters parameters_;   ///< empty before the first fit
  std::vector<double> lengths_;  ///< n
  double mean_ = 0.0;
  std::vector<double> weights_;  ///< K⁻¹(y − mean), one a point
};

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/numbers/symmetric_eigen.h"
#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {

/// The constants of CMA-ES for n parameters and λ points of a generation: Hansen (2016), The CMA Evolution Strategy: A
/// Tutorial, arXiv:1604.00772, table 1.
struct CmaConstants {
  std::vector<double> weights;  ///< λ, best first; the first `parents` are positive and sum up to 1
  std::size_t parents = 0;      ///< μ
  double muEff = 0.0;           ///< μ_eff, variance effective selection mass
  double cSigma = 0.0;          ///< c_σ
  double dSigma = 0.0;          ///< d_σ
  double cc = 0.0;              ///< c_c
  double c1 = 0.0;              ///< c_1
  double cMu = 0.0;             ///< c_μ
};
CmaConstants cmaConstants(std::size_t n, std::size_t lambda);

/// λ = 4 + ⌊3 ln n⌋.
std::size_t cmaPopulationSize(std::size_t n);

/// The normal distribution of CMA-ES and how it learns from a generation, with active covariance: steps that were worse
/// than the parents have negative weights. A point is m + σ·A·y with y from N(0, C). A is the identity unless somebody
/// widens it for integer parameters.
class CmaDistribution final {
 public:
  CmaDistribution(std::vector<double> mean, double sigma, std::size_t lambda);

  /// y from N(0, C); n values.
  std::vector<double> drawStep(UniformGenerator& random) const;
  /// m + σ·A·y.
  std::vector<double> pointOf(std::span<const double> step) const;
  /// The y of a point.
  std::vector<double> stepTo(std::span<const double> point) const;
  /// √(yᵀ·C⁻¹·y).
  double lengthOf(std::span<const double> step) const;
  /// Shortens a step that was not drawn to the length that a drawn one usually has at most: Hansen (2011), Injecting
  /// external solutions into CMA-ES, arXiv:1110.4181.
  void limitLength(std::vector<double>& step) const;

  /// Takes the λ steps of a generation, best first.
  void update(std::span<const std::vector<double>* const> ranked);
  /// Makes σ larger where many points of a generation are equally good.
  void widen();

  std::size_t size() const { return mean_.size(); }
  const CmaConstants& constants() const { return constants_; }
  const std::vector<double>& mean() const { return mean_; }
  double sigma() const { return sigma_; }
  /// C_jj.
  double variance(std::size_t j) const { return covariance_[j * size() + j]; }
  /// σ·A_jj·√C_jj: the standard deviation of coordinate j.
  double deviation(std::size_t j) const;
  /// Lengths of the axes of C, and the axes row by row.
  const std::vector<double>& axisLengths() const { return axisLengths_; }
  std::span<const double> axis(std::size_t k) const { return std::span(eigen_.vectors).subspan(k * size(), size()); }
  /// The largest eigenvalue of C divided by the smallest one; infinity where rounding has left none above 0.
  double condition() const;
  /// σ·|p_c,j|.
  double pathLength(std::size_t j) const;

  /// For integer parameters: moves the mean and widens coordinate j.
  void setMean(std::size_t j, double value) { mean_[j] = value; }
  double widening(std::size_t j) const { return widening_[j]; }
  void setWidening(std::size_t j, double value) { widening_[j] = value; }

 private:
  /// D⁻¹·Bᵀ·y: the step in units of the axes.
  std::vector<double> whitened(std::span<const double> step) const;
  void updateCovariance(std::span<const std::vector<double>* const> ranked, bool isPathMoving);
  void decompose();

  CmaConstants constants_;
  std::vector<double> mean_;        ///< m
  double sigma_;                    ///< σ
  std::vector<double> covariance_;  ///< C, n · n
  std::vector<double> widening_;    ///< diagonal of A
  std::vector<double> sigmaPath_;   ///< p_σ
  std::vector<double> path_;        ///< p_c
  SymmetricEigen eigen_;            ///< of C, as of the last decomposition
  std::vector<double> axisLengths_;
  double expectedLength_;  ///< of a vector from N(0, I)
  int generation_ = 0;
  int decomposedAt_ = 0;
};

}  // namespace mirevo

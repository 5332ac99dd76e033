#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/surrogate/surrogate_model.h"

namespace mirevo {

/// Number of coefficients of a full quadratic polynomial in n parameters.
constexpr std::size_t quadraticCoefficientCount(std::size_t n) {
  return (n + 1) * (n + 2) / 2;
}

/// The full quadratic polynomial in n parameters, (n+1)(n+2)/2 coefficients, by least squares. A small ridge keeps it
/// defined where the points do not determine every coefficient.
class QuadraticSurrogate final : public SurrogateModel {
 public:
  bool fit(std::span<const std::vector<double>> points, std::span<const double> values) override;
  double predict(std::span<const double> point) const override;

 private:
  std::vector<double> terms(std::span<const double> point) const;

  std::vector<double> centre_;        ///< n; mean of the points
  std::vector<double> width_;         ///< n; largest distance from the mean, 0 for a coordinate that does not vary
  std::vector<double> coefficients_;  ///< of 1, x_j, x_j·x_k (j <= k) in the scaled coordinates
};

}  // namespace mirevo

#include "algorithms/surrogate/quadratic_surrogate.h"

#include <algorithm>
#include <cmath>

#include "algorithms/numbers/gram_matrix.h"
#include "algorithms/numbers/lapack.h"

namespace mirevo {

std::vector<double> QuadraticSurrogate::terms(std::span<const double> point) const {
  const std::size_t n = centre_.size();
  std::vector<double> scaled(n);
  for (std::size_t j = 0; j < n; ++j) scaled[j] = width_[j] > 0.0 ? (point[j] - centre_[j]) / width_[j] : 0.0;
  std::vector<double> result{1.0};
  result.reserve(quadraticCoefficientCount(n));
  result.insert(result.end(), scaled.begin(), scaled.end());
  for (std::size_t j = 0; j < n; ++j) {
    for (std::size_t k = j; k < n; ++k) result.push_back(scaled[j] * scaled[k]);
  }
  return result;
}

bool QuadraticSurrogate::fit(std::span<const std::vector<double>> points, std::span<const double> values) {
  if (points.empty()) return false;
  const std::size_t n = points.front().size();
  const auto count = static_cast<double>(points.size());
  centre_.assign(n, 0.0);
  width_.assign(n, 0.0);
  for (const auto& point : points) {
    for (std::size_t j = 0; j < n; ++j) centre_[j] += point[j] / count;
  }
  for (const auto& point : points) {
    for (std::size_t j = 0; j < n; ++j) width_[j] = std::max(width_[j], std::abs(point[j] - centre_[j]));
  }

  const std::size_t size = quadraticCoefficientCount(n);
  std::vector<double> design(size * points.size());  // X, one column after another
  std::vector<double> moments(size, 0.0);            // Xᵀy
  for (std::size_t i = 0; i < points.size(); ++i) {
    const std::vector<double> row = terms(points[i]);
    for (std::size_t column = 0; column < size; ++column) {
      moments[column] += row[column] * values[i];
      design[column * points.size() + i] = row[column];
    }
  }
  std::vector<std::span<const double>> columns;
  for (std::size_t k = 0; k < size; ++k) columns.push_back(std::span(design).subspan(k * points.size(), points.size()));
  const std::vector<double> normal = gramMatrix(columns);  // XᵀX
  // The ridge grows until the matrix is positive definite in floating point.
  double ridge = 1.0e-8 * count;
  while (ridge <= count) {
    std::vector<double> factor = normal;
    for (std::size_t k = 1; k < size; ++k) factor[k * size + k] += ridge;
    ridge *= 100.0;
    if (!choleskyFactor(factor.data(), static_cast<int>(size))) continue;
    coefficients_ = moments;
    choleskySolve(factor.data(), static_cast<int>(size), coefficients_.data());
    return std::all_of(coefficients_.begin(), coefficients_.end(), [](double c) { return std::isfinite(c); });
  }
  return false;
}

double QuadraticSurrogate::predict(std::span<const double> point) const {
  const std::vector<double> row = terms(point);
  double sum = 0.0;
  for (std::size_t k = 0; k < row.size(); ++k) sum += coefficients_[k] * row[k];
  return sum;
}

}  // namespace mirevo

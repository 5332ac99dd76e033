#include "algorithms/numbers/least_squares.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace mirevo {
namespace {

double dot(std::span<const double> a, std::span<const double> b) {
  double sum = 0.0;
  for (std::size_t i = 0; i < a.size(); ++i) sum += a[i] * b[i];
  return sum;
}

/// Makes two columns orthogonal; false if they were already.
bool rotate(std::vector<double>& p, std::vector<double>& q, std::span<double> vectorP, std::span<double> vectorQ) {
  const double alpha = dot(p, p);
  const double beta = dot(q, q);
  const double gamma = dot(p, q);
  constexpr double kOrthogonal = 4.0 * std::numeric_limits<double>::epsilon();
  if (!(std::abs(gamma) > kOrthogonal * std::sqrt(alpha) * std::sqrt(beta))) return false;
  const double zeta = (beta - alpha) / (2.0 * gamma);
  const double t = std::copysign(1.0, zeta) / (std::abs(zeta) + std::hypot(1.0, zeta));
  const double c = 1.0 / std::hypot(1.0, t);
  const double s = c * t;
  const auto turn = [c, s](std::span<double> a, std::span<double> b) {
    for (std::size_t i = 0; i < a.size(); ++i) {
      const double left = a[i];
      a[i] = c * left - s * b[i];
      b[i] = s * left + c * b[i];
    }
  };
  turn(p, q);
  turn(vectorP, vectorQ);
  return true;
}

}  // namespace

SingularValues singularValues(std::vector<std::vector<double>> columns, std::span<const double> b) {
  const std::size_t k = columns.size();
  SingularValues found;
  found.vectors.assign(k * k, 0.0);
  for (std::size_t j = 0; j < k; ++j) found.vectors[j * k + j] = 1.0;
  const auto vectorOf = [&](std::size_t j) { return std::span(found.vectors).subspan(j * k, k); };
  constexpr int kMostSweeps = 60;
  for (int sweep = 0; sweep < kMostSweeps; ++sweep) {
    bool hasTurned = false;
    for (std::size_t p = 0; p + 1 < k; ++p) {
      for (std::size_t q = p + 1; q < k; ++q) {
        hasTurned = rotate(columns[p], columns[q], vectorOf(p), vectorOf(q)) || hasTurned;
      }
    }
    if (!hasTurned) break;
  }
  for (const std::vector<double>& column : columns) {
    found.values.push_back(std::sqrt(dot(column, column)));
    found.coefficients.push_back(found.values.back() > 0.0 ? dot(column, b) / found.values.back() : 0.0);
  }
  return found;
}

std::vector<double> SingularValues::solve(double lambda, double smallestShare) const {
  const std::size_t k = values.size();
  std::vector<double> x(k, 0.0);
  if (k == 0) return x;
  const double limit = smallestShare * *std::max_element(values.begin(), values.end());
  for (std::size_t i = 0; i < k; ++i) {
    if (!(values[i] > limit)) continue;
    const double factor = values[i] * coefficients[i] / (values[i] * values[i] + lambda);
    // A = U·S·V': column i of A·V belongs to singular vector i, whose entries are those of the rotations.
    for (std::size_t j = 0; j < k; ++j) x[j] += factor * vectors[i * k + j];
  }
  return x;
}

TriangularSystem reduceToTriangle(std::vector<std::vector<double>> columns, std::vector<double> rightSide) {
  const std::size_t n = columns.size();
  const std::size_t m = std::max(rightSide.size(), n);
  rightSide.resize(m, 0.0);
  for (std::vector<double>& column : columns) column.resize(m, 0.0);
  for (std::size_t j = 0; j < n; ++j) {
    const std::span<double> below = std::span(columns[j]).subspan(j);
    const double length = std::sqrt(dot(below, below));
    if (length == 0.0) continue;
    const double alpha = below[0] > 0.0 ? -length : length;
    std::vector<double> v(below.begin(), below.end());
    v[0] -= alpha;
    const double square = dot(v, v);
    const auto reflect = [&](std::vector<double>& values) {
      const std::span<double> part = std::span(values).subspan(j);
      const double factor = 2.0 * dot(v, part) / square;
      for (std::size_t i = 0; i < part.size(); ++i) part[i] -= factor * v[i];
    };
    for (std::size_t other = j + 1; other < n; ++other) reflect(columns[other]);
    reflect(rightSide);
    below[0] = alpha;
    std::fill(below.begin() + 1, below.end(), 0.0);
  }
  TriangularSystem system;
  const std::span<const double> rest = std::span(rightSide).subspan(n);
  system.rest = dot(rest, rest);
  for (std::vector<double>& column : columns) {
    column.resize(n);
    system.columns.push_back(std::move(column));
  }
  rightSide.resize(n);
  system.rightSide = std::move(rightSide);
  return system;
}

}  // namespace mirevo

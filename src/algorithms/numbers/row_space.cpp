#include "algorithms/numbers/row_space.h"

#include <cmath>
#include <utility>

namespace mirevo {
namespace {

/// Shorter than this share of itself, what is left of a row is rounding.
constexpr double kDependent = 1.0e-9;

double dot(std::span<const double> a, std::span<const double> b) {
  double sum = 0.0;
  for (std::size_t i = 0; i < a.size(); ++i) sum += a[i] * b[i];
  return sum;
}

void addTo(std::vector<double>& sum, double factor, std::span<const double> values) {
  for (std::size_t i = 0; i < sum.size(); ++i) sum[i] += factor * values[i];
}

}  // namespace

bool RowSpace::add(std::span<const double> row, double rightSide) {
  std::vector<double> left(row.begin(), row.end());
  const double length = std::sqrt(dot(left, left));
  if (!(length > 0.0) || !std::isfinite(length) || !std::isfinite(rightSide)) return false;
  std::vector<double> factors(rows_.size(), 0.0);
  for (int pass = 0; pass < 2; ++pass) {
    for (std::size_t i = 0; i < rows_.size(); ++i) {
      const double factor = dot(rows_[i], left);
      addTo(left, -factor, rows_[i]);
      factors[i] += factor;
      rightSide -= factor * rightSides_[i];
    }
  }
  const double rest = std::sqrt(dot(left, left));
  if (!(rest > kDependent * length)) return false;
  for (double& value : left) value /= rest;
  factors.push_back(rest);
  rows_.push_back(std::move(left));
  rightSides_.push_back(rightSide / rest);
  factors_.push_back(std::move(factors));
  return true;
}

std::vector<double> RowSpace::shortestSolution() const {
  std::vector<double> x(unknownCount_, 0.0);
  for (std::size_t i = 0; i < rows_.size(); ++i) addTo(x, rightSides_[i], rows_[i]);
  return x;
}

std::vector<std::vector<double>> RowSpace::nullSpace() const {
  std::vector<std::vector<double>> found;
  // The unit vectors of which most is left first would be the most exact; a share of a hundredth is exact enough.
  for (const double leastShare : {1.0e-2, 1.0e-6}) {
    for (std::size_t j = 0; j < unknownCount_ && found.size() + rows_.size() < unknownCount_; ++j) {
      std::vector<double> left(unknownCount_, 0.0);
      left[j] = 1.0;
      for (int pass = 0; pass < 3; ++pass) {
        for (const auto& row : rows_) addTo(left, -dot(row, left), row);
        for (const auto& vector : found) addTo(left, -dot(vector, left), vector);
      }
      const double rest = std::sqrt(dot(left, left));
      if (!(rest > leastShare)) continue;
      for (double& value : left) value /= rest;
      found.push_back(std::move(left));
    }
  }
  return found;
}

std::vector<double> RowSpace::coefficientsOf(std::span<const double> vector) const {
  // The vector is Q'·c in the space of the rows, and these are L·Q: L'·y = c.
  std::vector<double> y(rows_.size(), 0.0);
  for (std::size_t k = rows_.size(); k-- > 0;) {
    double value = dot(rows_[k], vector);
    for (std::size_t i = k + 1; i < rows_.size(); ++i) value -= factors_[i][k] * y[i];
    y[k] = value / factors_[k][k];
  }
  return y;
}

}  // namespace mirevo

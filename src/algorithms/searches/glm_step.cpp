#include "algorithms/searches/glm_step.h"

#include <algorithm>
#include <cmath>

namespace mirevo {
namespace {

double dot(std::span<const double> a, std::span<const double> b) {
  double sum = 0.0;
  for (std::size_t i = 0; i < a.size(); ++i) sum += a[i] * b[i];
  return sum;
}

}  // namespace

GlmLinearModel::GlmLinearModel(std::vector<std::vector<double>> jacobian, std::span<const double> residuals,
                               std::span<const double> set, const SearchBounds& bounds, double smallestSingularValue)
    : set_(set.begin(), set.end()),
      bounds_(bounds),
      smallestSingularValue_(smallestSingularValue),
      sumOfSquares_(dot(residuals, residuals)) {
  for (std::vector<double>& column : jacobian) {
    const double length = std::sqrt(dot(column, column));
    lengths_.push_back(std::isfinite(length) ? length : 0.0);
    for (double& value : column) value = lengths_.back() > 0.0 ? value / length : 0.0;
  }
  std::vector<double> rightSide(residuals.begin(), residuals.end());
  for (double& value : rightSide) value = -value;
  system_ = reduceToTriangle(std::move(jacobian), std::move(rightSide));
}

/// Without the right side, which fixed parameters change.
const SingularValues& GlmLinearModel::decomposed(const std::vector<bool>& isFree) {
  const auto found = decomposed_.find(isFree);
  if (found != decomposed_.end()) return found->second;
  std::vector<std::vector<double>> columns;
  for (std::size_t j = 0; j < isFree.size(); ++j) {
    if (isFree[j]) columns.push_back(system_.columns[j]);
  }
  return decomposed_.emplace(isFree, singularValues(std::move(columns), system_.rightSide)).first->second;
}

/// The scaled step: that of the free parameters beside the fixed ones.
std::vector<double> GlmLinearModel::stepOf(const std::vector<bool>& isFree, const std::vector<double>& fixed,
                                           double lambda) {
  std::vector<double> step = fixed;
  SingularValues reduced = decomposed(isFree);
  // What the fixed steps change of the right side, on the left singular vectors: u = R·v / s.
  std::vector<double> change(system_.rightSide.size(), 0.0);
  bool hasChange = false;
  for (std::size_t j = 0; j < fixed.size(); ++j) {
    if (isFree[j] || fixed[j] == 0.0) continue;
    hasChange = true;
    for (std::size_t i = 0; i < change.size(); ++i) change[i] += system_.columns[j][i] * fixed[j];
  }
  std::vector<std::size_t> places;
  for (std::size_t j = 0; j < isFree.size(); ++j) {
    if (isFree[j]) places.push_back(j);
  }
  const std::size_t k = places.size();
  if (hasChange) {
    std::vector<double> products(k);
    for (std::size_t j = 0; j < k; ++j) products[j] = dot(system_.columns[places[j]], change);
    for (std::size_t i = 0; i < k; ++i) {
      if (!(reduced.values[i] > 0.0)) continue;
      reduced.coefficients[i] -= dot(std::span(reduced.vectors).subspan(i * k, k), products) / reduced.values[i];
    }
  }
  const std::vector<double> found = reduced.solve(lambda, smallestSingularValue_);
  for (std::size_t j = 0; j < k; ++j) step[places[j]] = found[j];
  return step;
}

std::vector<double> GlmLinearModel::setFor(double lambda) {
  const std::size_t n = set_.size();
  std::vector<bool> isFree(n);
  std::vector<bool> wasFreed(n, false);
  for (std::size_t j = 0; j < n; ++j) isFree[j] = lengths_[j] > 0.0;
  std::vector<double> fixed(n, 0.0);
  std::vector<double> step;
  for (;;) {
    step = stepOf(isFree, fixed, lambda);
    bool hasLeft = false;
    for (std::size_t j = 0; j < n; ++j) {
      if (!isFree[j]) continue;
      const double low = stepTo(j, bounds_.lower[j]);
      const double high = stepTo(j, bounds_.upper[j]);
      if (step[j] >= low && step[j] <= high) continue;
      isFree[j] = false;
      fixed[j] = step[j] < low ? low : high;
      hasLeft = true;
    }
    if (hasLeft) continue;
    // The gradient of the damped sum of squares by the scaled step.
    std::vector<double> left = system_.rightSide;
    for (std::size_t j = 0; j < n; ++j) {
      for (std::size_t i = 0; i < left.size(); ++i) left[i] -= system_.columns[j][i] * step[j];
    }
    for (std::size_t j = 0; j < n && !hasLeft; ++j) {
      if (isFree[j] || wasFreed[j] || !(lengths_[j] > 0.0)) continue;
      const double downhill = dot(system_.columns[j], left) - lambda * step[j];
      const bool isAtLower = fixed[j] == stepTo(j, bounds_.lower[j]);
      if (isAtLower ? !(downhill > 0.0) : !(downhill < 0.0)) continue;
      isFree[j] = true;
      wasFreed[j] = true;
      fixed[j] = 0.0;
      hasLeft = true;
    }
    if (!hasLeft) break;
  }
  std::vector<double> found(n);
  for (std::size_t j = 0; j < n; ++j) {
    const double value = lengths_[j] > 0.0 ? set_[j] + step[j] / lengths_[j] : set_[j];
    found[j] = std::clamp(value, bounds_.lower[j], bounds_.upper[j]);
    if (isFree[j] || !(lengths_[j] > 0.0)) continue;
    found[j] = fixed[j] == stepTo(j, bounds_.lower[j]) ? bounds_.lower[j] : bounds_.upper[j];
  }
  return found;
}

std::vector<double> GlmLinearModel::correctedSet(double lambda, std::span<const double> set,
                                                 std::span<const std::vector<double>> jacobian,
                                                 std::span<const double> lack) {
  /// Transtrum and Sethna (2012) take a correction that is not small beside the step for a sign that there is none.
  constexpr double kMostOfStep = 0.75;
  const std::size_t n = set_.size();
  std::vector<bool> isFree(n);
  for (std::size_t j = 0; j < n; ++j) {
    isFree[j] = lengths_[j] > 0.0 && set[j] > bounds_.lower[j] && set[j] < bounds_.upper[j];
  }
  SingularValues reduced = decomposed(isFree);
  std::vector<double> products;
  for (std::size_t j = 0; j < n; ++j) {
    if (isFree[j]) products.push_back(dot(jacobian[j], lack) / lengths_[j]);
  }
  const std::size_t k = products.size();
  for (std::size_t i = 0; i < k; ++i) {
    const double product = dot(std::span(reduced.vectors).subspan(i * k, k), products);
    reduced.coefficients[i] = reduced.values[i] > 0.0 ? -product / reduced.values[i] : 0.0;
  }
  const std::vector<double> step = reduced.solve(lambda, smallestSingularValue_);
  double before = 0.0;
  for (std::size_t j = 0; j < n; ++j) before += stepTo(j, set[j]) * stepTo(j, set[j]);
  std::vector<double> found(set.begin(), set.end());
  if (!(dot(step, step) <= kMostOfStep * kMostOfStep * before)) return found;
  for (std::size_t j = 0, place = 0; j < n; ++j) {
    if (isFree[j]) found[j] = std::clamp(set[j] + step[place++] / lengths_[j], bounds_.lower[j], bounds_.upper[j]);
  }
  return found;
}

double GlmLinearModel::sumOfSquaresAt(std::span<const double> set) const {
  std::vector<double> left = system_.rightSide;
  for (std::size_t j = 0; j < set_.size(); ++j) {
    const double step = stepTo(j, set[j]);
    for (std::size_t i = 0; i < left.size(); ++i) left[i] -= system_.columns[j][i] * step;
  }
  return dot(left, left) + system_.rest;
}

double GlmLinearModel::largestCosine() const {
  double largest = 0.0;
  if (!(sumOfSquares_ > 0.0)) return 0.0;
  for (std::size_t j = 0; j < set_.size(); ++j) {
    const double downhill = dot(system_.columns[j], system_.rightSide);
    const bool isHeld =
        (set_[j] <= bounds_.lower[j] && downhill < 0.0) || (set_[j] >= bounds_.upper[j] && downhill > 0.0);
    if (!isHeld) largest = std::max(largest, std::abs(downhill) / std::sqrt(sumOfSquares_));
  }
  return largest;
}

}  // namespace mirevo

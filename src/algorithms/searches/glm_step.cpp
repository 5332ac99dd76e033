#include "algorithms/searches/glm_step.h"

#include <algorithm>
#include <cmath>
#include <optional>
#include <utility>

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

void GlmLinearModel::freeUnseen(const std::vector<bool>& isKnown) {
  // So long that a step over the whole range is as long as the residuals.
  const double length = sumOfSquares_ > 0.0 ? std::sqrt(sumOfSquares_) : 1.0;
  for (std::size_t j = 0; j < lengths_.size(); ++j) {
    if (lengths_[j] == 0.0 && isKnown[j]) lengths_[j] = length / (bounds_.upper[j] - bounds_.lower[j]);
  }
}

RowSpace GlmLinearModel::heldRows(const std::vector<bool>& isFree, const std::vector<double>& fixed,
                                  std::span<const LinearConstraint> constraints, std::vector<bool>& isHeld) const {
  RowSpace rows(static_cast<std::size_t>(std::ranges::count(isFree, true)));
  for (std::size_t c = 0; c < constraints.size(); ++c) {
    if (!isHeld[c]) continue;
    std::vector<double> row;
    double rightSide = -constraints[c].margin;
    for (std::size_t j = 0; j < isFree.size(); ++j) {
      const double slope = slopeOf(constraints[c], j);
      if (isFree[j]) {
        row.push_back(slope);
      } else {
        rightSide -= slope * fixed[j];
      }
    }
    isHeld[c] = rows.add(row, rightSide);
  }
  return rows;
}

/// Of the scaled columns in these directions of the free parameters.
SingularValues GlmLinearModel::decomposedAlong(std::span<const std::vector<double>> directions,
                                               const std::vector<bool>& isFree,
                                               std::span<const double> rightSide) const {
  std::vector<std::vector<double>> columns;
  for (const std::vector<double>& direction : directions) {
    std::vector<double>& column = columns.emplace_back(system_.rightSide.size(), 0.0);
    for (std::size_t j = 0, place = 0; j < isFree.size(); ++j) {
      if (!isFree[j]) continue;
      const double factor = direction[place++];
      for (std::size_t i = 0; i < column.size(); ++i) column[i] += factor * system_.columns[j][i];
    }
  }
  return singularValues(std::move(columns), rightSide);
}

/// The scaled step: the shortest one to the constraints, and from there along them.
std::vector<double> GlmLinearModel::stepAlong(const RowSpace& rows, const std::vector<bool>& isFree,
                                              const std::vector<double>& fixed, double lambda) const {
  const std::vector<double> onto = rows.shortestSolution();
  std::vector<double> step = fixed;
  for (std::size_t j = 0, place = 0; j < isFree.size(); ++j) {
    if (isFree[j]) step[j] = onto[place++];
  }
  std::vector<double> left = system_.rightSide;
  for (std::size_t j = 0; j < step.size(); ++j) {
    for (std::size_t i = 0; i < left.size(); ++i) left[i] -= system_.columns[j][i] * step[j];
  }
  const std::vector<std::vector<double>> directions = rows.nullSpace();
  const std::vector<double> along = decomposedAlong(directions, isFree, left).solve(lambda, smallestSingularValue_);
  for (std::size_t d = 0; d < directions.size(); ++d) {
    for (std::size_t j = 0, place = 0; j < isFree.size(); ++j) {
      if (isFree[j]) step[j] += along[d] * directions[d][place++];
    }
  }
  return step;
}

std::vector<double> GlmLinearModel::balance(std::vector<double>& downhill, const std::vector<bool>& isFree,
                                            std::span<const LinearConstraint> constraints,
                                            const std::vector<bool>& isHeld) const {
  std::vector<double> multipliers(constraints.size(), 0.0);
  std::vector<bool> isInRows = isHeld;
  const RowSpace rows = heldRows(isFree, std::vector<double>(isFree.size(), 0.0), constraints, isInRows);
  if (rows.size() == 0) return multipliers;
  std::vector<double> wanted;
  for (std::size_t j = 0; j < isFree.size(); ++j) {
    if (isFree[j]) wanted.push_back(-downhill[j]);
  }
  const std::vector<double> found = rows.coefficientsOf(wanted);
  for (std::size_t c = 0, place = 0; c < constraints.size(); ++c) {
    if (!isInRows[c]) continue;
    multipliers[c] = found[place++];
    for (std::size_t j = 0; j < downhill.size(); ++j) downhill[j] += multipliers[c] * slopeOf(constraints[c], j);
  }
  return multipliers;
}

/// Where a step from one point towards another first meets a bound or a constraint.
struct GlmLinearModel::Obstacle {
  double share = 1.0;  ///< of the way
  std::optional<std::size_t> parameter;
  std::optional<std::size_t> constraint;
  double value = 0.0;  ///< scaled step of the parameter at its bound
};

GlmLinearModel::Obstacle GlmLinearModel::firstObstacle(std::span<const double> from, std::span<const double> to,
                                                       const std::vector<bool>& isFree,
                                                       std::span<const LinearConstraint> constraints,
                                                       const std::vector<bool>& isHeld) const {
  constexpr double kRounding = 1.0e-12;
  Obstacle first;
  for (std::size_t j = 0; j < from.size(); ++j) {
    if (!isFree[j]) continue;
    const double bound = stepTo(j, to[j] < from[j] ? bounds_.lower[j] : bounds_.upper[j]);
    if (to[j] < from[j] ? to[j] >= bound : to[j] <= bound) continue;
    const double share = std::max(0.0, (bound - from[j]) / (to[j] - from[j]));
    if (share < first.share) first = {share, j, std::nullopt, bound};
  }
  for (std::size_t c = 0; c < constraints.size(); ++c) {
    if (isHeld[c]) continue;
    double margin = constraints[c].margin;
    double change = 0.0;
    double size = std::abs(margin);
    for (std::size_t j = 0; j < from.size(); ++j) {
      const double slope = slopeOf(constraints[c], j);
      margin += slope * from[j];
      change += slope * (to[j] - from[j]);
      size += std::abs(slope) * (std::abs(from[j]) + std::abs(to[j]));
    }
    if (margin + change >= -kRounding * size) continue;
    const double share = std::max(0.0, -margin / change);
    if (share < first.share) first = {share, std::nullopt, c, 0.0};
  }
  return first;
}

/// A primal active-set method: the steps within the constraints lead from one obstacle to the next, which is held from
/// then on, and let go what is not needed where they have come to their end.
std::vector<double> GlmLinearModel::constrainedSet(double lambda, std::span<const LinearConstraint> constraints) {
  constexpr double kRounding = 1.0e-10;
  const std::size_t n = set_.size();
  std::vector<bool> isFree(n);
  for (std::size_t j = 0; j < n; ++j) isFree[j] = lengths_[j] > 0.0;
  std::vector<double> fixed(n, 0.0);
  std::vector<bool> isHeld(constraints.size(), false);
  std::vector<double> step(n, 0.0);
  const std::size_t mostRounds = 20 + 4 * (n + constraints.size());
  for (std::size_t round = 0; round < mostRounds; ++round) {
    const RowSpace rows = heldRows(isFree, fixed, constraints, isHeld);
    const std::vector<double> target =
        rows.size() == 0 ? stepOf(isFree, fixed, lambda) : stepAlong(rows, isFree, fixed, lambda);
    const Obstacle obstacle = firstObstacle(step, target, isFree, constraints, isHeld);
    for (std::size_t j = 0; j < n; ++j) step[j] += obstacle.share * (target[j] - step[j]);
    if (obstacle.parameter) {
      isFree[*obstacle.parameter] = false;
      step[*obstacle.parameter] = fixed[*obstacle.parameter] = obstacle.value;
      continue;
    }
    if (obstacle.constraint) {
      isHeld[*obstacle.constraint] = true;
      continue;
    }
    // At the minimum of what is free: the multipliers tell what need not be held.
    std::vector<double> left = system_.rightSide;
    for (std::size_t j = 0; j < n; ++j) {
      for (std::size_t i = 0; i < left.size(); ++i) left[i] -= system_.columns[j][i] * step[j];
    }
    std::vector<double> downhill(n);
    for (std::size_t j = 0; j < n; ++j) downhill[j] = dot(system_.columns[j], left) - lambda * step[j];
    double worst = -kRounding * std::sqrt(dot(downhill, downhill));
    const std::vector<double> multipliers = balance(downhill, isFree, constraints, isHeld);
    std::optional<std::size_t> parameter;
    std::optional<std::size_t> constraint;
    for (std::size_t c = 0; c < constraints.size(); ++c) {
      double square = 0.0;
      for (std::size_t j = 0; j < n; ++j) square += slopeOf(constraints[c], j) * slopeOf(constraints[c], j);
      if (const double push = multipliers[c] * std::sqrt(square); push < worst) {
        worst = push;
        constraint = c;
      }
    }
    for (std::size_t j = 0; j < n; ++j) {
      if (isFree[j] || !(lengths_[j] > 0.0)) continue;
      const double push = fixed[j] == stepTo(j, bounds_.lower[j]) ? -downhill[j] : downhill[j];
      if (!(push < worst)) continue;
      worst = push;
      parameter = j;
    }
    if (!parameter && !constraint) break;
    if (parameter) {
      isFree[*parameter] = true;
      fixed[*parameter] = 0.0;
    } else {
      isHeld[*constraint] = false;
    }
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

std::vector<double> GlmLinearModel::setFor(double lambda, std::span<const LinearConstraint> constraints) {
  if (!constraints.empty()) return constrainedSet(lambda, constraints);
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
                                                 std::span<const double> lack,
                                                 std::span<const LinearConstraint> constraints) {
  /// Transtrum and Sethna (2012) take a correction that is not small beside the step for a sign that there is none.
  constexpr double kMostOfStep = 0.75;
  const std::size_t n = set_.size();
  std::vector<bool> isFree(n);
  for (std::size_t j = 0; j < n; ++j) {
    isFree[j] = lengths_[j] > 0.0 && set[j] > bounds_.lower[j] && set[j] < bounds_.upper[j];
  }
  std::vector<bool> isHeld(constraints.size(), true);
  const RowSpace rows = heldRows(isFree, std::vector<double>(n, 0.0), constraints, isHeld);
  const std::vector<std::vector<double>> directions =
      rows.size() == 0 ? std::vector<std::vector<double>>() : rows.nullSpace();
  SingularValues reduced =
      rows.size() == 0 ? decomposed(isFree) : decomposedAlong(directions, isFree, system_.rightSide);
  std::vector<double> products;
  for (std::size_t j = 0; j < n; ++j) {
    if (isFree[j]) products.push_back(dot(jacobian[j], lack) / lengths_[j]);
  }
  if (rows.size() > 0) {
    std::vector<double> along;
    along.reserve(directions.size());
    for (const std::vector<double>& direction : directions) along.push_back(dot(direction, products));
    products = std::move(along);
  }
  const std::size_t k = products.size();
  for (std::size_t i = 0; i < k; ++i) {
    const double product = dot(std::span(reduced.vectors).subspan(i * k, k), products);
    reduced.coefficients[i] = reduced.values[i] > 0.0 ? -product / reduced.values[i] : 0.0;
  }
  std::vector<double> step = reduced.solve(lambda, smallestSingularValue_);
  if (rows.size() > 0) {
    std::vector<double> ofParameters(static_cast<std::size_t>(std::ranges::count(isFree, true)), 0.0);
    for (std::size_t d = 0; d < k; ++d) {
      for (std::size_t i = 0; i < ofParameters.size(); ++i) ofParameters[i] += step[d] * directions[d][i];
    }
    step = std::move(ofParameters);
  }
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

double GlmLinearModel::largestCosine(std::span<const LinearConstraint> constraints) const {
  double largest = 0.0;
  if (!(sumOfSquares_ > 0.0)) return 0.0;
  const std::size_t n = set_.size();
  std::vector<double> downhill(n);
  for (std::size_t j = 0; j < n; ++j) downhill[j] = dot(system_.columns[j], system_.rightSide);
  const auto isHeldByBound = [&](std::size_t j) {
    return (set_[j] <= bounds_.lower[j] && downhill[j] < 0.0) || (set_[j] >= bounds_.upper[j] && downhill[j] > 0.0);
  };
  std::vector<bool> isHeld(constraints.size(), true);
  const std::vector<double> plain = downhill;
  for (bool letsGo = !constraints.empty(); letsGo;) {
    std::vector<bool> isFree(n);
    downhill = plain;
    for (std::size_t j = 0; j < n; ++j) isFree[j] = lengths_[j] > 0.0 && !isHeldByBound(j);
    const std::vector<double> multipliers = balance(downhill, isFree, constraints, isHeld);
    const auto least = std::ranges::min_element(multipliers);
    letsGo = *least < 0.0;
    if (letsGo) isHeld[static_cast<std::size_t>(least - multipliers.begin())] = false;
  }
  for (std::size_t j = 0; j < n; ++j) {
    if (!isHeldByBound(j)) largest = std::max(largest, std::abs(downhill[j]) / std::sqrt(sumOfSquares_));
  }
  return largest;
}

}  // namespace mirevo

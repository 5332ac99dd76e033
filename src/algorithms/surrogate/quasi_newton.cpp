#include "algorithms/surrogate/quasi_newton.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <limits>
#include <numeric>
#include <utility>

namespace mirevo {
namespace {

constexpr int kMostHalvings = 6;

using Vector = std::vector<double>;

Vector difference(const Vector& a, const Vector& b) {
  Vector result(a.size());
  for (std::size_t k = 0; k < a.size(); ++k) result[k] = a[k] - b[k];
  return result;
}

double product(const Vector& a, const Vector& b) {
  return std::inner_product(a.begin(), a.end(), b.begin(), 0.0);
}

/// The state of a search: its point, and its approximation of the function's curvature.
class QuasiNewton final {
 public:
  QuasiNewton(const SmoothFunction& function, Vector start, const Box& bounds, const QuasiNewtonSettings& settings)
      : function_(function), bounds_(bounds), settings_(settings), point_(std::move(start)) {}

  LowPoint run() {
    value_ = function_.value(point_);
    if (!std::isfinite(value_)) return {point_, value_};
    slope_ = function_.slope();
    for (int move = 0; move < settings_.mostMoves; ++move) {
      const double before = value_;
      const Vector direction = descent();
      if (product(direction, slope_) < 0.0 && moveAlong(direction)) {
        if (before - value_ < settings_.leastGain) break;
      } else if (curvature_.empty()) {
        break;
      } else {
        curvature_.clear();
      }
    }
    if (isAway_) function_.value(point_);
    return {point_, value_};
  }

 private:
  bool isHeld(std::size_t k) const {
    return (point_[k] <= bounds_.lower[k] && slope_[k] > 0.0) || (point_[k] >= bounds_.upper[k] && slope_[k] < 0.0);
  }

  /// The direction to the minimum of the quadratic model in the free coordinates; steepest descent while there is no
  /// model.
  Vector descent() const {
    const std::size_t n = point_.size();
    Vector direction(n, 0.0);
    for (std::size_t k = 0; k < n; ++k) {
      if (isHeld(k)) continue;
      if (curvature_.empty()) direction[k] = -slope_[k];
      for (std::size_t i = 0; i < n && !curvature_.empty(); ++i) {
        if (!isHeld(i)) direction[k] -= curvature_[k * n + i] * slope_[i];
      }
    }
    return direction;
  }

  /// Takes the longest of a few steps that decreases the function; false if none does.
  bool moveAlong(const Vector& direction) {
    double largest = 0.0;
    for (const double d : direction) largest = std::max(largest, std::abs(d));
    double step = std::min(1.0, settings_.longestMove / largest);
    for (int halving = 0; halving <= kMostHalvings; ++halving, step /= 2.0) {
      Vector next = point_;
      for (std::size_t k = 0; k < next.size(); ++k) {
        next[k] = std::clamp(next[k] + step * direction[k], bounds_.lower[k], bounds_.upper[k]);
      }
      const double reached = function_.value(next);
      isAway_ = !(reached < value_);
      if (isAway_) continue;
      const Vector slope = function_.slope();
      learn(difference(next, point_), difference(slope, slope_));
      point_ = std::move(next);
      value_ = reached;
      slope_ = slope;
      return true;
    }
    return false;
  }

  /// BFGS update from a move `s` over which the slope changed by `y`.
  void learn(const Vector& s, const Vector& y) {
    const double bend = product(s, y);
    if (!(bend > 1.0e-10 * product(y, y))) return;
    const std::size_t n = s.size();
    if (curvature_.empty()) {
      curvature_.assign(n * n, 0.0);
      for (std::size_t k = 0; k < n; ++k) curvature_[k * n + k] = bend / product(y, y);
    }
    Vector hy(n, 0.0);
    for (std::size_t k = 0; k < n; ++k) {
      for (std::size_t i = 0; i < n; ++i) hy[k] += curvature_[k * n + i] * y[i];
    }
    const double scale = 1.0 + product(y, hy) / bend;
    for (std::size_t k = 0; k < n; ++k) {
      for (std::size_t i = 0; i < n; ++i) {
        curvature_[k * n + i] += (scale * s[k] * s[i] - hy[k] * s[i] - s[k] * hy[i]) / bend;
      }
    }
  }

  const SmoothFunction& function_;
  const Box& bounds_;
  const QuasiNewtonSettings& settings_;
  Vector point_;
  double value_ = std::numeric_limits<double>::infinity();
  Vector slope_;
  Vector curvature_;     ///< n·n, the approximate inverse of the second derivatives; empty while nothing is known
  bool isAway_ = false;  ///< whether the function was last evaluated at another point
};

}  // namespace

LowPoint quasiNewtonSearch(const SmoothFunction& function, std::vector<double> start, const Box& bounds,
                           const QuasiNewtonSettings& settings) {
  return QuasiNewton(function, std::move(start), bounds, settings).run();
}

}  // namespace mirevo

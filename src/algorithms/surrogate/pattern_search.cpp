#include "algorithms/surrogate/pattern_search.h"

#include <algorithm>
#include <cstddef>
#include <utility>

namespace mirevo {
namespace {

constexpr double kFirstStep = 0.25;  // of the box's width
constexpr double kLastStep = 1.0e-4;
constexpr int kMostRounds = 200;

using Function = std::function<double(const std::vector<double>&)>;

/// Moves `point`, whose value is `value`, along every coordinate in turn if that is better; returns the value reached.
double explore(const Function& function, std::vector<double>& point, double value, double step, const Box& box,
               const std::vector<double>& leastMoves) {
  for (std::size_t j = 0; j < point.size(); ++j) {
    const double old = point[j];
    const double move = std::max(step * (box.upper[j] - box.lower[j]), leastMoves[j]);
    for (const double target : {old + move, old - move}) {
      point[j] = std::clamp(target, box.lower[j], box.upper[j]);
      const double trial = point[j] == old ? value : function(point);
      if (isBetter(trial, value)) {
        value = trial;
        break;
      }
      point[j] = old;
    }
  }
  return value;
}

/// The point as far beyond `to` as `from` is before it, clamped to the box.
std::vector<double> beyond(const std::vector<double>& from, const std::vector<double>& to, const Box& box) {
  std::vector<double> point(to.size());
  for (std::size_t j = 0; j < point.size(); ++j) {
    point[j] = std::clamp(2.0 * to[j] - from[j], box.lower[j], box.upper[j]);
  }
  return point;
}

}  // namespace

std::vector<double> patternSearch(const Function& function, std::vector<double> start, const Box& box,
                                  const std::vector<double>& leastMoves) {
  std::vector<double> best = std::move(start);
  double value = function(best);
  double step = kFirstStep;
  for (int round = 0; round < kMostRounds && step >= kLastStep; ++round) {
    std::vector<double> next = best;
    double found = explore(function, next, value, step, box, leastMoves);
    if (!isBetter(found, value)) step /= 2.0;
    for (; isBetter(found, value) && round < kMostRounds; ++round) {
      std::vector<double> ahead = beyond(best, next, box);
      best = std::move(next);
      value = found;
      next = std::move(ahead);
      const double reached = function(next);
      found = explore(function, next, reached, step, box, leastMoves);
    }
  }
  return best;
}

}  // namespace mirevo

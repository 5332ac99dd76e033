#include "algorithms/pareto/hypervolume.h"

#include <algorithm>
#include <iterator>
#include <limits>
#include <map>
#include <numeric>

namespace mirevo {
namespace {

using Points = std::vector<std::vector<double>>;

bool isAtMost(std::span<const double> a, std::span<const double> b) {
  for (std::size_t i = 0; i < a.size(); ++i) {
    if (!(a[i] <= b[i])) return false;
  }
  return true;
}

Points below(std::span<const std::vector<double>> points, std::span<const double> reference) {
  Points inside;
  for (const std::vector<double>& point : points) {
    bool isInside = true;
    for (std::size_t i = 0; i < reference.size(); ++i) isInside = isInside && point[i] < reference[i];
    if (isInside) inside.push_back(point);
  }
  return inside;
}

/// Without those that another one dominates, and with one of equals.
Points nondominated(Points points) {
  std::ranges::sort(points);  // what dominates a point comes before it
  Points kept;
  for (std::vector<double>& point : points) {
    const bool isCovered = std::ranges::any_of(kept, [&](const auto& other) { return isAtMost(other, point); });
    if (!isCovered) kept.push_back(std::move(point));
  }
  return kept;
}

double volumeToReference(std::span<const double> point, std::span<const double> reference) {
  double volume = 1.0;
  for (std::size_t i = 0; i < point.size(); ++i) volume *= reference[i] - point[i];
  return volume;
}

double area(Points points, std::span<const double> reference) {
  std::ranges::sort(points);
  double sum = 0.0;
  double height = reference[1];
  for (const std::vector<double>& point : points) {
    if (point[1] >= height) continue;
    sum += (reference[0] - point[0]) * (height - point[1]);
    height = point[1];
  }
  return sum;
}

/// Along the third objective, over slices whose area is that of the staircase of the points so far: Fonseca, Paquete
/// and Lopez-Ibanez (2006), doi:10.1109/CEC.2006.1688440.
double volume(Points points, std::span<const double> reference) {
  std::ranges::sort(points, {}, [](const std::vector<double>& point) { return point[2]; });
  std::map<double, double> stairs;  // second objective by the first, falling
  stairs[-std::numeric_limits<double>::infinity()] = reference[1];
  stairs[reference[0]] = -std::numeric_limits<double>::infinity();
  double slice = 0.0;
  double sum = 0.0;
  double depth = points.empty() ? 0.0 : points.front()[2];
  for (const std::vector<double>& point : points) {
    sum += slice * (point[2] - depth);
    depth = point[2];
    auto step = std::prev(stairs.upper_bound(point[0]));
    if (step->second <= point[1]) continue;
    double height = step->second;
    double from = point[0];
    auto next = std::next(step);
    while (true) {
      slice += (next->first - from) * (height - point[1]);
      if (next->second <= point[1]) break;
      from = next->first;
      height = next->second;
      next = stairs.erase(next);
    }
    stairs[point[0]] = point[1];
  }
  return sum + slice * (reference[2] - depth);
}

double volumeOf(Points points, std::span<const double> reference);

/// What the points dominate of what `point` dominates.
double sharedVolume(std::span<const double> point, std::span<const std::vector<double>> others,
                    std::span<const double> reference) {
  Points limited;
  limited.reserve(others.size());
  for (const std::vector<double>& other : others) {
    std::vector<double> worse = other;
    for (std::size_t i = 0; i < worse.size(); ++i) worse[i] = std::max(worse[i], point[i]);
    limited.push_back(std::move(worse));
  }
  return volumeOf(std::move(limited), reference);
}

double volumeOf(Points points, std::span<const double> reference) {
  if (points.empty()) return 0.0;
  const std::size_t count = reference.size();
  if (count == 1) return reference[0] - std::ranges::min(points).front();
  if (count == 2) return area(std::move(points), reference);
  if (count == 3) return volume(std::move(points), reference);
  points = nondominated(std::move(points));  // the sweeps pass over the others
  // From the worst in the last objective on, so that this one is the point's own for all that are limited by it.
  std::ranges::sort(points, std::ranges::greater{}, [](const std::vector<double>& point) { return point.back(); });
  const std::span<const double> inner = reference.first(count - 1);
  double sum = 0.0;
  for (std::size_t i = 0; i < points.size(); ++i) {
    const std::vector<double> slice(points[i].begin(), std::prev(points[i].end()));
    Points rest;
    for (std::size_t k = i + 1; k < points.size(); ++k) {
      rest.emplace_back(points[k].begin(), std::prev(points[k].end()));
    }
    const double own = volumeToReference(slice, inner) - sharedVolume(slice, rest, inner);
    sum += own * (reference.back() - points[i].back());
  }
  return sum;
}

/// In the plane all at once: that of a point is the rectangle up to its neighbours on the staircase.
std::vector<double> areaContributions(std::span<const std::vector<double>> points, std::span<const double> reference) {
  std::vector<std::size_t> order(points.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::ranges::stable_sort(order, [points](std::size_t a, std::size_t b) { return points[a] < points[b]; });
  std::vector<std::size_t> stairs;
  std::vector<bool> isAlone(points.size(), true);
  for (const std::size_t i : order) {
    const bool isInside = points[i][0] < reference[0] && points[i][1] < reference[1];
    if (isInside && !stairs.empty() && points[i] == points[stairs.back()]) isAlone[stairs.back()] = false;
    if (isInside && (stairs.empty() || points[i][1] < points[stairs.back()][1])) stairs.push_back(i);
  }
  std::vector<double> contributions(points.size(), 0.0);
  for (std::size_t k = 0; k < stairs.size(); ++k) {
    const std::vector<double>& point = points[stairs[k]];
    const double right = k + 1 < stairs.size() ? points[stairs[k + 1]][0] : reference[0];
    const double upper = k > 0 ? points[stairs[k - 1]][1] : reference[1];
    if (isAlone[stairs[k]]) contributions[stairs[k]] = (right - point[0]) * (upper - point[1]);
  }
  return contributions;
}

}  // namespace

double hypervolume(std::span<const std::vector<double>> points, std::span<const double> reference) {
  return volumeOf(below(points, reference), reference);
}

std::vector<double> hypervolumeContributions(std::span<const std::vector<double>> points,
                                             std::span<const double> reference) {
  if (reference.size() == 2) return areaContributions(points, reference);
  std::vector<double> contributions(points.size(), 0.0);
  for (std::size_t i = 0; i < points.size(); ++i) {
    if (below(points.subspan(i, 1), reference).empty()) continue;
    Points others;
    others.reserve(points.size() - 1);
    for (std::size_t k = 0; k < points.size(); ++k) {
      if (k != i) others.push_back(points[k]);
    }
    if (std::ranges::any_of(others, [&](const auto& other) { return isAtMost(other, points[i]); })) continue;
    const double shared = sharedVolume(points[i], below(others, reference), reference);
    contributions[i] = std::max(0.0, volumeToReference(points[i], reference) - shared);
  }
  return contributions;
}

std::size_t mostPointsOfHypervolume(std::size_t objectives) {
  constexpr std::size_t kMost[] = {100'000, 100'000, 100'000, 2000, 300, 100, 60, 40};
  return objectives < std::size(kMost) ? kMost[objectives] : 25;
}

}  // namespace mirevo

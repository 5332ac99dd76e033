#include "algorithms/pareto/hypervolume.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <limits>
#include <tuple>
#include <utility>

namespace mirevo {
namespace {

using Points = std::vector<std::vector<double>>;

bool isAtMost(std::span<const double> a, std::span<const double> b) {
  for (std::size_t i = 0; i < a.size(); ++i) {
    if (!(a[i] <= b[i])) return false;
  }
  return true;
}

bool isBelow(std::span<const double> point, std::span<const double> reference) {
  for (std::size_t i = 0; i < reference.size(); ++i) {
    if (!(point[i] < reference[i])) return false;
  }
  return true;
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

using Spatial = std::vector<std::array<double, 3>>;

/// Along the third objective, over slices whose area is that of the staircase of the points so far: Fonseca, Paquete
/// and Lopez-Ibanez (2006), doi:10.1109/CEC.2006.1688440. Sorts the points.
double volume(Spatial& points, std::span<const double> reference) {
  std::ranges::sort(points, {}, [](const std::array<double, 3>& point) { return point[2]; });
  struct Step {
    double from = 0.0;    // in the first objective
    double height = 0.0;  // in the second, falling
  };
  constexpr double kInfinite = std::numeric_limits<double>::infinity();
  std::vector<Step> stairs{{-kInfinite, reference[1]}, {reference[0], -kInfinite}};
  double slice = 0.0;
  double sum = 0.0;
  double depth = points.empty() ? 0.0 : points.front()[2];
  for (const std::array<double, 3>& point : points) {
    sum += slice * (point[2] - depth);
    depth = point[2];
    const auto step = std::prev(std::ranges::upper_bound(stairs, point[0], {}, &Step::from));
    if (step->height <= point[1]) continue;
    double height = step->height;
    double from = point[0];
    auto next = std::next(step);
    while (true) {
      slice += (next->from - from) * (height - point[1]);
      if (next->height <= point[1]) break;
      from = next->from;
      height = next->height;
      ++next;
    }
    const bool isAtStep = step->from == point[0];
    if (isAtStep) step->height = point[1];
    const auto place = stairs.erase(std::next(step), next);
    if (!isAtStep) stairs.insert(place, {point[0], point[1]});
  }
  return sum + slice * (reference[2] - depth);
}

double volumeOf(Points points, std::span<const double> reference);

/// What the points dominate of what `point` dominates, by as many first objectives as the reference has.
double sharedVolume(std::span<const double> point, std::span<const std::vector<double>> others,
                    std::span<const double> reference) {
  if (reference.size() == 3) {
    Spatial limited;
    limited.reserve(others.size());
    for (const std::vector<double>& other : others) {
      limited.push_back({std::max(other[0], point[0]), std::max(other[1], point[1]), std::max(other[2], point[2])});
    }
    return volume(limited, reference);
  }
  Points limited;
  limited.reserve(others.size());
  for (const std::vector<double>& other : others) {
    std::vector<double> worse(reference.size());
    for (std::size_t i = 0; i < worse.size(); ++i) worse[i] = std::max(other[i], point[i]);
    limited.push_back(std::move(worse));
  }
  return volumeOf(std::move(limited), reference);
}

double volumeOf(Points points, std::span<const double> reference) {
  if (points.empty()) return 0.0;
  const std::size_t count = reference.size();
  if (count == 1) return reference[0] - std::ranges::min(points).front();
  if (count == 2) return area(std::move(points), reference);
  if (count == 3) {
    Spatial spatial;
    spatial.reserve(points.size());
    for (const std::vector<double>& point : points) spatial.push_back({point[0], point[1], point[2]});
    return volume(spatial, reference);
  }
  points = nondominated(std::move(points));  // the sweeps pass over the others
  // From the worst in the last objective on, so that this one is the point's own for all that are limited by it.
  std::ranges::sort(points, std::ranges::greater{}, [](const std::vector<double>& point) { return point.back(); });
  const std::span<const double> inner = reference.first(count - 1);
  double sum = 0.0;
  for (std::size_t i = 0; i < points.size(); ++i) {
    const std::span<const double> slice = std::span(points[i]).first(count - 1);
    const std::span<const std::vector<double>> rest = std::span(points).subspan(i + 1);
    const double own = volumeToReference(slice, inner) - sharedVolume(slice, rest, inner);
    sum += own * (reference.back() - points[i].back());
  }
  return sum;
}

/// In the plane all at once: that of a point is the rectangle up to its neighbours on the staircase.
std::vector<double> areaContributions(const PointTable& points, std::span<const double> reference) {
  struct Place {
    double x = 0.0;
    double y = 0.0;
    std::size_t point = 0;
  };
  std::vector<Place> order;
  order.reserve(points.size());
  for (std::size_t i = 0; i < points.size(); ++i) {
    if (points[i][0] < reference[0] && points[i][1] < reference[1]) order.push_back({points[i][0], points[i][1], i});
  }
  std::ranges::sort(order, {}, [](const Place& place) { return std::tuple(place.x, place.y, place.point); });
  std::vector<Place> stairs;
  std::vector<bool> isAlone(points.size(), true);
  for (const Place& place : order) {
    if (!stairs.empty() && place.x == stairs.back().x && place.y == stairs.back().y) {
      isAlone[stairs.back().point] = false;
    }
    if (stairs.empty() || place.y < stairs.back().y) stairs.push_back(place);
  }
  std::vector<double> contributions(points.size(), 0.0);
  for (std::size_t k = 0; k < stairs.size(); ++k) {
    const Place& place = stairs[k];
    const double right = k + 1 < stairs.size() ? stairs[k + 1].x : reference[0];
    const double upper = k > 0 ? stairs[k - 1].y : reference[1];
    if (isAlone[place.point]) contributions[place.point] = (right - place.x) * (upper - place.y);
  }
  return contributions;
}

}  // namespace

double hypervolume(std::span<const std::vector<double>> points, std::span<const double> reference) {
  Points inside;
  std::ranges::copy_if(points, std::back_inserter(inside),
                       [reference](const std::vector<double>& point) { return isBelow(point, reference); });
  return volumeOf(std::move(inside), reference);
}

std::vector<double> hypervolumeContributions(const PointTable& points, std::span<const double> reference) {
  if (reference.size() == 2) return areaContributions(points, reference);
  Points inside;
  std::vector<std::size_t> places;
  for (std::size_t i = 0; i < points.size(); ++i) {
    if (!isBelow(points[i], reference)) continue;
    inside.emplace_back(points[i].begin(), points[i].end());
    places.push_back(i);
  }
  std::vector<double> contributions(points.size(), 0.0);
  for (std::size_t i = 0; i < inside.size(); ++i) {
    // The point itself is the last for so long, the others keep their order.
    std::rotate(inside.begin() + static_cast<std::ptrdiff_t>(i), inside.begin() + static_cast<std::ptrdiff_t>(i) + 1,
                inside.end());
    const std::vector<double>& point = inside.back();
    const std::span<const std::vector<double>> others = std::span(inside).first(inside.size() - 1);
    if (std::ranges::none_of(others, [&point](const auto& other) { return isAtMost(other, point); })) {
      const double own = volumeToReference(point, reference) - sharedVolume(point, others, reference);
      contributions[places[i]] = std::max(0.0, own);
    }
    std::rotate(inside.begin() + static_cast<std::ptrdiff_t>(i), inside.end() - 1, inside.end());
  }
  return contributions;
}

std::size_t mostPointsOfHypervolume(std::size_t objectives) {
  constexpr std::size_t kMost[] = {100'000, 100'000, 100'000, 20'000, 300, 100, 60, 40};
  return objectives < std::size(kMost) ? kMost[objectives] : 25;
}

}  // namespace mirevo

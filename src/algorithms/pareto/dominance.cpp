#include "algorithms/pareto/dominance.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>

namespace mirevo {
namespace {

/// Points in the order of each objective, from which ever more of them are left out: they are sorted but once.
class CrowdedPoints final {
 public:
  explicit CrowdedPoints(const PointTable& points)
      : orders_(points.width()), distances_(points.size()), isLeftOut_(points.size()) {
    for (std::size_t j = 0; j < orders_.size(); ++j) {
      orders_[j].resize(points.size());
      for (std::size_t i = 0; i < points.size(); ++i) orders_[j][i] = {points[i][j], i};
      std::ranges::stable_sort(orders_[j], {}, &Place::value);
    }
  }

  /// By the index of the point, of those that are left.
  const std::vector<double>& distances() {
    constexpr double kInfinite = std::numeric_limits<double>::infinity();
    std::ranges::fill(distances_, 0.0);
    for (const std::vector<Place>& order : orders_) {
      // A point that equals all others is alone at every end.
      if (order.size() == 1) distances_[order.front().point] = kInfinite;
      const double range = order.back().value - order.front().value;
      if (!(range > 0.0)) continue;
      distances_[order.front().point] = kInfinite;
      distances_[std::ranges::lower_bound(order, order.back().value, {}, &Place::value)->point] = kInfinite;
      for (std::size_t i = 1; i + 1 < order.size(); ++i) {
        distances_[order[i].point] += (order[i + 1].value - order[i - 1].value) / range;
      }
    }
    // A share of an infinite range may be no number, which has no place in an order.
    for (double& distance : distances_) {
      if (std::isnan(distance)) distance = 0.0;
    }
    return distances_;
  }

  void leaveOut(std::span<const std::size_t> points) {
    for (const std::size_t i : points) isLeftOut_[i] = 1;
    for (std::vector<Place>& order : orders_) {
      std::erase_if(order, [this](const Place& place) { return isLeftOut(place.point); });
    }
  }
  bool isLeftOut(std::size_t point) const { return isLeftOut_[point] != 0; }

 private:
  struct Place {
    double value = 0.0;
    std::size_t point = 0;
  };

  std::vector<std::vector<Place>> orders_;  ///< one for each objective; equal values by the index of their points
  std::vector<double> distances_;
  std::vector<char> isLeftOut_;
};

}  // namespace

bool dominates(std::span<const double> a, std::span<const double> b) {
  bool isLess = false;
  for (std::size_t i = 0; i < a.size(); ++i) {
    if (!(a[i] <= b[i])) return false;
    if (a[i] < b[i]) isLess = true;
  }
  return isLess;
}

bool isConstraintDominated(const ObjectivePoint& point, const ObjectivePoint& by) {
  if (by.violation != point.violation) return by.violation < point.violation;
  return point.violation == 0.0 && dominates(by.values, point.values);
}

std::vector<int> nondominationRanks(std::span<const ObjectivePoint> points) {
  // What dominates a point comes before it.
  std::vector<std::size_t> order(points.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::ranges::stable_sort(order, [points](std::size_t a, std::size_t b) {
    if (points[a].violation != points[b].violation) return points[a].violation < points[b].violation;
    return points[a].violation == 0.0 && points[a].values < points[b].values;
  });
  std::vector<int> ranks(points.size(), 0);
  std::vector<PointTable> fronts;
  std::size_t place = 0;
  for (; place < order.size() && points[order[place]].violation == 0.0; ++place) {
    const std::vector<double>& values = points[order[place]].values;
    // A point that dominates this one is dominated itself by one of each front before its own.
    const auto front = std::ranges::partition_point(fronts, [&values](const PointTable& members) {
      for (std::size_t i = members.size(); i > 0; --i) {
        if (dominates(members[i - 1], values)) return true;
      }
      return false;
    });
    ranks[order[place]] = static_cast<int>(front - fronts.begin()) + 1;
    if (front == fronts.end()) {
      fronts.emplace_back().add(values);
    } else {
      front->add(values);
    }
  }
  auto rank = static_cast<int>(fronts.size());
  double violation = 0.0;
  for (; place < order.size(); ++place) {
    if (points[order[place]].violation != violation) ++rank;
    violation = points[order[place]].violation;
    ranks[order[place]] = rank;
  }
  return ranks;
}

std::vector<double> crowdingDistances(const PointTable& points) {
  return CrowdedPoints(points).distances();
}

std::vector<std::size_t> spreadOver(const PointTable& points, std::size_t count) {
  std::vector<std::size_t> kept(points.size());
  std::iota(kept.begin(), kept.end(), std::size_t{0});
  if (kept.size() <= count) return kept;
  CrowdedPoints crowded(points);
  std::vector<std::size_t> order;
  while (kept.size() > count) {
    // Far more than are wanted: a share at a time, as the distances cost as much for one as for many.
    const std::size_t excess = kept.size() - count;
    const std::size_t most = std::max<std::size_t>(1, excess / 8);
    const std::vector<double>& distances = crowded.distances();
    order = kept;
    const auto first = order.end() - static_cast<std::ptrdiff_t>(most);
    std::nth_element(order.begin(), first, order.end(), [&distances](std::size_t a, std::size_t b) {
      return distances[a] != distances[b] ? distances[a] > distances[b] : a < b;
    });
    crowded.leaveOut({first, order.end()});
    std::erase_if(kept, [&crowded](std::size_t i) { return crowded.isLeftOut(i); });
  }
  return kept;
}

void includeInSpread(std::vector<std::size_t>& indices, std::size_t wanted,
                     std::span<const std::vector<double>> points) {
  if (indices.empty() || std::ranges::find(indices, wanted) != indices.end()) return;
  std::vector<std::vector<double>> chosen;
  chosen.reserve(indices.size());
  for (const std::size_t i : indices) chosen.push_back(points[i]);
  const std::vector<double> distances = crowdingDistances(chosen);
  std::size_t least = 0;
  for (std::size_t i = 1; i < distances.size(); ++i) {
    if (distances[i] <= distances[least]) least = i;
  }
  indices[least] = wanted;
  std::ranges::sort(indices);
}

}  // namespace mirevo

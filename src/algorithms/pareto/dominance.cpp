#include "algorithms/pareto/dominance.h"

#include <algorithm>
#include <limits>
#include <numeric>

namespace mirevo {

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
  const std::size_t n = points.size();
  std::vector<std::vector<std::size_t>> dominated(n);  // by each point
  std::vector<int> dominators(n, 0);                   // that have no rank yet
  for (std::size_t i = 0; i < n; ++i) {
    for (std::size_t k = i + 1; k < n; ++k) {
      if (isConstraintDominated(points[k], points[i])) {
        dominated[i].push_back(k);
        ++dominators[k];
      } else if (isConstraintDominated(points[i], points[k])) {
        dominated[k].push_back(i);
        ++dominators[i];
      }
    }
  }
  std::vector<int> ranks(n, 0);
  std::vector<std::size_t> front;
  for (std::size_t i = 0; i < n; ++i) {
    if (dominators[i] == 0) front.push_back(i);
  }
  for (int rank = 1; !front.empty(); ++rank) {
    std::vector<std::size_t> next;
    for (const std::size_t i : front) {
      ranks[i] = rank;
      for (const std::size_t k : dominated[i]) {
        if (--dominators[k] == 0) next.push_back(k);
      }
    }
    front = std::move(next);
  }
  return ranks;
}

std::vector<double> crowdingDistances(std::span<const std::vector<double>> points) {
  std::vector<double> distances(points.size(), 0.0);
  if (points.empty()) return distances;
  std::vector<std::size_t> order(points.size());
  for (std::size_t j = 0; j < points.front().size(); ++j) {
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::stable_sort(order.begin(), order.end(),
                     [points, j](std::size_t a, std::size_t b) { return points[a][j] < points[b][j]; });
    const double range = points[order.back()][j] - points[order.front()][j];
    if (!(range > 0.0)) continue;
    distances[order.front()] = std::numeric_limits<double>::infinity();
    distances[*std::ranges::find_if(order, [&](std::size_t i) { return points[i][j] == points[order.back()][j]; })] =
        std::numeric_limits<double>::infinity();
    for (std::size_t i = 1; i + 1 < order.size(); ++i) {
      distances[order[i]] += (points[order[i + 1]][j] - points[order[i - 1]][j]) / range;
    }
  }
  // A point that equals all others is alone at every end.
  if (points.size() == 1) distances.front() = std::numeric_limits<double>::infinity();
  return distances;
}

std::vector<std::size_t> spreadOver(std::span<const std::vector<double>> points, std::size_t count) {
  std::vector<std::size_t> kept(points.size());
  std::iota(kept.begin(), kept.end(), std::size_t{0});
  while (kept.size() > count) {
    // Far more than are wanted: a share at a time, as the distances cost as much for one as for many.
    const std::size_t excess = kept.size() - count;
    const std::size_t most = std::max<std::size_t>(1, excess / 8);
    std::vector<std::vector<double>> left;
    left.reserve(kept.size());
    for (const std::size_t i : kept) left.push_back(points[i]);
    const std::vector<double> distances = crowdingDistances(left);
    std::vector<std::size_t> order(kept.size());
    std::iota(order.begin(), order.end(), std::size_t{0});
    std::stable_sort(order.begin(), order.end(),
                     [&](std::size_t a, std::size_t b) { return distances[a] > distances[b]; });
    order.resize(kept.size() - most);
    std::ranges::sort(order);
    std::vector<std::size_t> next;
    next.reserve(order.size());
    for (const std::size_t place : order) next.push_back(kept[place]);
    kept = std::move(next);
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

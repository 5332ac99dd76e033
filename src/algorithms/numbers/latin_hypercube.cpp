#include "algorithms/numbers/latin_hypercube.h"

#include <limits>
#include <numeric>
#include <utility>

namespace mirevo {
namespace {

/// A random permutation of 0..count−1 (Fisher and Yates).
std::vector<std::size_t> randomOrder(std::size_t count, UniformGenerator& random) {
  std::vector<std::size_t> order(count);
  std::iota(order.begin(), order.end(), std::size_t{0});
  for (std::size_t left = count; left > 1; --left) {
    const auto pick = static_cast<std::size_t>(random.next() * static_cast<double>(left));
    std::swap(order[left - 1], order[pick]);
  }
  return order;
}

/// The smallest squared distance between two points, or any value not above `enough` once it is known to be that small.
double smallestSquaredDistance(const UnitPoints& points, double enough) {
  double smallest = std::numeric_limits<double>::infinity();
  for (std::size_t i = 0; i < points.size(); ++i) {
    for (std::size_t k = 0; k < i; ++k) {
      double squared = 0.0;
      for (std::size_t j = 0; j < points[i].size() && squared < smallest; ++j) {
        const double difference = points[i][j] - points[k][j];
        squared += difference * difference;
      }
      if (squared < smallest) smallest = squared;
      if (smallest <= enough) return smallest;
    }
  }
  return smallest;
}

}  // namespace

UnitPoints latinHypercube(std::size_t count, std::size_t dimension, UniformGenerator& random) {
  UnitPoints points(count, std::vector<double>(dimension));
  for (std::size_t j = 0; j < dimension; ++j) {
    const std::vector<std::size_t> stratum = randomOrder(count, random);
    for (std::size_t i = 0; i < count; ++i) {
      points[i][j] = (static_cast<double>(stratum[i]) + random.next()) / static_cast<double>(count);
    }
  }
  return points;
}

UnitPoints maximinLatinHypercube(std::size_t count, std::size_t dimension, int tries, UniformGenerator& random) {
  UnitPoints best;
  double bestDistance = -1.0;
  for (int i = 0; i < tries; ++i) {
    UnitPoints candidate = latinHypercube(count, dimension, random);
    const double distance = smallestSquaredDistance(candidate, bestDistance);
    if (distance > bestDistance) {
      bestDistance = distance;
      best = std::move(candidate);
    }
  }
  return best;
}

}  // namespace mirevo

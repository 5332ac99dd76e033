#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/pareto/point_table.h"

namespace mirevo {

/// A point of the objective space: what is minimised, and by how much its set violates constraints.
struct ObjectivePoint {
  std::vector<double> values;  ///< one per objective, finite where `violation` is 0
  double violation = 0.0;      ///< 0: none; infinite for a failed model run, of which nothing is known
};

/// Whether `a` is at most `b` in every objective and less in one.
bool dominates(std::span<const double> a, std::span<const double> b);

/// Constraint-domination after Deb, Pratap, Agarwal and Meyarivan (2002), doi:10.1109/4235.996017: the smaller
/// violation is better, and of two points without any the one that dominates the other.
bool isConstraintDominated(const ObjectivePoint& point, const ObjectivePoint& by);

/// The non-dominated sort of the same paper: of each point its rank, 1 for those that no other dominates, 2 for those
/// that only points of rank 1 dominate, and so on. Found one after the other, in the order of their first objective,
/// with as much memory as the points have: Zhang, Tian, Cheng and Jin (2015), doi:10.1109/TEVC.2014.2308305.
std::vector<int> nondominationRanks(std::span<const ObjectivePoint> points);

/// The crowding distance of the same paper, of points of one rank: the sum over the objectives of the distance between
/// the two neighbours of a point in that objective, as a share of its range over the points. Infinite for those at the
/// ends of an objective; of equal values at an end, for the first in the order of the points. An objective without a
/// range counts nothing; a distance that is no number, as a range overflows, is 0.
std::vector<double> crowdingDistances(const PointTable& points);
inline std::vector<double> crowdingDistances(std::span<const std::vector<double>> points) {
  return crowdingDistances(PointTable(points));
}

/// The indices, ascending, of `count` of these points that are spread over all of them: again and again those with the
/// least crowding distances are left out, the later of equals; an eighth of what is still too many at a time, and one
/// at a time where fewer than sixteen are.
std::vector<std::size_t> spreadOver(const PointTable& points, std::size_t count);
inline std::vector<std::size_t> spreadOver(std::span<const std::vector<double>> points, std::size_t count) {
  return spreadOver(PointTable(points), count);
}

/// Puts `wanted` among these indices, in their order, if it is missing: in place of the one with the least crowding
/// distance among them, the later of equals, so that an end is given up only if there is nothing else.
void includeInSpread(std::vector<std::size_t>& indices, std::size_t wanted,
                     std::span<const std::vector<double>> points);

}  // namespace mirevo

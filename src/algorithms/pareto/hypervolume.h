#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/pareto/point_table.h"

namespace mirevo {

/// The hypervolume of points that are minimised: the volume of what at least one of them dominates, up to `reference`
/// (Zitzler and Thiele 1999, doi:10.1109/4235.797969). Exact: a sweep for two and three objectives, and for more the
/// sum of the points' exclusive volumes by recursion after While, Bradstreet and Barone (2012),
/// doi:10.1109/TEVC.2010.2077298, whose time may grow exponentially with the number of objectives. Points that are not
/// below the reference in every objective count nothing.
double hypervolume(std::span<const std::vector<double>> points, std::span<const double> reference);

/// Of each point what the hypervolume would lose without it, for points of which none dominates another. Those that
/// equal others have 0.
std::vector<double> hypervolumeContributions(const PointTable& points, std::span<const double> reference);

/// Of more points the hypervolume would take long, as it is that of hundreds of fronts.
std::size_t mostPointsOfHypervolume(std::size_t objectives);

}  // namespace mirevo

#pragma once

#include <span>
#include <vector>

#include "measures/output_measure.h"

namespace mirevo {

/// The values as a statistic compares them, shape n, in double precision: ln(v + epsilon), the root of v, 1/(v +
/// epsilon),
/// ((v + epsilon)^lambda - 1)/lambda (Box and Cox 1964; the logarithm for lambda 0), or the ranks of the series. NaN
/// where a value has none: a root, logarithm or power of a negative number, the inverse or logarithm of 0.
std::vector<double> transformed(std::span<const double> values, ValueTransformation transformation, double epsilon,
                                double lambda);

}  // namespace mirevo

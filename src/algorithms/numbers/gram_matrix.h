#pragma once

#include <span>
#include <vector>

namespace mirevo {

/// The products of p columns of equal length with each other, p x p. Each entry is summed from the first row to the
/// last, beginning with 0, as a plain loop over the two columns does: the same bits, in a fraction of the time.
std::vector<double> gramMatrix(std::span<const std::span<const double>> columns);

}  // namespace mirevo

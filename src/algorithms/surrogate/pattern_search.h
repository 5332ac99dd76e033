#pragma once

#include <functional>
#include <vector>

#include "algorithms/numbers/search_bounds.h"

namespace mirevo {

/// Pattern search after Hooke and Jeeves (1961), doi:10.1145/321062.321069: a point in `box` near a minimum of
/// `function` and never worse than `start`. Steps shrink from a quarter of the box to a ten-thousandth, but in
/// coordinate j never below `leastMoves[j]`. The number of calls is limited, and the result is deterministic; a value
/// that is not a number is worse than every other.
std::vector<double> patternSearch(const std::function<double(const std::vector<double>&)>& function,
                                  std::vector<double> start, const Box& box, const std::vector<double>& leastMoves);

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <vector>

#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {

/// Points of the unit cube, one per row, each with as many coordinates as there are parameters.
using UnitPoints = std::vector<std::vector<double>>;

/// Latin hypercube sample: each of the `count` strata of equal width of every parameter holds exactly one point, at a
/// random position in it. McKay, Beckman and Conover (1979), doi:10.1080/00401706.1979.10489755.
UnitPoints latinHypercube(std::size_t count, std::size_t dimension, UniformGenerator& random);

/// The one of `tries` Latin hypercube samples whose two nearest points are farthest apart. Johnson, Moore and Ylvisaker
/// (1990), doi:10.1016/0378-3758(90)90122-B.
UnitPoints maximinLatinHypercube(std::size_t count, std::size_t dimension, int tries, UniformGenerator& random);

}  // namespace mirevo

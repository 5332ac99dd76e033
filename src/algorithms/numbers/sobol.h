#pragma once

#include <cstddef>

#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {

/// The largest number of parameters for which there are direction numbers (Joe and Kuo 2008, doi:10.1137/070709359).
inline constexpr std::size_t kMaxSobolDimension = 3667;

/// The first `count` points of a scrambled Sobol sequence: of 2^k points, every dyadic stratum of width 2^-k of each
/// parameter holds one, as in the plain sequence, at a random position. The digits are scrambled by one random lower
/// triangular matrix and one random digital shift per parameter, after Matousek (1998), doi:10.1006/jcom.1998.0489. The
/// origin, the sequence's first point, is kept: without it the strata are not balanced. `dimension` is at most
/// kMaxSobolDimension.
UnitPoints scrambledSobol(std::size_t count, std::size_t dimension, UniformGenerator& random);

}  // namespace mirevo

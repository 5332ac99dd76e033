#pragma once

#include <cstddef>
#include <cstdint>

#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/numbers/uniform_generator.h"

namespace mirevo {

/// The nested uniform scrambling of one coordinate in base 2: each binary digit is flipped or not, independently for
/// every value of the digits before it. Owen (1995), doi:10.1007/978-1-4612-2552-2_19; that the variance of a mean then
/// falls faster than 1/n: Owen (1997), doi:10.1214/aos/1031594731. The random bits of the tree are not stored: that of
/// a node is a hash of a key and the digits that lead to it.
class NestedScrambling final {
 public:
  explicit NestedScrambling(std::uint64_t key) : key_(key) {}

  /// The scrambled digits, the most significant first.
  std::uint32_t apply(std::uint32_t digits) const;

 private:
  std::uint64_t key_;
};

/// The first `count` points of a Sobol sequence, each of the `dimension` parameters with a nested uniform scrambling of
/// its own: of 2^k points, every dyadic stratum of width 2^-k of each parameter holds one, and every point for itself
/// is uniformly distributed in the open unit cube. `dimension` is at most kMaxSobolDimension.
UnitPoints owenScrambledSobol(std::size_t count, std::size_t dimension, UniformGenerator& random);

}  // namespace mirevo

#pragma once

#include <cstdint>
#include <cstdlib>
#include <random>

#include "algorithms/numbers/special_functions.h"

namespace mirevo {

/// The random numbers of Markov chains, which need more of them than the period of UniformGenerator's leading digits
/// has: the 64-bit Mersenne Twister, whose sequence the C++ standard fixes. The sign of the seed does not matter.
class ChainRandom final {
 public:
  explicit ChainRandom(std::int32_t seed, std::uint64_t stream = 0)
      : engine_(static_cast<std::uint64_t>(std::llabs(seed)) + (stream << 32U)) {}

  /// Uniform in the open interval (0, 1).
  double uniform() {
    constexpr double kStep = 1.0 / 9007199254740992.0;  // 2^-53
    return (static_cast<double>(engine_() >> 11U) + 0.5) * kStep;
  }
  double uniform(double lower, double upper) { return lower + uniform() * (upper - lower); }
  /// 0 ... count - 1.
  std::size_t below(std::size_t count) {
    const auto index = static_cast<std::size_t>(uniform() * static_cast<double>(count));
    return index < count ? index : count - 1;
  }
  double normal() {
    int fault = 0;
    return normalQuantile(uniform(), fault);
  }

 private:
  std::mt19937_64 engine_;
};

}  // namespace mirevo

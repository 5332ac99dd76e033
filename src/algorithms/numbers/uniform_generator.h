#pragma once

#include <array>
#include <cstdint>

namespace mirevo {

/// The run's uniform random stream: three linear congruential generators with a shuffle table of 97 entries. The same
/// seed gives the same stream on every machine. The state belongs to the object, so that no two tasks share it.
class UniformGenerator final {
 public:
  /// The stream of a run: the sign of the seed does not matter.
  explicit UniformGenerator(std::int32_t seed);

  /// The next deviate in (0, 1). The state can reach neither 0 nor 1 from any seed: docs/algorithms/random-numbers.md.
  double next() { return uniformDeviate(seedVariable_); }

  /// Seeds that differ by this have the same stream.
  static constexpr std::int32_t kSeedPeriod = 259200;

  /// The generator itself: a negative `idum`, or the first call, initialises it, after which `idum` is 1.
  double uniformDeviate(std::int32_t& idum);

 private:
  void initialise(std::int32_t idum);
  double advanceFirstTwo();

  std::int32_t seedVariable_;
  bool initialised_ = false;
  std::int32_t ix1_ = 0;
  std::int32_t ix2_ = 0;
  std::int32_t ix3_ = 0;
  std::array<double, 97> table_{};
};

}  // namespace mirevo

#include "algorithms/numbers/uniform_generator.h"

#include <cassert>

namespace mirevo {

namespace {

/// x' = (multiplier * x + increment) mod modulus; every product stays below 2^31.
struct CongruentialGenerator {
  std::int32_t modulus;
  std::int32_t multiplier;
  std::int32_t increment;

  constexpr std::int32_t advance(std::int32_t x) const { return (multiplier * x + increment) % modulus; }
  constexpr std::int64_t largestProduct() const { return std::int64_t{multiplier} * (modulus - 1) + increment; }
};

constexpr CongruentialGenerator kFirst{UniformGenerator::kSeedPeriod, 7141, 54773};
constexpr CongruentialGenerator kSecond{134456, 8121, 28411};
constexpr CongruentialGenerator kThird{243000, 4561, 51349};
static_assert(kFirst.largestProduct() <= INT32_MAX && kSecond.largestProduct() <= INT32_MAX &&
              kThird.largestProduct() <= INT32_MAX);

/// The reciprocals of the first two moduli, deliberately rounded to 32 bits: the stream depends on them.
constexpr double kReciprocal1 = 3.8580246837227605e-6;
constexpr double kReciprocal2 = 7.4373774623381905e-6;

constexpr std::int32_t kTableSize = 97;

}  // namespace

UniformGenerator::UniformGenerator(std::int32_t seed) : seedVariable_(seed > 0 ? -seed : seed) {}

double UniformGenerator::uniformDeviate(std::int32_t& idum) {
  if (idum < 0 || !initialised_) {
    initialise(idum);
    idum = 1;
  }
  const double fresh = advanceFirstTwo();
  ix3_ = kThird.advance(ix3_);
  const std::int32_t index = kTableSize * ix3_ / kThird.modulus;
  assert(index >= 0 && index < kTableSize);
  double& entry = table_[static_cast<std::size_t>(index)];
  const double result = entry;
  entry = fresh;
  return result;
}

void UniformGenerator::initialise(std::int32_t idum) {
  // In 64 bits, since the difference overflows 32 bits for the smallest idum. The first call may have a positive idum;
  // the remainder is made non-negative, so that the state is valid for any idum.
  const std::int64_t remainder = (std::int64_t{kFirst.increment} - idum) % kFirst.modulus;
  ix1_ = static_cast<std::int32_t>(remainder < 0 ? remainder + kFirst.modulus : remainder);
  ix1_ = kFirst.advance(ix1_);
  ix2_ = ix1_ % kSecond.modulus;
  ix1_ = kFirst.advance(ix1_);
  ix3_ = ix1_ % kThird.modulus;
  for (double& entry : table_) entry = advanceFirstTwo();
  initialised_ = true;
}

double UniformGenerator::advanceFirstTwo() {
  ix1_ = kFirst.advance(ix1_);
  ix2_ = kSecond.advance(ix2_);
  return (ix1_ + ix2_ * kReciprocal2) * kReciprocal1;
}

}  // namespace mirevo

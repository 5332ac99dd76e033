#include "algorithms/numbers/owen_sobol.h"

#include <cassert>
#include <cmath>
#include <vector>

#include <boost/random/sobol.hpp>

#include "algorithms/numbers/sobol.h"

namespace mirevo {
namespace {

constexpr int kDigits = 32;

/// The output function of SplitMix64, a bijection whose bits all depend on all of its argument. Steele, Lea and Flood
/// (2014), doi:10.1145/2660193.2660195.
constexpr std::uint64_t mixed(std::uint64_t bits) {
  bits += 0x9e3779b97f4a7c15U;
  bits = (bits ^ (bits >> 30U)) * 0xbf58476d1ce4e5b9U;
  bits = (bits ^ (bits >> 27U)) * 0x94d049bb133111ebU;
  return bits ^ (bits >> 31U);
}

/// 64 random bits. A deviate of the run's stream has fewer good bits, so four deviates give 16 bits each.
std::uint64_t randomKey(UniformGenerator& random) {
  std::uint64_t key = 0;
  for (int part = 0; part < 4; ++part) {
    key = key << 16U | (static_cast<std::uint64_t>(random.next() * 65536.0) & 0xffffU);
  }
  return key;
}

}  // namespace

std::uint32_t NestedScrambling::apply(std::uint32_t digits) const {
  std::uint32_t flips = 0;
  for (int digit = 0; digit < kDigits; ++digit) {
    // The digits before this one behind a leading 1, which tells their number: no two nodes have the same.
    const std::uint64_t before = digit == 0 ? 0U : digits >> (kDigits - digit);
    const std::uint64_t node = std::uint64_t{1} << digit | before;
    const auto flip = static_cast<std::uint32_t>(mixed(key_ ^ mixed(node)) >> 63U);
    flips |= flip << (kDigits - 1 - digit);
  }
  return digits ^ flips;
}

UnitPoints owenScrambledSobol(std::size_t count, std::size_t dimension, UniformGenerator& random) {
  assert(dimension >= 1 && dimension <= kMaxSobolDimension);
  std::vector<NestedScrambling> scrambling;
  scrambling.reserve(dimension);
  for (std::size_t j = 0; j < dimension; ++j) scrambling.emplace_back(randomKey(random));

  // The library's engine leaves out the origin; it is point 0 here.
  boost::random::sobol_engine<std::uint32_t, kDigits> sequence(dimension);
  UnitPoints points(count, std::vector<double>(dimension));
  for (std::size_t i = 0; i < count; ++i) {
    for (std::size_t j = 0; j < dimension; ++j) {
      const std::uint32_t digits = i == 0 ? 0U : static_cast<std::uint32_t>(sequence());
      // Half a last digit more: neither 0 nor 1.
      points[i][j] = std::ldexp(static_cast<double>(scrambling[j].apply(digits)) + 0.5, -kDigits);
    }
  }
  return points;
}

}  // namespace mirevo

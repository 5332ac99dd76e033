#include "algorithms/numbers/sobol.h"

#include <array>
#include <bit>
#include <cassert>
#include <cmath>
#include <cstdint>

#include <boost/random/sobol.hpp>

namespace mirevo {
namespace {

constexpr int kDigits = 32;

/// 32 random bits. A deviate of the run's stream has fewer good bits, so two deviates give 16 bits each.
std::uint32_t randomBits(UniformGenerator& random) {
  const auto high = static_cast<std::uint32_t>(random.next() * 65536.0) & 0xffffU;
  const auto low = static_cast<std::uint32_t>(random.next() * 65536.0) & 0xffffU;
  return high << 16U | low;
}

/// y = L·x + e over the binary digits of one coordinate, the most significant first; L has a unit diagonal.
class DigitScramble {
 public:
  explicit DigitScramble(UniformGenerator& random) {
    for (int row = 0; row < kDigits; ++row) {
      const std::uint32_t diagonal = 0x80000000U >> row;
      const std::uint32_t leftOfDiagonal = ~(diagonal | (diagonal - 1U));
      rows_[static_cast<std::size_t>(row)] = (randomBits(random) & leftOfDiagonal) | diagonal;
    }
    shift_ = randomBits(random);
  }

  std::uint32_t apply(std::uint32_t digits) const {
    std::uint32_t result = shift_;
    for (int row = 0; row < kDigits; ++row) {
      const int parity = std::popcount(rows_[static_cast<std::size_t>(row)] & digits) & 1;
      result ^= static_cast<std::uint32_t>(parity) << (kDigits - 1 - row);
    }
    return result;
  }

 private:
  std::array<std::uint32_t, kDigits> rows_{};
  std::uint32_t shift_ = 0;
};

}  // namespace

UnitPoints scrambledSobol(std::size_t count, std::size_t dimension, UniformGenerator& random) {
  assert(dimension >= 1 && dimension <= kMaxSobolDimension);
  std::vector<DigitScramble> scramble;
  scramble.reserve(dimension);
  for (std::size_t j = 0; j < dimension; ++j) scramble.emplace_back(random);

  // The library's engine leaves out the origin; it is point 0 here.
  boost::random::sobol_engine<std::uint32_t, kDigits> sequence(dimension);
  UnitPoints points(count, std::vector<double>(dimension));
  for (std::size_t i = 0; i < count; ++i) {
    for (std::size_t j = 0; j < dimension; ++j) {
      const std::uint32_t digits = i == 0 ? 0U : static_cast<std::uint32_t>(sequence());
      points[i][j] = std::ldexp(static_cast<double>(scramble[j].apply(digits)), -kDigits);
    }
  }
  return points;
}

}  // namespace mirevo

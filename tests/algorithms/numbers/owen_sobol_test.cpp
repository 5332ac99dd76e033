#include "algorithms/numbers/owen_sobol.h"

#include <algorithm>
#include <cmath>
#include <set>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

// The definition: digit k of two numbers that agree up to it is flipped in both or in neither, and independently where
// they do not.
TEST(NestedScrambling, FlipsADigitByAllDigitsBeforeIt) {
  int equalFlips = 0;
  constexpr int kKeys = 4000;
  for (std::uint64_t key = 0; key < kKeys; ++key) {
    const NestedScrambling scrambling(key * 7919U);
    const std::uint32_t a = 0x5a5a5a5aU;
    for (int digit = 0; digit < 32; ++digit) {
      const std::uint32_t other = a ^ (0x80000000U >> digit);  // the first difference
      const std::uint32_t difference = scrambling.apply(a) ^ scrambling.apply(other);
      ASSERT_EQ(31 - std::countl_zero(difference), 31 - digit) << "digit " << digit;
    }
    // Behind the first digit, which differs, the flips of the second are those of two nodes.
    const auto flipOfSecond = [&](std::uint32_t digits) { return (scrambling.apply(digits) ^ digits) >> 30U & 1U; };
    equalFlips += flipOfSecond(0x00000000U) == flipOfSecond(0x80000000U) ? 1 : 0;
  }
  EXPECT_NEAR(equalFlips, kKeys / 2, 4 * std::sqrt(kKeys / 4.0));
}

TEST(OwenScrambledSobol, PutsOnePointIntoEachStratumWhateverTheScrambling) {
  UniformGenerator random(3);
  std::set<double> firsts;
  for (int repetition = 0; repetition < 20; ++repetition) {
    const UnitPoints points = owenScrambledSobol(256, 6, random);
    for (std::size_t j = 0; j < 6; ++j) {
      for (const int count : {16, 256}) {
        std::set<int> strata;
        for (std::size_t i = 0; i < static_cast<std::size_t>(count); ++i)
          strata.insert(static_cast<int>(points[i][j] * count));
        EXPECT_EQ(strata.size(), static_cast<std::size_t>(count));
      }
      EXPECT_GT(points[0][j], 0.0);
      EXPECT_LT(points[0][j], 1.0);
      firsts.insert(points[0][j]);
    }
    // Two coordinates together, which the first dimensions of the sequence fill evenly: 16 squares of 16 points.
    std::array<int, 16> squares{};
    for (std::size_t i = 0; i < 16; ++i) {
      ++squares[static_cast<std::size_t>(points[i][0] * 4) * 4 + static_cast<std::size_t>(points[i][1] * 4)];
    }
    EXPECT_EQ(std::ranges::count(squares, 1), 16);
  }
  EXPECT_EQ(firsts.size(), 120U);
}

// Owen (1997): of a smooth function the standard error of the mean falls as n^-3/2, and not as n^-1/2.
TEST(OwenScrambledSobol, IntegratesASmoothFunctionFarBetterThanRandomPoints) {
  const auto errorOf = [](std::size_t count) {
    double squares = 0.0;
    for (int seed = 1; seed <= 40; ++seed) {
      UniformGenerator random(seed);
      double sum = 0.0;
      for (const auto& point : owenScrambledSobol(count, 2, random)) sum += point[0] * std::exp(point[1]);
      squares += std::pow(sum / static_cast<double>(count) - 0.5 * (std::exp(1.0) - 1.0), 2);
    }
    return std::sqrt(squares / 40.0);
  };
  const double slope = std::log2(errorOf(32) / errorOf(2048)) / 6.0;
  EXPECT_GT(slope, 1.2);
  EXPECT_LT(slope, 1.8);
}

}  // namespace
}  // namespace mirevo

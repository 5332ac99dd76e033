#include "algorithms/numbers/uniform_generator.h"

#include <array>
#include <cstdint>
#include <limits>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

// Seeds, the first four deviates and the thousandth, computed apart from this program with integers of unlimited size.
const std::tuple<std::int32_t, std::array<double, 4>, double> kReferences[] = {
    {0, {0.27427201467933515, 0.5690608555635296, 0.32530293667380894, 0.056088919582193884}, 0.33302477141400566},
    {1, {0.3900425093484263, 0.1711484132940249, 0.6423839028188294, 0.8688522382590367}, 0.940285031434319},
    {-5, {0.15150577606895058, 0.829547319893649, 0.6959620382375513, 0.6661892255246773}, 0.3223007856249504},
    {5, {0.15150577606895058, 0.829547319893649, 0.6959620382375513, 0.6661892255246773}, 0.3223007856249504},
    {12345, {0.14444817223010653, 0.5430696857272362, 0.5110078153164299, 0.43795504708560906}, 0.41202695151680585},
    {std::numeric_limits<std::int32_t>::max(),
     {0.15065754973362216, 0.23891087258030572, 0.38103670315622323, 0.42676275946255215},
     0.072945637631904},
    {std::numeric_limits<std::int32_t>::min(),
     {0.9226792080635396, 0.8303500889906098, 0.05112435889564622, 0.3531817711949466},
     0.08498785099660379},
};

/// All at once, as no generator may disturb another.
TEST(UniformGenerator, GivesTheReferenceStream) {
  std::vector<UniformGenerator> generators;
  for (const auto& reference : kReferences) generators.emplace_back(std::get<0>(reference));
  for (std::size_t k = 0; k < 1000; ++k) {
    for (std::size_t i = 0; i < generators.size(); ++i) {
      const auto& [seed, first, thousandth] = kReferences[i];
      const double deviate = generators[i].next();
      if (k < 4 || k == 999) {
        EXPECT_EQ(deviate, k < 4 ? first[k] : thousandth) << seed;
      }
    }
  }
}

TEST(UniformGenerator, ReinitialisesOnANegativeSeedVariableAlone) {
  UniformGenerator generator(1);
  std::int32_t idum = 1;
  const double first = generator.uniformDeviate(idum);  // the first call re-initialises, whatever the sign
  EXPECT_EQ(idum, 1);
  const double second = generator.uniformDeviate(idum);
  EXPECT_NE(first, second);
  idum = -1;
  EXPECT_EQ(generator.uniformDeviate(idum), 0.3900425093484263);
  EXPECT_EQ(idum, 1);
  EXPECT_EQ(generator.uniformDeviate(idum), 0.1711484132940249);
}

TEST(UniformGenerator, KeepsAValidStateForAnyPositiveFirstSeedVariable) {
  for (std::int32_t idum : {54773, 54774, 1000000, std::numeric_limits<std::int32_t>::max()}) {
    UniformGenerator generator(0);
    for (int k = 0; k < 1000; ++k) {
      const double deviate = generator.uniformDeviate(idum);
      EXPECT_GT(deviate, 0.0);
      EXPECT_LT(deviate, 1.0);
    }
  }
}

}  // namespace
}  // namespace mirevo

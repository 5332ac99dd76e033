#include "algorithms/bayes/chain_diagnostics.h"

#include <cmath>

#include <gtest/gtest.h>

#include "algorithms/bayes/chain_random.h"

namespace mirevo {
namespace {

/// Chains of x_t = phi x_(t-1) + e_t, stationary with variance 1, around means of their own.
std::vector<std::vector<double>> processes(double phi, std::span<const double> means, std::size_t length) {
  ChainRandom random(11);
  std::vector<std::vector<double>> chains;
  for (const double mean : means) {
    double value = random.normal();
    std::vector<double>& chain = chains.emplace_back();
    for (std::size_t t = 0; t < length; ++t) {
      chain.push_back(mean + value);
      value = phi * value + std::sqrt(1.0 - phi * phi) * random.normal();
    }
  }
  return chains;
}

TEST(ChainDiagnostics, EffectiveSizesAreThoseOfAutoregressiveProcesses) {
  const std::vector<double> means(4, 0.0);
  for (const double phi : {0.0, 0.5, 0.9}) {
    const double expected = 40'000.0 * (1.0 - phi) / (1.0 + phi);
    EXPECT_NEAR(effectiveSampleSize(processes(phi, means, 10'000)), expected, 0.1 * expected) << phi;
  }
  // Neighbours that are anticorrelated tell more than independent ones.
  EXPECT_GT(effectiveSampleSize(processes(-0.5, means, 10'000)), 80'000.0);
}

TEST(ChainDiagnostics, RHatIsOfTheVariancesAmongAndWithinHalves) {
  // By hand: halves {1, 2}, {3, 4}, {2, 3}, {4, 5}: W = 0.5, the variance of the means 1.5, 2.5, 3.5, 4.5 is 5/3.
  const std::vector<std::vector<double>> chains{{1.0, 2.0, 3.0, 4.0}, {2.0, 3.0, 4.0, 5.0}};
  EXPECT_NEAR(splitRHat(chains), std::sqrt((0.25 + 5.0 / 3.0) / 0.5), 1e-12);
  EXPECT_NEAR(splitRHat(processes(0.0, std::vector(4, 0.0), 10'000)), 1.0, 0.002);
  EXPECT_GT(splitRHat(processes(0.0, std::vector{0.0, 0.0, 0.0, 1.0}, 10'000)), 1.05);
  // A trend that all chains share is seen, too.
  auto rising = processes(0.0, std::vector(4, 0.0), 10'000);
  for (auto& chain : rising) {
    for (std::size_t t = 0; t < chain.size(); ++t) chain[t] += 2e-4 * static_cast<double>(t);
  }
  EXPECT_GT(splitRHat(rising), 1.05);
}

TEST(ChainDiagnostics, ChainsThatDifferInWidthOrRarelyReachTheirTailsAreFound) {
  const std::vector<double> means(4, 0.0);
  const auto alike = processes(0.5, means, 10'000);
  EXPECT_LT(largestRHat(alike), 1.003);
  EXPECT_NEAR(leastEffectiveSampleSize(alike), 13'333.0, 1'500.0);
  // One chain goes only half as far as the others, about the same mean.
  auto narrow = alike;
  for (double& value : narrow[2]) value *= 0.5;
  EXPECT_LT(splitRHat(narrow), 1.003);
  EXPECT_GT(largestRHat(narrow), 1.05);
  // A single value far off makes a variance that hides how the chains differ; their ranks do not.
  auto shifted = alike;
  for (double& value : shifted[0]) value += 0.5;
  shifted[1][5'000] = 1e6;
  EXPECT_LT(splitRHat(shifted), 1.003);
  EXPECT_GT(largestRHat(shifted), 1.01);
  // Alternating signs: means are known well, but half of each chain is in the tail.
  auto slow = processes(-0.9, means, 10'000);
  for (auto& chain : slow) {
    for (std::size_t t = 0; t < chain.size(); ++t) chain[t] *= t % 2'000 < 1'500 ? 1.0 : 10.0;
  }
  EXPECT_GT(effectiveSampleSize(slow), 40'000.0);
  EXPECT_LT(leastEffectiveSampleSize(slow), 1'000.0);
}

TEST(ChainDiagnostics, ChainsThatStandStillHaveNone) {
  const std::vector<std::vector<double>> still{{1.0, 1.0, 1.0, 1.0}, {1.0, 1.0, 1.0, 1.0}};
  EXPECT_TRUE(std::isnan(splitRHat(still)));
  EXPECT_TRUE(std::isnan(effectiveSampleSize(still)));
  EXPECT_TRUE(std::isnan(largestRHat(still)));
  EXPECT_TRUE(std::isnan(leastEffectiveSampleSize(still)));
  EXPECT_TRUE(std::isnan(splitRHat(std::vector<std::vector<double>>{{1.0, 2.0, 3.0}})));
  const std::vector<std::vector<double>> apart{{1.0, 1.0, 1.0, 1.0}, {2.0, 2.0, 2.0, 2.0}};
  EXPECT_TRUE(std::isinf(splitRHat(apart)));
  EXPECT_TRUE(std::isinf(largestRHat(apart)));  // though all are equally far from the median
}

}  // namespace
}  // namespace mirevo

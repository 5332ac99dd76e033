#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <span>
#include <string_view>

/// Distributions that are known, which stand for the posterior of a model: logarithms of their densities, but for a
/// constant.
namespace mirevo::testing {

/// 1/3 N(-5, I) + 2/3 N(5, I): mean 5/3, variance 1 + 25 - 25/9.
inline double lnTwoPeaks(std::span<const double> x) {
  double low = 0.0;
  double high = 0.0;
  for (const double value : x) {
    low -= 0.5 * (value + 5.0) * (value + 5.0);
    high -= 0.5 * (value - 5.0) * (value - 5.0);
  }
  const double top = std::max(low, high);
  return top + std::log(std::exp(low - top) / 3.0 + 2.0 * std::exp(high - top) / 3.0);
}

/// Normal; the variance of dimension j, from 1, is j, and all correlations are 0.5.
inline double lnCorrelated(std::span<const double> x) {
  double squares = 0.0;
  double sum = 0.0;
  for (std::size_t j = 0; j < x.size(); ++j) {
    const double z = x[j] / std::sqrt(static_cast<double>(j + 1));
    squares += z * z;
    sum += z;
  }
  return -(squares - sum * sum / static_cast<double>(x.size() + 1));
}

/// x1 ~ N(0, 100), x2 + 0.1 x1^2 - 10 ~ N(0, 1), the others N(0, 1): means 0, variance of x2 201.
inline double lnTwisted(std::span<const double> x) {
  const double bent = x[1] + 0.1 * x[0] * x[0] - 10.0;
  double sum = -0.005 * x[0] * x[0] - 0.5 * bent * bent;
  for (const double value : x.subspan(2)) sum -= 0.5 * value * value;
  return sum;
}

struct KnownDensity {
  std::string_view name;
  std::size_t dimensions = 10;
  double bound = 20.0;  ///< the prior is uniform from its negative to it
  int chains = 4;
  double (*lnDensity)(std::span<const double>) = nullptr;
  double (*mean)(std::size_t j) = nullptr;       ///< of dimension j, from 0
  double (*deviation)(std::size_t j) = nullptr;  ///< its standard deviation
};

inline std::span<const KnownDensity> knownDensities() {
  static const KnownDensity all[] = {{"two-peaks", 10, 20.0, 10, lnTwoPeaks, [](std::size_t) { return 5.0 / 3.0; },
                                      [](std::size_t) { return std::sqrt(26.0 - 25.0 / 9.0); }},
                                     {"twisted", 10, 300.0, 4, lnTwisted, [](std::size_t) { return 0.0; },
                                      [](std::size_t j) { return j == 0   ? 10.0
                                                                 : j == 1 ? std::sqrt(201.0)
                                                                          : 1.0; }},
                                     {"correlated", 100, 50.0, 4, lnCorrelated, [](std::size_t) { return 0.0; },
                                      [](std::size_t j) { return std::sqrt(static_cast<double>(j + 1)); }}};
  return all;
}

}  // namespace mirevo::testing

#pragma once

#include <array>
#include <cmath>
#include <span>
#include <vector>

namespace mirevo {

/// The function of 20 factors of Morris (1991), doi:10.1080/00401706.1991.10484804, on the unit cube: factors 1 to 7
/// have effects that are not linear or interact, 8 to 10 linear ones, 11 to 20 hardly any. There the coefficients that
/// are not given are standard normal; here they are uniform with the same variance, without a generator.
inline double morrisFunction(std::span<const double> x) {
  std::array<double, 20> w{};
  for (std::size_t i = 0; i < 20; ++i) {
    const bool isCurved = i == 2 || i == 4 || i == 6;
    w[i] = 2.0 * ((isCurved ? 1.1 * x[i] / (x[i] + 0.1) : x[i]) - 0.5);
  }
  // sqrt(3) (2 u - 1), u uniform: variance 1.
  const auto small = [](std::size_t k) {
    return std::sqrt(3.0) * (2.0 * std::fmod(static_cast<double>(k) * 0.6180339887498949, 1.0) - 1.0);
  };
  double y = 0.0;
  for (std::size_t i = 0; i < 20; ++i) {
    y += (i < 10 ? 20.0 : small(i)) * w[i];
    for (std::size_t j = i + 1; j < 20; ++j) y += (j < 6 ? -15.0 : small(20 * i + j)) * w[i] * w[j];
  }
  for (std::size_t i = 0; i < 5; ++i) {
    for (std::size_t j = i + 1; j < 5; ++j) {
      for (std::size_t k = j + 1; k < 5; ++k) y -= 10.0 * w[i] * w[j] * w[k];
    }
  }
  return y + 5.0 * w[0] * w[1] * w[2] * w[3];
}

}  // namespace mirevo

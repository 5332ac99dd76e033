#pragma once

#include <algorithm>
#include <cmath>
#include <string>
#include <vector>

#include "algorithms/test_functions.h"

/// The functions on which the searches are compared.
namespace mirevo::bench {

using testing::TestFunction;

inline double sixHumpCamelBack(const std::vector<double>& x) {
  const double a = x[0] * x[0];
  const double b = x[1] * x[1];
  return (4.0 - 2.1 * a + a * a / 3.0) * a + x[0] * x[1] + (-4.0 + 4.0 * b) * b;
}

inline double hartman6(const std::vector<double>& x) {
  static constexpr double a[4][6] = {
      {10, 3, 17, 3.5, 1.7, 8}, {0.05, 10, 17, 0.1, 8, 14}, {3, 3.5, 1.7, 10, 17, 8}, {17, 8, 0.05, 10, 0.1, 14}};
  static constexpr double c[4] = {1.0, 1.2, 3.0, 3.2};
  static constexpr double p[4][6] = {{0.1312, 0.1696, 0.5569, 0.0124, 0.8283, 0.5886},
                                     {0.2329, 0.4135, 0.8307, 0.3736, 0.1004, 0.9991},
                                     {0.2348, 0.1451, 0.3522, 0.2883, 0.3047, 0.6650},
                                     {0.4047, 0.8828, 0.8732, 0.5743, 0.1091, 0.0381}};
  double sum = 0.0;
  for (std::size_t i = 0; i < 4; ++i) {
    double exponent = 0.0;
    for (std::size_t j = 0; j < 6; ++j) exponent += a[i][j] * (x[j] - p[i][j]) * (x[j] - p[i][j]);
    sum -= c[i] * std::exp(-exponent);
  }
  return sum;
}

inline double goldsteinPrice(const std::vector<double>& x) {
  const double a = x[0];
  const double b = x[1];
  const double first =
      1.0 + (a + b + 1.0) * (a + b + 1.0) * (19.0 - 14.0 * a + 3.0 * a * a - 14.0 * b + 6.0 * a * b + 3.0 * b * b);
  const double second = 30.0 + (2.0 * a - 3.0 * b) * (2.0 * a - 3.0 * b) *
                                   (18.0 - 32.0 * a + 12.0 * a * a + 48.0 * b - 36.0 * a * b + 27.0 * b * b);
  return first * second;
}

/// The two-dimensional form, with the minimum −2.
inline double rastriginPlane(const std::vector<double>& x) {
  return x[0] * x[0] + x[1] * x[1] - std::cos(18.0 * x[0]) - std::cos(18.0 * x[1]);
}

inline double shekel10(const std::vector<double>& x) {
  static constexpr double a[10][4] = {{4, 4, 4, 4}, {1, 1, 1, 1}, {8, 8, 8, 8}, {6, 6, 6, 6}, {3, 7, 3, 7},
                                      {2, 9, 2, 9}, {5, 5, 3, 3}, {8, 1, 8, 1}, {6, 2, 6, 2}, {7, 3.6, 7, 3.6}};
  static constexpr double c[10] = {0.1, 0.2, 0.2, 0.4, 0.4, 0.6, 0.3, 0.7, 0.5, 0.5};
  double sum = 0.0;
  for (std::size_t i = 0; i < 10; ++i) {
    double squares = c[i];
    for (std::size_t j = 0; j < 4; ++j) squares += (x[j] - a[i][j]) * (x[j] - a[i][j]);
    sum -= 1.0 / squares;
  }
  return sum;
}

/// The functions of Duan, Sorooshian and Gupta (1993) with their bounds, and ten-dimensional ones that are usual for
/// comparing searches with small budgets.
inline std::vector<TestFunction> allFunctions() {
  using testing::cube;
  using testing::griewank;
  using testing::rosenbrock;
  using testing::testFunction;
  return {
      {"Goldstein-Price 2-D", {-2, -2}, {2, 2}, {0, -1}, 3.0, goldsteinPrice},
      testFunction("Rosenbrock 2-D"),
      {"Six-hump camel-back 2-D", {-5, -5}, {5, 5}, {0.08984201, -0.71265640}, -1.03162845, sixHumpCamelBack},
      cube("Rastrigin 2-D", 2, -1, 1, 0, -2.0, rastriginPlane),
      testFunction("Griewank 2-D"),
      cube("Griewank 10-D", 10, -600, 600, 0, 0.0, [](const auto& x) { return griewank(x, 4000.0); }),
      {"Shekel 4-D",
       {0, 0, 0, 0},
       {10, 10, 10, 10},
       {4.00074671, 4.00059326, 3.99966290, 3.99950981},
       -10.53640982,
       shekel10},
      {"Hartman 6-D",
       {0, 0, 0, 0, 0, 0},
       {1, 1, 1, 1, 1, 1},
       {0.20168952, 0.15001069, 0.47687398, 0.27533243, 0.31165162, 0.65730054},
       -3.32236801,
       hartman6},
      testFunction("Ackley 10-D"),
      testFunction("Rastrigin 10-D"),
      cube("Rosenbrock 10-D", 10, -5, 5, 1, 0.0, rosenbrock),
      cube("Rosenbrock 4-D", 4, -5, 5, 1, 0.0, rosenbrock),
      cube("Ackley 30-D", 30, -32.768, 32.768, 0, 0.0, testing::ackley),
      cube("Griewank 30-D", 30, -600, 600, 0, 0.0, [](const auto& x) { return griewank(x, 4000.0); }),
      cube("Rosenbrock 30-D", 30, -5, 5, 1, 0.0, rosenbrock),
  };
}

inline TestFunction functionNamed(const std::string& name) {
  const auto functions = allFunctions();
  const auto found = std::ranges::find(functions, name, &TestFunction::name);
  return functions.at(static_cast<std::size_t>(found - functions.begin()));
}

}  // namespace mirevo::bench

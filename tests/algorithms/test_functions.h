#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <functional>
#include <numbers>
#include <string>
#include <utility>
#include <vector>

#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/searches/search_algorithm.h"

/// Published test functions of global optimisation. Used by the tests and by the benchmark of the searches.
namespace mirevo::testing {

struct TestFunction {
  std::string name;
  std::vector<double> lower;
  std::vector<double> upper;
  std::vector<double> optimum;  ///< where the smallest value lies
  double optimalValue = 0.0;
  std::function<double(const std::vector<double>&)> value;

  std::size_t size() const { return lower.size(); }
};

inline double rosenbrock(const std::vector<double>& x) {
  double sum = 0.0;
  for (std::size_t j = 0; j + 1 < x.size(); ++j) {
    const double step = x[j + 1] - x[j] * x[j];
    sum += 100.0 * step * step + (1.0 - x[j]) * (1.0 - x[j]);
  }
  return sum;
}

inline double rastrigin(const std::vector<double>& x) {
  double sum = 10.0 * static_cast<double>(x.size());
  for (const double value : x) sum += value * value - 10.0 * std::cos(2.0 * std::numbers::pi * value);
  return sum;
}

inline double griewank(const std::vector<double>& x, double divisor) {
  double sum = 0.0;
  double product = 1.0;
  for (std::size_t j = 0; j < x.size(); ++j) {
    sum += x[j] * x[j];
    product *= std::cos(x[j] / std::sqrt(static_cast<double>(j + 1)));
  }
  return sum / divisor - product + 1.0;
}

inline double ackley(const std::vector<double>& x) {
  const auto n = static_cast<double>(x.size());
  double squares = 0.0;
  double cosines = 0.0;
  for (const double value : x) {
    squares += value * value;
    cosines += std::cos(2.0 * std::numbers::pi * value);
  }
  return -20.0 * std::exp(-0.2 * std::sqrt(squares / n)) - std::exp(cosines / n) + 20.0 + std::numbers::e;
}

inline TestFunction cube(std::string name, std::size_t n, double lower, double upper, double optimum,
                         double optimalValue, std::function<double(const std::vector<double>&)> value) {
  return {std::move(name),
          std::vector<double>(n, lower),
          std::vector<double>(n, upper),
          std::vector<double>(n, optimum),
          optimalValue,
          std::move(value)};
}

inline std::vector<TestFunction> testFunctions() {
  return {
      {"Rosenbrock 2-D", {-5, -2}, {5, 8}, {1, 1}, 0.0, rosenbrock},
      cube("Griewank 2-D", 2, -600, 600, 0, 0.0, [](const auto& x) { return griewank(x, 200.0); }),
      cube("Ackley 10-D", 10, -32.768, 32.768, 0, 0.0, ackley),
      cube("Rastrigin 10-D", 10, -5.12, 5.12, 0, 0.0, rastrigin),
  };
}

inline TestFunction testFunction(const std::string& name) {
  const auto functions = testFunctions();
  const auto found = std::ranges::find(functions, name, &TestFunction::name);
  return functions.at(static_cast<std::size_t>(found - functions.begin()));
}

/// The function moved so that its optimum lies anywhere in the middle nine tenths of the range, by a move that the seed
/// determines: a search that is drawn to the middle of the range, or to round numbers, gains nothing from it.
inline TestFunction shifted(TestFunction function, int seed) {
  UniformGenerator random(100000 + seed);
  std::vector<double> move(function.size());
  for (std::size_t j = 0; j < move.size(); ++j) {
    const double range = function.upper[j] - function.lower[j];
    const double place = function.lower[j] + (0.05 + 0.9 * random.next()) * range;
    move[j] = place - function.optimum[j];
    function.optimum[j] = place;
  }
  function.value = [move, value = function.value](std::vector<double> x) {
    for (std::size_t j = 0; j < x.size(); ++j) x[j] -= move[j];
    return value(x);
  };
  return function;
}

inline SearchBounds boundsOf(const TestFunction& function) {
  SearchBounds bounds{function.lower, function.upper, function.lower};
  for (std::size_t j = 0; j < function.size(); ++j) {
    bounds.initial[j] = 0.5 * (function.lower[j] + function.upper[j]);
  }
  return bounds;
}

}  // namespace mirevo::testing

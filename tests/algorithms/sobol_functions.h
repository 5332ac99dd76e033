#pragma once

#include <cmath>
#include <cstddef>
#include <functional>
#include <numbers>
#include <span>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/analyses/sobol_design.h"
#include "parameters/search_space.h"

namespace mirevo {

/// A function of independent parameters, uniform in [0, 1], with known Sobol' indices.
struct SobolFunction {
  std::string name;
  std::function<double(std::span<const double>)> value;
  std::vector<double> first;
  std::vector<double> total;
};

/// Ishigami and Homma (1990), a = 7, b = 0.1.
inline SobolFunction ishigami() {
  constexpr double kPi = std::numbers::pi;
  constexpr double a = 7.0;
  constexpr double b = 0.1;
  const double pi4 = std::pow(kPi, 4);
  const double first = 0.5 * std::pow(1.0 + b * pi4 / 5.0, 2);
  const double second = a * a / 8.0;
  const double both = 8.0 * b * b * pi4 * pi4 / 225.0;
  const double all = first + second + both;
  return {"Ishigami",
          [](std::span<const double> u) {
            const auto x = [&u](std::size_t j) { return kPi * (2.0 * u[j] - 1.0); };
            return std::sin(x(0)) + a * std::pow(std::sin(x(1)), 2) + b * std::pow(x(2), 4) * std::sin(x(0));
          },
          {first / all, second / all, 0.0},
          {(first + both) / all, second / all, both / all}};
}

/// Sobol' (1993): the product of (|4u - 2| + a) / (1 + a).
inline SobolFunction gFunction(const std::string& name, const std::vector<double>& a) {
  double all = 1.0;
  for (const double one : a) all *= 1.0 + 1.0 / (3.0 * (1.0 + one) * (1.0 + one));
  SobolFunction function{name, {}, {}, {}};
  function.value = [a](std::span<const double> u) {
    double product = 1.0;
    for (std::size_t j = 0; j < a.size(); ++j) product *= (std::abs(4.0 * u[j] - 2.0) + a[j]) / (1.0 + a[j]);
    return product;
  };
  for (const double one : a) {
    const double own = 1.0 / (3.0 * (1.0 + one) * (1.0 + one));
    function.first.push_back(own / (all - 1.0));
    function.total.push_back(own * all / (1.0 + own) / (all - 1.0));
  }
  return function;
}

/// The G function with the coefficients of which Saltelli et al. (2008) give the indices.
inline SobolFunction gFunctionOfEight() {
  return gFunction("G", {0.0, 1.0, 4.5, 9.0, 99.0, 99.0, 99.0, 99.0});
}

/// p parameters, uniform in [0, 1], each a factor of its own.
struct UnitProblem {
  ParameterDistributions distributions;
  std::vector<SobolFactor> factors;

  explicit UnitProblem(std::size_t p) {
    SearchSpace space;
    space.lower.assign(p, 0.0);
    space.upper.assign(p, 1.0);
    space.initial.assign(p, 0.5);
    space.transformation.assign(p, TransformationType::none);
    for (std::size_t j = 0; j < p; ++j) {
      space.names.push_back(fmt::format("x{}", j + 1));
      factors.push_back({space.names.back(), {j}});
    }
    distributions = ParameterDistributions::uniform(space);
  }
};

}  // namespace mirevo

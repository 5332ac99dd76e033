#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// A function of the equation language: exactly one of the three pointers is set.
struct EquationFunction {
  std::string_view name;
  double (*unary)(double) = nullptr;
  double (*binary)(double, double) = nullptr;
  double (*anyCount)(const double* values, int count) = nullptr;

  int minimumArguments() const { return binary != nullptr ? 2 : 1; }
  /// -1 for any number.
  int maximumArguments() const { return anyCount != nullptr ? -1 : minimumArguments(); }
};

/// All functions of the equation language. Angles are in radians; `log` is the natural logarithm.
std::span<const EquationFunction> equationFunctions();

/// The function with this name, in any letter case; null when there is none.
const EquationFunction* findEquationFunction(std::string_view name);

/// The functions' names, for suggestions.
std::vector<std::string> equationFunctionNames();

}  // namespace mirevo

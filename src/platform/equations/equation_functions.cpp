#include "platform/equations/equation_functions.h"

#include <cmath>

#include "common/text.h"

namespace mirevo {
namespace {

/// NaN when any argument is NaN, unlike std::fmin: an undefined value must not vanish in a minimum.
double smallest(const double* values, int count) {
  double result = values[0];
  for (int i = 1; i < count; ++i) result = values[i] < result || std::isnan(values[i]) ? values[i] : result;
  return result;
}

double largest(const double* values, int count) {
  double result = values[0];
  for (int i = 1; i < count; ++i) result = values[i] > result || std::isnan(values[i]) ? values[i] : result;
  return result;
}

double signOf(double value) {
  if (std::isnan(value)) return value;
  return value > 0.0 ? 1.0 : (value < 0.0 ? -1.0 : 0.0);
}

double negation(double value) {
  return value == 0.0 ? 1.0 : 0.0;
}

constexpr EquationFunction unary(std::string_view name, double (*function)(double)) {
  return {name, function, nullptr, nullptr};
}
constexpr EquationFunction binary(std::string_view name, double (*function)(double, double)) {
  return {name, nullptr, function, nullptr};
}
constexpr EquationFunction anyCount(std::string_view name, double (*function)(const double*, int)) {
  return {name, nullptr, nullptr, function};
}

const EquationFunction kFunctions[] = {
    unary("exp", [](double x) { return std::exp(x); }),
    unary("ln", [](double x) { return std::log(x); }),
    unary("log", [](double x) { return std::log(x); }),
    unary("log10", [](double x) { return std::log10(x); }),
    unary("log2", [](double x) { return std::log2(x); }),
    unary("sqrt", [](double x) { return std::sqrt(x); }),
    unary("abs", [](double x) { return std::abs(x); }),
    unary("sign", signOf),
    unary("floor", [](double x) { return std::floor(x); }),
    unary("ceil", [](double x) { return std::ceil(x); }),
    unary("round", [](double x) { return std::round(x); }),
    unary("int", [](double x) { return std::trunc(x); }),
    unary("not", negation),
    unary("sin", [](double x) { return std::sin(x); }),
    unary("cos", [](double x) { return std::cos(x); }),
    unary("tan", [](double x) { return std::tan(x); }),
    unary("asin", [](double x) { return std::asin(x); }),
    unary("acos", [](double x) { return std::acos(x); }),
    unary("atan", [](double x) { return std::atan(x); }),
    unary("sinh", [](double x) { return std::sinh(x); }),
    unary("cosh", [](double x) { return std::cosh(x); }),
    unary("tanh", [](double x) { return std::tanh(x); }),
    unary("asinh", [](double x) { return std::asinh(x); }),
    unary("acosh", [](double x) { return std::acosh(x); }),
    unary("atanh", [](double x) { return std::atanh(x); }),
    binary("atan2", [](double y, double x) { return std::atan2(y, x); }),
    binary("pow", [](double x, double y) { return std::pow(x, y); }),
    binary("mod", [](double x, double y) { return std::fmod(x, y); }),
    anyCount("min", smallest),
    anyCount("max", largest),
};

}  // namespace

std::span<const EquationFunction> equationFunctions() {
  return kFunctions;
}

const EquationFunction* findEquationFunction(std::string_view name) {
  const std::string lower = toLowerAscii(name);
  for (const EquationFunction& function : kFunctions) {
    if (function.name == lower) return &function;
  }
  return nullptr;
}

std::vector<std::string> equationFunctionNames() {
  std::vector<std::string> names;
  for (const EquationFunction& function : kFunctions) names.emplace_back(function.name);
  return names;
}

}  // namespace mirevo

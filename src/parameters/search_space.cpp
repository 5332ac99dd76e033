#include "parameters/search_space.h"

#include <bit>
#include <cassert>
#include <cmath>
#include <cstdint>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Keeps a value that is a rounding error below a step of an integer parameter on that step.
constexpr double kIntegerTolerance = 1.0e-8;

void checkInitialValue(const ModelParameter& parameter) {
  const char* relation = nullptr;
  if (parameter.initialValue < parameter.lowerBound) relation = "smaller than lower";
  if (relation == nullptr && parameter.initialValue > parameter.upperBound) relation = "larger than upper";
  if (relation == nullptr) return;
  fatalError(
      fmt::format("Error: Initial parameter value {} bound for parameter {}", relation, trimTrailing(parameter.name)),
      fmt::format("initial value {}, bounds {} to {}", formatReal(parameter.initialValue),
                  formatReal(parameter.lowerBound), formatReal(parameter.upperBound)));
}

double transformForward(const ModelParameter& parameter, double value, std::string_view which) {
  bool failed = false;
  const double transformed = TransformParameterValue(value, parameter.lowerBound, parameter.transformationType,
                                                     TransformDirection::forward, failed);
  if (failed) {
    fatalError(fmt::format("Error: Invalid parameter transformation for parameter {}", trimTrailing(parameter.name)),
               fmt::format("the {} {} has no logarithm; a logarithmic parameter needs an initial value and bounds "
                           "greater than 0",
                           which, formatReal(value)));
  }
  return transformed;
}

/// Adds those of the parameter that is the last of the space so far.
void addGivenValues(const ModelParameter& parameter, SearchSpace& space) {
  std::vector<double> values{parameter.initialValue, parameter.lowerBound, parameter.upperBound};
  values.insert(values.end(), parameter.givenValues.begin(), parameter.givenValues.end());
  for (const double value : values) {
    if (value > 0.0) space.givenValues.try_emplace({space.size() - 1, std::log(value)}, value);
  }
}

}  // namespace

double TransformParameterValue(double value, double lowerBound, TransformationType type, TransformDirection direction,
                               bool& failed) {
  failed = false;
  switch (type) {
    case TransformationType::none:
      return value;
    case TransformationType::logarithmic:
      if (direction != TransformDirection::forward) return std::exp(value);
      if (!(value > 0.0)) {
        failed = true;
        return 0.0;
      }
      return std::log(value);
    case TransformationType::integer:
      return lowerBound + std::trunc(value - lowerBound + kIntegerTolerance);
  }
  return 0.0;
}

double onGrid(const ModelParameter& parameter, double value) {
  if (parameter.transformationType != TransformationType::integer) return value;
  bool failed = false;
  return TransformParameterValue(value, parameter.lowerBound, TransformationType::integer, TransformDirection::forward,
                                 failed);
}

bool isOnGrid(const ModelParameter& parameter, double value) {
  constexpr double kRounding = 1.0e-6;
  return std::abs(onGrid(parameter, value) - value) <= kRounding;
}

SearchSpace BuildSearchSpace(std::span<const ModelParameter> parameters) {
  SearchSpace space;
  for (const ModelParameter& parameter : parameters) {
    if (parameter.parameterType != ParameterType::variable) continue;
    checkInitialValue(parameter);
    space.names.emplace_back(trimTrailing(parameter.name));
    space.initial.push_back(transformForward(parameter, parameter.initialValue, "initial value"));
    space.lower.push_back(transformForward(parameter, parameter.lowerBound, "lower bound"));
    double upper = transformForward(parameter, parameter.upperBound, "upper bound");
    if (parameter.transformationType == TransformationType::integer) upper += 1.0;
    space.upper.push_back(upper);
    space.transformation.push_back(parameter.transformationType);
    if (parameter.transformationType == TransformationType::logarithmic) addGivenValues(parameter, space);
  }
  if (space.names.empty()) fatalError("Error: No variable model parameters defined");
  return space;
}

double toModelScale(const SearchSpace& space, std::size_t k, double value) {
  const auto given = space.givenValues.find({k, value});
  if (given != space.givenValues.end() && given->first.second == value) return given->second;  // not for NaN
  bool failed = false;
  return TransformParameterValue(value, space.lower[k], space.transformation[k], TransformDirection::backward, failed);
}

std::vector<double> ToModelScale(const SearchSpace& space, std::span<const double> set) {
  assert(set.size() == space.size());
  std::vector<double> values(space.size());
  for (std::size_t k = 0; k < values.size(); ++k) values[k] = toModelScale(space, k, set[k]);
  return values;
}

std::optional<std::size_t> findOtherValue(const SearchSpace& space, std::span<const double> set,
                                          std::span<const double> earlier) {
  assert(set.size() == space.size() && earlier.size() == space.size());
  for (std::size_t k = 0; k < space.size(); ++k) {
    const auto isSame = [value = earlier[k]](double other) {
      // A difference in the last digit is a sign of another sequence of random numbers.
      return std::bit_cast<std::uint64_t>(other) == std::bit_cast<std::uint64_t>(value);
    };
    bool failed = false;  // earlier versions had exp(ln x) for a given value, too
    if (isSame(toModelScale(space, k, set[k])) ||
        isSame(TransformParameterValue(set[k], space.lower[k], space.transformation[k], TransformDirection::backward,
                                       failed))) {
      continue;
    }
    return k;
  }
  return std::nullopt;
}

}  // namespace mirevo

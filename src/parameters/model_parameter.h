#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "common/settings/code_name.h"

namespace mirevo {

enum class TransformationType : std::int32_t { none = 0, logarithmic = 1, integer = 2 };
inline constexpr CodeName kTransformationTypeNames[] = {{0, "none"}, {1, "logarithmic"}, {2, "integer"}};

enum class ParameterType : std::int32_t { variable = 0, fixed = 1, dependent = 2 };
inline constexpr CodeName kParameterTypeNames[] = {{0, "variable"}, {1, "fixed"}, {2, "dependent"}};

enum class LogicalOperator : std::int32_t { less = 0, lessOrEqual = 1, greater = 2, greaterOrEqual = 3 };
inline constexpr CodeName kLogicalOperatorNames[] = {{0, "<"}, {1, "<="}, {2, ">"}, {3, ">="}};

/// One parameter of the model as the setup describes it; values and bounds are on the model scale.
struct ModelParameter {
  double initialValue = 0.0;
  double lowerBound = 0.0;
  double upperBound = 0.0;
  TransformationType transformationType = TransformationType::none;
  ParameterType parameterType = ParameterType::variable;
  double idValue = 0.0;  ///< denotes the parameter in numeric-ID templates, such as 1.5E-035
  std::string name;      ///< unique, at most 255 bytes, trailing blanks trimmed
  std::string equation;  ///< for a dependent parameter
  std::string comment;
  std::vector<std::string> keyLines;  ///< kept with the parameter, not interpreted
  std::vector<double> givenValues;    ///< further values that the setup gives for runs, model scale
};

/// Compares two equations over the model parameters; a parameter set that violates it is not run.
struct InternalConstraint {
  std::string leftEquation;
  std::string rightEquation;
  LogicalOperator logicalOperator = LogicalOperator::less;
};

}  // namespace mirevo

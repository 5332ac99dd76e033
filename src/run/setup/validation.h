#pragma once

#include <optional>
#include <string>
#include <unordered_set>

#include "run/setup/run_config.h"

namespace mirevo {

// The checks of what relates values of a setup to each other; single values are checked against the ranges of their
// keyword rows. Each gives the fixed text of the first check that fails, or nothing.

/// Names of a list so far; a check of a name adds it.
using NamesUsed = std::unordered_set<std::string>;

inline constexpr std::string_view kSlotsKeyword = "NoSimultaneousSim";

/// The initial value against the bounds, on the model scale; the bounds against each other.
std::optional<SettingRefusal> validateParameterBounds(const ModelParameter& parameter);
/// The name among those of earlier parameters, and the transformation of the bounds.
std::optional<SettingRefusal> validateParameterDefinition(const ModelParameter& parameter, NamesUsed& names);
/// That both sides of a constraint have an equation.
std::optional<SettingRefusal> validateEquations(const InternalConstraint& constraint);

std::optional<SettingRefusal> validateEvaluationPeriod(const EvaluationPeriod& period);
/// The number of the value in the output-measure file, for a measure that is read from there.
std::optional<SettingRefusal> validateMeasurementNumber(const OutputMeasure& measure);
/// The name among those of earlier objective functions.
std::optional<SettingRefusal> validateObjectiveFunction(const ObjectiveFunction& function, NamesUsed& names);
/// That the scale and location of aggregation methods 1 and 2 can come from somewhere: the setup, or an initial sample.
std::optional<SettingRefusal> validateTransformation(const ObjectiveFunction& function, AggregationMethod method,
                                                     bool hasInitialSample);
/// That a task whose evaluations depend on each other does not ask for several slots.
std::optional<SettingRefusal> validateProcessCount(const RunConfig& config);

}  // namespace mirevo

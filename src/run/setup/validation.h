#pragma once

#include <optional>
#include <string>
#include <unordered_set>

#include "run/setup/run_config.h"

namespace mirevo {

// Checks of values of a setup against each other; single values are checked against the ranges of their keyword rows.
// Each function returns the refusal of the first check that fails, if any.

/// The names of a list read so far; checking a name adds it.
using NamesUsed = std::unordered_set<std::string>;

inline constexpr std::string_view kSlotsKeyword = "NoSimultaneousSim";

/// Checks the initial value against the bounds, and the bounds against each other, on the model scale.
std::optional<SettingRefusal> validateParameterBounds(const ModelParameter& parameter);
/// Checks that no earlier parameter has the name, and the transformation of the bounds.
std::optional<SettingRefusal> validateParameterDefinition(const ModelParameter& parameter, NamesUsed& names);
/// Checks that both sides of a constraint have an equation.
std::optional<SettingRefusal> validateEquations(const InternalConstraint& constraint);

std::optional<SettingRefusal> validateEvaluationPeriod(const EvaluationPeriod& period);
/// That the warm-up is shorter than the period.
std::optional<SettingRefusal> validateWarmUp(const EvaluationPeriod& period);
/// That months are such, and that the limits of a measure leave any value between them.
std::optional<SettingRefusal> validateSelection(const OutputMeasure& measure);
/// That the measure's own period is inside the evaluation period and not all of it in the warm-up.
std::optional<SettingRefusal> validateOwnPeriod(const OutputMeasure& measure, const EvaluationPeriod& period);
std::optional<SettingRefusal> validateValidationPeriod(const ValidationPeriod& period);
/// Checks that no earlier validation period has the name.
std::optional<SettingRefusal> validatePeriodName(const ValidationPeriod& period, NamesUsed& names);
/// Checks the number of the value in the output-measure file, for a measure of interface type 1.
std::optional<SettingRefusal> validateMeasurementNumber(const OutputMeasure& measure);
/// That the statistic leaves the choice of a transformation to the setup.
std::optional<SettingRefusal> validateValueTransformation(const OutputMeasure& measure);
/// Checks the weights and quality codes of observations, and that the statistic can use them.
std::optional<SettingRefusal> validateWeighting(const OutputMeasure& measure);
/// Checks that no earlier objective function has the name.
std::optional<SettingRefusal> validateObjectiveFunction(const ObjectiveFunction& function, NamesUsed& names);
/// Checks that the scale and location of aggregation methods 1 and 2 are given in the setup or can be determined from
/// an initial sample.
std::optional<SettingRefusal> validateTransformation(const ObjectiveFunction& function, AggregationMethod method,
                                                     bool hasInitialSample);
/// Checks that there is only one slot for a task that cannot use several.
std::optional<SettingRefusal> validateProcessCount(const RunConfig& config);

}  // namespace mirevo

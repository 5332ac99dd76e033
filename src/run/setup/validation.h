#pragma once

#include <span>
#include <string>
#include <string_view>
#include <unordered_set>

#include "run/setup/run_config.h"
#include "run/setup/setup_access.h"

namespace mirevo {

// The checks of a setup's values. Each operation takes the values of one group and the section that they were read
// from, and returns only when all of them are valid; otherwise it ends the run with the fixed text of the first check
// that fails, and below it the place of the value, what was found and what was expected. Single values are held against
// the ranges of the keyword table, which the manual prints, too.

/// Names of a list so far; a check of a name adds it.
using NamesUsed = std::unordered_set<std::string>;

/// The initial value of a variable parameter against its bounds, on the model scale; the bounds against each other.
void validateParameterBounds(const ModelParameter& parameter, const SetupSection& section);
/// Codes, name and transformation.
void validateParameterDefinition(const ModelParameter& parameter, NamesUsed& names, const SetupSection& section);
/// Operator and equations of a constraint.
void validateLogicalOperator(const InternalConstraint& constraint, const SetupSection& section);

void validateEvaluationPeriod(const EvaluationPeriod& period, const SetupSection& section);
void validateAggregationMethod(AggregationMethod method, const SetupSection& section);
void validateOutputMeasure(const OutputMeasure& measure, const SetupSection& section);
void validateObjectiveFunction(const ObjectiveFunction& function, NamesUsed& names, const SetupSection& section);
/// That the scale and location of aggregation methods 1 and 2 can come from somewhere: the setup, or an initial sample.
void validateTransformation(const ObjectiveFunction& function, AggregationMethod method, bool hasInitialSample,
                            const SetupSection& section);

void validateScenarioType(const ScenarioConfig& scenario, const SetupSection& section);
/// The values of one run against the parameters.
void validateScenarioRun(std::span<const double> values, std::span<const ModelParameter> parameters,
                         const SetupSection& section);
void validateSensitivityType(const SensitivityConfig& sensitivity, const SetupSection& section);
void validateLocalSensitivity(const SensitivityConfig& sensitivity, std::span<const ModelParameter> parameters,
                              const SetupSection& section);

void validateAlgorithmType(AlgorithmType type, const SetupSection& section);
void validateSceControl(const SceSettings& sce, const SimplexSettings& simplex, const SetupSection& section);
void validatePseControl(const PseSettings& pse, const SimplexSettings& simplex, const SetupSection& section);
void validateDdsControl(const DdsSettings& dds, const SetupSection& section);
/// The budget of the stopping criteria, in the words of DDS.
void validateDdsBudget(const StoppingCriteria& stopping, const SetupSection& section);
void validateSurrogateControl(const OptimisationConfig& optimisation, std::size_t variableCount,
                              const SetupSection& section);
void validateStoppingCriteria(const StoppingCriteria& stopping, const SetupSection& section);
void validateInitialSampleMethod(const InitialSampleSettings& sample, const SetupSection& section);

void validateUncertaintyType(const UncertaintySettings& uncertainty, const SetupSection& section);
void validateUncertaintyDeviation(const NormalDistribution& parameter, const SetupSection& section);

void validateProcessCount(const RunConfig& config, const SetupSection& section);

/// A file that must exist, `path` being what the keyword's value stands for.
void validateFileExists(const std::string& path, std::string_view keyword, const SetupSection& section);
/// A file that must be readable, for the given text before its name.
void validateFileOpens(const std::string& path, std::string_view keyword, const SetupSection& section,
                       std::string_view message = "Error: Unable to open ");
/// A file of the model, which lies in the base folder or below it.
void validateInBaseFolder(const std::string& path, const std::string& baseFolder, std::string_view keyword,
                          const SetupSection& section);

}  // namespace mirevo

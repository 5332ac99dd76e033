#include "run/setup/validation.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "algorithms/analyses/local_sensitivity.h"
#include "algorithms/surrogate/quadratic_surrogate.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"
#include "parameters/search_space.h"

namespace mirevo {
namespace {

template <class Enum>
double code(Enum value) {
  return static_cast<double>(value);
}

bool isVariable(const ModelParameter& parameter) {
  return parameter.parameterType == ParameterType::variable;
}

void validateDate(const DateRecord& date, std::string_view keyword, const SetupSection& section) {
  try {
    date_check(date, kDateFieldCount);
  } catch (const FatalError& error) {
    section.refuse(error.message(), keyword, "no day and time of the calendar");
  }
}

}  // namespace

void validateParameterBounds(const ModelParameter& parameter, const SetupSection& section) {
  // First, as the initial value lies outside such bounds whatever it is.
  if (parameter.lowerBound > parameter.upperBound) {
    section.refuse("Error: Lower bound larger than upper bound for parameter " + parameter.name, "Lower_Bound",
                   fmt::format("expected {} or less, found {}", parameter.upperBound, parameter.lowerBound));
  }
  if (parameter.initialValue < parameter.lowerBound) {
    section.refuse("Error: Initial parameter value smaller than lower bound for parameter " + parameter.name,
                   "Initial_Value",
                   fmt::format("expected {} or more, found {}", parameter.lowerBound, parameter.initialValue));
  }
  if (parameter.initialValue > parameter.upperBound) {
    section.refuse("Error: Initial parameter value larger than upper bound for parameter " + parameter.name,
                   "Initial_Value",
                   fmt::format("expected {} or less, found {}", parameter.upperBound, parameter.initialValue));
  }
}

void validateParameterDefinition(const ModelParameter& parameter, NamesUsed& names, const SetupSection& section) {
  section.check("Transformation_Type", code(parameter.transformationType),
                "Error: Transformation type invalid for parameter " + parameter.name);
  section.check("Parameter_Type", code(parameter.parameterType),
                "Error: Parameter type invalid for parameter " + parameter.name);
  if (!names.insert(parameter.name).second) {
    section.refuse(fmt::format("Error: Invalid parameter name {}. Name used more than once.", parameter.name),
                   "Parameter_Name", "expected a name that no earlier parameter has");
  }
  // The upper bound and the initial value are not below the lower bound.
  if (isVariable(parameter) && parameter.transformationType == TransformationType::logarithmic &&
      !(parameter.lowerBound > 0.0)) {
    section.refuse(
        "Error: Invalid parameter transformation for parameter " + parameter.name, "Lower_Bound",
        fmt::format("expected a value greater than 0 for a logarithmic parameter, found {}", parameter.lowerBound));
  }
}

void validateLogicalOperator(const InternalConstraint& constraint, const SetupSection& section) {
  section.check("Logical_Operator", constraint.logicalOperator, "Error: Invalid logical operator in " + section.name());
  for (const auto& [keyword, equation] :
       {std::pair{"Left_Equation", &constraint.leftEquation}, std::pair{"Right_Equation", &constraint.rightEquation}}) {
    if (trim(*equation).empty()) {
      section.refuse("Error: Invalid equation for internal constraints", keyword,
                     "expected an equation over the parameters' names, found a blank text");
    }
  }
}

void validateEvaluationPeriod(const EvaluationPeriod& period, const SetupSection& section) {
  validateDate(period.start, "Start_Date", section);
  validateDate(period.end, "End_Date", section);
  if (daysSince(period.start, period.end) < 0.0) {
    section.refuse(
        "Error: End date of the evaluation period before its start date", "End_Date",
        fmt::format("expected {} or later, found {}", formatKdxDate(period.start), formatKdxDate(period.end)));
  }
}

void validateAggregationMethod(AggregationMethod method, const SetupSection& section) {
  section.check("Aggregation_Method", code(method), "Error: Objective function aggregation method invalid");
}

void validateOutputMeasure(const OutputMeasure& measure, const SetupSection& section) {
  section.check("Interface_Type", code(measure.interfaceType),
                "Error: Interface type invalid for output measure " + measure.name);
  section.check("Statistic_Type", code(measure.statisticType),
                "Error: Statistic type invalid for output measure " + measure.name);
  // One text for both weights on purpose; the place below it tells them apart.
  section.check("Weight", measure.weight, "Error: Weight invalid for output measure " + measure.name);
  section.check("Weight_Above", measure.weightAbove, "Error: Weight invalid for output measure " + measure.name);
  if (measure.interfaceType == InterfaceType::measureFile) {
    section.check("MeasurementNo", measure.measurementNo,
                  "Error: Measurement No. invalid for output measure " + measure.name);
  }
}

void validateObjectiveFunction(const ObjectiveFunction& function, NamesUsed& names, const SetupSection& section) {
  section.check("Function_Type", code(function.functionType),
                "Error: Function type invalid for objective function " + function.name);
  section.check("Weight", function.weight, "Error: Weight invalid for objective function " + function.name);
  if (!names.insert(function.name).second) {
    section.refuse(fmt::format("Error: Invalid objective function name {}. Name used more than once.", function.name),
                   "Name", "expected a name that no earlier objective function has");
  }
  if (function.standardDeviation) {
    section.check("Standard_Deviation", *function.standardDeviation,
                  "Error: Standard deviation invalid for objective function " + function.name);
  }
}

void validateTransformation(const ObjectiveFunction& function, AggregationMethod method, bool hasInitialSample,
                            const SetupSection& section) {
  const bool needsScale = method == AggregationMethod::commonDistance || method == AggregationMethod::commonProbability;
  if (!needsScale || hasInitialSample || (function.standardDeviation && function.location)) return;
  section.refuse("Error: Standard deviation and location not defined for objective function " + function.name,
                 function.standardDeviation ? "Location" : "Standard_Deviation",
                 fmt::format("expected the keyword, which aggregation method {} needs: this run has no initial sample "
                             "to take it from",
                             static_cast<int>(method)));
}

void validateScenarioType(const ScenarioConfig& scenario, const SetupSection& section) {
  section.check("Scenario_Type", scenario.scenarioType, "Error: Invalid scenario type selection");
}

void validateScenarioRun(std::span<const double> values, std::span<const ModelParameter> parameters,
                         const SetupSection& section) {
  if (values.size() != parameters.size()) {
    section.refuse(
        "Error: Invalid number of parameter values in " + section.name(), "Parameters",
        fmt::format("expected one value for each of the {} parameters, found {}", parameters.size(), values.size()));
  }
  for (std::size_t i = 0; i < values.size(); ++i) {
    const ModelParameter& parameter = parameters[i];
    if (!isVariable(parameter) || (values[i] >= parameter.lowerBound && values[i] <= parameter.upperBound)) continue;
    section.refuse(fmt::format("Error: Value for parameter {} in {} out of bounds", parameter.name, section.name()),
                   "Parameters",
                   fmt::format("value {}: expected {} to {}, found {}", i + 1, parameter.lowerBound,
                               parameter.upperBound, values[i]));
  }
}

void validateSensitivityType(const SensitivityConfig& sensitivity, const SetupSection& section) {
  section.check("Sensitivity_Type", sensitivity.sensitivityType, "Error: Invalid sensitivity type selection");
}

void validateLocalSensitivity(const SensitivityConfig& sensitivity, std::span<const ModelParameter> parameters,
                              const SetupSection& section) {
  section.check("Differencing", sensitivity.local.differencing,
                "Error: Differencing option in local sensitivity analysis invalid");
  section.check("Perturbation_Option", sensitivity.local.perturbationOption,
                "Error: Perturbation option in local sensitivity analysis invalid");
  section.check("Perturbation_Fraction", sensitivity.local.perturbationFraction,
                "Error: Perturbation fraction in local sensitivity analysis invalid");
  const SearchSpace space = BuildSearchSpace(parameters);
  std::size_t j = 0;
  for (const ModelParameter& parameter : parameters) {
    // A perturbation that would leave the range is taken the other way, so that both must fail.
    if (!isVariable(parameter) || hasRoomForStep(sensitivity.local, space, j++)) continue;
    section.refuse(fmt::format("Error: Perturbed value for parameter {} in local sensitivity analysis out of bounds",
                               parameter.name),
                   "Perturbation_Fraction",
                   fmt::format("{} of the {}, from {}, leaves the bounds {} to {} both ways{}",
                               sensitivity.local.perturbationFraction,
                               sensitivity.local.perturbationOption == 0 ? "range" : "value", parameter.initialValue,
                               parameter.lowerBound, parameter.upperBound,
                               parameter.transformationType == TransformationType::logarithmic ? " (logarithms)" : ""));
  }
}

void validateAlgorithmType(AlgorithmType type, const SetupSection& section) {
  section.check("Algorithm_Type", code(type), "Error: Invalid optimisation algorithm type selection");
}

void validateSceControl(const SceSettings& sce, const SimplexSettings& simplex, const SetupSection& section) {
  constexpr std::string_view kSubcomplex = "Error: No. of points in a subcomplex in SCE algorithm invalid";
  section.check("No_Complexes", sce.complexCount, "Error: No. of complexes in SCE algorithm invalid");
  section.check("No_Points_Complex", sce.pointsPerComplex,
                "Error: No. of points in a complex in SCE algorithm invalid");
  section.check("No_Points_Subcomplex", simplex.pointCount, kSubcomplex);
  if (simplex.pointCount > sce.pointsPerComplex) {
    section.refuse(
        kSubcomplex, "No_Points_Subcomplex",
        fmt::format("expected at most the {} points of a complex, found {}", sce.pointsPerComplex, simplex.pointCount));
  }
  section.check("No_Evaluation_Steps", sce.evolutionSteps, "Error: No. of evaluation steps in SCE algorithm invalid");
}

void validatePseControl(const PseSettings& pse, const SimplexSettings& simplex, const SetupSection& section) {
  constexpr std::string_view kSimplex = "Error: No. of points in a simplex in PSE algorithm invalid";
  section.check("Population_Size", pse.populationSize, "Error: Population size in PSE algorithm invalid");
  section.check("No_Points_Simplex", simplex.pointCount, kSimplex);
  if (simplex.pointCount > pse.populationSize) {
    section.refuse(kSimplex, "No_Points_Simplex",
                   fmt::format("expected at most the {} points of the population, found {}", pse.populationSize,
                               simplex.pointCount));
  }
  section.check("Prob_Reflection", pse.reflectionProbability,
                "Error: Probability for reflection step in PSE algorithm invalid");
  section.check("Prob_Contraction", pse.contractionProbability,
                "Error: Probability for contraction step in PSE algorithm invalid");
  if (pse.reflectionProbability + pse.contractionProbability > 1.0) {
    section.refuse("Error: Sum of probabilities for reflection and contraction in PSE algorithm larger than 1",
                   "Prob_Contraction",
                   fmt::format("expected at most 1 with Prob_Reflection, found {} + {}", pse.reflectionProbability,
                               pse.contractionProbability));
  }
}

void validateDdsControl(const DdsSettings& dds, const SetupSection& section) {
  section.check("Perturbation_Parameter", dds.perturbation, "Error: Perturbation parameter in DDS algorithm invalid");
}

void validateDdsBudget(const StoppingCriteria& stopping, const SetupSection& section) {
  section.check("Max_No_Evaluations", stopping.maxEvaluations,
                "Error: Maximum No. of model evaluations in DDS algorithm invalid");
}

void validateSurrogateControl(const OptimisationConfig& optimisation, std::size_t variableCount,
                              const SetupSection& section) {
  constexpr std::string_view kNeighbourhood = "Error: Invalid neighbourhood size for surrogate modelling optimisation";
  const SurrogateSettings& surrogate = optimisation.surrogate;
  section.check("Model_Type", surrogate.modelType, "Error: Invalid model type for surrogate modelling optimisation");
  section.check("Neighbourhood_Size", surrogate.neighbourhoodSize, kNeighbourhood);
  const std::size_t coefficientCount = quadraticCoefficientCount(variableCount);
  const bool isNeighbourhoodGiven = surrogate.neighbourhoodSize > 0;
  if (isNeighbourhoodGiven && surrogate.modelType == 0 &&
      static_cast<std::size_t>(surrogate.neighbourhoodSize) < coefficientCount) {
    section.refuse(
        kNeighbourhood, "Neighbourhood_Size",
        fmt::format("expected at least the {} coefficients of a quadratic polynomial in {} parameters, or 0, "
                    "found {}",
                    coefficientCount, variableCount, surrogate.neighbourhoodSize));
  }
  section.check("Sampling_rate", surrogate.samplingRate,
                "Error: Invalid sampling rate for surrogate modelling optimisation");
  section.check("No_Initial_Generations", surrogate.initialGenerations,
                "Error: Invalid no of initial generations for surrogate modelling optimisation");
  if (optimisation.algorithmType == AlgorithmType::dds) return;

  const double available = optimisation.evaluationsAfter(surrogate.initialGenerations);
  if (available < surrogate.neighbourhoodSize) {
    section.refuse(
        "Error: Population size and/or initial No. of generations too small for surrogate modelling optimisation",
        "No_Initial_Generations",
        fmt::format("expected at least Neighbourhood_Size = {} evaluated sets before the surrogate is fitted, found {}",
                    surrogate.neighbourhoodSize, available));
  }
}

void validateStoppingCriteria(const StoppingCriteria& stopping, const SetupSection& section) {
  section.check("Max_No_Evaluations", stopping.maxEvaluations, "Error: Maximum No. of model evaluations invalid");
  section.check("No_Loops_Convergence", stopping.loopsConvergence,
                "Error: No. of loops for evaluation of convergence criterion invalid");
  section.check("Min_Change", stopping.minChange, "Error: Minimum change convergence criterion invalid");
}

void validateInitialSampleMethod(const InitialSampleSettings& sample, const SetupSection& section) {
  constexpr std::int32_t kFromFile = 4;
  section.check("Initial_Sample_Generation", sample.generation, "Error: Initial sample generation method invalid");
  if (sample.generation == kFromFile) validateFileOpens(sample.fileName, "Initial_Sample_File_Name", section);
}

void validateUncertaintyType(const UncertaintySettings& uncertainty, const SetupSection& section) {
  section.check("Uncertainty_Type", uncertainty.uncertaintyType,
                "Error: Invalid uncertainty estimation type selection");
  section.check("Sample_Size", uncertainty.sampleSize, "Error: Sample size in uncertainty estimation invalid");
}

void validateUncertaintyDeviation(const NormalDistribution& parameter, const SetupSection& section) {
  section.check("Standard_Deviation", parameter.standardDeviation,
                "Error: Standard deviation in uncertainty estimation invalid");
}

void validateProcessCount(const RunConfig& config, const SetupSection& section) {
  section.check("NoSimultaneousSim", config.simultaneousSimulations, "Error: Invalid No. of processes");
  if (config.usesMpiWorkers) return;
  if (config.simultaneousSimulations > 1 && config.simulationOption == SimulationOption::parameterOptimisation &&
      config.optimisation.algorithmType != AlgorithmType::pse) {
    section.refuse("Error: Use Population Simplex Evolution algorithm for application with multiple processors",
                   "NoSimultaneousSim",
                   fmt::format("expected 1 with this Algorithm_Type, found {}", config.simultaneousSimulations));
  }
}

}  // namespace mirevo

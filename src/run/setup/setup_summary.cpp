#include "run/setup/setup_summary.h"

#include <algorithm>
#include <iterator>

#include <fmt/format.h>

#include "algorithms/surrogate/proposal_selector.h"
#include "common/calendar.h"
#include "common/text.h"
#include "platform/kdx/kdx.h"

namespace mirevo {
namespace {

std::string_view transformationName(TransformationType type) {
  switch (type) {
    case TransformationType::none:
      return "none";
    case TransformationType::logarithmic:
      return "logarithmic";
    case TransformationType::integer:
      return "integer";
  }
  return "";
}

std::string_view operatorName(std::int32_t logicalOperator) {
  constexpr std::string_view kNames[] = {"<", "<=", ">", ">="};
  return logicalOperator >= 0 && logicalOperator <= 3 ? kNames[logicalOperator] : "?";
}

std::string_view functionTypeName(FunctionType type) {
  switch (type) {
    case FunctionType::sum:
      return "sum";
    case FunctionType::sumOfAbsolutes:
      return "sum of absolute values";
    case FunctionType::sumOfSquares:
      return "sum of squares";
  }
  return "";
}

/// Writes the summary line by line.
class Summary final {
 public:
  explicit Summary(const RunConfig& config) : config_(config) {}

  void addParameters(const SearchSpace& space, std::span<const int> evaluationOrder) {
    line("Model parameters: {}, of which variable: {}", config_.parameters.size(), space.size());
    std::size_t variable = 0;
    for (const ModelParameter& parameter : config_.parameters) {
      if (parameter.parameterType == ParameterType::fixed) {
        line("  {}: fixed at {}", parameter.name, parameter.initialValue);
      } else if (parameter.parameterType == ParameterType::dependent) {
        line("  {}: dependent, {}", parameter.name, parameter.equation);
      } else {
        line("  {}: variable, initial value {}, bounds {} to {}, transformation {}, search from {:.6g} to {:.6g}",
             parameter.name, parameter.initialValue, parameter.lowerBound, parameter.upperBound,
             transformationName(parameter.transformationType), space.lower[variable], space.upper[variable]);
        ++variable;
      }
    }
    if (!std::is_sorted(evaluationOrder.begin(), evaluationOrder.end())) {
      line("  order of evaluation: {}", fmt::join(evaluationOrder, ", "));
    }
    for (const InternalConstraint& constraint : config_.constraints) {
      line("  constraint: {} {} {}", constraint.leftEquation, operatorName(constraint.logicalOperator),
           constraint.rightEquation);
    }
  }

  void addMeasures() {
    line("Evaluation period: {} to {}", formatDate(config_.period.start), formatDate(config_.period.end));
    line("Output measures: {}", config_.measures.size());
    for (const OutputMeasure& measure : config_.measures) {
      line("  {}: {}, weight {} (above {}), objective function {}", measure.name, statisticName(measure),
           measure.weight, measure.weightAbove, measure.functionName.empty() ? "none" : measure.functionName);
    }
    line("Objective functions: {}", config_.objectives.size());
    for (const ObjectiveFunction& function : config_.objectives) {
      std::string text =
          fmt::format("  {}: {} of {} output measures, weight {}", function.name,
                      functionTypeName(function.functionType), function.measures.size(), function.weight);
      if (function.standardDeviation) text += fmt::format(", standard deviation {}", *function.standardDeviation);
      if (function.location) text += fmt::format(", location {}", *function.location);
      line("{}", text);
    }
    line("Aggregation: {}", config_.aggregationMethod == AggregationMethod::zero
                                ? "every aggregate is 0"
                                : aggregationMethodName(config_.aggregationMethod));
  }

  void addSurrogate(std::size_t variableCount) {
    const OptimisationConfig& search = config_.optimisation;
    if (config_.simulationOption != SimulationOption::parameterOptimisation || search.useSurrogateModel != 1 ||
        search.algorithmType == AlgorithmType::dds) {
      return;
    }
    line("Surrogate model: {} fitted to the {} nearest sets, chooses one of {} proposals; loops without it: {}",
         surrogateModelName(search.surrogate), neighbourhoodSize(search.surrogate, variableCount),
         proposalsPerRun(search.surrogate), search.surrogate.initialGenerations);
  }

  template <class... Values>
  void line(fmt::format_string<Values...> format, Values&&... values) {
    if (!text_.empty()) text_ += '\n';
    fmt::format_to(std::back_inserter(text_), format, std::forward<Values>(values)...);
  }

  std::string text() const { return text_; }

 private:
  const RunConfig& config_;
  std::string text_;
};

}  // namespace

std::string_view statisticName(const OutputMeasure& measure) {
  if (measure.interfaceType == InterfaceType::measureFile) return "written by the model";
  switch (measure.statisticType) {
    case StatisticType::mean:
      return "mean";
    case StatisticType::rootMeanSquare:
      return "root mean square";
    case StatisticType::standardDeviation:
      return "standard deviation";
    case StatisticType::peakDifference:
      return "difference of the largest values";
    case StatisticType::lowDifference:
      return "difference of the smallest values";
  }
  return "";
}

std::string taskName(const RunConfig& config) {
  switch (config.simulationOption) {
    case SimulationOption::scenarioRuns:
      return config.scenario.scenarioType == 0 ? "Scenario runs: Single run using initial parameter set"
                                               : "Scenario runs: Multiple runs";
    case SimulationOption::sensitivityAnalysis:
      return fmt::format("Sensitivity analysis: Local sensitivity analysis, {} differences",
                         config.sensitivity.local.differencing == 1 ? "central" : "forward");
    case SimulationOption::parameterOptimisation:
      break;
    case SimulationOption::uncertaintyAnalysis:
      return fmt::format("Uncertainty analysis: {} sampling",
                         config.uncertainty.uncertaintyType == 1 ? "Latin hypercube" : "simple random");
  }
  if (config.simulationOption != SimulationOption::parameterOptimisation) return "none";
  std::string task = "Parameter optimisation: ";
  switch (config.optimisation.algorithmType) {
    case AlgorithmType::sce:
      task += "Shuffled Complex Evolution";
      break;
    case AlgorithmType::pse:
      task += "Population Simplex Evolution";
      break;
    case AlgorithmType::dds:
      return task + "Dynamically Dimensioned Search";
  }
  return config.optimisation.useSurrogateModel == 1 ? task + " with surrogate model" : task;
}

std::string setupSummary(const RunConfig& config, const SearchSpace& space, std::span<const int> evaluationOrder) {
  Summary summary(config);
  summary.line("Title: {}", config.title);
  summary.line("Task: {}", taskName(config));
  summary.line("Base folder: {}", config.baseFolder);
  summary.line("Batch items: {}, parameter files: {}, saved output files: {}", config.batchItems.size(),
               config.parameterFiles.size(), config.savedOutputFiles.size());
  summary.addParameters(space, evaluationOrder);
  summary.addMeasures();
  if (config.drawsRandomNumbers()) summary.line("Random seed: {}", config.randomSeed);
  summary.line("Model evaluations planned: {}{}", config.plannedEvaluations(),
               config.simulationOption == SimulationOption::parameterOptimisation ? " and a final model run" : "");
  summary.addSurrogate(space.size());
  summary.line("Simultaneous simulations: {}{}", config.simultaneousSimulations,
               config.useSingleThread ? ", one thread each" : "");
  return summary.text();
}

}  // namespace mirevo

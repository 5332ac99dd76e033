#include "run/setup/setup_summary.h"

#include <algorithm>
#include <iterator>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/text.h"
#include "measures/statistics.h"

namespace mirevo {
namespace {

/// Statistics that do not weigh differences have one weight.
std::string weightText(const OutputMeasure& measure) {
  if (!isCriterion(measure)) return fmt::format("weight {} (above {})", measure.weight, measure.weightAbove);
  return fmt::format("weight {}", measure.weight);
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
             codeName(kTransformationTypeNames, parameter.transformationType), space.lower[variable],
             space.upper[variable]);
        ++variable;
      }
    }
    if (!std::is_sorted(evaluationOrder.begin(), evaluationOrder.end())) {
      line("  order of evaluation: {}", fmt::join(evaluationOrder, ", "));
    }
    for (const InternalConstraint& constraint : config_.constraints) {
      line("  constraint: {} {} {}", constraint.leftEquation,
           codeName(kLogicalOperatorNames, constraint.logicalOperator), constraint.rightEquation);
    }
  }

  void addMeasures() {
    line("Evaluation period: {} to {}", formatDate(config_.period.start), formatDate(config_.period.end));
    if (config_.period.warmUpDays > 0.0) {
      line("Observations count from {} on, after a warm-up of {} days", formatDate(endOfWarmUp(config_.period)),
           formatReal(config_.period.warmUpDays));
    }
    for (const ValidationPeriod& period : config_.validationPeriods) {
      line("Validation period {}: {} to {}", period.name, formatDate(period.start), formatDate(period.end));
    }
    line("Output measures: {}", config_.measures.size());
    for (const OutputMeasure& measure : config_.measures) {
      const std::string weighting = describeWeighting(measure.weighting);
      line("  {}: {}, {}{}{}, objective function {}", measure.name, statisticWithBest(measure), weightText(measure),
           weighting.empty() ? "" : ", ", weighting, measure.functionName.empty() ? "none" : measure.functionName);
      addPairing(measure);
    }
    line("Objective functions: {}", config_.objectives.size());
    for (const ObjectiveFunction& function : config_.objectives) {
      std::string text =
          fmt::format("  {}: {} of {}, weight {}", function.name, codeName(kFunctionTypeNames, function.functionType),
                      countText(function.measures.size(), "output measure"), function.weight);
      if (function.standardDeviation) text += fmt::format(", standard deviation {}", *function.standardDeviation);
      if (function.location) text += fmt::format(", location {}", *function.location);
      line("{}", text);
    }
    line("Aggregation: {}", config_.aggregationMethod == AggregationMethod::zero
                                ? "every aggregate is 0"
                                : aggregationMethodName(config_.aggregationMethod));
  }

  /// Which observations count and what they are compared with, if that is not as usual.
  void addPairing(const OutputMeasure& measure) {
    if (measure.interfaceType != InterfaceType::timeSeries) return;
    const std::string selection = describeSelection(measure.selection);
    const std::string matching = describeMatching(measure.timeMatch);
    if (selection.empty() && matching.empty()) return;
    line("    observations: {}{}{}", selection.empty() ? "all" : selection, matching.empty() ? "" : "; compared with ",
         matching);
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

std::string statisticName(const OutputMeasure& measure) {
  if (measure.interfaceType == InterfaceType::measureFile) {
    return measure.observedValue
               ? fmt::format("weighted difference of the model's number to {}", formatReal(*measure.observedValue))
               : "written by the model";
  }
  return describeStatistic(measure);
}

std::string statisticWithBest(const OutputMeasure& measure) {
  return statisticName(measure) + (isCriterion(measure) ? fmt::format(", best {}", bestValue(measure)) : "");
}

std::string setupSummary(const RunConfig& config, const SearchSpace& space, std::span<const int> evaluationOrder) {
  Summary summary(config);
  summary.line("Title: {}", config.title);
  summary.line("Task: {}", config.taskDescription());
  summary.line("Base folder: {}", config.baseFolder);
  summary.line("Batch items: {}, parameter files: {}, saved output files: {}", config.batchItems.size(),
               config.parameterFiles.size(), config.savedOutputFiles.size());
  summary.addParameters(space, evaluationOrder);
  summary.addMeasures();
  if (config.drawsRandomNumbers()) summary.line("Random seed: {}", config.task->randomSeed);
  summary.line("Model evaluations planned: {}{}", config.plannedEvaluations(),
               config.task && config.task->hasFinalRun() ? " and a final model run" : "");
  if (config.task) {
    for (const std::string& text : config.task->summaryLines(space)) summary.line("{}", text);
  }
  if (!config.reuseResults) {
    summary.line("Reuse of results: none, the model is run for every set");
  } else if (config.reusesResults()) {
    summary.line("Reuse of results: a set that was run is not run again");
  } else if (config.task) {
    summary.line("Reuse of results: none, {}", config.task->runsEverySet()
                                                   ? "every listed run is made"
                                                   : "as output files are kept of every model run");
  }
  summary.line("Simultaneous simulations: {}{}", config.simultaneousSimulations,
               config.useSingleThread ? ", one thread each" : "");
  return summary.text();
}

}  // namespace mirevo

#include "run/tasks/tasks.h"

#include <fmt/core.h>

#include "algorithms/numbers/uniform_generator.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "run/tasks/analysis_tasks.h"
#include "run/tasks/search_factory.h"

namespace mirevo {
namespace {

constexpr std::string_view kEndOfTask = "Normal termination";

void logValues(RunLog& log, std::string_view heading, std::span<const std::string> names,
               std::span<const double> values) {
  log.line(heading);
  for (std::size_t i = 0; i < names.size() && i < values.size(); ++i) {
    log.line(fmt::format("   {} = {}", names[i], formatReal(values[i])));
  }
}

std::vector<std::string> objectiveNames(const RunConfig& config) {
  std::vector<std::string> names;
  for (const ObjectiveFunction& objective : config.objectives) names.push_back(objective.name);
  return names;
}

void logBestSet(const TaskContext& context, const ParameterSet& best, const EvaluationResult& result) {
  logValues(context.log, "Best parameter set:", context.space.names, ToModelScale(context.space, best));
  logValues(context.log, "Objective functions:", objectiveNames(context.config), result.objectiveValues);
  context.log.line(fmt::format("Aggregate: {}", formatReal(result.aggregate)));
}

std::string runScenarios(const TaskContext& context) {
  const std::int32_t type = context.config.scenario.scenarioType;
  if (type == 0) {
    const std::vector<ParameterSet> sets{context.space.initial};
    context.evaluator.evaluateParameterSets(sets, DispatchMode::task);
  } else if (type == 1) {
    context.evaluator.evaluateParameterSets(scenarioSets(context.config), DispatchMode::task);
  }
  return std::string(kEndOfTask);
}

std::string runOptimisation(const TaskContext& context) {
  const OptimisationConfig& optimisation = context.config.optimisation;
  const bool isKnownSearch = !searchShortName(optimisation.algorithmType).empty();
  if (optimisation.useSurrogateModel != 0 && optimisation.useSurrogateModel != 1) return std::string(kEndOfTask);
  if (!isKnownSearch) return std::string(kEndOfTask);

  UniformGenerator random(context.config.randomSeed);
  const SearchSummary summary = runConfiguredSearch(optimisation, context.space, context.evaluator, random,
                                                    [&context](std::string_view line) { context.log.line(line); });
  context.log.line("");
  context.log.line(summary.terminationMessage);
  const std::vector<ParameterSet> best{summary.best};
  if (best.front().empty()) return summary.terminationMessage;
  if (context.searchEnded) context.searchEnded(summary);
  logBestSet(context, best.front(), summary.bestResult);
  context.log.line("");
  context.log.line("Final model run with the best parameter set:");
  context.evaluator.evaluateParameterSets(best, DispatchMode::finalRun);
  return summary.terminationMessage;
}

}  // namespace

TaskOutcome runTask(const TaskContext& context) {
  switch (context.config.simulationOption) {
    case SimulationOption::scenarioRuns:
      return {runScenarios(context), {}};
    case SimulationOption::sensitivityAnalysis:
      if (context.config.sensitivity.sensitivityType != 0) break;
      return {std::string(kEndOfTask), runSensitivity(context)};
    case SimulationOption::parameterOptimisation:
      return {runOptimisation(context), {}};
    case SimulationOption::uncertaintyAnalysis:
      return {std::string(kEndOfTask), runUncertainty(context)};
  }
  return {std::string(kEndOfTask), {}};
}

std::vector<ParameterSet> scenarioSets(const RunConfig& config) {
  std::vector<ParameterSet> sets;
  for (std::size_t run = 0; run < config.scenario.runs.size(); ++run) {
    const std::vector<double>& values = config.scenario.runs[run];
    ParameterSet set;
    for (std::size_t i = 0; i < config.parameters.size(); ++i) {
      const ModelParameter& parameter = config.parameters[i];
      if (parameter.parameterType != ParameterType::variable) continue;
      bool failed = i >= values.size();
      if (!failed) {
        set.push_back(TransformParameterValue(values[i], parameter.lowerBound, parameter.transformationType,
                                              TransformDirection::forward, failed));
      }
      if (failed) {
        fatalError("Error: Invalid parameter transformation for parameter " + parameter.name,
                   fmt::format("Scenario run {} has {}.", run + 1,
                               i < values.size() ? "the value " + formatReal(values[i]) + ", which has no logarithm"
                                                 : "no value for it"));
      }
    }
    sets.push_back(std::move(set));
  }
  return sets;
}

}  // namespace mirevo

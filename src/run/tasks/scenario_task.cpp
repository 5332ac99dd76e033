#include "run/tasks/scenario_task.h"

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/off_grid.h"

namespace mirevo {
namespace {

constexpr CodeName kTypeNames[] = {{0, "single run"}, {1, "multiple runs"}};
constexpr std::string_view kValuesKeyword = "Parameters";
constexpr std::string_view kWhatSets = "scenarios";

const SettingSection<ScenarioSettings>& scenarioSection() {
  static const SettingSection<ScenarioSettings> section{
      {"SCENARIOS",
       "when `Option` is 0",
       "Scenario runs.",
       {setting<&ScenarioSettings::type>({.name = "Scenario_Type",
                                          .range = between(0, 1),
                                          .codes = kTypeNames,
                                          .refusal = "Error: Invalid scenario type selection",
                                          .meaning = "0 a single run with the initial values, 1 multiple runs."})}}};
  return section;
}

const SectionRow& listSection() {
  static const SectionRow section{"SCENARIOS/SCENARIO_RUNS",
                                  "when `Scenario_Type` is 1",
                                  "The parameter sets of the runs. At least one.",
                                  {itemCount(1)}};
  return section;
}

const SettingSection<ScenarioRun>& runSection() {
  static const SettingSection<ScenarioRun> section{
      {"SCENARIOS/SCENARIO_RUNS/SCENARIO_n",
       "for each item",
       "A run.",
       {setting<&ScenarioRun::name>({.name = "Name",
                                     .type = KeywordType::freeText,
                                     .defaultValue = "''",
                                     .meaning = "What the run is called in the log, in the closing lines of the "
                                                "result file and in the report.",
                                     .bearsOnResults = kNotOfResults}),
        setting<&ScenarioRun::values>({.name = kValuesKeyword,
                                       .unit = "of the parameters",
                                       .meaning =
                                           "One value per parameter in the order of `MODEL_PARAMETERS`, those of "
                                           "variable parameters within their bounds; those of fixed and dependent "
                                           "ones are read and not used."})}}};
  return section;
}

/// "Scenario 1: dry"; none if no run has a name.
std::vector<std::string> nameLines(std::span<const ScenarioRun> runs) {
  std::vector<std::string> lines;
  for (std::size_t i = 0; i < runs.size(); ++i) {
    if (!runs[i].name.empty()) lines.push_back(fmt::format("Scenario {}: {}", i + 1, columnName(runs[i].name)));
  }
  return lines;
}

/// Checks the values of one run against the parameters.
void validateScenarioRun(std::span<const double> values, std::span<const ModelParameter> parameters,
                         const SetupSection& section) {
  if (values.size() != parameters.size()) {
    section.refuse(
        "Error: Invalid number of parameter values in " + section.name(), kValuesKeyword,
        fmt::format("expected one value for each of the {} parameters, found {}", parameters.size(), values.size()));
  }
  for (std::size_t i = 0; i < values.size(); ++i) {
    const ModelParameter& parameter = parameters[i];
    const bool isInside = values[i] >= parameter.lowerBound && values[i] <= parameter.upperBound;
    if (parameter.parameterType != ParameterType::variable || isInside) continue;
    section.refuse(fmt::format("Error: Value for parameter {} in {} out of bounds", parameter.name, section.name()),
                   kValuesKeyword,
                   fmt::format("value {}: expected {} to {}, found {}", i + 1, parameter.lowerBound,
                               parameter.upperBound, values[i]));
  }
}

/// Warns once of each parameter for which a run has a value that it does not get; `told` says of which already.
void warnOfUnusedValues(std::span<const double> values, std::span<const ModelParameter> parameters,
                        const SetupSection& section, std::vector<bool>& told) {
  for (std::size_t i = 0; i < values.size(); ++i) {
    const ModelParameter& parameter = parameters[i];
    if (told[i]) continue;
    const std::string name = quotedForMessage(parameter.name);
    std::string text;
    if (parameter.parameterType == ParameterType::variable) {
      if (const std::string offGrid = offGridText(parameter, values[i]); !offGrid.empty()) {
        text = fmt::format("of the integer parameter {} {}; so for all such values", name, offGrid);
      }
    } else if (parameter.parameterType == ParameterType::fixed && values[i] != parameter.initialValue) {
      text = fmt::format("is not used: parameter {} is fixed at {}", name, formatReal(parameter.initialValue));
    }
    if (text.empty()) continue;
    told[i] = true;
    section.warn(kValuesKeyword, fmt::format("value {}, {}, {}", i + 1, formatReal(values[i]), text));
  }
}

}  // namespace

const TaskFacts& ScenarioTask::facts() const {
  static constexpr TaskFacts kFacts{{0, "scenarios"}, "scenario runs", run_files::kPlain};
  return kFacts;
}

std::vector<const SectionRow*> ScenarioTask::sections() const {
  return {&scenarioSection().row, &listSection(), &runSection().row};
}

std::vector<std::string> ScenarioTask::neededSections(const SetupSection& target) const {
  std::vector<std::string> paths{std::string(scenarioSection().row.path)};
  const auto type = target.peek(paths.front(), "Scenario_Type");
  if (type == SetupValue(std::int32_t{1})) paths.emplace_back(listSection().path);
  return paths;
}

void ScenarioTask::read(const TaskReading& reading) {
  parameters_.assign(reading.parameters.begin(), reading.parameters.end());
  const SetupSection section = reading.target.open("SCENARIOS");
  section.read(scenarioSection(), settings);
  if (settings.type == ScenarioType::singleRun) {
    if (section.holds("SCENARIO_RUNS/SCENARIO_1")) {
      section.warn("Scenario_Type", "0 makes a single run with the initial values, SCENARIO_RUNS is not read");
    }
    return;
  }
  std::vector<bool> told(reading.parameters.size());
  section.open("SCENARIO_RUNS")
      .readItems("SCENARIO_", runSection(), settings.runs, "Error: No scenario runs defined",
                 [&reading, &told](const SetupSection& item, const ScenarioRun& run) {
                   validateScenarioRun(run.values, reading.parameters, item);
                   warnOfUnusedValues(run.values, reading.parameters, item, told);
                 });
}

std::vector<double> ScenarioTask::givenValues(std::size_t parameter) const {
  std::vector<double> values;
  for (const ScenarioRun& run : settings.runs) values.push_back(run.values[parameter]);
  return values;
}

std::string ScenarioTask::description() const {
  return settings.type == ScenarioType::singleRun ? "Scenario runs: Single run using initial parameter set"
                                                  : "Scenario runs: Multiple runs";
}

std::vector<std::string> ScenarioTask::summaryLines(const SearchSpace& /*space*/) const {
  return nameLines(settings.runs);
}

int ScenarioTask::shownRuns() const {
  return settings.type == ScenarioType::singleRun ? 0 : kMostShownScenarios;
}

TaskReport ScenarioTask::report() const {
  TaskReport report;
  for (const ScenarioRun& run : settings.runs) report.runNames.push_back(run.name);
  return report;
}

int ScenarioTask::plannedEvaluations() const {
  return settings.type == ScenarioType::singleRun ? 1 : static_cast<int>(settings.runs.size());
}

std::vector<ParameterSet> ScenarioTask::sets(const SearchSpace& space,
                                             std::span<const ModelParameter> parameters) const {
  return settings.type == ScenarioType::singleRun ? std::vector<ParameterSet>{space.initial}
                                                  : scenarioSets(settings.runs, parameters);
}

std::vector<SetDoubt> ScenarioTask::setDoubts(const SearchSpace& space, const Feasibility& feasibility) const {
  const std::vector<ParameterSet> all = sets(space, parameters_);
  return infeasibleSets(feasibility, all, kWhatSets, static_cast<int>(all.size())).doubts();
}

std::optional<ParameterSet> ScenarioTask::trialSet(const SearchSpace& space, const Feasibility& feasibility) const {
  return firstFeasible(feasibility, sets(space, parameters_));
}

TaskOutcome ScenarioTask::run(const TaskContext& context) {
  const std::vector<ParameterSet> all = sets(context.space, context.parameters);
  warnOfInfeasibleSets(context, all, kWhatSets, static_cast<int>(all.size()));
  context.evaluator.evaluateParameterSets(all, DispatchMode::task);
  TaskOutcome outcome{std::string(kEndOfTask), nameLines(settings.runs)};
  if (!outcome.report.empty()) logReport(context, outcome.report);
  return outcome;
}

std::vector<ParameterSet> scenarioSets(std::span<const ScenarioRun> runs, std::span<const ModelParameter> parameters) {
  std::vector<ParameterSet> sets;
  for (std::size_t run = 0; run < runs.size(); ++run) {
    const std::vector<double>& values = runs[run].values;
    ParameterSet set;
    for (std::size_t i = 0; i < parameters.size(); ++i) {
      const ModelParameter& parameter = parameters[i];
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

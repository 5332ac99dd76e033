#include "run/setup/setting_doubts.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <span>
#include <string_view>
#include <unordered_map>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/paths.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/statistics.h"
#include "parameters/search_space.h"
#include "run/setup/model_keywords.h"
#include "run/tasks/off_grid.h"

namespace mirevo {
namespace {

/// Whether two names are of one file, links followed where it exists.
bool isSameFile(const std::string& a, const std::string& b) {
  std::error_code ignored;
  return a == b || std::filesystem::equivalent(a, b, ignored);
}

void warnOfParameterFiles(const RunConfig& config, const SectionsRead& sections) {
  // By name: a link is replaced by a file of its own when it is written.
  std::unordered_map<std::string_view, std::size_t> first;
  for (std::size_t i = 0; i < config.parameterFiles.size(); ++i) {
    const auto [earlier, isNew] = first.try_emplace(config.parameterFiles[i].paramFileName, i);
    if (isNew) continue;
    sections.parameterFiles[i].warn(
        "ParamFileName", fmt::format("{} writes this file, too; the model gets what is written last, from this item",
                                     sections.parameterFiles[earlier->second].name()));
  }
}

void warnOfIdValues(const RunConfig& config, const SectionsRead& sections) {
  const bool areUsed =
      std::any_of(config.parameterFiles.begin(), config.parameterFiles.end(),
                  [](const ParameterFileItem& item) { return item.templateType == TemplateType::numericId; });
  if (!areUsed) return;
  std::unordered_map<std::int32_t, const ModelParameter*> first;
  for (std::size_t i = 0; i < config.parameters.size(); ++i) {
    const ModelParameter& parameter = config.parameters[i];
    const auto key = idKey(parameter.idValue);
    if (parameter.idValue == 0.0 || !key) continue;
    const auto [earlier, isNew] = first.try_emplace(*key, &parameter);
    if (isNew) continue;
    sections.parameters[i].warn(
        "Parameter_IDValue",
        fmt::format("taken for that of parameter {}, {}: ID values must differ by 1e-37 or more",
                    quotedForMessage(earlier->second->name), formatReal(earlier->second->idValue)));
  }
}

void warnOffGrid(const ModelParameter& parameter, double value, std::string_view keyword, const SetupSection& section) {
  const std::string text = offGridText(parameter, value);
  if (!text.empty()) section.warn(keyword, fmt::format("{} {}", formatReal(value), text));
}

void warnOfParameters(const RunConfig& config, const SectionsRead& sections) {
  for (std::size_t i = 0; i < config.parameters.size(); ++i) {
    const ModelParameter& parameter = config.parameters[i];
    if (parameter.parameterType != ParameterType::dependent && !trim(parameter.equation).empty()) {
      sections.parameters[i].warn("Parameter_Equation",
                                  "not used, as only Parameter_Type = 2 makes a parameter dependent");
    }
    if (parameter.parameterType == ParameterType::dependent &&
        parameter.transformationType == TransformationType::integer) {
      sections.parameters[i].warn("Transformation_Type",
                                  "has no effect on a dependent parameter: its value is that of its equation");
    }
    if (parameter.parameterType != ParameterType::variable) continue;
    warnOffGrid(parameter, parameter.initialValue, "Initial_Value", sections.parameters[i]);
    warnOffGrid(parameter, parameter.upperBound, "Upper_Bound", sections.parameters[i]);
  }
}

bool hasOneValue(const ModelParameter& parameter) {
  if (parameter.parameterType != ParameterType::variable) return true;
  return onGrid(parameter, parameter.upperBound) <= parameter.lowerBound;
}

void warnOfStatistic(const OutputMeasure& measure, const SetupSection& section) {
  const Statistic& statistic = statisticOf(measure.statisticType);
  if (statistic.key.code) {
    if (isWeightless(measure)) {
      section.warn("Weight", "both weights are 0, the measure does not depend on the model");
    }
  } else {
    if (measure.weight == 0.0) section.warn("Weight", "the measure contributes nothing to its objective function");
    if (section.isWritten("Weight_Above") && measure.weightAbove != measure.weight) {
      section.warn("Weight_Above",
                   fmt::format("has no effect with the statistic '{}', which does not weigh differences: "
                               "Weight multiplies what it contributes to the objective function",
                               statistic.key.name));
    }
  }
  const ValueTransformation used = transformationOf(measure);
  const bool usesEpsilon = statistic.usesEpsilon || used == ValueTransformation::logarithm ||
                           used == ValueTransformation::inverse || used == ValueTransformation::boxCox;
  if (!usesEpsilon && section.isWritten("Epsilon")) {
    section.warn("Epsilon", "has no effect, as the measure takes no logarithm, inverse or power");
  }
  if (used != ValueTransformation::boxCox && section.isWritten("Box_Cox_Lambda")) {
    section.warn("Box_Cox_Lambda", "has no effect without Transformation = 'Box-Cox'");
  }
}

void warnOfMatching(const OutputMeasure& measure, const SetupSection& section) {
  if (measure.timeMatch.kind == TimeMatch::mean) return;
  for (const std::string_view keyword : {"Day_Begins", "Day_Stamp"}) {
    if (section.isWritten(keyword)) section.warn(keyword, "has no effect without Time_Match = 'mean'");
  }
}

/// Of a measure that is a number of the model, or its weighted difference to an observed value.
void warnOfModelsNumber(const OutputMeasure& measure, const SetupSection& section) {
  const std::string_view reason = measure.observedValue
                                      ? "has no effect with Interface_Type = 1: the model's number is compared as it is"
                                      : "has no effect with Interface_Type = 1: the model's number is taken as it is";
  if (isWeightless(measure)) {
    section.warn("Weight", "both weights are 0, the measure does not depend on the model");
  }
  if (!statisticOf(measure.statisticType).key.code) {
    section.warn("Statistic_Type", fmt::format("{}, and a search makes it small", reason));
  }
  const auto warnOf = [&](std::span<const std::string_view> keywords) {
    for (const std::string_view keyword : keywords) {
      if (section.isWritten(keyword)) section.warn(keyword, reason);
    }
  };
  warnOf(std::array<std::string_view, 3>{"Transformation", "Epsilon", "Box_Cox_Lambda"});
  warnOf(kSelectionKeywords);
  warnOf(kMatchingKeywords);
}

void warnOfMeasures(const RunConfig& config, const SectionsRead& sections) {
  for (std::size_t i = 0; i < config.measures.size(); ++i) {
    const OutputMeasure& measure = config.measures[i];
    if (measure.interfaceType != InterfaceType::timeSeries) {
      warnOfModelsNumber(measure, sections.measures[i]);
      continue;
    }
    if (measure.observedValue) sections.measures[i].warn("Observed_Value", "has no effect with Interface_Type = 0");
    warnOfStatistic(measure, sections.measures[i]);
    warnOfMatching(measure, sections.measures[i]);
    if (isSameFile(measure.simulation.fileName, measure.observation.fileName)) {
      sections.measures[i].warn("Name",
                                "the observed series is in the file of the simulated one, which the model writes");
    }
  }
}

void warnOfMeasureFile(const RunConfig& config, const SectionsRead& sections) {
  if (trim(config.measureFile).empty() || config.readsMeasureFile()) return;
  sections.measureFile->warn("File_Name", "has no effect, as no output measure has Interface_Type = 1");
}

/// Whether the value of an objective function becomes ever better the further a measure is below 0.
bool rewardsTooLittle(const RunConfig& config, const ObjectiveFunction& objective, const OutputMeasure& measure) {
  if (config.aggregationMethod == AggregationMethod::zero || objective.functionType != FunctionType::sum ||
      !(objective.weight > 0.0)) {
    return false;
  }
  if (measure.interfaceType != InterfaceType::timeSeries) return measure.observedValue && measure.weight > 0.0;
  const Statistic& statistic = statisticOf(measure.statisticType);
  return statistic.best == Best::zero && statistic.inObjective(-1.0) < 0.0 && measure.weight > 0.0;
}

/// What makes a search pointless.
void warnOfSearch(const RunConfig& config, const SectionsRead& sections) {
  if (config.aggregationMethod == AggregationMethod::zero && config.task->judgesByAggregate()) {
    sections.judgement->warn("Aggregation_Method",
                             "makes every aggregate 0: the search cannot tell one set from another");
  }
  for (std::size_t i = 0; i < config.objectives.size(); ++i) {
    for (const MeasureTerm& term : config.objectives[i].measures) {
      const OutputMeasure& measure = config.measures[term.index];
      if (!rewardsTooLittle(config, config.objectives[i], measure)) continue;
      sections.objectives[i].warn(
          "Function_Type",
          fmt::format("a sum with a difference that may be negative ({}) is the smaller the further the simulation is "
                      "below the observation, and the search looks for the smallest: absolute values or squares are "
                      "meant for differences",
                      quotedForMessage(measure.name)));
      break;
    }
  }
  if (std::all_of(config.parameters.begin(), config.parameters.end(), hasOneValue)) {
    const auto variable = std::find_if(
        config.parameters.begin(), config.parameters.end(),
        [](const ModelParameter& parameter) { return parameter.parameterType == ParameterType::variable; });
    sections.parameters[static_cast<std::size_t>(variable - config.parameters.begin())].warn(
        "Upper_Bound", "the bounds leave one value to every variable parameter: all sets of the search are the same");
  }
}

void warnOfObjectives(const RunConfig& config, const SectionsRead& sections) {
  for (const SetupSection& section : sections.objectives) {
    for (const std::string_view keyword : {"Standard_Deviation", "Location"}) {
      if (config.aggregationMethod != AggregationMethod::none || !section.isWritten(keyword)) continue;
      section.warn(keyword, "has no effect with Aggregation_Method = 0");
    }
  }
  const bool isWeighted = std::any_of(config.objectives.begin(), config.objectives.end(),
                                      [](const ObjectiveFunction& objective) { return objective.weight != 0.0; });
  if (isWeighted || config.objectives.empty()) return;
  sections.objectives.front().warn("Weight", "the weights of all objective functions are 0, and so is every aggregate");
}

void warnOfCoverage(const RunConfig& config, const SectionsRead& sections) {
  const bool comparesSeries =
      std::any_of(config.measures.begin(), config.measures.end(),
                  [](const OutputMeasure& measure) { return measure.interfaceType == InterfaceType::timeSeries; });
  if (comparesSeries) return;
  constexpr std::string_view kReason = "has no effect, as no output measure compares series";
  if (config.minimumCoverage > 0.0) sections.judgement->warn("Minimum_Coverage", kReason);
  if (config.period.largestGapHours > 0.0) sections.judgement->warn("Largest_Gap", kReason);
  if (config.period.warmUpDays > 0.0) sections.judgement->warn("Warm_Up_Days", kReason);
}

void warnOfValidation(const RunConfig& config, const SectionsRead& sections) {
  const bool hasSeries = !validationTargets(config.measures, config.validationPeriods).empty();
  for (std::size_t i = 0; i < config.validationPeriods.size(); ++i) {
    const ValidationPeriod& period = config.validationPeriods[i];
    if (!hasSeries) {
      sections.validationPeriods[i].warn("Start_Date", "without effect, no output measure compares series");
    } else if (std::ranges::any_of(config.measures, [&](const OutputMeasure& measure) {
                 const EvaluationPeriod counted = countedPeriod(measure, config.period);
                 return measure.interfaceType == InterfaceType::timeSeries &&
                        daysSince(counted.start, period.end) >= 0.0 && daysSince(counted.end, period.start) <= 0.0;
               })) {
      sections.validationPeriods[i].warn(
          "Start_Date", fmt::format("the validation period overlaps the evaluation period, {} to {}, and is no "
                                    "independent test of it",
                                    formatDate(config.period.start), formatDate(config.period.end)));
    }
  }
}

void warnOfProcessFolder(const RunConfig& config, const SectionsRead& sections) {
  if (config.processFolder.empty()) return;
  constexpr std::string_view kKeyword = "ProcessFolder";
  if (pathInFolder(config.processFolder, config.baseFolder)) {
    sections.slots->warn(
        kKeyword, fmt::format("is in the base folder {}, of which every process folder is a copy", config.baseFolder));
  }
  if (config.usesMpiWorkers) return;  // it may be on a disk that only the workers have
  std::error_code ignored;
  const std::filesystem::path parent = std::filesystem::path(config.processFolder).parent_path();
  if (std::filesystem::exists(parent, ignored)) return;
  sections.slots->warn(kKeyword, fmt::format("{} does not exist and is made: is the name right?", parent.string()));
}

}  // namespace

void warnOfDoubtfulSettings(const RunConfig& config, const SectionsRead& sections) {
  warnOfParameterFiles(config, sections);
  warnOfIdValues(config, sections);
  warnOfParameters(config, sections);
  warnOfMeasures(config, sections);
  warnOfMeasureFile(config, sections);
  warnOfObjectives(config, sections);
  warnOfCoverage(config, sections);
  warnOfValidation(config, sections);
  if (config.task && config.task->hasFinalRun()) warnOfSearch(config, sections);
  warnOfProcessFolder(config, sections);
}

}  // namespace mirevo

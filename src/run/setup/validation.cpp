#include "run/setup/validation.h"

#include <algorithm>
#include <cmath>
#include <string_view>
#include <utility>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/statistics.h"

namespace mirevo {
namespace {

std::optional<SettingRefusal> validateDate(const DateRecord& date, std::string_view keyword) {
  try {
    date_check(date, kDateFieldCount);
  } catch (const FatalError& error) {
    return SettingRefusal{error.message(), keyword, "no day and time of the calendar"};
  }
  return std::nullopt;
}

/// `kind` of the period: "evaluation".
std::optional<SettingRefusal> validateDates(const DateRecord& start, const DateRecord& end, std::string_view kind) {
  if (auto refusal = validateDate(start, "Start_Date")) return refusal;
  if (auto refusal = validateDate(end, "End_Date")) return refusal;
  if (daysSince(start, end) >= 0.0) return std::nullopt;
  return SettingRefusal{fmt::format("Error: End date of the {} period before its start date", kind), "End_Date",
                        fmt::format("expected {} or later, found {}", formatDate(start), formatDate(end))};
}

SettingRefusal refuseRepeated(std::string_view message, const std::string& name, std::string_view keyword,
                              std::string_view kind) {
  return {fmt::format("{} {}. Name used more than once.", message, name), keyword,
          fmt::format("expected a name that no earlier {} has", kind)};
}

}  // namespace

std::optional<SettingRefusal> validateParameterBounds(const ModelParameter& parameter) {
  const bool isBelow = parameter.initialValue < parameter.lowerBound;
  if (!isBelow && !(parameter.initialValue > parameter.upperBound)) return std::nullopt;
  std::string explanation =
      isBelow ? fmt::format("expected {} or more, found {}", parameter.lowerBound, parameter.initialValue)
              : fmt::format("expected {} or less, found {}", parameter.upperBound, parameter.initialValue);
  // Every value is outside bounds that are the wrong way round.
  if (parameter.lowerBound > parameter.upperBound) {
    explanation = fmt::format("Lower_Bound {} is above Upper_Bound {}: are they swapped? The initial value is {}",
                              parameter.lowerBound, parameter.upperBound, parameter.initialValue);
  }
  return SettingRefusal{fmt::format("Error: Initial parameter value {} bound for parameter {}",
                                    isBelow ? "smaller than lower" : "larger than upper", parameter.name),
                        "Initial_Value", explanation};
}

std::optional<SettingRefusal> validateParameterDefinition(const ModelParameter& parameter, NamesUsed& names) {
  if (!names.insert(parameter.name).second) {
    return refuseRepeated("Error: Invalid parameter name", parameter.name, "Parameter_Name", "parameter");
  }
  if (parameter.parameterType != ParameterType::variable) return std::nullopt;
  if (!std::isfinite(parameter.upperBound - parameter.lowerBound)) {
    return SettingRefusal{
        "Error: Bounds too far apart for parameter " + parameter.name, "Upper_Bound",
        fmt::format("expected a difference from Lower_Bound = {} that a number can hold (1.79e308 at most), found {}",
                    parameter.lowerBound, parameter.upperBound)};
  }
  // Only the lower bound matters: the upper bound and the initial value are not below it.
  if (parameter.transformationType != TransformationType::logarithmic || parameter.lowerBound > 0.0) {
    return std::nullopt;
  }
  return SettingRefusal{
      "Error: Invalid parameter transformation for parameter " + parameter.name, "Lower_Bound",
      fmt::format("expected a value greater than 0 for a logarithmic parameter, found {}", parameter.lowerBound)};
}

std::optional<SettingRefusal> validateEquations(const InternalConstraint& constraint) {
  const bool isLeftBlank = trim(constraint.leftEquation).empty();
  if (!isLeftBlank && !trim(constraint.rightEquation).empty()) return std::nullopt;
  return SettingRefusal{"Error: Invalid equation for internal constraints",
                        isLeftBlank ? "Left_Equation" : "Right_Equation",
                        "expected an equation over the parameters' names, found a blank text"};
}

std::optional<SettingRefusal> validateEvaluationPeriod(const EvaluationPeriod& period) {
  return validateDates(period.start, period.end, "evaluation");
}

std::optional<SettingRefusal> validateValidationPeriod(const ValidationPeriod& period) {
  return validateDates(period.start, period.end, "validation");
}

std::optional<SettingRefusal> validatePeriodName(const ValidationPeriod& period, NamesUsed& names) {
  if (names.insert(period.name).second) return std::nullopt;
  return refuseRepeated("Error: Invalid name of the validation period", period.name, "Name", "validation period");
}

std::optional<SettingRefusal> validateWarmUp(const EvaluationPeriod& period) {
  const double days = daysSince(period.start, period.end);
  if (period.warmUpDays == 0.0 || period.warmUpDays < days) return std::nullopt;
  return SettingRefusal{"Error: Warm-up as long as the evaluation period", "Warm_Up_Days",
                        fmt::format("expected less than {}, the days from {} to {}, found {}", formatReal(days),
                                    formatDate(period.start), formatDate(period.end), formatReal(period.warmUpDays))};
}

std::optional<SettingRefusal> validateSelection(const OutputMeasure& measure) {
  const ObservationSelection& selection = measure.selection;
  for (const double month : selection.months) {
    if (month >= 1.0 && month <= 12.0 && month == std::floor(month)) continue;
    return SettingRefusal{"Error: Months invalid for output measure " + measure.name, "Months",
                          fmt::format("expected whole numbers 1 to 12, found {}", formatReal(month))};
  }
  if (!selection.lowestObserved || !selection.highestObserved ||
      *selection.lowestObserved <= *selection.highestObserved) {
    return std::nullopt;
  }
  return SettingRefusal{"Error: Limits of the observed values invalid for output measure " + measure.name,
                        "Highest_Observed",
                        fmt::format("expected Lowest_Observed = {} or more, found {}",
                                    formatReal(*selection.lowestObserved), formatReal(*selection.highestObserved))};
}

std::optional<SettingRefusal> validateOwnPeriod(const OutputMeasure& measure, const EvaluationPeriod& period) {
  const std::string message = "Error: Period invalid for output measure " + measure.name;
  const auto isBefore = [](const DateRecord& a, const DateRecord& b) { return daysSince(b, a) < 0.0; };
  const auto refuse = [&](std::string_view keyword, std::string_view expected, const DateRecord& found) {
    return SettingRefusal{message, keyword, fmt::format("expected {}, found {}", expected, formatDate(found))};
  };
  const std::string inside =
      fmt::format("a time in the evaluation period, {} to {}", formatDate(period.start), formatDate(period.end));
  for (const auto& [date, keyword] :
       {std::pair(measure.selection.start, "Start_Date"), std::pair(measure.selection.end, "End_Date")}) {
    if (!date) continue;
    if (auto refusal = validateDate(*date, keyword)) return refusal;
    if (isBefore(*date, period.start) || isBefore(period.end, *date)) return refuse(keyword, inside, *date);
  }
  if (!measure.selection.end) return std::nullopt;
  const EvaluationPeriod counted = countedPeriod(measure, period);
  if (!isBefore(counted.end, counted.start)) return std::nullopt;
  const bool isWarmUp = !measure.selection.start || isBefore(*measure.selection.start, counted.start);
  return refuse("End_Date",
                fmt::format("{} or later, {}", formatDate(counted.start),
                            isWarmUp ? "the end of the warm-up" : "the measure's Start_Date"),
                *measure.selection.end);
}

std::optional<SettingRefusal> validateMeasurementNumber(const OutputMeasure& measure) {
  if (measure.interfaceType != InterfaceType::measureFile || measure.measurementNo >= 1) return std::nullopt;
  return SettingRefusal{"Error: Measurement No. invalid for output measure " + measure.name, "MeasurementNo",
                        fmt::format("expected 1 or more, found {}", measure.measurementNo)};
}

std::optional<SettingRefusal> validateValueTransformation(const OutputMeasure& measure) {
  const Statistic& statistic = statisticOf(measure.statisticType);
  const bool isOfSeries = measure.interfaceType == InterfaceType::timeSeries;
  if (!isOfSeries || measure.transformation == ValueTransformation::none) return std::nullopt;
  std::string_view reason;
  if (statistic.transformation != ValueTransformation::none || statistic.usesEpsilon) {
    reason = "has a transformation of its own";
  } else if (statistic.needsPeaks) {
    reason = "is that of extremes, use 'peak error' or a bias instead";
  } else if (measure.transformation == ValueTransformation::rank && statistic.isOfSizes) {
    reason = "is hardly changed by the model once the values are ranks";
  }
  if (reason.empty()) return std::nullopt;
  return SettingRefusal{"Error: Transformation invalid for output measure " + measure.name, "Transformation",
                        fmt::format("the statistic '{}' {}", statistic.key.name, reason)};
}

std::optional<SettingRefusal> validateWeighting(const OutputMeasure& measure) {
  const ObservationWeighting& w = measure.weighting;
  const auto refuse = [&measure](std::string_view keyword, std::string explanation) {
    return SettingRefusal{"Error: Weights of observations invalid for output measure " + measure.name, keyword,
                          std::move(explanation)};
  };
  if (w.hasWeights() && w.hasErrors()) {
    return refuse(
        w.errorItem != 0 ? "Error_Item_No" : "Error_Item_Name",
        fmt::format("expected {} or {}, found both", w.weightItem != 0 ? "Weight_Item_No" : "Weight_Item_Name",
                    w.errorItem != 0 ? "Error_Item_No" : "Error_Item_Name"));
  }
  const std::string_view weightKeyword = w.errorItem != 0    ? "Error_Item_No"
                                         : w.hasErrors()     ? "Error_Item_Name"
                                         : w.weightItem != 0 ? "Weight_Item_No"
                                                             : "Weight_Item_Name";
  const bool hasCodes = !w.leftOut.empty() || !w.downWeighted.empty();
  const std::string_view listKeyword = w.leftOut.empty() ? "Quality_Down_Weighted" : "Quality_Left_Out";
  if (hasCodes && !w.hasCodes()) {
    return refuse(listKeyword, "expected Quality_Item_No beside it, the item of the file that has the codes");
  }
  if (!hasCodes && w.hasCodes()) {
    return refuse(w.qualityItem != 0 ? "Quality_Item_No" : "Quality_Item_Name",
                  "expected Quality_Left_Out or Quality_Down_Weighted beside it, the codes that "
                  "make a difference");
  }
  for (const auto& [keyword, item] : {std::pair{weightKeyword, std::max(w.weightItem, w.errorItem)},
                                      std::pair{std::string_view("Quality_Item_No"), w.qualityItem}}) {
    if (item != measure.observation.itemNo || !measure.observation.itemName.empty()) continue;
    return refuse(keyword, fmt::format("expected another item than the observed one, Item_No = {}", item));
  }
  const auto isInBoth = [&w](double code) { return std::ranges::find(w.leftOut, code) != w.leftOut.end(); };
  if (const auto both = std::ranges::find_if(w.downWeighted, isInBoth); both != w.downWeighted.end()) {
    return refuse("Quality_Down_Weighted",
                  fmt::format("expected a code in one list, found {} in Quality_Left_Out, too", formatReal(*both)));
  }
  if (!(w.qualityWeight < 1.0)) {
    return refuse("Quality_Weight",
                  fmt::format("expected a number between 0 and 1, found {}{}", formatReal(w.qualityWeight),
                              w.qualityWeight == 1.0 ? ", with which the codes change nothing" : ""));
  }
  if (measure.interfaceType != InterfaceType::timeSeries || !w.weighs() || takesWeights(measure)) return std::nullopt;
  const bool isOfRanks = measure.transformation == ValueTransformation::rank;
  return refuse(
      w.hasWeights() || w.hasErrors() ? weightKeyword : "Quality_Down_Weighted",
      fmt::format("{} has no weighted form: use another one, or leave observations out with "
                  "Quality_Left_Out",
                  isOfRanks ? std::string("the transformation 'rank'")
                            : fmt::format("the statistic '{}'", statisticOf(measure.statisticType).key.name)));
}

std::optional<SettingRefusal> validateObjectiveFunction(const ObjectiveFunction& function, NamesUsed& names) {
  if (names.insert(function.name).second) return std::nullopt;
  return refuseRepeated("Error: Invalid objective function name", function.name, "Name", "objective function");
}

std::optional<SettingRefusal> validateTransformation(const ObjectiveFunction& function, AggregationMethod method,
                                                     bool hasInitialSample) {
  const bool needsScale = method == AggregationMethod::commonDistance || method == AggregationMethod::commonProbability;
  if (!needsScale || hasInitialSample || (function.standardDeviation && function.location)) return std::nullopt;
  return SettingRefusal{
      "Error: Standard deviation and location not defined for objective function " + function.name,
      function.standardDeviation ? "Location" : "Standard_Deviation",
      fmt::format("expected the keyword, which aggregation method {} needs: this run does not take it "
                  "from an initial sample",
                  static_cast<int>(method))};
}

std::optional<SettingRefusal> validateProcessCount(const RunConfig& config) {
  if (config.usesMpiWorkers || !config.task || config.simultaneousSimulations <= 1) return std::nullopt;
  const std::optional<OneSlotOnly> only = config.task->needsOneSlot();
  if (!only) return std::nullopt;
  return SettingRefusal{std::string(only->refusal), kSlotsKeyword,
                        fmt::format("expected 1 with this {}, found {}; several model runs at a time: {}",
                                    only->keyword, config.simultaneousSimulations, only->advice)};
}

}  // namespace mirevo

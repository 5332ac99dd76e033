#include "measures/statistics.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <cstddef>
#include <cstdint>

#include <fmt/core.h>

#include "common/text.h"
#include "measures/criteria.h"
#include "measures/measure_statistics.h"

namespace mirevo {
namespace {

/// One of the statistics that MeasureStatistics holds.
template <double MeasureStatistics::*Figure>
double figure(const MeasureStatistics& statistics) {
  return statistics.*Figure;
}

double asItIs(double value) {
  return value;
}

double oneMinus(double value) {
  return 1.0 - value;
}

double magnitude(double value) {
  return std::abs(value);
}

double share(double percent) {
  return std::abs(percent) / 100.0;
}

/// A criterion of the pairs alone.
template <double (*Criterion)(ValuePairs)>
double ofPairs(const MeasureStatistics& statistics) {
  return Criterion(comparedPairs(statistics));
}

template <double KlingGupta::*Figure>
double ofKlingGupta(const MeasureStatistics& statistics) {
  return klingGupta(comparedPairs(statistics)).*Figure;
}

double rSquared(const MeasureStatistics& statistics) {
  const double r = klingGupta(comparedPairs(statistics)).correlation;
  return r * r;
}

double volumeErrorOfRuns(const MeasureStatistics& statistics) {
  return volumeError(comparedPairs(statistics), statistics.times, statistics.breaks);
}

double peakTimeErrorInHours(const MeasureStatistics& statistics) {
  constexpr double kHoursPerDay = 24.0;
  return kHoursPerDay * peakTimeError(comparedPairs(statistics), statistics.times);
}

template <double (*Criterion)(ValuePairs, double)>
double withEpsilon(const MeasureStatistics& statistics) {
  return Criterion(comparedPairs(statistics), statistics.epsilon);
}

constexpr std::string_view kObservedConstant = "the observed values do not vary";
constexpr std::string_view kObservedSumZero = "the observed values sum to 0";

constexpr auto kTable = std::to_array<Statistic>({
    {.key = {0, "mean"},
     .description = "mean",
     .value = figure<&MeasureStatistics::mean>,
     .best = Best::zero,
     .inObjective = asItIs,
     .takesWeights = true,
     .isOfSizes = true},
    {.key = {1, "root mean square"},
     .description = "root mean square",
     .value = figure<&MeasureStatistics::rootMeanSquare>,
     .best = Best::smallest,
     .inObjective = asItIs,
     .takesWeights = true},
    {.key = {2, "standard deviation"},
     .description = "standard deviation",
     .value = figure<&MeasureStatistics::standardDeviation>,
     .best = Best::smallest,
     .inObjective = asItIs,
     .takesWeights = true},
    {.key = {3, "peak difference"},
     .description = "difference of the largest values",
     .value = figure<&MeasureStatistics::peakDifference>,
     .best = Best::zero,
     .inObjective = asItIs,
     .needsPeaks = true},
    {.key = {4, "low difference"},
     .description = "difference of the smallest values",
     .value = figure<&MeasureStatistics::lowDifference>,
     .best = Best::zero,
     .inObjective = asItIs,
     .needsPeaks = true},
    {.key = {std::nullopt, "NSE"},
     .description = "Nash-Sutcliffe efficiency",
     .value = ofPairs<nashSutcliffe>,
     .best = Best::largest,
     .inObjective = oneMinus,
     .takesWeights = true,
     .undefined = kObservedConstant},
    {.key = {std::nullopt, "log-NSE"},
     .description = "Nash-Sutcliffe efficiency of the logarithms",
     .value = ofPairs<nashSutcliffe>,
     .best = Best::largest,
     .inObjective = oneMinus,
     .takesWeights = true,
     .transformation = ValueTransformation::logarithm,
     .undefined = "the observed values do not vary, or a value plus epsilon is not positive"},
    {.key = {std::nullopt, "sqrt-NSE"},
     .description = "Nash-Sutcliffe efficiency of the square roots",
     .value = ofPairs<nashSutcliffe>,
     .best = Best::largest,
     .inObjective = oneMinus,
     .takesWeights = true,
     .transformation = ValueTransformation::squareRoot,
     .undefined = "the observed values do not vary, or a value is negative"},
    {.key = {std::nullopt, "KGE"},
     .description = "Kling-Gupta efficiency (2009)",
     .value = ofKlingGupta<&KlingGupta::efficiency2009>,
     .best = Best::largest,
     .inObjective = oneMinus,
     .takesWeights = true,
     .undefined = "either series does not vary, or the observed values sum to 0"},
    {.key = {std::nullopt, "KGE-2012"},
     .description = "Kling-Gupta efficiency (2012)",
     .value = ofKlingGupta<&KlingGupta::efficiency2012>,
     .best = Best::largest,
     .inObjective = oneMinus,
     .takesWeights = true,
     .undefined = "either series does not vary, or sums to 0"},
    {.key = {std::nullopt, "KGE-NP"},
     .description = "non-parametric Kling-Gupta efficiency (2018)",
     .value = ofPairs<klingGuptaNonParametric>,
     .best = Best::largest,
     .inObjective = oneMinus,
     .undefined = "either series does not vary, or sums to 0"},
    {.key = {std::nullopt, "percent bias"},
     .description = "bias [%]",
     .value = ofPairs<percentBias>,
     .best = Best::zero,
     .inObjective = share,
     .takesWeights = true,
     .isOfSizes = true,
     .undefined = kObservedSumZero},
    {.key = {std::nullopt, "mean absolute error"},
     .description = "mean absolute error",
     .value = ofPairs<meanAbsoluteError>,
     .best = Best::smallest,
     .inObjective = asItIs,
     .takesWeights = true},
    {.key = {std::nullopt, "RSR"},
     .description = "root mean square error over the observed standard deviation",
     .value = ofPairs<standardisedRootMeanSquareError>,
     .best = Best::smallest,
     .inObjective = asItIs,
     .takesWeights = true,
     .undefined = kObservedConstant},
    {.key = {std::nullopt, "r2"},
     .description = "square of the correlation",
     .value = rSquared,
     .best = Best::largest,
     .inObjective = oneMinus,
     .takesWeights = true,
     .undefined = "either series does not vary"},
    {.key = {std::nullopt, "index of agreement"},
     .description = "index of agreement",
     .value = ofPairs<indexOfAgreement>,
     .best = Best::largest,
     .inObjective = oneMinus,
     .takesWeights = true,
     .undefined = "all values of both series are the same"},
    {.key = {std::nullopt, "peak error"},
     .description = "error of the largest value [%]",
     .value = ofPairs<peakError>,
     .best = Best::zero,
     .inObjective = share,
     .isOfSizes = true,
     .undefined = "the largest observed value is 0"},
    {.key = {std::nullopt, "time-to-peak error"},
     .description = "error of the time of the largest value [h]",
     .value = peakTimeErrorInHours,
     .best = Best::zero,
     .inObjective = magnitude},
    {.key = {std::nullopt, "volume error"},
     .description = "error of the volume [%]",
     .value = volumeErrorOfRuns,
     .best = Best::zero,
     .inObjective = share,
     .isOfSizes = true,
     .undefined = "there is one pair only, or the observed volume is 0"},
    {.key = {std::nullopt, "high-flow bias"},
     .description = "bias of the high segment of the duration curve [%]",
     .value = ofPairs<highFlowBias>,
     .best = Best::zero,
     .inObjective = share,
     .isOfSizes = true,
     .undefined = "the observed high values sum to 0"},
    {.key = {std::nullopt, "mid-slope bias"},
     .description = "bias of the slope of the middle segment of the duration curve [%]",
     .value = withEpsilon<middleSlopeBias>,
     .best = Best::zero,
     .inObjective = share,
     .usesEpsilon = true,
     .undefined = "the observed slope is 0, or a value plus epsilon is not positive"},
    {.key = {std::nullopt, "low-flow bias"},
     .description = "bias of the low segment of the duration curve [%, positive: too small]",
     .value = withEpsilon<lowFlowBias>,
     .best = Best::zero,
     .inObjective = share,
     .usesEpsilon = true,
     .undefined = "the observed low values do not vary, or a value plus epsilon is not positive"},
    {.key = {std::nullopt, "sum of squared errors"},
     .description = "sum of squared errors",
     .value = ofPairs<sumOfSquaredErrors>,
     .best = Best::smallest,
     .inObjective = asItIs,
     .takesWeights = true},
});

constexpr auto kNames = [] {
  std::array<CodeName, kTable.size()> names;
  std::transform(kTable.begin(), kTable.end(), names.begin(), [](const Statistic& row) { return row.key; });
  return names;
}();

/// StatisticType is an index into the table, and its enumerators are the codes.
constexpr bool codesArePlaces() {
  for (std::size_t i = 0; i < kTable.size(); ++i) {
    if (kTable[i].key.code && *kTable[i].key.code != static_cast<std::int32_t>(i)) return false;
  }
  return true;
}
static_assert(codesArePlaces());

std::string_view transformationName(ValueTransformation transformation) {
  return kValueTransformationNames[static_cast<std::size_t>(transformation)].name;
}

}  // namespace

std::span<const Statistic> statisticTable() {
  return kTable;
}

std::span<const CodeName> statisticNames() {
  return kNames;
}

const Statistic& statisticOf(StatisticType type) {
  return kTable.at(static_cast<std::size_t>(type));
}

bool isCriterion(const OutputMeasure& measure) {
  return measure.interfaceType == InterfaceType::timeSeries && !statisticOf(measure.statisticType).key.code;
}

double bestValue(const OutputMeasure& measure) {
  return statisticOf(measure.statisticType).best == Best::largest ? 1.0 : 0.0;
}

ValueTransformation transformationOf(const OutputMeasure& measure) {
  const ValueTransformation own = statisticOf(measure.statisticType).transformation;
  return own == ValueTransformation::none ? measure.transformation : own;
}

bool takesWeights(const OutputMeasure& measure) {
  return statisticOf(measure.statisticType).takesWeights && transformationOf(measure) != ValueTransformation::rank;
}

bool isWeightless(const OutputMeasure& measure) {
  const bool isOfFile = measure.interfaceType == InterfaceType::measureFile;
  const bool usesWeights = isOfFile ? measure.observedValue.has_value() : !isCriterion(measure);
  return usesWeights && measure.weight == 0.0 && measure.weightAbove == 0.0;
}

std::string describeStatistic(const OutputMeasure& measure) {
  std::string text(statisticOf(measure.statisticType).description);
  if (measure.transformation != ValueTransformation::none) {
    text += fmt::format(", transformed: {}", transformationName(measure.transformation));
  }
  return text;
}

std::string describeUndefined(const OutputMeasure& measure) {
  if (measure.interfaceType != InterfaceType::timeSeries) return {};
  std::string text(statisticOf(measure.statisticType).undefined);
  if (measure.transformation != ValueTransformation::none) {
    if (!text.empty()) text += ", or ";
    text += fmt::format("a value has no transformation '{}'", transformationName(measure.transformation));
  }
  return text.empty() ? text : fmt::format(", as it is if {}", text);
}

std::optional<StatisticType> findStatistic(std::string_view name) {
  for (std::size_t i = 0; i < kTable.size(); ++i) {
    if (equalIgnoringCase(kTable[i].key.name, name)) return static_cast<StatisticType>(i);
  }
  return std::nullopt;
}

}  // namespace mirevo

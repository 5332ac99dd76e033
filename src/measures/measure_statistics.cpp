#include "measures/measure_statistics.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <span>
#include <string>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/large_pages.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/statistics.h"
#include "measures/value_transformation.h"

namespace mirevo {

std::string listItems(const TimeSeriesObject& series) {
  std::string text;
  constexpr int kMostNames = 20;
  for (int item = 1; item <= std::min(series.itemCount(), kMostNames); ++item) {
    text += fmt::format("\n{}: {}", item, series.itemName(item));
  }
  if (series.itemCount() > kMostNames) text += fmt::format("\nand {} more", series.itemCount() - kMostNames);
  return text;
}

std::string describeSpan(const TimeSeriesObject& series, const std::string& fileName) {
  const std::span<const double> times = series.times();
  return fmt::format("{} begins {} and has {} time steps over {} days", fileName,
                     formatDate(series.startTime().value()), times.size(), formatReal(times.back() - times.front()));
}

std::string describeLackOfObservations(const TimeSeriesObject& series, int item, const std::string& fileName) {
  return fmt::format(
      "there is nothing to compare with: item No. {} ({}) of the observed {} has no value in the evaluation period",
      item, series.itemName(item), fileName);
}

namespace {

/// An item of an opened file, with its time axis.
struct SeriesItem {
  const TimeSeriesObject& series;
  int item;
  std::string fileName;
  DateRecord start;
  std::optional<float> deleteValue;
  std::optional<std::span<const double>> exact;  ///< its values in 64 bits; none where those in 32 bits are used
  std::vector<double> weights = {};              ///< one per step, 0 for a value that does not count; empty: each 1

  std::optional<double> valueFor(double time, std::size_t& hint, const TimeMatcher& matcher) const {
    if (exact) return matcher.exactValueAt(*exact, time, hint);
    return matcher.valueAt(item, time, hint);
  }
};

/// A span of time in days since the start of a file.
struct Period {
  double start;
  double end;
};

SeriesItem readItem(TimeSeriesObject& series, const SeriesReference& reference, SeriesPrecision precision) {
  const std::string name(trimTrailing(reference.fileName));
  requireItem(series, reference);
  const std::optional<DateRecord> start = series.startTime();
  if (!start) fatalError("Error getting time properties of TS object of file " + name, "the file has no time step");
  const std::optional<float> deleteValue = series.deleteValue();
  if (!deleteValue) fatalError("Error getting delete value of TS object of file " + name, series.lastError());
  if (series.times().size() != static_cast<std::size_t>(series.timeStepCount())) {
    fatalError("Error getting time step of TS object in " + name, series.lastError());
  }
  SeriesItem item{series, reference.itemNo, name, *start, deleteValue, std::nullopt};
  if (precision == SeriesPrecision::exact) item.exact = series.exactValues(reference.itemNo);
  return item;
}

/// The item of a measure's observations, of which some may not count.
SeriesItem readObservedItem(TimeSeriesObject& series, const OutputMeasure& measure, const EvaluationPeriod& period,
                            SeriesPrecision precision) {
  SeriesItem item = readItem(series, measure.observation, precision);
  item.weights = observationWeights(series, measure, period);
  return item;
}

Period periodOn(const DateRecord& axisStart, const EvaluationPeriod& period) {
  return {daysSince(axisStart, period.start), daysSince(axisStart, period.end)};
}

/// The weights of differences that are not positive, and of those that are, in the number in which all is computed.
template <class Number>
struct Weights {
  Number atOrBelow;
  Number above;

  /// The weighted difference of a simulated and an observed value.
  Number difference(double simulated, double observed) const {
    const Number e = static_cast<Number>(simulated) - static_cast<Number>(observed);
    return e <= 0 ? atOrBelow * e : above * e;
  }
};

std::string describeSpan(const SeriesItem& item) {
  return describeSpan(item.series, item.fileName);
}

/// If there are no observations in the period: that this, and not the simulated file, is at fault.
std::string describeLackOf(const MeasureStatistics& statistics, const SeriesItem& observation) {
  if (statistics.observationCount > 0) return {};
  return describeLackOfObservations(observation.series, observation.item, observation.fileName) + "\n";
}

/// Calls `use(time, observed, weight, simulated)` for every observation that counts for the measure and is not missing,
/// in order, with its time in days on the simulation's axis and its simulated value, if there is one; stops when that
/// is false.
template <typename Use>
void forEachObservation(const OutputMeasure& measure, const SeriesItem& simulation, const SeriesItem& observation,
                        const EvaluationPeriod& period, const Use& use) {
  const Period days = periodOn(simulation.start, countedPeriod(measure, period));
  const TimeMatcher matcher(measure.timeMatch, simulation.series, simulation.start, period.largestGapDays());
  const ObservationFilter filter(measure.selection, observation.start);
  // Observation times on the simulation's axis: one offset of whole seconds, so equal times differ by rounding only,
  // which is far below the tolerance for the same time.
  const double offset = daysSince(simulation.start, observation.start);
  const std::span<const double> times = observation.series.times();
  const std::span<const float> observed = observation.series.values(observation.item);
  std::size_t hint = 0;
  for (std::size_t k = 0; k < times.size(); ++k) {
    const double time = times[k] + offset;
    if (time < days.start - kSameTimeDays) continue;
    if (time > days.end + kSameTimeDays) break;
    if (isMissing(observed[k], observation.deleteValue) || !filter.counts(times[k], observed[k])) continue;
    const double weight = observation.weights.empty() ? 1.0 : observation.weights[k];
    if (weight == 0.0) continue;
    const double value = observation.exact ? (*observation.exact)[k] : observed[k];
    if (!use(time, value, weight, simulation.valueFor(time, hint, matcher))) break;
  }
}

/// The small value of Pushpalatha et al. (2012), doi:10.1016/j.jhydrol.2011.11.055, as a share of the observed mean.
constexpr double kShareOfMean = 0.01;

/// The pairs in the period, and the number and first time of the observations without a simulated value.
MeasureStatistics collectPairs(const OutputMeasure& measure, const SeriesItem& simulation,
                               const SeriesItem& observation, const EvaluationPeriod& period) {
  MeasureStatistics statistics;
  std::optional<double> firstUnused;
  double sumOfObserved = 0.0;
  for (auto* values : {&statistics.times, &statistics.simulatedValues, &statistics.observedValues}) {
    reserveToFill(*values, observation.series.times().size());
  }
  forEachObservation(measure, simulation, observation, period,
                     [&](double time, double observed, double weight, const std::optional<double>& simulated) {
                       ++statistics.observationCount;
                       sumOfObserved += observed;
                       if (simulated) {
                         statistics.times.push_back(time);
                         statistics.simulatedValues.push_back(*simulated);
                         statistics.observedValues.push_back(observed);
                         if (!observation.weights.empty()) statistics.weights.push_back(weight);
                       } else if (!firstUnused) {
                         firstUnused = time;
                       }
                       return true;
                     });
  if (statistics.simulatedValues.empty()) {
    fatalError(withNumber("Error: No simulated data found at observation times for item No. % in ", simulation.item) +
                   simulation.fileName,
               fmt::format("{}the evaluation period is {} to {}\n{}\n{}{}", describeLackOf(statistics, observation),
                           formatDate(period.start), formatDate(period.end), describeSpan(simulation),
                           describeSpan(observation),
                           measure.timeMatch.isUsual()
                               ? ""
                               : "\nobservations are compared with " + describeMatching(measure.timeMatch)));
  }
  // Of all observations, so that it is the same for every model run.
  statistics.epsilon = kShareOfMean * std::abs(sumOfObserved / static_cast<double>(statistics.observationCount));
  if (firstUnused) statistics.firstUnused = dateOfSecond(secondAfter(secondNumber(simulation.start), *firstUnused));
  return statistics;
}

/// Finds the pairs that are not joined with the one before, where observations are left out inside the period.
void addBreaks(const OutputMeasure& measure, const SeriesItem& simulation, const SeriesItem& observation,
               MeasureStatistics& statistics) {
  if (!measure.selection.leavesHoles()) return;
  const ObservationFilter filter(measure.selection, observation.start);
  const double offset = daysSince(simulation.start, observation.start);
  const std::span<const double> times = observation.series.times();
  const std::span<const float> values = observation.series.values(observation.item);
  std::size_t pair = 0;
  std::size_t before = 0;  // step of the previous pair
  bool isBroken = false;
  for (std::size_t k = 0; k < times.size() && pair < statistics.times.size(); ++k) {
    if (times[k] + offset < statistics.times[pair]) {
      isBroken = isBroken || (!isMissing(values[k], observation.deleteValue) && !filter.counts(times[k], values[k]));
      continue;
    }
    if (pair > 0 && (isBroken || !filter.isJoined(times[before], times[k]))) statistics.breaks.push_back(pair);
    isBroken = false;
    before = k;
    ++pair;
  }
}

/// Mean, root mean square and standard deviation over the pairs, in observation order, every operation in this number.
template <class Number>
void addDifferenceStatistics(const Weights<Number>& weights, MeasureStatistics& statistics) {
  Number sum = 0;
  Number sumOfSquares = 0;
  const ValuePairs pairs = comparedPairs(statistics);
  for (std::size_t i = 0; i < pairs.simulated.size(); ++i) {
    Number e = weights.difference(pairs.simulated[i], pairs.observed[i]);
    if (!pairs.weights.empty()) e *= static_cast<Number>(pairs.weights[i]);
    sum += e;
    sumOfSquares += e * e;
  }
  const auto n = static_cast<Number>(statistics.simulatedValues.size());
  const Number mean = sum / n;
  const Number rootMeanSquare = std::sqrt(sumOfSquares / n);
  const Number v = rootMeanSquare * rootMeanSquare - mean * mean;
  statistics.mean = mean;
  statistics.rootMeanSquare = rootMeanSquare;
  // If v is zero, or negative by rounding, the result is v itself: deliberately not clipped.
  statistics.standardDeviation = v > 0 ? std::sqrt(v) : v;
}

/// The values of observations, NaN for one that does not count; empty if all of them count.
std::vector<double> countingValues(const SeriesItem& observation) {
  std::vector<double> values;
  const std::span<const float> single = observation.series.values(observation.item);
  for (std::size_t k = 0; k < observation.weights.size(); ++k) {
    const double value = observation.exact ? (*observation.exact)[k] : single[k];
    values.push_back(observation.weights[k] == 0.0 ? std::numeric_limits<double>::quiet_NaN() : value);
  }
  return values;
}

/// Peak and low difference over the period, cut to the time span of the simulated series.
template <class Number>
void addPeakStatistics(const SeriesItem& simulation, const SeriesItem& observation, const EvaluationPeriod& period,
                       const Weights<Number>& weights, MeasureStatistics& statistics) {
  const std::span<const double> times = simulation.series.times();
  Period cut = periodOn(simulation.start, period);
  cut = {std::max(cut.start, times.front()), std::min(cut.end, times.back())};
  if (cut.end < cut.start) {
    fatalError("Error: Invalid time period defined for extracting max or min in " + simulation.fileName,
               fmt::format("the evaluation period is {} to {}\n{}", formatDate(period.start), formatDate(period.end),
                           describeSpan(simulation)));
  }
  const double offset = daysSince(observation.start, simulation.start);
  const Period observedCut{cut.start + offset, cut.end + offset};
  const std::vector<double> counting = countingValues(observation);
  const auto extract = [&counting](const auto& single, const auto& exact, const SeriesItem& item, const Period& span,
                                   std::string_view what) {
    std::optional<double> value;
    if (!item.weights.empty()) {
      value = exact(item.series.times(), counting, span.start, span.end);
    } else if (item.exact) {
      value = exact(item.series.times(), *item.exact, span.start, span.end);
    } else {
      value = single(item.series, item.item, span.start, span.end);
    }
    if (!value) {
      fatalError(
          fmt::format("Error extracting {} value of TS item in {}", what, item.fileName),
          fmt::format("item No. {} has no value that is not missing in the period\n{}", item.item, describeSpan(item)));
    }
    return *value;
  };
  const double observedMax = extract(extractMaxValue, exactMaxValue, observation, observedCut, "max");
  const double simulatedMax = extract(extractMaxValue, exactMaxValue, simulation, cut, "max");
  statistics.peakDifference = weights.difference(simulatedMax, observedMax);
  const double observedMin = extract(extractMinValue, exactMinValue, observation, observedCut, "min");
  const double simulatedMin = extract(extractMinValue, exactMinValue, simulation, cut, "min");
  statistics.lowDifference = weights.difference(simulatedMin, observedMin);
}

/// Where extremes of the files might be those of other observations, or of single steps instead of means.
template <class Number>
void addPeaksOfPairs(const Weights<Number>& weights, MeasureStatistics& statistics) {
  const auto [simulatedMin, simulatedMax] = std::ranges::minmax(statistics.simulatedValues);
  const auto [observedMin, observedMax] = std::ranges::minmax(statistics.observedValues);
  statistics.peakDifference = weights.difference(simulatedMax, observedMax);
  statistics.lowDifference = weights.difference(simulatedMin, observedMin);
}

void transformPairs(const OutputMeasure& measure, MeasureStatistics& statistics) {
  if (measure.epsilon) statistics.epsilon = *measure.epsilon;
  const ValueTransformation used = transformationOf(measure);
  if (used == ValueTransformation::none) return;
  const auto ofValues = [&](const std::vector<double>& values) {
    return transformed(values, used, statistics.epsilon, measure.boxCoxLambda);
  };
  statistics.transformed = TransformedPairs{ofValues(statistics.simulatedValues), ofValues(statistics.observedValues)};
}

}  // namespace

ValuePairs comparedPairs(const MeasureStatistics& statistics) {
  if (statistics.transformed) {
    return {statistics.transformed->simulatedValues, statistics.transformed->observedValues, statistics.weights};
  }
  return {statistics.simulatedValues, statistics.observedValues, statistics.weights};
}

void requireItem(TimeSeriesObject& series, const SeriesReference& reference) {
  const std::string name(trimTrailing(reference.fileName));
  if (reference.itemNo < 1 || reference.itemNo > series.itemCount()) {
    std::string detail =
        reference.itemLocation + "the file has " + countText(static_cast<std::size_t>(series.itemCount()), "item");
    detail += listItems(series);
    fatalError(withNumber("Error: Item No. % not found in ", reference.itemNo) + name, detail);
  }
  if (!series.getData(reference.itemNo)) {
    fatalError("Error getting data of TS item in " + name, series.lastError() + series.firstLines());
  }
}

MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation, double weight,
                                           double weightAbove, bool wantPeaks, SeriesPrecision precision) {
  const SeriesItem simulated = readItem(simulation, measure.simulation, precision);
  const SeriesItem observed = readObservedItem(observation, measure, period, precision);
  MeasureStatistics statistics = collectPairs(measure, simulated, observed, period);
  addBreaks(measure, simulated, observed, statistics);
  transformPairs(measure, statistics);
  const auto add = [&](const auto& weights) {
    addDifferenceStatistics(weights, statistics);
    if (!wantPeaks) return;
    if (measure.selection.leavesHoles() || !measure.timeMatch.isUsual()) {
      addPeaksOfPairs(weights, statistics);
    } else {
      addPeakStatistics(simulated, observed, countedPeriod(measure, period), weights, statistics);
    }
  };
  if (precision == SeriesPrecision::exact) {
    add(Weights<double>{weight, weightAbove});
  } else {
    add(Weights<float>{static_cast<float>(weight), static_cast<float>(weightAbove)});
  }
  return statistics;
}

MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation,
                                           SeriesPrecision precision) {
  return computeMeasureStatistics(measure, period, simulation, observation, measure.weight, measure.weightAbove,
                                  statisticOf(measure.statisticType).needsPeaks, precision);
}

bool hasPairs(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
              TimeSeriesObject& observation) {
  bool found = false;
  forEachObservation(measure, readItem(simulation, measure.simulation, SeriesPrecision::single),
                     readObservedItem(observation, measure, period, SeriesPrecision::single), period,
                     [&found](double, double, double, const std::optional<double>& simulated) {
                       found = simulated.has_value();
                       return !found;
                     });
  return found;
}

double selectStatistic(const MeasureStatistics& statistics, StatisticType type) {
  return statisticOf(type).value(statistics);
}

double valueAgainst(const ObservedSeries& observed, std::span<const double> simulated, const OutputMeasure& measure) {
  MeasureStatistics statistics;
  statistics.times = observed.days;
  statistics.simulatedValues.assign(simulated.begin(), simulated.end());
  statistics.observedValues = observed.values;
  statistics.weights = observed.weights;
  statistics.observationCount = observed.values.size();
  statistics.epsilon = kShareOfMean * std::abs(meanOf(observed.values));
  transformPairs(measure, statistics);
  addDifferenceStatistics(Weights<double>{measure.weight, measure.weightAbove}, statistics);
  return selectStatistic(statistics, measure.statisticType);
}

double measureValue(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
                    TimeSeriesObject& observation, SeriesPrecision precision) {
  return selectStatistic(computeMeasureStatistics(measure, period, simulation, observation, precision),
                         measure.statisticType);
}

}  // namespace mirevo

#include "measures/measure_statistics.h"

#include <algorithm>
#include <cmath>
#include <span>
#include <string>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/statistics.h"

namespace mirevo {
namespace {

/// An item of an opened file, with its time axis.
struct SeriesItem {
  const TimeSeriesObject& series;
  int item;
  std::string fileName;
  DateRecord start;
  std::optional<float> deleteValue;
};

/// A span of time in days since the start of a file.
struct Period {
  double start;
  double end;
};

SeriesItem readItem(TimeSeriesObject& series, const SeriesReference& reference) {
  const std::string name(trimTrailing(reference.fileName));
  requireItem(series, reference);
  const std::optional<DateRecord> start = series.startTime();
  if (!start) fatalError("Error getting time properties of TS object of file " + name, "the file has no time step");
  const std::optional<float> deleteValue = series.deleteValue();
  if (!deleteValue) fatalError("Error getting delete value of TS object of file " + name, series.lastError());
  if (series.times().size() != static_cast<std::size_t>(series.timeStepCount())) {
    fatalError("Error getting time step of TS object in " + name, series.lastError());
  }
  return {series, reference.itemNo, name, *start, deleteValue};
}

Period periodOn(const DateRecord& axisStart, const EvaluationPeriod& period) {
  return {daysSince(axisStart, period.start), daysSince(axisStart, period.end)};
}

/// The weighted difference of a simulated and an observed value.
float weightedDifference(float simulated, float observed, float weight, float weightAbove) {
  const float difference = simulated - observed;
  return difference <= 0.0F ? weight * difference : weightAbove * difference;
}

std::string describeSpan(const SeriesItem& item) {
  const std::span<const double> times = item.series.times();
  return fmt::format("{} begins {} and has {} time steps over {} days", item.fileName, formatDate(item.start),
                     times.size(), formatReal(times.back() - times.front()));
}

/// If there are no observations in the period: that this, and not the simulated file, is at fault.
std::string describeLackOf(const MeasureStatistics& statistics, const SeriesItem& observation) {
  if (statistics.observationCount > 0) return {};
  return fmt::format(
      "there is nothing to compare with: item No. {} ({}) of the observed {} has no value in the "
      "evaluation period\n",
      observation.item, observation.series.itemName(observation.item), observation.fileName);
}

/// Calls `use(time, observed, simulated)` for every observation in the period that is not missing, in order, with
/// its time in days on the simulation's axis and the simulated value there, if there is one; stops when that is false.
template <typename Use>
void forEachObservation(const SeriesItem& simulation, const SeriesItem& observation, const EvaluationPeriod& period,
                        const Use& use) {
  const Period days = periodOn(simulation.start, period);
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
    if (isMissing(observed[k], observation.deleteValue)) continue;
    if (!use(time, observed[k], valueAt(simulation.series, simulation.item, time, hint, period.largestGapDays())))
      break;
  }
}

/// The pairs in the period, and the number and first time of the observations without a simulated value.
MeasureStatistics collectPairs(const SeriesItem& simulation, const SeriesItem& observation,
                               const EvaluationPeriod& period) {
  MeasureStatistics statistics;
  std::optional<double> firstUnused;
  forEachObservation(simulation, observation, period,
                     [&](double time, float observed, const std::optional<float>& simulated) {
                       ++statistics.observationCount;
                       if (simulated) {
                         statistics.times.push_back(time);
                         statistics.simulatedValues.push_back(*simulated);
                         statistics.observedValues.push_back(observed);
                       } else if (!firstUnused) {
                         firstUnused = time;
                       }
                       return true;
                     });
  if (statistics.simulatedValues.empty()) {
    fatalError(withNumber("Error: No simulated data found at observation times for item No. % in ", simulation.item) +
                   simulation.fileName,
               fmt::format("{}the evaluation period is {} to {}\n{}\n{}", describeLackOf(statistics, observation),
                           formatDate(period.start), formatDate(period.end), describeSpan(simulation),
                           describeSpan(observation)));
  }
  if (firstUnused) {
    constexpr double kDaySeconds = 86400.0;
    statistics.firstUnused = dateOfSecond(secondNumber(simulation.start) + std::llround(*firstUnused * kDaySeconds));
  }
  return statistics;
}

/// Mean, root mean square and standard deviation over the pairs. Deliberately in single precision and in observation
/// order.
void addDifferenceStatistics(float weight, float weightAbove, MeasureStatistics& statistics) {
  float sum = 0.0F;
  float sumOfSquares = 0.0F;
  for (std::size_t i = 0; i < statistics.simulatedValues.size(); ++i) {
    const float e =
        weightedDifference(statistics.simulatedValues[i], statistics.observedValues[i], weight, weightAbove);
    sum += e;
    sumOfSquares += e * e;
  }
  const auto n = static_cast<float>(statistics.simulatedValues.size());
  statistics.mean = sum / n;
  statistics.rootMeanSquare = std::sqrt(sumOfSquares / n);
  const float v = statistics.rootMeanSquare * statistics.rootMeanSquare - statistics.mean * statistics.mean;
  // If v is zero, or negative by rounding, the result is v itself: deliberately not clipped.
  statistics.standardDeviation = v > 0.0F ? std::sqrt(v) : v;
}

/// Peak and low difference over the period, cut to the time span of the simulated series.
void addPeakStatistics(const SeriesItem& simulation, const SeriesItem& observation, const EvaluationPeriod& period,
                       float weight, float weightAbove, MeasureStatistics& statistics) {
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
  const auto extract = [](auto&& extractValue, const SeriesItem& item, const Period& span, std::string_view what) {
    const std::optional<float> value = extractValue(item.series, item.item, span.start, span.end);
    if (!value) {
      fatalError(
          fmt::format("Error extracting {} value of TS item in {}", what, item.fileName),
          fmt::format("item No. {} has no value that is not missing in the period\n{}", item.item, describeSpan(item)));
    }
    return *value;
  };
  const float observedMax = extract(extractMaxValue, observation, observedCut, "max");
  const float simulatedMax = extract(extractMaxValue, simulation, cut, "max");
  statistics.peakDifference = weightedDifference(simulatedMax, observedMax, weight, weightAbove);
  const float observedMin = extract(extractMinValue, observation, observedCut, "min");
  const float simulatedMin = extract(extractMinValue, simulation, cut, "min");
  statistics.lowDifference = weightedDifference(simulatedMin, observedMin, weight, weightAbove);
}

}  // namespace

void requireItem(TimeSeriesObject& series, const SeriesReference& reference) {
  const std::string name(trimTrailing(reference.fileName));
  if (reference.itemNo < 1 || reference.itemNo > series.itemCount()) {
    std::string detail = reference.itemLocation +
                         fmt::format("the file has {} item{}", series.itemCount(), series.itemCount() == 1 ? "" : "s");
    constexpr int kMostNames = 20;
    for (int item = 1; item <= std::min(series.itemCount(), kMostNames); ++item) {
      detail += fmt::format("\n{}: {}", item, series.itemName(item));
    }
    fatalError(withNumber("Error: Item No. % not found in ", reference.itemNo) + name, detail);
  }
  if (!series.getData(reference.itemNo)) fatalError("Error getting data of TS item in " + name, series.lastError());
}

MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation, float weight,
                                           float weightAbove, bool wantPeaks) {
  const SeriesItem simulated = readItem(simulation, measure.simulation);
  const SeriesItem observed = readItem(observation, measure.observation);
  MeasureStatistics statistics = collectPairs(simulated, observed, period);
  addDifferenceStatistics(weight, weightAbove, statistics);
  if (wantPeaks) addPeakStatistics(simulated, observed, period, weight, weightAbove, statistics);
  return statistics;
}

MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation) {
  return computeMeasureStatistics(measure, period, simulation, observation, static_cast<float>(measure.weight),
                                  static_cast<float>(measure.weightAbove),
                                  statisticOf(measure.statisticType).needsPeaks);
}

bool hasPairs(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
              TimeSeriesObject& observation) {
  bool found = false;
  forEachObservation(readItem(simulation, measure.simulation), readItem(observation, measure.observation), period,
                     [&found](double, float, const std::optional<float>& simulated) {
                       found = simulated.has_value();
                       return !found;
                     });
  return found;
}

double selectStatistic(const MeasureStatistics& statistics, StatisticType type) {
  const Statistic& statistic = statisticOf(type);
  return statistic.inObjective(statistic.value(statistics));
}

double measureValue(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
                    TimeSeriesObject& observation) {
  return selectStatistic(computeMeasureStatistics(measure, period, simulation, observation), measure.statisticType);
}

}  // namespace mirevo

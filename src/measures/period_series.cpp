#include "measures/period_series.h"

#include <algorithm>
#include <limits>
#include <optional>

#include "common/calendar.h"
#include "measures/dates.h"
#include "measures/measure_statistics.h"
#include "platform/series/form_meaning.h"

namespace mirevo {
namespace {

/// `weights`: one per step, 0 for one that is taken as missing; empty: each 1.

PeriodSeries readSteps(TimeSeriesObject& series, const SeriesReference& reference, const EvaluationPeriod& period,
                       std::span<const double> weights) {
  requireItem(series, reference);
  PeriodSeries read;
  const std::optional<DateRecord> start = series.startTime();
  if (!start) return read;
  const std::int64_t origin = secondNumber(*start);
  const std::span<const double> times = series.times();
  const std::span<const float> values = series.values(reference.itemNo);
  const auto dayOf = [origin](const DateRecord& date) {
    return static_cast<double>(secondNumber(date) - origin) / kSecondsPerDay;
  };
  auto first = std::upper_bound(times.begin(), times.end(), dayOf(period.start));
  if (first != times.begin()) --first;
  auto last = std::lower_bound(first, times.end(), dayOf(period.end));
  if (last != times.end()) ++last;
  const std::optional<float> deleteValue = series.deleteValue();
  for (auto time = first; time != last; ++time) {
    const std::int64_t second = secondAfter(origin, *time);
    if (!read.seconds.empty() && second <= read.seconds.back()) continue;  // a step of less than a second
    const auto step = static_cast<std::size_t>(time - times.begin());
    const float value = values[step];
    const bool isLeftOut = !weights.empty() && weights[step] == 0.0;
    read.seconds.push_back(second);
    read.values.push_back(isLeftOut || isMissing(value, deleteValue) ? std::numeric_limits<float>::quiet_NaN() : value);
  }
  return read;
}

/// By their numbers where both are known, as a name may be written in several ways.
bool isSameItem(const SeriesReference& a, const SeriesReference& b) {
  const auto isKnown = [](const SeriesReference& item) { return item.itemName.empty() || item.hasItemNo; };
  return isKnown(a) && isKnown(b) ? a.itemNo == b.itemNo : a.itemName == b.itemName;
}

bool isSameSeries(const SeriesReference& a, const SeriesReference& b) {
  return isSameItem(a, b) && a.fileName == b.fileName && a.listing == b.listing &&
         isReadAlike(a.fileName, a.form, b.form);
}

std::vector<std::size_t> firstOfEach(std::span<const OutputMeasure> measures,
                                     bool (*isSame)(const OutputMeasure&, const OutputMeasure&)) {
  std::vector<std::size_t> distinct;
  for (std::size_t i = 0; i < measures.size(); ++i) {
    if (measures[i].interfaceType != InterfaceType::timeSeries) continue;
    const bool isRepeated = std::any_of(distinct.begin(), distinct.end(),
                                        [&](std::size_t other) { return isSame(measures[i], measures[other]); });
    if (!isRepeated) distinct.push_back(i);
  }
  return distinct;
}

}  // namespace

PeriodSeries readPeriodSeries(TimeSeriesObject& series, const SeriesReference& reference,
                              const EvaluationPeriod& period) {
  return readSteps(series, reference, period, {});
}

PeriodSeries readPeriodObservations(TimeSeriesObject& series, const OutputMeasure& measure,
                                    const EvaluationPeriod& period) {
  return readSteps(series, measure.observation, period, stepWeights(series, measure));
}

std::vector<float> valuesAt(const PeriodSeries& series, std::span<const std::int64_t> seconds, double largestGap) {
  const double largestWidth = (largestGap + kSameTimeDays) * kSecondsPerDay;
  std::vector<float> values(seconds.size(), std::numeric_limits<float>::quiet_NaN());
  std::size_t next = 0;  // first step that is not before the time
  for (std::size_t i = 0; i < seconds.size(); ++i) {
    while (next < series.seconds.size() && series.seconds[next] < seconds[i]) ++next;
    if (next == series.seconds.size()) break;
    if (series.seconds[next] == seconds[i]) {
      values[i] = series.values[next];
    } else if (next > 0) {
      const auto before = static_cast<double>(seconds[i] - series.seconds[next - 1]);
      const auto width = static_cast<double>(series.seconds[next] - series.seconds[next - 1]);
      if (width > largestWidth) continue;
      const double below = series.values[next - 1];
      values[i] = static_cast<float>(below + (series.values[next] - below) * before / width);
    }
  }
  return values;
}

bool isSameItems(const OutputMeasure& a, const OutputMeasure& b) {
  return isSameSeries(a.simulation, b.simulation) && isSameSeries(a.observation, b.observation);
}

bool isMatchedAlike(const OutputMeasure& a, const OutputMeasure& b) {
  return isSameItems(a, b) && a.timeMatch == b.timeMatch && hasSameMissingValues(a.simulation.form, b.simulation.form);
}

bool isSamePair(const OutputMeasure& a, const OutputMeasure& b) {
  return isMatchedAlike(a, b) && a.selection.isSameAs(b.selection) && a.weighting == b.weighting &&
         hasSameMissingValues(a.observation.form, b.observation.form);
}

std::vector<std::size_t> measuresOfDistinctPairs(std::span<const OutputMeasure> measures) {
  std::vector<std::size_t> distinct = firstOfEach(measures, isSamePair);
  return distinct.size() > kMostShownPairs ? firstOfEach(measures, isMatchedAlike) : distinct;
}

std::size_t pairsShownWithOthers(std::span<const OutputMeasure> measures) {
  return firstOfEach(measures, isSamePair).size() - measuresOfDistinctPairs(measures).size();
}

}  // namespace mirevo

#include "measures/observed_series.h"

#include <algorithm>
#include <array>
#include <limits>
#include <optional>
#include <span>

#include "measures/dates.h"
#include "measures/measure_statistics.h"

namespace mirevo {

ObservedSeries readObservedSeries(std::size_t index, const OutputMeasure& measure, const EvaluationPeriod& period,
                                  SeriesPrecision precision, TimeSeriesObject& observation) {
  ObservedSeries observed;
  observed.measure = index;
  requireItem(observation, measure.observation);
  const std::optional<DateRecord> start = observation.startTime();
  if (!start) return observed;
  observed.start = *start;
  const EvaluationPeriod counted = countedPeriod(measure, period);
  const double first = daysSince(*start, counted.start) - kSameTimeDays;
  const double last = daysSince(*start, counted.end) + kSameTimeDays;
  const ObservationFilter filter(measure.selection, *start);
  const std::span<const double> times = observation.times();
  const std::span<const float> values = observation.values(measure.observation.itemNo);
  std::span<const double> exact;
  if (precision == SeriesPrecision::exact) exact = observation.exactValues(measure.observation.itemNo);
  const std::vector<double> weights = observationWeights(observation, measure, period);
  for (std::size_t k = 0; k < times.size(); ++k) {
    if (times[k] < first || times[k] > last || isMissing(values[k], observation.deleteValue())) continue;
    if (!weights.empty() && weights[k] == 0.0) continue;
    if (!filter.counts(times[k], values[k])) continue;
    observed.days.push_back(times[k]);
    if (!weights.empty()) observed.weights.push_back(weights[k]);
    observed.values.push_back(precision == SeriesPrecision::exact ? exact[k] : values[k]);
  }
  return observed;
}

double usualMarkerAmong(std::span<const double> values) {
  constexpr std::array<float, 11> kMarkers = {-99.0F,  -999.0F, -9999.0F, -99999.0F, -999999.0F, -99.9F,
                                              -99.99F, -999.9F, -999.99F, -9999.9F,  -9999.99F};
  std::array<std::size_t, kMarkers.size()> counts{};
  double least = std::numeric_limits<double>::infinity();  // of the other values
  for (const double value : values) {
    const auto* const found = std::find(kMarkers.begin(), kMarkers.end(), static_cast<float>(value));
    if (found == kMarkers.end()) {
      least = std::min(least, value);
    } else {
      ++counts[static_cast<std::size_t>(found - kMarkers.begin())];
    }
  }
  const auto most = static_cast<std::size_t>(std::max_element(counts.begin(), counts.end()) - counts.begin());
  if (counts[most] == 0 || !(kMarkers[most] < least)) return std::numeric_limits<double>::quiet_NaN();
  return kMarkers[most];
}

std::size_t simulatedValueCount(std::span<const ObservedSeries> observed, SeriesPrecision precision) {
  std::size_t count = 0;
  for (const ObservedSeries& series : observed) count += series.values.size();
  return precision == SeriesPrecision::exact ? 2 * count : count;
}

void appendSimulatedValues(const ObservedSeries& observed, const OutputMeasure& measure, SeriesPrecision precision,
                           double largestGap, TimeSeriesObject& simulation, std::vector<double>& values) {
  requireItem(simulation, measure.simulation);
  const std::optional<DateRecord> start = simulation.startTime();
  const double offset = start ? daysSince(*start, observed.start) : 0.0;
  const int item = measure.simulation.itemNo;
  const TimeMatcher matcher(measure.timeMatch, simulation, start.value_or(observed.start), largestGap);
  const auto append = [&](const auto& valueAtTime) {
    std::size_t hint = 0;
    for (const double days : observed.days) {
      const std::optional<double> value = start ? valueAtTime(days + offset, hint) : std::nullopt;
      values.push_back(value.value_or(std::numeric_limits<double>::quiet_NaN()));
    }
  };
  if (precision == SeriesPrecision::single) {
    append([&](double days, std::size_t& hint) -> std::optional<double> { return matcher.valueAt(item, days, hint); });
    return;
  }
  const auto appendExact = [&](std::span<const double> series) {
    append([&](double days, std::size_t& hint) { return matcher.exactValueAt(series, days, hint); });
  };
  appendExact(simulation.exactValues(item));
  appendExact(simulation.units(item));
}

}  // namespace mirevo

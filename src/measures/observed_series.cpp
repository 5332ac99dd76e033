#include "measures/observed_series.h"

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
  const double first = daysSince(*start, period.start) - kSameTimeDays;
  const double last = daysSince(*start, period.end) + kSameTimeDays;
  const std::span<const double> times = observation.times();
  const std::span<const float> values = observation.values(measure.observation.itemNo);
  std::span<const double> exact;
  if (precision == SeriesPrecision::exact) exact = observation.exactValues(measure.observation.itemNo);
  for (std::size_t k = 0; k < times.size(); ++k) {
    if (times[k] < first || times[k] > last || isMissing(values[k], observation.deleteValue())) continue;
    observed.days.push_back(times[k]);
    observed.values.push_back(precision == SeriesPrecision::exact ? exact[k] : values[k]);
  }
  return observed;
}

void appendSimulatedValues(const ObservedSeries& observed, const OutputMeasure& measure, SeriesPrecision precision,
                           TimeSeriesObject& simulation, std::vector<double>& values) {
  requireItem(simulation, measure.simulation);
  const std::optional<DateRecord> start = simulation.startTime();
  const double offset = start ? daysSince(*start, observed.start) : 0.0;
  std::size_t hint = 0;
  std::span<const double> exact;
  if (precision == SeriesPrecision::exact) exact = simulation.exactValues(measure.simulation.itemNo);
  for (const double days : observed.days) {
    std::optional<double> value;
    if (start && precision == SeriesPrecision::exact) {
      value = exactValueAt(simulation.times(), exact, days + offset, hint);
    } else if (start) {
      value = valueAt(simulation, measure.simulation.itemNo, days + offset, hint);
    }
    values.push_back(value ? *value : std::numeric_limits<double>::quiet_NaN());
  }
}

}  // namespace mirevo

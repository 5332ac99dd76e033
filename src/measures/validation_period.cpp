#include "measures/validation_period.h"

#include <cmath>
#include <limits>
#include <string_view>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/measure_statistics.h"
#include "measures/observed_series.h"

namespace mirevo {
namespace {

/// Without the time of day if that is the beginning of the day.
std::string dayOf(const DateRecord& date) {
  constexpr std::string_view kMidnight = " 00:00";
  std::string text = formatDate(date);
  if (text.ends_with(kMidnight)) text.resize(text.size() - kMidnight.size());
  return text;
}

}  // namespace

std::vector<ValidationTarget> validationTargets(std::span<const OutputMeasure> measures,
                                                std::span<const ValidationPeriod> periods) {
  std::vector<ValidationTarget> targets;
  for (std::size_t period = 0; period < periods.size(); ++period) {
    for (std::size_t i = 0; i < measures.size(); ++i) {
      if (measures[i].interfaceType == InterfaceType::timeSeries) targets.push_back({i, period});
    }
  }
  return targets;
}

std::vector<std::string> validationNames(std::span<const OutputMeasure> measures,
                                         std::span<const ValidationPeriod> periods) {
  std::vector<std::string> names;
  for (const auto& [measure, period] : validationTargets(measures, periods)) {
    names.push_back(fmt::format("{} in {}", trimTrailing(measures[measure].name), periods[period].name));
  }
  return names;
}

std::string namedByDates(const ValidationPeriod& period) {
  return fmt::format("{} to {}", dayOf(period.start), dayOf(period.end));
}

EvaluationPeriod judgedAs(const ValidationPeriod& period, const EvaluationPeriod& evaluation) {
  EvaluationPeriod judged = evaluation;
  judged.start = period.start;
  judged.end = period.end;
  judged.warmUpDays = 0.0;
  return judged;
}

EvaluationPeriod hullOf(const EvaluationPeriod& evaluation, std::span<const ValidationPeriod> periods) {
  EvaluationPeriod hull = evaluation;
  for (const ValidationPeriod& period : periods) {
    if (daysSince(hull.start, period.start) < 0.0) hull.start = period.start;
    if (daysSince(hull.end, period.end) > 0.0) hull.end = period.end;
  }
  return hull;
}

ValidationValue validationValue(const OutputMeasure& measure, const EvaluationPeriod& period,
                                TimeSeriesObject& simulation, TimeSeriesObject& observation) {
  ValidationValue found{.value = std::numeric_limits<double>::quiet_NaN()};
  try {
    if (!hasPairs(measure, period, simulation, observation)) {
      found.missingCount = readObservedSeries(0, measure, period, SeriesPrecision::single, observation).values.size();
      return found;
    }
    const MeasureStatistics statistics = computeMeasureStatistics(measure, period, simulation, observation);
    found.pairCount = statistics.simulatedValues.size();
    found.missingCount = statistics.observationCount - found.pairCount;
    found.firstUnused = statistics.firstUnused;
    const double value = selectStatistic(statistics, measure.statisticType);
    if (std::isfinite(value)) found.value = value;
  } catch (const FatalError&) {  // no reason to end a run: nothing depends on the value
  }
  return found;
}

}  // namespace mirevo

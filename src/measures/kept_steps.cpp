#include "measures/kept_steps.h"

#include <cstdint>
#include <iterator>
#include <limits>
#include <map>
#include <string>
#include <string_view>
#include <tuple>
#include <utility>
#include <vector>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/checksum.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/series_tables.h"

namespace mirevo {
namespace {

/// Each secondNumber() between `first` and `last`, both included, that is one of a step.
std::vector<std::int64_t> readSteps(const SeriesReference& simulation, const DateRecord& first,
                                    const DateRecord& last) {
  const auto series = openTimeSeries(simulation);
  std::vector<std::int64_t> seconds;
  if (const auto start = series->startTime()) {
    for (const double days : series->times()) {
      const std::int64_t second = secondAfter(secondNumber(*start), days);
      if (second >= secondNumber(first) && second <= secondNumber(last)) seconds.push_back(second);
    }
  }
  if (seconds.empty()) {
    fatalError("Error: No simulated steps for the band in " + std::string(trimTrailing(simulation.fileName)),
               fmt::format("{}The times of 'steps' are taken from this file as it is in the model's folder, and there "
                           "it has no time step from {} to {}\nRun the model in its folder, or select 'observations'",
                           simulation.fileLocation, formatDate(first), formatDate(last)));
  }
  return seconds;
}

/// Steps at the second of an observation, or of another step, are not added.
void addTimes(std::span<const std::int64_t> steps, ObservedSeries& observed) {
  if (observed.days.empty()) observed.start = dateOfSecond(steps.front());
  const std::int64_t origin = secondNumber(observed.start);
  std::vector<double> days;
  std::vector<double> values;
  std::vector<double> weights;
  std::int64_t last = std::numeric_limits<std::int64_t>::min();
  std::size_t next = 0;  // observation
  const auto addObservation = [&] {
    days.push_back(observed.days[next]);
    values.push_back(observed.values[next]);
    if (!observed.weights.empty()) weights.push_back(observed.weights[next]);
    last = secondAfter(origin, observed.days[next++]);
  };
  for (const std::int64_t step : steps) {
    while (next < observed.days.size() && secondAfter(origin, observed.days[next]) <= step) addObservation();
    if (step <= last) continue;
    days.push_back(static_cast<double>(step - origin) / kSecondsPerDay);
    values.push_back(std::numeric_limits<double>::quiet_NaN());
    if (!observed.weights.empty()) weights.push_back(0.0);
    last = step;
  }
  while (next < observed.days.size()) addObservation();
  observed.days = std::move(days);
  observed.values = std::move(values);
  observed.weights = std::move(weights);
}

}  // namespace

void addSimulatedSteps(const KeptSteps& kept, std::span<const OutputMeasure> measures, const EvaluationPeriod& period,
                       std::span<ObservedSeries> observed) {
  // By file and form.
  std::map<std::tuple<std::string, TextForm, const void*>, std::vector<std::int64_t>> steps;
  for (ObservedSeries& series : observed) {
    const OutputMeasure& measure = measures[series.measure];
    if (!measure.timeMatch.isUsual()) continue;  // its times are those of the observations
    const SeriesReference& simulation = measure.simulation;
    std::vector<std::int64_t>& ofFile = steps[{simulation.fileName, simulation.form, simulation.listing.get()}];
    if (ofFile.empty()) ofFile = readSteps(simulation, period.start, kept.end.value_or(period.end));
    addTimes(ofFile, series);
  }
}

std::uint64_t checksumOfTimes(std::span<const ObservedSeries> observed) {
  std::vector<std::int64_t> seconds;
  for (const ObservedSeries& series : observed) {
    seconds.push_back(std::ssize(series.days));
    for (const double days : series.days) seconds.push_back(secondAfter(secondNumber(series.start), days));
  }
  return checksumOf({reinterpret_cast<const char*>(seconds.data()), seconds.size() * sizeof(std::int64_t)});
}

}  // namespace mirevo

#include "measures/time_match.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <vector>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/measure_statistics.h"
#include "measures/output_measure.h"
#include "measures/period_series.h"

namespace mirevo {
namespace {

constexpr double kHoursPerDay = 24.0;
constexpr double kSecondsPerHour = 3600.0;
/// Two steps farther apart than so many usual ones have a missing step between them.
constexpr double kLargestRatio = 1.5;

/// Seconds of the 00:00 of the day.
std::int64_t midnightOf(std::int64_t second) {
  const std::int64_t ofDay = second % kSecondsOfDay;
  return second - (ofDay < 0 ? ofDay + kSecondsOfDay : ofDay);
}

double medianStep(std::span<const double> times) {
  std::vector<double> steps;
  for (std::size_t i = 1; i < times.size(); ++i) steps.push_back(times[i] - times[i - 1]);
  if (steps.empty()) return 0.0;
  const auto middle = steps.begin() + static_cast<std::ptrdiff_t>(steps.size() / 2);
  std::nth_element(steps.begin(), middle, steps.end());
  return *middle;
}

DateRecord shifted(const DateRecord& date, double seconds) {
  return dateOfSecond(secondNumber(date) + std::llround(seconds));
}

/// The observed times of the period, those without a value included, and the times of day of `observed` on days that
/// have none.
std::vector<std::int64_t> timesOfDays(const PeriodSeries& observed, const EvaluationPeriod& period) {
  std::vector<std::int64_t> seconds = observed.seconds;
  const std::int64_t timeOfDay = seconds.empty() ? 0 : seconds.front() - midnightOf(seconds.front());
  std::size_t next = 0;
  const std::size_t count = seconds.size();
  const std::int64_t last = secondNumber(period.end);
  for (std::int64_t day = midnightOf(secondNumber(period.start)); day <= last; day += kSecondsOfDay) {
    while (next < count && seconds[next] < day) ++next;
    if (next == count || seconds[next] >= day + kSecondsOfDay) seconds.push_back(day + timeOfDay);
  }
  std::sort(seconds.begin(), seconds.end());
  return seconds;
}

}  // namespace

TimeMatcher::TimeMatcher(const TimeMatching& matching, const TimeSeriesObject& simulation, const DateRecord& start,
                         double largestGap)
    : matching_(matching),
      simulation_(simulation),
      times_(simulation.times()),
      deleteValue_(simulation.deleteValue()),
      start_(secondNumber(start)),
      largestGap_(matching.kind == TimeMatch::exact ? 0.0 : largestGap) {
  if (matching.kind == TimeMatch::mean) usualStep_ = medianStep(times_);
}

std::optional<float> TimeMatcher::valueAt(int item, double days, std::size_t& hint) const {
  if (matching_.kind == TimeMatch::mean) {
    const auto mean = dayMean(simulation_.values(item), deleteValue_, days);
    return mean ? std::optional(static_cast<float>(*mean)) : std::nullopt;
  }
  return mirevo::valueAt(times_, simulation_.values(item), deleteValue_, days + matching_.offsetHours / kHoursPerDay,
                         hint, largestGap_);
}

std::optional<double> TimeMatcher::exactValueAt(std::span<const double> values, double days, std::size_t& hint) const {
  if (matching_.kind == TimeMatch::mean) return dayMean(values, std::nullopt, days);
  const double time = days + matching_.offsetHours / kHoursPerDay;
  return mirevo::exactValueAt(times_, values, time, hint, largestGap_);
}

/// The mean of the steps from the beginning of the day on and before its end. Each step is taken to reach to the next
/// one, so that the day is covered if none is missing at its beginning, inside it or at its end.
template <class Value>
std::optional<double> TimeMatcher::dayMean(std::span<const Value> values, std::optional<float> deleteValue,
                                           double days) const {
  const double hours = matching_.dayBeginsHours - (matching_.dayStamp == DayStamp::end ? kHoursPerDay : 0.0);
  const std::int64_t midnight = midnightOf(secondAfter(start_, days));
  const double begin =
      (static_cast<double>(midnight - start_) + (hours + matching_.offsetHours) * kSecondsPerHour) / kSecondsPerDay;
  const double end = begin + 1.0;
  const std::span<const double> times = times_;
  const auto first = std::lower_bound(times.begin(), times.end(), begin - kSameTimeDays);
  const auto stop = std::lower_bound(first, times.end(), end - kSameTimeDays);
  if (first == stop || *first - begin > std::max(usualStep_ - kSameTimeDays, kSameTimeDays) ||
      end - *(stop - 1) > usualStep_ + kSameTimeDays) {
    return std::nullopt;
  }
  double sum = 0.0;
  for (auto time = first; time != stop; ++time) {
    if (time != first && *time - *(time - 1) > kLargestRatio * usualStep_) return std::nullopt;
    const Value value = values[static_cast<std::size_t>(time - times.begin())];
    if (isMissing(value, deleteValue)) return std::nullopt;
    sum += value;
  }
  return sum / static_cast<double>(stop - first);
}

PeriodSeries readMatchedSeries(TimeSeriesObject& simulation, TimeSeriesObject& observation,
                               const OutputMeasure& measure, const EvaluationPeriod& period) {
  const TimeMatching& matching = measure.timeMatch;
  if (matching.isUsual()) return readPeriodSeries(simulation, measure.simulation, period);
  const PeriodSeries observed = readPeriodSeries(observation, measure.observation, period);
  const double offset = matching.offsetHours * kSecondsPerHour;
  PeriodSeries matched;
  if (matching.kind != TimeMatch::mean) {
    EvaluationPeriod simulated = period;
    simulated.start = shifted(period.start, offset);
    simulated.end = shifted(period.end, offset);
    matched = readPeriodSeries(simulation, measure.simulation, simulated);
    for (std::int64_t& second : matched.seconds) second -= std::llround(offset);
    if (matching.kind == TimeMatch::interpolate) return matched;
  }
  std::vector<std::int64_t> seconds = matched.seconds;
  const std::vector<std::int64_t> more =
      matching.kind == TimeMatch::mean ? timesOfDays(observed, period) : observed.seconds;
  seconds.insert(seconds.end(), more.begin(), more.end());
  std::sort(seconds.begin(), seconds.end());
  seconds.erase(std::unique(seconds.begin(), seconds.end()), seconds.end());
  if (matching.kind == TimeMatch::exact) return {seconds, valuesAt(matched, seconds, 0.0)};

  requireItem(simulation, measure.simulation);
  const std::optional<DateRecord> start = simulation.startTime();
  matched.seconds = seconds;
  matched.values.assign(seconds.size(), std::numeric_limits<float>::quiet_NaN());
  if (!start) return matched;
  const TimeMatcher matcher(matching, simulation, *start, period.largestGapDays());
  std::size_t hint = 0;
  for (std::size_t i = 0; i < seconds.size(); ++i) {
    const double days = static_cast<double>(seconds[i] - secondNumber(*start)) / kSecondsPerDay;
    if (const auto mean = matcher.valueAt(measure.simulation.itemNo, days, hint)) matched.values[i] = *mean;
  }
  return matched;
}

std::string describeMatching(const TimeMatching& matching) {
  std::string text;
  if (matching.kind == TimeMatch::exact) text = "the simulated step at their time";
  if (matching.kind == TimeMatch::interpolate && matching.offsetHours != 0.0) text = "the simulated values";
  if (matching.kind == TimeMatch::mean) {
    text = fmt::format("the mean of the simulated values of the day that {} on their date, {} h after its beginning",
                       matching.dayStamp == DayStamp::start ? "begins" : "ends", formatReal(matching.dayBeginsHours));
  }
  if (matching.offsetHours != 0.0) {
    text += fmt::format(", simulated time being observed time {} {} h", matching.offsetHours < 0.0 ? "-" : "+",
                        formatReal(std::abs(matching.offsetHours)));
  }
  return text;
}

}  // namespace mirevo

#include "measures/observation_selection.h"

#include <algorithm>
#include <cstddef>
#include <tuple>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/observed_series.h"
#include "measures/output_measure.h"
#include "measures/period_series.h"

namespace mirevo {
namespace {

using namespace date_field;

/// The settings of a selection, each by itself, in the order in which they are told.
std::vector<ObservationSelection> settingsOf(const ObservationSelection& selection) {
  std::vector<ObservationSelection> settings;
  if (selection.start) settings.push_back({.start = selection.start});
  if (selection.end) settings.push_back({.end = selection.end});
  if (!selection.months.empty()) settings.push_back({.months = selection.months});
  if (selection.lowestObserved) settings.push_back({.lowestObserved = selection.lowestObserved});
  if (selection.highestObserved) settings.push_back({.highestObserved = selection.highestObserved});
  return settings;
}

void add(ObservationSelection& selection, const ObservationSelection& setting) {
  if (setting.start) selection.start = setting.start;
  if (setting.end) selection.end = setting.end;
  if (!setting.months.empty()) selection.months = setting.months;
  if (setting.lowestObserved) selection.lowestObserved = setting.lowestObserved;
  if (setting.highestObserved) selection.highestObserved = setting.highestObserved;
}

}  // namespace

bool ObservationSelection::isSameAs(const ObservationSelection& other) const {
  const auto settings = [](const ObservationSelection& s) {
    return std::tie(s.start, s.end, s.months, s.lowestObserved, s.highestObserved);
  };
  return settings(*this) == settings(other);
}

DateRecord endOfWarmUp(const EvaluationPeriod& period) {
  return dateOfSecond(secondAfter(secondNumber(period.start), period.warmUpDays));
}

EvaluationPeriod countedPeriod(const OutputMeasure& measure, const EvaluationPeriod& period) {
  EvaluationPeriod counted = period;
  if (period.warmUpDays > 0.0) counted.start = endOfWarmUp(period);
  counted.warmUpDays = 0.0;
  const std::optional<DateRecord>& start = measure.selection.start;
  const std::optional<DateRecord>& end = measure.selection.end;
  if (start && secondNumber(*start) > secondNumber(counted.start)) counted.start = *start;
  if (end && secondNumber(*end) < secondNumber(counted.end)) counted.end = *end;
  return counted;
}

ObservationFilter::ObservationFilter(const ObservationSelection& selection, const DateRecord& start)
    : origin_(secondNumber(start)), hasMonths_(!selection.months.empty()) {
  for (const double month : selection.months) months_.at(static_cast<std::size_t>(month)) = true;
  if (selection.lowestObserved) lowest_ = static_cast<float>(*selection.lowestObserved);
  if (selection.highestObserved) highest_ = static_cast<float>(*selection.highestObserved);
}

bool ObservationFilter::counts(double days, float value) const {
  if (value < lowest_ || value > highest_) return false;
  if (!hasMonths_) return true;
  return months_.at(static_cast<std::size_t>(dateOfSecond(secondAfter(origin_, days))[kMonth]));
}

bool ObservationFilter::isJoined(double from, double to) const {
  if (!hasMonths_) return true;
  const auto monthNumber = [this](double days) {
    const DateRecord date = dateOfSecond(secondAfter(origin_, days));
    return std::int64_t{date[kYear]} * 12 + date[kMonth] - 1;
  };
  const std::int64_t last = monthNumber(to);
  for (std::int64_t month = monthNumber(from); month <= last; ++month) {
    if (!months_.at(static_cast<std::size_t>(month % 12 + 1))) return false;
  }
  return true;
}

void keepCounted(PeriodSeries& observations, const OutputMeasure& measure, const EvaluationPeriod& period,
                 std::span<const EvaluationPeriod> others) {
  std::vector<EvaluationPeriod> periods(others.begin(), others.end());
  periods.push_back(countedPeriod(measure, period));
  const ObservationFilter filter(measure.selection, period.start);
  const std::int64_t origin = secondNumber(period.start);
  for (std::size_t i = 0; i < observations.seconds.size(); ++i) {
    const std::int64_t second = observations.seconds[i];
    const double days = static_cast<double>(second - origin) / kSecondsPerDay;
    const bool isInside = std::ranges::any_of(periods, [second](const EvaluationPeriod& one) {
      return second >= secondNumber(one.start) && second <= secondNumber(one.end);
    });
    if (!isInside || !filter.counts(days, observations.values[i])) {
      observations.values[i] = std::numeric_limits<float>::quiet_NaN();
    }
  }
}

std::string describeSelection(const ObservationSelection& selection) {
  std::vector<std::string> texts;
  if (selection.start) texts.push_back("Start_Date = " + formatDate(*selection.start));
  if (selection.end) texts.push_back("End_Date = " + formatDate(*selection.end));
  if (!selection.months.empty()) texts.push_back(fmt::format("Months = {}", fmt::join(selection.months, ", ")));
  if (selection.lowestObserved) texts.push_back("Lowest_Observed = " + formatReal(*selection.lowestObserved));
  if (selection.highestObserved) texts.push_back("Highest_Observed = " + formatReal(*selection.highestObserved));
  return fmt::format("{}", fmt::join(texts, ", "));
}

std::string describeSelected(const OutputMeasure& measure, const EvaluationPeriod& period,
                             TimeSeriesObject& observation) {
  OutputMeasure tried = measure;
  tried.selection = {};
  tried.weighting = {};
  EvaluationPeriod counted = period;
  counted.warmUpDays = 0.0;
  const auto count = [&] {
    return readObservedSeries(0, tried, counted, SeriesPrecision::single, observation).values.size();
  };
  std::string text = countText(count(), "observation") + " in the evaluation period";
  const auto addCount = [&](const std::string& setting) {
    text += fmt::format(", {} of them left by {}", count(), setting);
  };
  if (period.warmUpDays > 0.0) {
    counted.warmUpDays = period.warmUpDays;
    addCount("Warm_Up_Days = " + formatReal(period.warmUpDays));
  }
  for (const ObservationSelection& setting : settingsOf(measure.selection)) {
    add(tried.selection, setting);
    addCount(describeSelection(setting));
  }
  if (measure.weighting.isUsed()) {
    tried.weighting = measure.weighting;
    addCount("the weights and quality codes");
  }
  return text;
}

}  // namespace mirevo

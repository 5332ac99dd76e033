#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include "common/date_record.h"
#include "common/settings/code_name.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

struct EvaluationPeriod;
struct OutputMeasure;
struct PeriodSeries;

/// The simulated value that an observation is compared with: that at its time, interpolated between two steps; that of
/// a step at its time; the mean over the day of its date.
enum class TimeMatch : std::int32_t { interpolate, exact, mean };
/// Which day the date of an observation names: the one that begins on it, or the one that ends on it.
enum class DayStamp : std::int32_t { start, end };
/// Without codes: names only, in the order of the enumerators.
inline constexpr CodeName kTimeMatchNames[] = {
    {std::nullopt, "interpolate"}, {std::nullopt, "exact"}, {std::nullopt, "mean"}};
inline constexpr CodeName kDayStampNames[] = {{std::nullopt, "start"}, {std::nullopt, "end"}};

struct TimeMatching {
  TimeMatch kind = TimeMatch::interpolate;
  double offsetHours = 0.0;     ///< simulated time = observed time + offset
  double dayBeginsHours = 0.0;  ///< of observed time, 0 to 24: of 'mean'
  DayStamp dayStamp = DayStamp::start;

  bool operator==(const TimeMatching&) const = default;
  /// Simulated values are compared as they are interpolated at the observed times.
  bool isUsual() const { return kind == TimeMatch::interpolate && offsetHours == 0.0; }
};

/// Finds the simulated value for each observation of a measure.
class TimeMatcher {
 public:
  /// `largestGap`: days between two steps over which is interpolated. The data of the simulated items that are asked
  /// for must be there, and the object must outlive the matcher.
  TimeMatcher(const TimeMatching& matching, const TimeSeriesObject& simulation, const DateRecord& start,
              double largestGap);

  /// The value for an observation `days` after the start of the simulated series, if there is one; in 32 bits. `hint`
  /// as of mirevo::valueAt().
  std::optional<float> valueAt(int item, double days, std::size_t& hint) const;
  /// The same in 64 bits of `values` at the steps of the series, in which NaN is missing.
  std::optional<double> exactValueAt(std::span<const double> values, double days, std::size_t& hint) const;

 private:
  template <class Value>
  std::optional<double> dayMean(std::span<const Value> values, std::optional<float> deleteValue, double days) const;

  TimeMatching matching_;
  const TimeSeriesObject& simulation_;
  std::span<const double> times_;  ///< of the simulation, like its delete value: asked for once and not for each value
  std::optional<float> deleteValue_;
  std::int64_t start_;      ///< secondNumber() of the first step
  double largestGap_;       ///< days
  double usualStep_ = 0.0;  ///< the median of the time between two steps, days; 0: there is one step
};

/// For display: the simulated series as the measure compares it, at the times of the observed series. Unless its
/// matching is the usual one, these are for 'mean' the means of the days of the period, at the observations' times of
/// day, and else its steps, less the offset; for 'exact', times of observations without a step have no value.
PeriodSeries readMatchedSeries(TimeSeriesObject& simulation, TimeSeriesObject& observation,
                               const OutputMeasure& measure, const EvaluationPeriod& period);

/// For people: how simulated values are found, "the mean of the simulated day, ..."; empty for the usual way.
std::string describeMatching(const TimeMatching& matching);

}  // namespace mirevo

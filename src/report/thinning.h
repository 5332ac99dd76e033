#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "report/report_data.h"
#include "run/results/series_table.h"

namespace mirevo {

/// Longer series are thinned for drawing, so that a report stays at a few megabytes; ten years of hourly values are
/// shorter.
inline constexpr std::size_t kMostDrawnTimes = 100'000;

/// At most so many times of each of `count` series or bands are drawn: kMostDrawnTimes, of many fewer, so that a report
/// of any number opens within seconds, but always more than a chart has pixels.
std::size_t mostDrawnTimes(std::size_t count);

/// The series at the times at which one of its columns has its smallest or largest value within a short span, and at
/// the ends of gaps, at most `most` of them: drawn, it looks like the whole series, peaks and gaps included. Of a
/// column with few values all are there.
ShownSeries thinned(const ShownSeries& series, std::size_t most = kMostDrawnTimes);
/// The same for a band; its counts stay those of all times.
ReportedBand thinned(const ReportedBand& band, std::size_t most = kMostDrawnTimes);

/// A column and its times.
struct TimedValues {
  std::span<const std::int64_t> seconds;
  std::span<const float> values;
};

/// The places of the values of a `drawn` column before which there is a gap in the `whole` one, over which no line is
/// drawn: a step between two values longer than one and a half of that which nine tenths of its steps do not exceed. Of
/// fewer than three values, which do not tell what is usual, all.
std::vector<std::size_t> gapsOf(const TimedValues& drawn, const TimedValues& whole);

/// Exceedance percentages for the flow duration curve of a thinned series, ascending between 0 and 100.
std::vector<double> exceedancePercentages();

/// The values that are reached or exceeded during each of exceedancePercentages() of the time, from the ranks of the
/// finite values. Empty if there are none.
std::vector<double> flowDuration(std::span<const float> values);

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "run/results/series_table.h"

namespace mirevo {

/// Longer series are thinned for drawing, so that a report stays at a few megabytes; ten years of hourly values are
/// shorter.
inline constexpr std::size_t kMostDrawnTimes = 100'000;

/// At most so many times of each of `count` series are drawn: kMostDrawnTimes, of many series fewer, so that a report
/// of any number opens within seconds, but always more than a chart has pixels.
std::size_t mostDrawnTimes(std::size_t count);

/// The series at the times at which one of its columns has its smallest or largest value within a short span, at most
/// `most` of them: drawn, it looks like the whole series, peaks included.
ShownSeries thinned(const ShownSeries& series, std::size_t most = kMostDrawnTimes);

/// Exceedance percentages for the flow duration curve of a thinned series, ascending between 0 and 100.
std::vector<double> exceedancePercentages();

/// The values that are reached or exceeded during each of exceedancePercentages() of the time, from the ranks of the
/// finite values. Empty if there are none.
std::vector<double> flowDuration(std::span<const float> values);

}  // namespace mirevo

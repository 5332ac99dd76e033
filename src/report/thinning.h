#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "run/results/series_table.h"

namespace mirevo {

/// Longer series are thinned for drawing, so that a report stays a few megabytes: ten years of hourly values are not.
inline constexpr std::size_t kMostDrawnTimes = 100'000;

/// The times at which any of the columns has its smallest or largest value within a short span, at most
/// kMostDrawnTimes of them: drawn, it looks as the whole does, peaks included.
ShownSeries thinned(const ShownSeries& series);

/// Percentages of time, ascending between 0 and 100, for the curve of a thinned series.
std::vector<double> exceedancePercentages();

/// The value that is reached or exceeded during each of those percentages of the time; of the finite values, by their
/// ranks. Empty without any.
std::vector<double> flowDuration(std::span<const float> values);

}  // namespace mirevo

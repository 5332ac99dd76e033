#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>

#include "measures/shown_above.h"

namespace mirevo {

/// A longer series above a hydrograph is thinned for drawing; twenty years of days are shorter.
inline constexpr std::size_t kMostTimesAbove = 8'000;

/// A series that the report draws above a hydrograph.
struct SeriesAbove {
  std::string name;
  PeriodSeries series;
  bool isThinned = false;  ///< to the largest value in each of kMostTimesAbove spans of equally many times
};

/// What is drawn above the hydrograph of the measure with this 0-based index, within the times of the hydrograph: the
/// series of the first measure that compares the same pair and has one. Empty if there is none, or if it cannot be
/// read; `fault` then says so.
std::optional<SeriesAbove> seriesAbove(std::span<const OutputMeasure> measures, std::size_t measure,
                                       std::span<const std::int64_t> seconds, std::string& fault);

}  // namespace mirevo

#pragma once

#include <cstdint>
#include <span>
#include <string>
#include <vector>

#include "run/results/series_table.h"

namespace mirevo {

/// The times at which a shown series has both an observed and a simulated value; one entry per time in each vector.
struct ShownPairs {
  std::vector<std::int64_t> seconds;  ///< secondNumber(), ascending
  std::vector<float> observed;
  std::vector<float> simulated;
};

/// The simulated values by which a series is judged: those of the best evaluation, or of the initial one if there are
/// none of the best.
const std::vector<float>& judgedValues(const ShownSeries& series);
ShownPairs shownPairs(const ShownSeries& series);

/// The median of the time from one pair to the next, in seconds; 0 with fewer than two pairs.
std::int64_t usualStep(const ShownPairs& pairs);

/// The year of a time, where years begin with this month (1 to 12): the calendar year in which it begins.
int yearOf(std::int64_t second, int firstMonth);
/// "1981", or "1981/82" if years do not begin in January.
std::string yearName(int year, int firstMonth);

}  // namespace mirevo

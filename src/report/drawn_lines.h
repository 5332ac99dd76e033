#pragma once

#include <cstdint>
#include <span>
#include <vector>

#include "run/results/series_table.h"

namespace mirevo {

/// The values of one column of a shown series, as they are to be drawn.
struct DrawnLine {
  bool isPoints = false;             ///< too far apart, or too uneven, for a line between them to tell anything
  std::vector<std::int64_t> breaks;  ///< secondNumber() of the values behind which a line is interrupted, ascending
};

/// A line is interrupted where the next value comes far later than the values usually do. The rows of a shown series
/// are the times of all its columns, so that a row without an observation says nothing; one without a simulated value
/// does, as these are interpolated.
struct DrawnLines {
  DrawnLine observed;
  DrawnLine initial;
  DrawnLine best;
};
DrawnLines drawnLines(const ShownSeries& series);

/// That of one simulated series at the times of the others; `observed` tells which of them are its own.
DrawnLine drawnSimulated(std::span<const std::int64_t> seconds, std::span<const float> values,
                         std::span<const float> observed);

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// One item of a time-series file over the evaluation period, on the file's own time steps: to be looked at, not to be
/// judged by.
struct PeriodSeries {
  std::vector<std::int64_t> seconds;  ///< secondNumber() of each step, ascending
  std::vector<float> values;          ///< one a step, NaN for a missing one

  bool operator==(const PeriodSeries&) const = default;
};

/// The steps in the period, both ends included, and one on either side of it, from which a value at an end of the
/// period is interpolated. Throws FatalError where the item cannot be read.
PeriodSeries readPeriodSeries(TimeSeriesObject& series, const SeriesReference& reference,
                              const EvaluationPeriod& period);

/// The values at those times (ascending): that of a step there, else linear between its two neighbours as the output
/// measures have it, NaN outside the axis or beside a missing value.
std::vector<float> valuesAt(const PeriodSeries& series, std::span<const std::int64_t> seconds);

/// Whether two measures compare the same two series.
bool isSamePair(const OutputMeasure& a, const OutputMeasure& b);

/// The measures that compare series, 0-based: of those that compare the same pair the first.
std::vector<std::size_t> measuresOfDistinctPairs(std::span<const OutputMeasure> measures);

}  // namespace mirevo

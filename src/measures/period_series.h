#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// One item of a time-series file over the evaluation period, at the time steps of the file: for display, not for the
/// measures.
struct PeriodSeries {
  std::vector<std::int64_t> seconds;  ///< secondNumber() of each step, ascending
  std::vector<float> values;          ///< one per step, NaN for a missing one

  bool operator==(const PeriodSeries&) const = default;
};

/// The steps in the period, both ends included, and one step on either side, for interpolation at the ends of the
/// period. Throws FatalError if the item cannot be read.
PeriodSeries readPeriodSeries(TimeSeriesObject& series, const SeriesReference& reference,
                              const EvaluationPeriod& period);

/// The same of a measure's observations, those that do not count being missing.
PeriodSeries readPeriodObservations(TimeSeriesObject& series, const OutputMeasure& measure,
                                    const EvaluationPeriod& period);

/// The values at the given times (ascending): that of a step at the time, else interpolated linearly between its two
/// neighbours as for the output measures; NaN outside the time axis, next to a missing value, and between two steps
/// that are farther apart than `largestGap` (days).
std::vector<float> valuesAt(const PeriodSeries& series, std::span<const std::int64_t> seconds,
                            double largestGap = kAnyGap);

/// Whether two measures compare the same items of the same files. An item whose number is not known is the same as one
/// of the same name.
bool isSameItems(const OutputMeasure& a, const OutputMeasure& b);
/// Whether the simulated series that is shown is the same, and the observed one but for observations that do not count.
bool isMatchedAlike(const OutputMeasure& a, const OutputMeasure& b);
/// Whether they also do so with the same observations and weights.
bool isSamePair(const OutputMeasure& a, const OutputMeasure& b);

/// Of more pairs than these, those of the same items are shown once, whatever observations of them the measures count:
/// series that are kept and shown would otherwise grow with the number of measures.
inline constexpr std::size_t kMostShownPairs = 100;

/// The measures whose series are shown, 0-based: of several that compare the same pair only the first, and of more than
/// kMostShownPairs only the first that matches the same items in the same way.
std::vector<std::size_t> measuresOfDistinctPairs(std::span<const OutputMeasure> measures);
/// How many pairs are not shown for that reason.
std::size_t pairsShownWithOthers(std::span<const OutputMeasure> measures);

}  // namespace mirevo

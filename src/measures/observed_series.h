#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "common/date_record.h"
#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// The observations of one output measure: those that count and are not missing. They are the same for
/// all evaluations of a run, so that simulated values at their times can be compared between evaluations.
struct ObservedSeries {
  std::size_t measure = 0;           ///< 0-based index of the output measure
  DateRecord start{};                ///< origin of `days`
  std::vector<double> days;          ///< ascending
  std::vector<double> values;        ///< one per time; NaN where there is a simulated step alone, addSimulatedSteps()
  std::vector<double> weights = {};  ///< one per time; empty: each 1
};

/// Those of a validation period.
struct ValidationObservations {
  std::size_t period = 0;  ///< 0-based
  ObservedSeries observed;
};

/// The period includes both ends. Throws FatalError if the item cannot be read.
ObservedSeries readObservedSeries(std::size_t index, const OutputMeasure& measure, const EvaluationPeriod& period,
                                  SeriesPrecision precision, TimeSeriesObject& observation);

/// Which of the values is often used to mark missing ones (-99, -999.9, ...) and is smaller than all that are not, so
/// that it is hardly one of them; NaN if there is none. With several the most frequent one.
double usualMarkerAmong(std::span<const double> values);

/// How many numbers appendSimulatedValues() appends for these series.
std::size_t simulatedValueCount(std::span<const ObservedSeries> observed, SeriesPrecision precision);

/// Appends the simulated value for each observation to `values`, NaN where there is none, as between steps farther
/// apart than `largestGap` (days). If exact, the unit in which the file gives each of them follows (interpolated as the
/// values are), NaN where there is none.
void appendSimulatedValues(const ObservedSeries& observed, const OutputMeasure& measure, SeriesPrecision precision,
                           double largestGap, TimeSeriesObject& simulation, std::vector<double>& values);

}  // namespace mirevo

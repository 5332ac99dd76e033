#pragma once

#include <cstddef>
#include <optional>
#include <vector>

#include "measures/measure_file.h"
#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// What the statistics of one measure are taken from: the pairs of a simulated and an observed value, and five figures
/// that are computed together, deliberately in single precision throughout.
struct MeasureStatistics {
  float mean = 0.0F;
  float rootMeanSquare = 0.0F;
  float standardDeviation = 0.0F;
  float peakDifference = 0.0F;
  float lowDifference = 0.0F;
  std::vector<double> times;              ///< of the pairs, in days since the start of the simulated file
  std::vector<float> simulatedValues;     ///< one per pair
  std::vector<float> observedValues;      ///< one per pair
  std::size_t observationCount = 0;       ///< in the period and not missing, used or not
  std::optional<DateRecord> firstUnused;  ///< time of the first of them without a simulated value
};

/// Makes the item of an opened file ready for reading. Throws FatalError with "Error: Item No. % not found in " or
/// "Error getting data of TS item in " and the file's name.
void requireItem(TimeSeriesObject& series, const SeriesReference& reference);

/// Statistics of simulated minus observed values, weighted: `weight` times the difference where it is not positive,
/// `weightAbove` times it where it is. Both ends of the period belong to it. Observations that are missing, and those
/// at whose time there is no simulated value, do not count. The peak and low difference only where `wantPeaks`. The two
/// files may start at different times; equal civil times meet exactly. Throws FatalError with the fixed texts.
MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation, float weight,
                                           float weightAbove, bool wantPeaks);

/// The same with the measure's own weights, and with the peak and low difference where its statistic needs them.
MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation);

/// Whether any observation in the period meets a simulated value, so that statistics can be computed. Throws FatalError
/// as they do for what cannot be read at all.
bool hasPairs(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
              TimeSeriesObject& observation);

/// What the statistic that a `Statistic_Type` selects is in an objective function.
double selectStatistic(const MeasureStatistics& statistics, StatisticType type);

/// The value of a measure of interface type 0, as selectStatistic() has it.
double measureValue(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
                    TimeSeriesObject& observation);

}  // namespace mirevo

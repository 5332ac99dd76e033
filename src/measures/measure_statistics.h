#pragma once

#include <vector>

#include "measures/measure_file.h"
#include "measures/output_measure.h"
#include "platform/time_series_object.h"

namespace mirevo {

/// The five statistics of one measure. Single precision throughout is deliberate.
struct MeasureStatistics {
  float mean = 0.0F;
  float rootMeanSquare = 0.0F;
  float standardDeviation = 0.0F;
  float peakDifference = 0.0F;
  float lowDifference = 0.0F;
  std::vector<float> simulatedValues;  ///< at the observation times that were used
};

/// Makes the item of an opened file ready for reading. Throws FatalError with "Error: Item No. % not found in " or
/// "Error getting data of TS item in " and the file's name.
void requireItem(TimeSeriesObject& series, const SeriesReference& reference);

/// Statistics of simulated minus observed values, weighted: `weight` times the difference where it is not positive,
/// `weightAbove` times it where it is. Both ends of the period belong to it. Observations that are missing, and those
/// at whose time there is no simulated value, do not count. The peaks and lows only where `wantPeaks`. The two files
/// may start at different times; equal civil times meet exactly. Throws FatalError with the fixed texts.
MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation, float weight,
                                           float weightAbove, bool wantPeaks);

/// The value of a measure of interface type 0: the statistic that its `Statistic_Type` selects.
double measureValue(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
                    TimeSeriesObject& observation);

}  // namespace mirevo

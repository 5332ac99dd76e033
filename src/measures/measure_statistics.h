#pragma once

#include <optional>
#include <string>
#include <vector>

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

/// Statistics of simulated minus observed values in the period; the peaks only where `wantPeaks`. Throws FatalError
/// with the fixed texts.
MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation, float weight,
                                           float weightAbove, bool wantPeaks);

/// The value of a measure of interface type 0: the statistic that its `Statistic_Type` selects.
double measureValue(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
                    TimeSeriesObject& observation);

/// The numbers of an output-measure file in free format: separated by blanks, tabs, commas, semicolons or line ends,
/// `#` comments to the end of the line. Nothing, with the place in `reason`, when something in it is no number.
std::optional<std::vector<double>> readMeasureFile(const std::string& fileName, std::string& reason);

}  // namespace mirevo

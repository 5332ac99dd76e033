#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "measures/criteria.h"
#include "measures/measure_file.h"
#include "measures/observed_series.h"
#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// One of each per pair.
struct TransformedPairs {
  std::vector<double> simulatedValues;
  std::vector<double> observedValues;
};

/// The basis of the statistics of one measure: the pairs of simulated and observed values, and five statistics of their
/// weighted differences that are computed together: deliberately in 32 bits throughout, each number here then being one
/// of 32 bits, or, if exact, in 64 bits throughout.
struct MeasureStatistics {
  double mean = 0.0;
  double rootMeanSquare = 0.0;
  double standardDeviation = 0.0;
  double peakDifference = 0.0;
  double lowDifference = 0.0;
  std::vector<double> times;            ///< of the pairs, in days since the start of the simulated series
  std::vector<double> simulatedValues;  ///< one per pair
  std::vector<double> observedValues;   ///< one per pair
  std::vector<double> weights;          ///< of the observations, one per pair; empty: each 1
  /// The pairs between which and the one before are observations, or months, that do not count.
  std::vector<std::size_t> breaks;
  /// The pairs as the statistics compare them, if that is not as they are.
  std::optional<TransformedPairs> transformed;
  double epsilon = 0.0;                   ///< the small value that is added where a logarithm or inverse is taken
  std::size_t observationCount = 0;       ///< observations that count and are not missing, whether used or not
  std::optional<DateRecord> firstUnused;  ///< time of the first observation without a simulated value
};

/// The pairs that the statistics compare.
ValuePairs comparedPairs(const MeasureStatistics& statistics);

/// Makes the item of an opened file ready for reading. Throws FatalError with "Error: Item No. % not found in " or
/// "Error getting data of TS item in " and the file's name.
void requireItem(TimeSeriesObject& series, const SeriesReference& reference);

/// Statistics of the weighted differences simulated minus observed: `weight` times a difference that is not positive,
/// `weightAbove` times one that is, times the weight of the observation. The period includes both ends. Missing
/// observations, those that the measure leaves out, those of weight 0, and those without a simulated value do not
/// count. The peak and low differences are computed only if `wantPeaks`: from the pairs, if observations are left out
/// inside the period or are not compared with the simulated value at their time. The two files may start at different
/// times; equal times always match. Throws FatalError with the fixed texts.
MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation, double weight,
                                           double weightAbove, bool wantPeaks,
                                           SeriesPrecision precision = SeriesPrecision::single);

/// The same with the weights of the measure, and with the peak and low differences if its statistic needs them.
MeasureStatistics computeMeasureStatistics(const OutputMeasure& measure, const EvaluationPeriod& period,
                                           TimeSeriesObject& simulation, TimeSeriesObject& observation,
                                           SeriesPrecision precision = SeriesPrecision::single);

/// Whether any observation that counts has a simulated value, so that statistics can be computed. Throws
/// FatalError if the series cannot be read.
bool hasPairs(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
              TimeSeriesObject& observation);

/// For people: the items of a file, each behind a line end; of many the first.
std::string listItems(const TimeSeriesObject& series);
/// For people: the time span of a series that has steps, and that an item of an observed one has no value in the
/// period.
std::string describeSpan(const TimeSeriesObject& series, const std::string& fileName);
std::string describeLackOfObservations(const TimeSeriesObject& series, int item, const std::string& fileName);

/// The statistic that `Statistic_Type` selects, on its own scale.
double selectStatistic(const MeasureStatistics& statistics, StatisticType type);

/// The value of a measure of interface type 0 for these simulated values at the times of the observations.
double valueAgainst(const ObservedSeries& observed, std::span<const double> simulated, const OutputMeasure& measure);

/// The value of a measure of interface type 0, as from selectStatistic().
double measureValue(const OutputMeasure& measure, const EvaluationPeriod& period, TimeSeriesObject& simulation,
                    TimeSeriesObject& observation, SeriesPrecision precision = SeriesPrecision::single);

}  // namespace mirevo

#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "common/settings/code_name.h"
#include "measures/output_measure.h"

namespace mirevo {

struct MeasureStatistics;

/// Which value of a statistic is best, on the scale of the statistic.
enum class Best { zero, smallest, largest };  // a criterion's largest value is 1

/// One way to reduce the comparison of two series to a number. A new one is a row of the table and a function of the
/// pairs, computed in double precision. Those with a code are statistics of the weighted differences; the others judge
/// the pairs without the weights of the measure.
struct Statistic {
  CodeName key;                               ///< in setups; one without a code has a name only
  std::string_view description;               ///< in the log and the report, with its unit if it has one of its own
  double (*value)(const MeasureStatistics&);  ///< on its own scale
  Best best;
  /// The contribution of a value to the objective function, which a search minimises: 0 for a perfect fit, larger for a
  /// worse one; MeasureTerm multiplies it by the weight of the measure. Values of statistics with a code are used
  /// unchanged, including negative differences: the type of the objective function decides on the sign.
  double (*inObjective)(double value);
  bool takesWeights = false;  ///< observations may have weights other than 0 and 1, unless values become ranks
  bool needsPeaks = false;    ///< it uses the peak or low difference of MeasureStatistics
  /// Of the values before the statistic; of one that has none the setup may choose it.
  ValueTransformation transformation = ValueTransformation::none;
  bool isOfSizes = false;           ///< ranks would make it the same for any simulation, or nearly so
  bool usesEpsilon = false;         ///< it takes logarithms of values to which MeasureStatistics::epsilon is added
  std::string_view undefined = {};  ///< when its value is NaN, behind "if": "the observed values do not vary"
};

/// Every statistic, those with a code first and in the order of their codes.
std::span<const Statistic> statisticTable();
/// The keys of the table, in its order.
std::span<const CodeName> statisticNames();

const Statistic& statisticOf(StatisticType type);
/// Whether a measure's value enters its objective function otherwise than as it is: it is a statistic without a code.
bool isCriterion(const OutputMeasure& measure);
/// The value of a perfect fit.
double bestValue(const OutputMeasure& measure);
/// The transformation that the values of a measure undergo: the statistic's own or the setup's.
ValueTransformation transformationOf(const OutputMeasure& measure);
/// Whether its observations may have weights other than 0 and 1.
bool takesWeights(const OutputMeasure& measure);
/// Whether both of its weights are 0, so that it is the same whatever the model does; a criterion has no use for them.
bool isWeightless(const OutputMeasure& measure);
/// For people: the statistic and its transformation.
std::string describeStatistic(const OutputMeasure& measure);
/// To be put behind the value of a measure that is NaN: when its statistic is, ", as it is if ..."; empty if that is
/// not known.
std::string describeUndefined(const OutputMeasure& measure);
/// The statistic with this name, in any letter case.
std::optional<StatisticType> findStatistic(std::string_view name);

}  // namespace mirevo

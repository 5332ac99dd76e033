#pragma once

#include <optional>
#include <span>
#include <string_view>

#include "common/settings/code_name.h"
#include "measures/output_measure.h"

namespace mirevo {

struct MeasureStatistics;

/// Which value of a statistic is best, on the scale of the statistic.
enum class Best { zero, smallest, largest };

/// One way to reduce the comparison of two series to a number. A new one is a row of the table and a function of the
/// pairs, computed in double precision.
struct Statistic {
  CodeName key;                               ///< in setups; one without a code has a name only
  std::string_view description;               ///< in the log and the report
  double (*value)(const MeasureStatistics&);  ///< on its own scale
  Best best;
  /// The contribution of a value to the objective function, which a search minimises: 0 for a perfect fit, larger for a
  /// worse one. Values of statistics with a code are used unchanged, including negative differences: the type of the
  /// objective function decides on the sign.
  double (*inObjective)(double value);
  bool needsPeaks = false;  ///< it uses the peak or low difference of MeasureStatistics
};

/// Every statistic, those with a code first and in the order of their codes.
std::span<const Statistic> statisticTable();
/// The keys of the table, in its order.
std::span<const CodeName> statisticNames();

const Statistic& statisticOf(StatisticType type);
/// The statistic with this name, in any letter case.
std::optional<StatisticType> findStatistic(std::string_view name);

}  // namespace mirevo

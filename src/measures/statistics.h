#pragma once

#include <optional>
#include <span>
#include <string_view>

#include "common/settings/code_name.h"
#include "measures/output_measure.h"

namespace mirevo {

struct MeasureStatistics;

/// Which value of a statistic is best, on its own scale.
enum class Best { zero, smallest, largest };

/// One way to reduce the comparison of two series to a number. A new one is a row of the table and a function of the
/// pairs, computed in 64 bits.
struct Statistic {
  CodeName key;                               ///< in setups; one without a code is chosen by its name alone
  std::string_view description;               ///< in the log and the report
  double (*value)(const MeasureStatistics&);  ///< on its own scale
  Best best;
  /// What a value becomes in the measure's objective function, which a search minimises: 0 for a perfect fit, and
  /// larger the worse it is. Those with a code go in as they are, a negative difference as such: its sign is left to
  /// the function's type.
  double (*inObjective)(double value);
  bool needsPeaks = false;  ///< of what MeasureStatistics holds it uses the peak and low difference
};

/// Every statistic, those with a code first and in the order of their codes.
std::span<const Statistic> statisticTable();
/// The keys of the table, in its order.
std::span<const CodeName> statisticNames();

const Statistic& statisticOf(StatisticType type);
/// The statistic of that name, in any letter case.
std::optional<StatisticType> findStatistic(std::string_view name);

}  // namespace mirevo

#pragma once

#include <array>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "common/date_record.h"

namespace mirevo {

struct EvaluationPeriod;
struct OutputMeasure;
struct PeriodSeries;
class TimeSeriesObject;

/// Which observations in the evaluation period count for a measure: all, unless said. Dates, months and values are
/// those of the observed series as its file has them.
struct ObservationSelection {
  std::optional<DateRecord> start = {};  ///< of a period of the measure's own, both ends included
  std::optional<DateRecord> end = {};
  std::vector<double> months = {};            ///< 1 to 12, in any order; empty: all
  std::optional<double> lowestObserved = {};  ///< both limits included
  std::optional<double> highestObserved = {};
  std::string location = {};  ///< of its first keyword, "setup.kdx:75:23: Months: "; empty if it has none

  /// Observations inside the period may be left out.
  bool leavesHoles() const { return !months.empty() || lowestObserved || highestObserved; }
  bool isSameAs(const ObservationSelection& other) const;
};

/// The first time at which observations count after the warm-up.
DateRecord endOfWarmUp(const EvaluationPeriod& period);

/// The period in which observations count for a measure: without the warm-up, and inside that of its own. Its end is
/// before its start if there is no such time.
EvaluationPeriod countedPeriod(const OutputMeasure& measure, const EvaluationPeriod& period);

/// Chooses among the observations of a measure by month and value.
class ObservationFilter {
 public:
  /// `start`: of the observed series.
  ObservationFilter(const ObservationSelection& selection, const DateRecord& start);

  /// Whether an observation counts, `days` after the start of the series; values are compared in 32 bits, so that one
  /// that is equal to a limit in the file is equal to it here, whatever the precision in which it is used.
  bool counts(double days, float value) const;
  /// Whether all of the time between two observations that count is of months that do.
  bool isJoined(double from, double to) const;

 private:
  std::int64_t origin_;
  bool hasMonths_;
  std::array<bool, 13> months_{};  ///< by the month's number
  float lowest_ = -std::numeric_limits<float>::infinity();
  float highest_ = std::numeric_limits<float>::infinity();
};

/// Makes the observations that do not count for the measure missing. In `others`, further periods, months and limits
/// hold, but neither the measure's own period nor a warm-up.
void keepCounted(PeriodSeries& observations, const OutputMeasure& measure, const EvaluationPeriod& period,
                 std::span<const EvaluationPeriod> others = {});

/// For people: the settings that leave observations out, "Months = 11, 12, Lowest_Observed = 0.5"; empty if there are
/// none.
std::string describeSelection(const ObservationSelection& selection);
/// How many observations each of the settings leaves, "365 observations in the evaluation period, 31 of them left by
/// Months = 1"; the item must be readable.
std::string describeSelected(const OutputMeasure& measure, const EvaluationPeriod& period,
                             TimeSeriesObject& observation);

}  // namespace mirevo

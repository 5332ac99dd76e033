#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "common/date_record.h"
#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// A period, both ends included, in which the measures are computed for information alone: it bears on no objective
/// function, so that it tests a calibration independently (split-sample test, Klemes 1986,
/// doi:10.1080/02626668609491024).
struct ValidationPeriod {
  std::string name;
  DateRecord start{};
  DateRecord end{};
};

/// A measure in a validation period, both by their 0-based indices.
struct ValidationTarget {
  std::size_t measure = 0;
  std::size_t period = 0;
};

/// For each period in turn, the measures that compare series. Validation values are in this order everywhere.
std::vector<ValidationTarget> validationTargets(std::span<const OutputMeasure> measures,
                                                std::span<const ValidationPeriod> periods);
/// "flow in 1991 to 2000", one per target.
std::vector<std::string> validationNames(std::span<const OutputMeasure> measures,
                                         std::span<const ValidationPeriod> periods);

/// The name of a period that the setup gives none: "1991-01-01 to 2000-12-31".
std::string namedByDates(const ValidationPeriod& period);

/// The evaluation period for the observations of a validation period.
EvaluationPeriod judgedAs(const ValidationPeriod& period, const EvaluationPeriod& evaluation);
/// From the first to the last day of all periods.
EvaluationPeriod hullOf(const EvaluationPeriod& evaluation, std::span<const ValidationPeriod> periods);

/// A measure in a validation period.
struct ValidationValue {
  double value = 0.0;                          ///< its statistic; NaN if it has none, whatever the reason
  std::size_t pairCount = 0;                   ///< observations with a simulated value
  std::size_t missingCount = 0;                ///< those without
  std::optional<DateRecord> firstUnused = {};  ///< time of the first without, if there are also some with one
};

ValidationValue validationValue(const OutputMeasure& measure, const EvaluationPeriod& period,
                                TimeSeriesObject& simulation, TimeSeriesObject& observation);

}  // namespace mirevo

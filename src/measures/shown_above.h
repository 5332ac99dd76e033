#pragma once

#include <string>
#include <vector>

#include "measures/period_series.h"

namespace mirevo {

/// A series that is drawn above a hydrograph.
struct NamedSeries {
  std::string name;  ///< of the item in its file
  PeriodSeries series;
};

/// Throws FatalError, with the texts for files of observations, if the file or the item cannot be read.
NamedSeries readShownAbove(SeriesReference reference, const EvaluationPeriod& period);

/// Throws FatalError if the series that the measure has drawn above its hydrograph cannot be read. Returns what may not
/// be meant, for warnings; nothing without such a series.
std::vector<std::string> requireShownAbove(const OutputMeasure& measure, const EvaluationPeriod& period);

}  // namespace mirevo

#pragma once

#include "report/json_writer.h"
#include "run/results/series_table.h"

namespace mirevo {

/// Writes the member "views": what the report tells of a pair of series beside its hydrograph, all of it computed from
/// all pairs of an observed and a simulated value. None without pairs. `firstMonth` (1 to 12) begins the years.
/// `hasPeaks`: none of the observations is left out for its value or its month.
void writeHydrographViews(JsonWriter& json, const ShownSeries& series, int firstMonth, bool hasPeaks = true);

}  // namespace mirevo

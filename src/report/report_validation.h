#pragma once

#include <span>

#include "report/report_data.h"
#include "run/results/result_row.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// In a run with validation periods: fills in the periods and the table of calibration and validation; the series,
/// which reach over all periods, are from then on those of the evaluation period, by which fit is judged, and whole in
/// `wholeSeries`. `best` may be null.
void addValidation(const RunConfig& config, std::span<const ResultRow> rows, const ResultRow* best, ReportData& data);

/// The part of a series from the first to the last second.
ShownSeries partOf(const ShownSeries& series, std::int64_t first, std::int64_t last);

}  // namespace mirevo

#pragma once

#include <string>

#include "report/report_data.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// Adds what a search has left beside its results: the limits of its parameters, its front, its repetitions, and notes
/// on what of these is damaged, or not there although a finished search of its kind writes it. `data` has the run, its
/// evaluations and its series.
void addSearchTables(const RunConfig& config, const std::string& filePrefix, std::size_t variableCount,
                     ReportData& data);

}  // namespace mirevo

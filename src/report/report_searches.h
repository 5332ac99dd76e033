#pragma once

#include <span>
#include <string>

#include "report/report_data.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// Adds what a search has left beside its results: the limits of its parameters, its front, its repetitions, and notes
/// on what of these is damaged, or not there although a finished search of its kind writes it. `parameters`: those that
/// vary. `data` has the run, its evaluations and its series.
void addSearchTables(const RunConfig& config, const std::string& filePrefix, std::span<const std::string> parameters,
                     ReportData& data);

}  // namespace mirevo

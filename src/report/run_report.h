#pragma once

#include <optional>
#include <string>

#include "report/report_data.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The content of the report on a setup's run, from its files beside the setup (`filePrefix`: folder and name without
/// ".kdx"). Empty, with the reason, if there are no results.
std::optional<ReportData> buildReport(const RunConfig& config, const std::string& filePrefix, std::string& reason);

/// Builds the report and writes it to its path. False, with the reason, when that fails; never throws.
bool writeReport(const RunConfig& config, const std::string& filePrefix, std::string& reason) noexcept;

}  // namespace mirevo

#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "common/files.h"
#include "report/report_data.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The content of the report on a setup's run, from its files beside the setup (`filePrefix`: folder and name without
/// ".kdx"). Empty, with the reason, if there are no results.
std::optional<ReportData> buildReport(const RunConfig& config, const std::string& filePrefix, std::string& reason);

/// Builds the report and writes it to its path. False, with the reason, when that fails; never throws.
bool writeReport(const RunConfig& config, const std::string& filePrefix, std::string& reason,
                 std::string_view temporaryEnding = kTemporaryEnding) noexcept;

/// Whether the file is a report on a run of that task; `reason` says why it cannot be read.
bool isReportOf(const std::string& path, std::string_view task, std::string& reason);

}  // namespace mirevo

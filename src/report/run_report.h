#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "measures/output_measure.h"
#include "report/report_data.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// How a run ended, for those who know it.
struct RunEnding {
  RunStateShown state = RunStateShown::finished;
  std::string message;
};

/// `<filePrefix>_Report.html`.
std::string reportPath(const std::string& filePrefix);

/// What a report shows of a setup's run, from its files beside the setup (`filePrefix`: folder and name without
/// ".kdx"). Without an `ending` the files and the run's lock say how it went. Nothing, with the reason, where there are
/// no results.
std::optional<ReportData> buildReport(const RunConfig& config, const std::string& filePrefix,
                                      const std::optional<RunEnding>& ending, std::string& reason);

/// Builds the report and writes it to its path. False, with the reason, when that fails; never
/// throws.
bool writeReport(const RunConfig& config, const std::string& filePrefix, const std::optional<RunEnding>& ending,
                 std::string& reason) noexcept;

/// The names by which `<setup>_Series.dat` calls the measures of those 0-based numbers, no two the same.
std::vector<std::string> seriesNames(std::span<const OutputMeasure> measures, std::span<const std::size_t> shown);

}  // namespace mirevo

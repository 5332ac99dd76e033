#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/local_sensitivity.h"
#include "parameters/search_space.h"
#include "report/report_data.h"
#include "run/results/result_row.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The names of all measures that compare the same pair of series as the one of that 0-based number, with commas.
std::string pairName(std::span<const OutputMeasure> measures, std::size_t measure);

/// The bands that a finished uncertainty analysis has written beside its results, one a pair of series; those that
/// cannot be read are left out.
std::vector<ReportedBand> reportedBands(const RunConfig& config, const std::string& filePrefix);

/// What a local sensitivity analysis found, computed again from its rows; nothing while the run with the initial values
/// is not there.
std::optional<ReportedSensitivity> reportedSensitivity(const RunConfig& config, const SensitivitySettings& settings,
                                                       const SearchSpace& space, std::span<const ResultRow> rows);

/// The covariance of the parameters that a finished sensitivity analysis has written beside its results; nothing where
/// there is none, or where its files cannot be read, with the `fault` in them.
std::optional<ReportedCovariance> reportedCovariance(const std::string& filePrefix, std::string& fault);

}  // namespace mirevo

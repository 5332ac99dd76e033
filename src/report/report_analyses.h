#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/local_sensitivity.h"
#include "parameters/search_space.h"
#include "report/report_data.h"
#include "run/results/pairs_file.h"
#include "run/results/result_row.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The names of all measures that compare the same pair of series as the one with this 0-based index, separated by
/// commas.
std::string pairName(std::span<const OutputMeasure> measures, std::size_t measure);

/// The bands that an uncertainty analysis has written beside its results, one per pair of series; those that cannot be
/// read are left out. `faults` gets a text on each that is damaged or not there; how long they were is in the record of
/// the run. `labels`: one per pair.
std::vector<ReportedBand> reportedBands(const RunConfig& config, const std::string& filePrefix, const RunRecord& record,
                                        std::span<const SeriesLabel> labels, std::vector<std::string>& faults);

/// The results of a local sensitivity analysis, computed from its rows, whose statistics are of 32 bits, and the pairs
/// of its runs; empty without a row for the initial values.
std::optional<ReportedSensitivity> reportedSensitivity(const RunConfig& config, const SensitivitySettings& settings,
                                                       const SearchSpace& space, std::span<const ResultRow> rows,
                                                       const PairsByNumber& pairs);

/// Takes the derivatives, which are of 64 bits, and the ranking from the table of a finished analysis. Returns why it
/// cannot; empty if it can.
std::string takeSensitivities(const std::string& filePrefix, ReportedSensitivity& sensitivity);

/// The covariance of the parameters that a finished sensitivity analysis has written beside its results; empty if there
/// is none, or if its files cannot be read, with the reason in `fault`.
std::optional<ReportedCovariance> reportedCovariance(const std::string& filePrefix, std::string& fault);

}  // namespace mirevo

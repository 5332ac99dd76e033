#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/sobol_settings.h"
#include "report/json_writer.h"
#include "report/series_labels.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// An index and its limits; NaN where there is none.
struct ReportedSobolIndex {
  double value = 0.0;
  double lower = 0.0;
  double upper = 0.0;
  std::int64_t blocks = 0;
  std::string problem = {};  ///< why it, or its limits, are not known; empty if they are
};

/// The indices of an output measure or objective function, one per factor in the order of the analysis.
struct ReportedSobolOutput {
  std::string kind;  ///< "measure" or "objective"
  std::string name;
  std::vector<ReportedSobolIndex> first;
  std::vector<ReportedSobolIndex> total;
  std::vector<ReportedSobolIndex> interactions;
  ReportedSobolIndex sumOfFirst;
  /// Of each two factors; empty without second order, symmetric, with NaN on the diagonal.
  std::vector<std::vector<double>> second;
  std::vector<std::int64_t> stageRows;                  ///< sizes of the sample
  std::vector<std::vector<ReportedSobolIndex>> stages;  ///< total indices: one row per size
};

/// Indices over time, one row per factor, one column per time.
struct ReportedSobolSeries {
  std::string measure;
  SeriesLabel label;
  std::vector<std::int64_t> seconds;
  std::vector<float> observed;
  std::vector<float> mean;
  std::vector<float> deviation;
  std::vector<std::vector<float>> first;
  std::vector<std::vector<float>> total;
  std::size_t stride = 1;  ///< every so many-th time is here
};

struct ReportedSobol {
  std::vector<std::string> factors;
  double negligibleIndex = 0.0;
  std::vector<ReportedSobolOutput> outputs;
  std::vector<ReportedSobolSeries> series;
};

/// The indices that a Sobol' analysis has written beside its results; empty, with the reason in `faults`, if its table
/// cannot be read. Series that cannot be read are left out. `labels`: one per distinct pair of series.
std::optional<ReportedSobol> reportedSobol(const RunConfig& config, const std::string& filePrefix,
                                           std::span<const SeriesLabel> labels, std::vector<std::string>& faults);

/// Writes the member "sobol" of the report's data.
void writeSobol(JsonWriter& json, const ReportedSobol& sobol);

}  // namespace mirevo

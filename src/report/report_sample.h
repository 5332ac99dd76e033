#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/distributions/parameter_distributions.h"
#include "parameters/search_space.h"
#include "report/json_writer.h"
#include "report/report_data.h"

namespace mirevo {

/// The distributions of all variable parameters, for charts of the sample.
std::vector<ReportedDistribution> reportedDistributions(const ParameterDistributions& distributions,
                                                        const SearchSpace& space);

/// What a sampling run has found on its parameters; empty if it has written nothing, as earlier versions did, or if the
/// file cannot be read, with the reason in `fault`.
std::optional<ReportedSampleSensitivity> reportedSampleSensitivity(const std::string& filePrefix,
                                                                   std::span<const std::string> parameters,
                                                                   std::string& fault);

/// Both as members of the report's data.
void writeSample(JsonWriter& json, const ReportData& data);

}  // namespace mirevo

#pragma once

#include <vector>

#include "parameters/parameter_model.h"
#include "report/report_data.h"
#include "run/results/result_row.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// All parameters of the setup with their start values and those of the best evaluation; `best` may be nullptr.
/// `parameters` is the model of the same setup.
std::vector<ReportedParameter> reportedParameters(const RunConfig& config, ParameterModel& parameters,
                                                  const ResultRow* best);

}  // namespace mirevo

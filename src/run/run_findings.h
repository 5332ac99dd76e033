#pragma once

#include <span>
#include <string>
#include <vector>

#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "parameters/parameter_model.h"
#include "run/results/run_record.h"
#include "run/run_reporter.h"

namespace mirevo {

/// Calibration and validation of the best evaluation and of the best tenth, as lines; none without validation periods.
std::vector<std::string> validationFindings(const RunReporter& reporter, std::span<const OutputMeasure> measures,
                                            std::span<const ValidationPeriod> periods);

/// What a run has found by its end: for the last lines of its result file, ...
void addFindings(const RunReporter& reporter, const ObjectiveAggregator& aggregator, ParameterModel& parameters,
                 std::span<const OutputMeasure> measures, std::span<const ValidationPeriod> periods,
                 std::vector<std::string>& lines);
/// ... and for its record.
void addFindings(const RunReporter& reporter, const ObjectiveAggregator& aggregator,
                 std::span<const ObjectiveFunction> objectives, RunRecord& record);

}  // namespace mirevo

#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/evaluated_sample.h"
#include "algorithms/analyses/uncertainty.h"
#include "run/tasks/task.h"

namespace mirevo {

/// The bands of the simulated series of a sample: what all forms of the uncertainty analysis have in common.

/// Why the end of the steps of the bands is refused, if it is.
std::optional<SettingRefusal> validateBandEnd(const UncertaintySettings& settings, const EvaluationPeriod& period);

/// The steps that the settings ask for.
std::optional<KeptSteps> bandSteps(const UncertaintySettings& settings);

/// What the bands will be of, before the first model run, so that an end of the steps that is not meant is seen in
/// time.
void logBandTimes(const TaskContext& context, const UncertaintySettings& settings);

/// Adds the band of each series over the evaluations `numbers` to `files` and returns lines on each for the report.
/// `weights`: one per evaluation; empty: they weigh the same.
std::vector<std::string> reportBands(const TaskContext& context, const UncertaintySettings& settings,
                                     std::span<const int> numbers, std::span<const double> weights,
                                     const SimulatedColumns& columns, std::vector<TaskFile>& files);

}  // namespace mirevo

#pragma once

#include "algorithms/analyses/uncertainty.h"
#include "run/tasks/task.h"

namespace mirevo {

/// The names of the parameters, measures and objective functions of an analysis.
AnalysisNames analysisNames(const TaskContext& context);

/// Writes an empty line and the lines of the report to the log.
void logReport(const TaskContext& context, std::span<const std::string> report);

/// Adds to the report, which is beside the results too, what a run warns of when it has its results.
void addNotes(std::span<const std::string> warnings, std::vector<std::string>& report);

}  // namespace mirevo

#pragma once

#include "algorithms/analyses/uncertainty.h"
#include "run/tasks/task.h"

namespace mirevo {

/// The names of what an analysis tells of.
AnalysisNames analysisNames(const TaskContext& context);

/// An empty line and the lines, to the log.
void logReport(const TaskContext& context, std::span<const std::string> report);

}  // namespace mirevo

#pragma once

#include <string>
#include <vector>

#include "run/tasks/tasks.h"

namespace mirevo {

/// What an analysis found: the lines that it has logged, for the result file, and the same for programs.
struct AnalysisFindings {
  std::vector<std::string> lines;
  std::vector<DataTable> tables;
};

/// The analyses: each evaluates its sets in one batch and logs what it found. Both throw FatalError and RunCancelled.

/// Uncertainty analysis; also writes the band of every simulated series beside the results.
AnalysisFindings runUncertainty(const TaskContext& context);

/// Local sensitivity analysis, with the covariance of the parameters where the setup asks for it.
AnalysisFindings runSensitivity(const TaskContext& context);

}  // namespace mirevo

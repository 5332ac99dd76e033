#pragma once

#include <memory>
#include <string>

#include "evaluation/output_reader.h"
#include "parameters/search_space.h"
#include "run/progress/run_log.h"
#include "run/results/scenario_series.h"
#include "run/results/series_recorder.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// Opens the file of the series that a report shows; null if no measure compares series, and
/// where no report is wanted. What an earlier run has left
/// there is taken up if this one `goesOn`, and otherwise renamed. `log` must outlive the recorder.
std::unique_ptr<SeriesRecorder> openSeries(const RunConfig& config, const SearchSpace& space, OutputReader& output,
                                           const std::string& path, bool goesOn, RunLog& log);

/// The same for the file of the series of scenarios; null for a task that shows none one beside another.
std::unique_ptr<ScenarioSeriesFile> openScenarioSeries(const RunConfig& config, OutputReader& output,
                                                       const std::string& path, bool goesOn, RunLog& log);

}  // namespace mirevo

#pragma once

#include <optional>
#include <string>
#include <vector>

#include "parameters/search_space.h"
#include "run/results/failure_table.h"
#include "run/results/pairs_file.h"
#include "run/results/restart_settings.h"
#include "run/results/result_table.h"
#include "run/results/row_check.h"
#include "run/results/run_record.h"
#include "run/results/scenario_series.h"
#include "run/results/series_table.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// What is known of a run from its files.
struct RunSources {
  std::string setup;            ///< the setup that the results name
  bool isOfOtherSetup = false;  ///< that is another one than the setup of the report, by its name
  ResultTable results;          ///< rows in the order of their numbers, each number once
  RunRecord record;
  std::string recordFault;  ///< why the record cannot be read; empty if it can, or if an earlier version wrote none
  RunStage stage = RunStage::running;
  std::string ended;                ///< empty while the run goes on
  std::vector<RowFault> rowFaults;  ///< of rows that are damaged or were changed; none while the run goes on
  std::string
      checksumFault;  ///< why the checksums of the rows cannot be read; empty if they can, or if none were written
};

/// A file that may be absent.
template <class Content>
struct OptionalSource {
  std::optional<Content> content;
  std::string file;    ///< its name
  std::string reason;  ///< why there is no content
};

/// Reads the results and the record of a setup's run; its lock tells whether it is still going on. `filePrefix`: folder
/// and name of the setup. Empty, with the reason, if there are no results.
std::optional<RunSources> readRunSources(const RunConfig& config, const SearchSpace& space,
                                         const std::string& filePrefix, std::string& reason);

OptionalSource<std::vector<FailureRow>> readFailures(const std::string& filePrefix, const ResultFileNames& names);
OptionalSource<PairsByNumber> readPairs(const std::string& filePrefix, const ResultFileNames& names);
/// The settings with which the results were computed.
OptionalSource<RestartSettings> readSettings(const std::string& filePrefix, const ResultFileNames& names);
OptionalSource<SeriesTable> readSeries(const std::string& filePrefix);
OptionalSource<std::vector<ScenarioSeries>> readScenarios(const std::string& filePrefix);

}  // namespace mirevo

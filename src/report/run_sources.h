#pragma once

#include <optional>
#include <string>
#include <vector>

#include "parameters/search_space.h"
#include "run/results/failure_table.h"
#include "run/results/result_table.h"
#include "run/results/run_record.h"
#include "run/results/series_table.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// What a run's files say of it.
struct RunSources {
  ResultTable results;  ///< rows in the order of their numbers, each number once
  RunRecord record;
  std::string recordFault;  ///< why there is no record to be read; empty where there is one, or none was written
  RunStage stage = RunStage::running;
  std::string ended;  ///< empty while the run goes on
};

/// A file that need not be there.
template <class Content>
struct OptionalSource {
  std::optional<Content> content;
  std::string file;    ///< its name
  std::string reason;  ///< why there is no content
};

/// Reads results and record of the setup's run; the run's lock says whether it is going on. `filePrefix`: folder and
/// name of the setup. Nothing, with the reason, where there are no results.
std::optional<RunSources> readRunSources(const RunConfig& config, const SearchSpace& space,
                                         const std::string& filePrefix, std::string& reason);

OptionalSource<std::vector<FailureRow>> readFailures(const std::string& filePrefix, const ResultFileNames& names);
OptionalSource<SeriesTable> readSeries(const std::string& filePrefix);

}  // namespace mirevo

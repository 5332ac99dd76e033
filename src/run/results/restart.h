#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "evaluation/earlier_evaluations.h"
#include "run/results/result_file.h"
#include "run/results/result_table.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The files of a run by which it can be taken up again when it is cut off.
struct RestartFiles {
  std::string results;
  std::string settings;         ///< what they depend on
  std::string simulatedValues;  ///< where the task works with them
};

/// Their names, from that of the result file: `basin_Optimisation.dat` and `basin_Optimisation_Restart.dat`.
RestartFiles restartFiles(const std::string& resultFile);

/// What there is to go on from.
struct EarlierRun {
  std::vector<ResultTable::Row> rows;  ///< in the order of their numbers
  std::vector<std::string> history;    ///< head lines that say when the run was started, and restarted
  /// DDS: the searches that this one goes on from.
  std::vector<EarlierSearch> searches;
  std::vector<std::string> notes;  ///< what the log should say, one line each
};

/// The earlier run whose results stand on disk, as the setup asks to go on from it; nothing where there is none. Rows
/// that are cut off, or that a raised budget makes obsolete, are left out. Throws FatalError where the setup is not
/// that of the earlier run, naming what has changed.
std::optional<EarlierRun> findEarlierRun(const RestartFiles& files, const RunConfig& config,
                                         const ResultColumns& columns);

/// Its evaluations by number. `failures`: why the failed ones did. `simulatedValues`: those of the others, where the
/// task works with them; rows without them are left out, and so made again.
std::map<int, EarlierEvaluations::Record> earlierRecords(
    EarlierRun& run, const ResultColumns& columns, const std::map<int, EvaluationFailure>& failures,
    std::optional<std::map<int, std::vector<double>>> simulatedValues);

/// Writes the settings of this run. Throws FatalError.
void writeRestartSettings(const std::string& path, const RunConfig& config);

}  // namespace mirevo

#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "evaluation/earlier_evaluations.h"
#include "run/results/result_table.h"
#include "run/results/run_record.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The files of a run by which it can be continued when it is cut off.
struct RestartFiles {
  std::string results;
  std::string settings;         ///< what they depend on
  std::string simulatedValues;  ///< where the task works with them
  std::string record;
  std::string failures;
};

/// Their paths; `filePrefix` is folder and name of the setup.
RestartFiles restartFiles(const std::string& filePrefix, const ResultFileNames& names);

/// What there is to go on from.
struct EarlierRun {
  std::vector<ResultRow> rows;  ///< in the order of their numbers
  std::string started;
  std::vector<std::string> restarted;
  /// DDS: the searches that this one goes on from.
  std::vector<EarlierSearch> searches;
  std::vector<std::string> notes;  ///< what the log should say, one line each
};

/// The earlier run whose results stand on disk, as the setup asks to go on from it; nothing where there is none. Rows
/// that are cut off, or that a raised budget makes obsolete, are left out. Throws FatalError where the setup is not
/// that of the earlier run, naming what has changed. `record`: what the earlier run has said of itself; versions of the
/// program before the record's have left none.
std::optional<EarlierRun> findEarlierRun(const RestartFiles& files, const RunConfig& config,
                                         const ResultColumns& columns, std::optional<RunRecord> record);

/// Its evaluations by number. `failures`: why those failed that did. `simulatedValues`: those of the others, where the
/// task works with them; rows without them are left out, and so made again.
std::map<int, EarlierEvaluations::Record> earlierRecords(
    EarlierRun& run, const std::map<int, EvaluationFailure>& failures,
    std::optional<std::map<int, std::vector<double>>> simulatedValues);

/// Writes the settings of this run. Throws FatalError.
void writeRestartSettings(const std::string& path, const RunConfig& config);

}  // namespace mirevo

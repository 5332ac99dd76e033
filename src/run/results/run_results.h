#pragma once

#include <map>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "common/data_table.h"
#include "common/file_lock.h"
#include "evaluation/earlier_evaluations.h"
#include "evaluation/run_comparison.h"
#include "measures/objective_functions.h"
#include "measures/observed_series.h"
#include "parameters/search_space.h"
#include "run/progress/run_log.h"
#include "run/results/failed_run_file.h"
#include "run/results/pairs_file.h"
#include "run/results/restart.h"
#include "run/results/result_file.h"
#include "run/results/run_record_file.h"
#include "run/results/simulated_values_file.h"
#include "run/results/unkept_files.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The files in which the evaluations of a run are kept, behind those of an earlier run where the setup asks to go on
/// from it.
class RunResults final {
 public:
  /// Looks for the earlier run, and changes nothing on disk. `filePrefix`: folder and name of the setup; the files'
  /// names begin with it. Throws FatalError where the earlier run is not one of this setup.
  RunResults(const RunConfig& config, const SearchSpace& space, const std::string& filePrefix);

  /// DDS: the searches that this run goes on from.
  std::vector<EarlierSearch> earlierSearches() const;

  /// `sources`: of all measures, for the account of the run.
  void setSources(std::span<const MeasureSource> sources);

  /// Throws FatalError if the earlier run, which this one is to go on from, has kept simulated values at other times.
  void requireSameTimes(const RunConfig& config, std::span<const ObservedSeries> observed);
  /// Opens the files. Results that the run does not go on from are kept under numbered names. `observed`: the series
  /// whose simulated values are to be kept; empty where the task does not work with them. Says in the log what was
  /// found. Throws FatalError.
  void open(const RunConfig& config, std::span<const ObservedSeries> observed, const ObjectiveAggregator& aggregator,
            RunLog& log);

  /// Throws FatalError if a file or folder that this run would write, rename or remove is not one of a run's.
  void requireReplaceableFiles(const RunConfig& config) const;

  /// Closes what stands beside the table. Throws FatalError when what was written did not all arrive.
  void close();

  /// Writes what the task found, each table to its own file; an earlier one with other content is kept under a numbered
  /// name. Throws FatalError.
  void writeTables(std::span<const DataTable> tables, RunLog& log) const;

  ResultFile& table() { return table_; }
  RestartSettingsFile& settings() { return settings_; }
  FailedRunFile& failedRuns() { return failedRuns_; }
  PairsFile& pairs() { return pairs_; }
  UnkeptFiles& unkeptFiles() { return unkeptFiles_; }
  RunRecordFile& record() { return record_; }
  /// nullptr where the task does not work with simulated values.
  SimulatedValuesFile* simulatedValues() { return simulatedValues_ ? &*simulatedValues_ : nullptr; }
  /// nullptr where there is no earlier run to go on from.
  EarlierEvaluations* earlierEvaluations() { return earlierEvaluations_ ? &*earlierEvaluations_ : nullptr; }

 private:
  RunRecord recordOf(const RunConfig& config, const RunLog& log) const;
  void lockFailedRuns(RunLog& log);
  void makeValuesFile(const RunConfig& config, std::span<const ObservedSeries> observed);
  void warnOfLostRows(RunLog& log) const;
  void startAfresh(const RunConfig& config, RunLog& log);
  void keepEarlierFiles(const RunConfig& config, RunLog& log) const;
  /// Account, tables of failures, pairs and checksums, those of analyses.
  std::vector<std::string> pathsBesideResults() const;
  std::vector<std::string> seriesPaths(const RunConfig& config) const;
  std::vector<std::string> earlierSeries(RunLog& log) const;
  /// Those of an unfinished run do not count any more when it goes on, and can be computed again.
  void removeStatistics(const RunConfig& config) const;
  int restorePairs(const RunConfig& config, const ResultRows& rows, EarlierPairs& earlier, RunLog& log) const;
  void goOn(const RunConfig& config, const ObjectiveAggregator& aggregator, RunLog& log);

  SearchSpace space_;
  std::string filePrefix_;
  std::vector<std::string> tableHead_;  ///< over every table that is for programs
  ResultColumns columns_;
  ResultFileNames names_;
  RestartFiles files_;
  RestartSettingsFile settings_;
  std::optional<EarlierRun> earlierRun_;
  bool earlierRunHasStatistics_ = false;  ///< of an analysis that did not come to its end
  ResultFile table_;
  FileLock failedRunsLock_;  ///< on `calSimErr.dat`
  FailedRunFile failedRuns_;
  PairsFile pairs_;
  UnkeptFiles unkeptFiles_;
  RunRecordFile record_;
  std::map<int, RunRecord::Compared> compared_;
  std::optional<SimulatedValuesFile> simulatedValues_;
  std::optional<EarlierEvaluations> earlierEvaluations_;
};

}  // namespace mirevo

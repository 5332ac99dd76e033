#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "measures/instruction_file.h"
#include "measures/measure_file.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "measures/validation_period.h"
#include "parameters/model_parameter.h"
#include "parameters/template_file.h"
#include "platform/processes/process_launcher.h"
#include "run/access/setup_access.h"
#include "run/tasks/task.h"

namespace mirevo {

enum class RestartMode : std::int32_t {
  startAfresh = 0,
  goOn = 1,
  goOnAndRepeatFailed = 2  ///< failed runs at the end are repeated
};

/// A file that the model writes and the run keeps.
struct SavedOutputFile {
  std::string fileName;
};

/// All settings of a run, composed of those that each part of the program defines for itself. File names are absolute.
struct RunConfig {
  std::string setupFile;    ///< absolute path
  std::string setupFolder;  ///< absolute, without a trailing separator
  std::string setupName;    ///< file name without the ending ".kdx"

  std::unique_ptr<Task> task;  ///< nullptr if the simulation option names none: nothing is run
  std::string title;
  bool writesReport = true;              ///< a report at the end of the run
  std::string improvementCommand;        ///< run by the shell when the best set improves and at the end; empty: none
  double improvementCommandTime = 60.0;  ///< longest time of it, s
  std::vector<BatchItem> batchItems;
  std::string baseFolder;  ///< of which model runs get a copy; of the first batch file, unless the setup names one
  std::vector<ParameterFileItem> parameterFiles;
  std::vector<ModelParameter> parameters;
  std::vector<InternalConstraint> constraints;
  EvaluationPeriod period;
  std::vector<ValidationPeriod> validationPeriods;  ///< each with a name of its own
  AggregationMethod aggregationMethod = AggregationMethod::none;
  double minimumCoverage = 0.0;  ///< share of the first successful run's pairs below which a model run fails
  std::vector<OutputMeasure> measures;
  std::string measureFile;                              ///< may be given though no measure reads it
  std::string instructionFile;                          ///< where its numbers are; empty: in free format
  std::shared_ptr<const InstructionFile> instructions;  ///< its content
  std::vector<MeasureFileSource> furtherMeasureFiles;   ///< behind the first one
  std::vector<ObjectiveFunction> objectives;
  std::vector<SavedOutputFile> savedOutputFiles;

  std::int32_t simultaneousSimulations = 1;
  bool usesMpiWorkers = false;  ///< then `simultaneousSimulations` is 1, for each worker
  bool useSingleThread = false;
  bool linksReadOnlyFiles = false;
  std::string processFolder;        ///< folder for the process folders; empty: that of the setup
  double maxSimulationTime = 0.0;   ///< longest time of a model run, s; 0: no limit
  double maxWorkerSilence = 600.0;  ///< of a worker of a job that has a set, s; 0: no limit

  RestartMode restart = RestartMode::startAfresh;
  bool reuseResults = true;                   ///< as the setup has it, see reusesResults()
  std::int32_t failedRunFolders = 3;          ///< failed model runs whose process folder is kept
  std::vector<ResultSetting> resultSettings;  ///< in reading order; must be unchanged when a run is continued

  /// Model evaluations that the task plans, on which the failed-run limit is based. 0 without a task.
  int plannedEvaluations() const;
  /// plannedEvaluations() and the final model run of a search, for the progress.
  int plannedModelRuns() const;
  /// Most model runs at a time that the task has use for, at least 1.
  int mostAtOnce() const;
  /// Whether the task's results depend on the random seed.
  bool drawsRandomNumbers() const { return task && task->drawsRandomNumbers(); }
  /// Whether the task uses simulated values at the observation times.
  bool keepsSimulatedValues() const { return task && task->keepsSimulatedValues(); }
  /// Whether the task uses output measures in 64 bits that differ from those in the rows.
  bool usesExactMeasures() const;
  /// Whether a set that was run is not run again: its result is known. Files that are kept of every model run, and runs
  /// that the setup lists one by one, need their model runs.
  bool reusesResults() const { return reuseResults && savedOutputFiles.empty() && task && !task->runsEverySet(); }
  /// Whether an output measure is of interface type 1.
  bool readsMeasureFile() const;
  /// "Parameter optimisation: Dynamically Dimensioned Search"; "none" without a task.
  std::string taskDescription() const { return task ? task->description() : "none"; }
  std::size_t variableParameterCount() const;
};

/// The beginning of the paths of the folders that the run makes for its model runs.
std::string processFolderPrefix(const RunConfig& config);

/// Where a setup file is, and the name after which the files of its run are named.
struct SetupLocation {
  std::string file;    ///< absolute path
  std::string folder;  ///< absolute, without a trailing separator
  std::string name;    ///< file name without the ending ".kdx"
};

/// The location of a setup file named on the command line; `fileName` may be relative and end in blanks. Does not
/// access the file.
SetupLocation locateSetup(const std::string& fileName);

}  // namespace mirevo

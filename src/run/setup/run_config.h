#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "parameters/model_parameter.h"
#include "parameters/template_file.h"
#include "platform/processes/process_launcher.h"
#include "run/access/setup_access.h"
#include "run/tasks/task.h"

namespace mirevo {

enum class RestartMode : std::int32_t {
  startAfresh = 0,
  goOn = 1,
  goOnAndRepeatFailed = 2  ///< failed runs at the end are made again
};

/// A file that the model writes and the run keeps.
struct SavedOutputFile {
  std::string fileName;
};

/// All settings of a run. File names are absolute. Composed of the settings that each part defines for itself; no part
/// below the run driver sees the whole.
struct RunConfig {
  std::string setupFile;    ///< absolute path
  std::string setupFolder;  ///< absolute, without a trailing separator
  std::string setupName;    ///< file name without the ending ".kdx"

  std::unique_ptr<Task> task;  ///< nullptr where the simulation option names none: nothing is run
  std::string title;
  bool writesReport = true;  ///< at the end of the run
  std::vector<BatchItem> batchItems;
  std::string baseFolder;  ///< the folder of the first batch file
  std::vector<ParameterFileItem> parameterFiles;
  std::vector<ModelParameter> parameters;
  std::vector<InternalConstraint> constraints;
  EvaluationPeriod period;
  AggregationMethod aggregationMethod = AggregationMethod::none;
  std::vector<OutputMeasure> measures;
  std::string measureFile;
  std::vector<ObjectiveFunction> objectives;
  std::vector<SavedOutputFile> savedOutputFiles;

  std::int32_t simultaneousSimulations = 1;
  bool usesMpiWorkers = false;  ///< then `simultaneousSimulations` is 1, on each worker
  bool useSingleThread = false;
  std::string processFolder;       ///< where the process folders are made; empty: beside the setup
  double maxSimulationTime = 0.0;  ///< seconds that a model run may take; 0: any

  RestartMode restart = RestartMode::startAfresh;
  std::int32_t failedRunFolders = 3;          ///< failed model runs whose process folder is kept
  std::vector<ResultSetting> resultSettings;  ///< in reading order; what may not change when a run is continued

  /// Model evaluations that the task plans; sizes the failed-run limit. 0 without a task.
  int plannedEvaluations() const;
  /// These and the final model run of a search: what progress counts towards.
  int plannedModelRuns() const;
  /// Whether the task's results depend on the random seed.
  bool drawsRandomNumbers() const { return task && task->drawsRandomNumbers(); }
  /// Whether the task works with simulated values at the observation times.
  bool keepsSimulatedValues() const { return task && task->keepsSimulatedValues(); }
  /// "Parameter optimisation: Dynamically Dimensioned Search"; "none" without a task.
  std::string taskDescription() const { return task ? task->description() : "none"; }
  std::size_t variableParameterCount() const;
};

/// What the names of folders that the run makes for its model runs begin with.
std::string processFolderPrefix(const RunConfig& config);

/// Where a setup file is and what the files of its run are named after.
struct SetupLocation {
  std::string file;    ///< absolute path
  std::string folder;  ///< absolute, without a trailing separator
  std::string name;    ///< file name without the ending ".kdx"
};

/// The location of a setup file named on the command line; `fileName` may be relative and end in blanks. Asks the
/// system for the current folder only.
SetupLocation locateSetup(const std::string& fileName);

}  // namespace mirevo

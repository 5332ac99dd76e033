#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>

#include "common/clock.h"
#include "common/file_lock.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"
#include "evaluation/slot_use.h"
#include "measures/objective_functions.h"
#include "parameters/parameter_model.h"
#include "platform/processes/process_launcher.h"
#include "run/improvement_hook.h"
#include "run/results/run_results.h"
#include "run/results/series_recorder.h"
#include "run/run_reporter.h"
#include "run/run_state.h"
#include "run/setup/run_config.h"
#include "run/tasks/task.h"
#include "viewer/live_line.h"

namespace mirevo {

/// One run from its setup file to its exit code. It owns all parts of the run, so that they still exist when an error
/// is reported and are destroyed in reverse order of construction.
class RunDriver final {
 public:
  RunDriver();
  ~RunDriver();
  RunDriver(const RunDriver&) = delete;
  RunDriver& operator=(const RunDriver&) = delete;

  /// Runs the setup file; returns 0 after "Normal termination", else 1. Errors that end a run are caught only here.
  int run(const std::string& setupFileName);
  /// The job, which is ended when everything else has been; none is left here.
  std::unique_ptr<Job> takeJob() { return std::move(state_.job); }

 private:
  /// How the run ends.
  struct Ending {
    RunStage stage = RunStage::finished;
    std::string closingLine;  ///< of the result file
    std::string message;      ///< the message with its details
    std::string time = dateAndTimeNow();
  };
  /// A file that could not be completed.
  struct Unwritten {
    std::string path;
    std::string reason;
  };

  /// Joins the job of the run. Throws FatalError like joinJob().
  void startJob();
  void openRun(const std::string& setupFileName);
  void warn(std::string_view text);
  void lockProcessFoldersOfJob(const std::string& prefix);
  void buildModel();
  void tellOfFolders(const FoldersMade& made);
  void logSetup();
  void openResults();
  void putEarlierReportAside();
  /// Runs the task, if there is one, and writes its files.
  const TaskOutcome& runTask();
  void writeFiles(std::span<const TaskFile> files);
  TaskContext taskContext();
  /// At an early end: logs and writes the statistics of what succeeded, and returns their lines for the result file.
  /// Nothing that goes wrong here may hide why the run ended.
  std::vector<std::string> keepStatistics();
  std::optional<TaskOutcome> statisticsOfEarlyEnd();
  /// Completes the results and the record of the run; returns what failed, if anything. `report`: what the task found.
  std::optional<Unwritten> closeResults(const Ending& ending, std::span<const std::string> report = {});
  void closeResultsOfEarlyEnd(const Ending& ending, std::span<const std::string> report);
  void completeRecord(const Ending& ending);
  /// Writes the HTML report, if the setup asks for it and there are results. Failures are warnings.
  void reportRun();
  void finish(const TaskOutcome& outcome);
  void openHook();
  HookValues hookValues(const ResultRow& row) const;
  /// Remembers the best evaluation for the end of the improvement command; before the results are closed.
  void noteBestForHook();
  void finishHook(std::string_view state);
  void logFailures();
  void logDifferences();
  void tellOfBestThatDiffers();
  void tellWarning(std::string_view text);
  int endInError(std::string_view message, std::string_view detail);
  void endLogInError(std::string_view message, std::string_view details);
  void closeLog();
  int endCancelled(std::string_view message);
  /// Closes the log, halts the model processes, leaves the job and ends the progress.
  int endEarly(std::string_view ending, std::string_view state);
  void endProgress(std::string_view ending);
  std::string warningCountText() const;
  std::string whereWarningsAre() const;
  void tellOfWarnings() const;

  std::optional<LiveLine> liveLine_;
  double toldOfFolders_ = 0.0;  ///< seconds after their making had begun
  RunState state_;
  FileLock runLock_;      ///< on the files with the setup's name
  FileLock processLock_;  ///< the master's, on the process folders of the job
  bool isSetupRead_ = false;
  bool hasBegun_ = false;   ///< from now on files of earlier runs are touched
  std::string filePrefix_;  ///< folder and name of the setup, without ".kdx": the beginning of the paths of the run's
                            ///< files
  RunConfig config_;
  std::unique_ptr<ParameterModel> parameters_;
  std::unique_ptr<ObjectiveAggregator> aggregator_;
  std::optional<RunResults> results_;
  std::unique_ptr<SeriesRecorder> series_;
  std::unique_ptr<ScenarioSeriesFile> scenarioSeries_;
  std::unique_ptr<RunReporter> reporter_;
  std::unique_ptr<ImprovementHook> hook_;  ///< if there is an improvement command
  std::optional<HookValues> bestAtEnd_;    ///< for it
  std::optional<FailedRunPolicy> failedRunPolicy_;
  std::unique_ptr<ProcessLauncher> launcher_;
  std::unique_ptr<ModelRunner> runner_;
  SlotUse slotUse_;
  std::unique_ptr<Evaluator> evaluator_;
  std::optional<TaskOutcome> outcome_;  ///< of the task, once it has come to its end
  bool hasLoggedDifferences_ = false;
};

}  // namespace mirevo

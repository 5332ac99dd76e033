#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "common/clock.h"
#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"
#include "measures/objective_functions.h"
#include "parameters/parameter_model.h"
#include "platform/processes/process_launcher.h"
#include "run/results/run_lock.h"
#include "run/results/run_results.h"
#include "run/results/series_recorder.h"
#include "run/run_reporter.h"
#include "run/run_state.h"
#include "run/setup/run_config.h"
#include "run/tasks/task.h"

namespace mirevo {

/// One run from its setup file to its exit code. It owns everything that the run is made of, so that all of it is still
/// there when an error is reported, and goes away in the reverse order of its making.
class RunDriver final {
 public:
  RunDriver();
  ~RunDriver();
  RunDriver(const RunDriver&) = delete;
  RunDriver& operator=(const RunDriver&) = delete;

  /// Runs the setup file; 0 after "Normal termination", else 1. The one place where an error ends a run.
  int run(const std::string& setupFileName);

 private:
  /// How the run ends.
  struct Ending {
    RunStage stage = RunStage::finished;
    std::string closingLine;  ///< of the result file
    std::string message;      ///< with all that is known of the reason
    std::string time = dateAndTimeNow();
  };
  /// A file that could not be brought to its end.
  struct Unwritten {
    std::string path;
    std::string reason;
  };

  /// Settles this process's part in the run's job. Throws FatalError when a job launcher started several processes that
  /// cannot be brought together, as they would all write the same files.
  void startJob();
  void openRun(const std::string& setupFileName);
  void buildModel();
  void logSetup();
  void openResults();
  void putEarlierReportAside();
  void openSeries();
  /// Runs the task, where there is one, and writes the files that it gives.
  TaskOutcome runTask();
  /// Brings the results and the record of the run to their end; what failed, if anything did. `report`: what the task
  /// found.
  std::optional<Unwritten> closeResults(const Ending& ending, std::span<const std::string> report = {});
  void completeRecord(const Ending& ending);
  /// The report of what was done, where there is anything and the setup wants it. What goes wrong with it is a warning.
  void reportRun();
  void finish(const TaskOutcome& outcome);
  void logFailures();
  int endInError(std::string_view message, std::string_view detail);
  int endCancelled(std::string_view message);
  /// Log closed, model processes halted, job left, progress ended.
  int endEarly(std::string_view ending);
  void endProgress(std::string_view ending);
  std::vector<std::string> closingLines(const Ending& ending) const;

  RunState state_;
  RunLock lock_;
  std::string filePrefix_;  ///< folder and name of the setup, without ".kdx": the run's files begin with it
  RunConfig config_;
  std::unique_ptr<ParameterModel> parameters_;
  std::unique_ptr<ObjectiveAggregator> aggregator_;
  std::optional<RunResults> results_;
  std::unique_ptr<SeriesRecorder> series_;
  std::unique_ptr<RunReporter> reporter_;
  std::optional<FailedRunPolicy> failedRunPolicy_;
  std::unique_ptr<ProcessLauncher> launcher_;
  std::unique_ptr<ModelRunner> runner_;
  std::unique_ptr<Evaluator> evaluator_;
};

}  // namespace mirevo

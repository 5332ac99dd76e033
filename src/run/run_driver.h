#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "evaluation/evaluator.h"
#include "evaluation/failed_run_policy.h"
#include "evaluation/model_run.h"
#include "measures/objective_functions.h"
#include "parameters/parameter_model.h"
#include "platform/processes/process_launcher.h"
#include "report/report_data.h"
#include "run/results/run_lock.h"
#include "run/results/run_results.h"
#include "run/results/series_recorder.h"
#include "run/run_reporter.h"
#include "run/run_state.h"
#include "run/setup/run_config.h"
#include "run/tasks/tasks.h"

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
  /// Settles this process's part in the run's job. Throws FatalError when a job launcher started several processes that
  /// cannot be brought together, as they would all write the same files.
  void startJob();
  void openRun(const std::string& setupFileName);
  void buildModel();
  void logSetup();
  void openResults();
  void putEarlierReportAside();
  void openSeries();
  /// False, with the system's reason, when the results could not be brought to their end. `report`: what the task
  /// found.
  bool closeResults(std::string_view terminationMessage, std::string& reason, std::span<const std::string> report = {});
  /// The report of what was done, where there is anything and the setup wants it. What goes wrong with it is a warning.
  void reportRun(RunStateShown state, std::string_view message);
  void finish(const TaskOutcome& outcome);
  void logFailures();
  int endInError(std::string_view message, std::string_view detail);
  int endCancelled(std::string_view message);
  /// Log closed, model processes halted, job left, progress ended.
  int endEarly(std::string_view ending);
  void endProgress(std::string_view ending);
  std::vector<std::string> closingLines(std::string_view terminationMessage) const;

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

#include "run/setup_check.h"

#include <cstdint>
#include <new>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/run_files.h"
#include "common/text.h"
#include "common/utf8.h"
#include "evaluation/local_evaluator.h"
#include "measures/item_names.h"
#include "platform/processes/child_guard.h"
#include "platform/processes/folder_tree.h"
#include "platform/processes/posix_process_launcher.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/front_end.h"
#include "run/check_text.h"
#include "run/results/earlier_sample_file.h"
#include "run/run_model.h"
#include "run/setup/setup_reader.h"
#include "run/signal_handlers.h"

namespace mirevo {
namespace {

class SetupCheck final {
 public:
  SetupCheck() {
    log_.passWarningsTo([this](std::string_view record) { warn(record); });
  }

  void run(const std::string& setupFileName);
  int exitCode() const { return exitCode_; }

 private:
  /// Names and contents of files may be in any encoding.
  void print(std::string_view text) {
    if (writeAnswer(withValidUtf8(text) + "\n") != 0) exitCode_ = 1;
  }
  void warn(std::string_view record) {
    ++warningCount_;
    print(record);
  }
  void runModel();
  void checkEarlierResults(const SearchSpace& space, const Feasibility& feasibility,
                           std::span<const ObservedSeries> observed);
  /// Throws FatalError if the run yields no result.
  void judgeRun(ModelRunner& runner, ProcessLauncher& launcher, std::span<const double> set, std::string_view what);
  EvaluationResult resultOf(ModelRunner& runner, ProcessLauncher& launcher, std::span<const double> set);
  void tryModel(ParameterModel& parameters, ModelRunner& runner, ProcessLauncher& launcher);
  void printParameters(ParameterModel& parameters, std::string_view title, std::span<const double> set);
  void printResult(const EvaluationResult& result, ModelRunner& runner);

  RunLog log_;  ///< never opened: of it the warnings alone are needed
  RunConfig config_;
  int warningCount_ = 0;
  std::string fault_;  ///< of a setup that is accepted, but whose run cannot come to its end
  int exitCode_ = 0;
  bool isRun_ = true;  ///< the model; false: its parameter set cannot be
};

void SetupCheck::run(const std::string& setupFileName) {
  installSignalHandlers();
  const SetupLocation setup = locateSetup(setupFileName);
  requireSetupFile(setup);
  print("Check of " + setup.file);
  config_ = readSetupFile(setupFileName, log_);
  print("Task: " + config_.taskDescription());
  if (config_.task) print(fmt::format("Planned model runs: {}", config_.plannedModelRuns()));
  runModel();
  if (exitCode_ != 0) return;
  if (!fault_.empty()) fatalError("Error: The run would end before it is complete", fault_);
  print(fmt::format("Nothing is wrong{}; no file of a run was made or changed",
                    warningCount_ == 0 ? std::string()
                                       : ", but for " + countText(static_cast<std::size_t>(warningCount_), "warning")));
}

void SetupCheck::runModel() {
  ParameterModel parameters(config_.parameters, config_.constraints);
  ObjectiveAggregator aggregator(config_.objectives, config_.aggregationMethod);
  if (config_.task) {
    config_.task->requireSets(parameters.searchSpace(), parameters.feasibility());
    for (const SetDoubt& doubt : config_.task->setDoubts(parameters.searchSpace(), parameters.feasibility())) {
      log_.warning(doubt.text);
      if (doubt.endsRun) fault_ = doubt.text;
    }
  }
  PosixProcessLauncher launcher;
  signalState.haltProcesses = haltProcessesFromSignal;
  config_.measures = withItemNumbers(config_.measures);
  ModelDescription model = describeModel(config_);
  model.runsAtOnce = 1;
  model.hasShownSeries = true;
  LauncherSettings settings = launcherSettings(config_, 1);
  settings.processFolderPrefix = runFilePath(processFolderPrefix(config_), run_files::kCheckFolder);
  const auto warnAbout = [this](std::string_view text) { log_.warning(text); };
  settings.warn = warnAbout;
  ModelRunner runner(std::move(model), parameters, aggregator, launcher, settings);
  for (const std::string& text : modelDoubts(config_, parameters, runner)) warnAbout(text);
  const std::string folder = launcher.getProcessFolder(1);
  isRun_ = false;
  try {
    if (config_.task) {
      config_.task->requireObservations(parameters.searchSpace(), config_.measures, config_.objectives,
                                        runner.output().observedSeries());
    }
    isRun_ = true;
    tryModel(parameters, runner, launcher);
  } catch (const FatalError& error) {
    if (!isRun_) {
      removeTree(folder);
      throw;
    }
    const std::string kept = "The folder in which the model was run is kept: " + folder;
    fatalError(error.message(), error.detail().empty() ? kept : error.detail() + "\n" + kept);
  }
  removeTree(folder);  // while it is still locked
  checkEarlierResults(parameters.searchSpace(), parameters.feasibility(), runner.output().observedSeries());
}

/// With the initial values; where these cannot be run and the task does without them, with a set of the task.
void SetupCheck::tryModel(ParameterModel& parameters, ModelRunner& runner, ProcessLauncher& launcher) {
  const SearchSpace& space = parameters.searchSpace();
  printParameters(parameters, "Initial values", space.initial);
  const auto violation = parameters.feasibility().violation(space.initial);
  if (violation && config_.task) {
    const std::string what = "They cannot be run, and this task does without them: " + *violation;
    if (!config_.task->earlierResultFile().empty()) {
      print(what + "\nThe model is not run: the evaluations are those of an earlier run");
      return;
    }
    if (const auto set = config_.task->trialSet(space, parameters.feasibility())) {
      print(what);
      printParameters(parameters, "Values of a set of the task, with which the model is run instead", *set);
      return judgeRun(runner, launcher, *set, "these values");
    }
  }
  judgeRun(runner, launcher, space.initial, "the initial values");
}

/// Of a task that judges the evaluations of an earlier run.
void SetupCheck::checkEarlierResults(const SearchSpace& space, const Feasibility& feasibility,
                                     std::span<const ObservedSeries> observed) {
  const std::string file = config_.task ? config_.task->earlierResultFile() : std::string();
  if (file.empty()) return;
  const EarlierSample earlier = readEarlierSample(file, config_, space, feasibility, observed);
  for (const std::string& text : earlier.notes) print(text);
  for (const std::string& text : earlier.warnings) log_.warning(text);
}

void SetupCheck::judgeRun(ModelRunner& runner, ProcessLauncher& launcher, std::span<const double> set,
                          std::string_view what) {
  const double began = runTimeClock();
  const EvaluationResult result = resultOf(runner, launcher, set);
  if (isRun_) print(fmt::format("It took {:.2f} s, with the reading of its results", runTimeClock() - began));
  for (const std::string& text : result.warnings) log_.warning(text);
  for (const FileDoubt& doubt : result.doubts) log_.warning(doubt.text);
  for (const UnusedObservations& unused : result.unusedObservations) log_.warning(unused.text);
  if (const std::string left = launcher.leftBehind(1); !left.empty()) log_.warning(left);
  if (result.ok()) return printResult(result, runner);
  std::string detail = result.failure->reason;
  for (const std::string& line : result.failure->lastOutput) detail += "\n   " + line;
  fatalError(fmt::format("Error: The evaluation of {} failed: {}", what, failureKindName(result.failure->kind)),
             detail);
}

EvaluationResult SetupCheck::resultOf(ModelRunner& runner, ProcessLauncher& launcher, std::span<const double> set) {
  if (auto failure = runner.prepareModelRun(set, 1, 1)) {
    isRun_ = false;
    return runner.failedResult(std::move(*failure));
  }
  print(fmt::format("The model is run in {}", launcher.getProcessFolder(1)));
  for (std::int32_t executing = 1, status = 0; executing != 0;) {
    launcher.isExecuting(1, executing, status);
    if (executing != 0) launcher.waitForChange(kPollSeconds);
  }
  return runner.collect(1);
}

void SetupCheck::printParameters(ParameterModel& parameters, std::string_view title, std::span<const double> set) {
  const SearchSpace& space = parameters.searchSpace();
  const std::vector<double> values = ToModelScale(space, set);
  print(fmt::format("{}:", title));
  for (std::size_t i = 0; i < space.size(); ++i) {
    print(fmt::format("   {} = {}", space.names[i], formatReal(values[i])));
  }
  for (const std::string& text : otherValueTexts(parameters, values)) print("   " + text);
}

void SetupCheck::printResult(const EvaluationResult& result, ModelRunner& runner) {
  const std::vector<PeriodSeries> observations = runner.output().readShownObservations();
  const CheckedRun run{config_,
                       result,
                       runner.output().sources(),
                       runner.output().shownMeasures(),
                       observations,
                       runner.aggregator().isSettled()};
  for (const std::string& line : checkedRunLines(run)) print(line);
}

int failed(std::string_view message, std::string_view detail) {
  showMessage(detail.empty() ? std::string(message) : fmt::format("{}\n{}", message, detail));
  return 1;
}

}  // namespace

int checkSetup(const std::string& setupFileName) {
  try {
    SetupCheck check;
    check.run(setupFileName);
    return check.exitCode();
  } catch (const FatalError& error) {
    return failed(trimTrailing(error.message()), error.detail());
  } catch (const std::bad_alloc&) {
    return failed("Error: Unable to allocate memory", {});
  } catch (const std::exception& error) {
    return failed("Error: Unexpected failure", error.what());
  }
}

}  // namespace mirevo

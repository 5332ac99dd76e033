#include "run/run_driver.h"

#include <filesystem>
#include <new>
#include <unistd.h>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "evaluation/local_evaluator.h"
#include "evaluation/mpi_evaluator.h"
#include "measures/period_series.h"
#include "platform/posix_process_launcher.h"
#include "run/mpi_start.h"
#include "run/run_model.h"
#include "run/run_report.h"
#include "run/setup_reader.h"
#include "run/setup_summary.h"
#include "run/setup_warnings.h"
#include "run/signal_handlers.h"
#include "run/signal_state.h"
#include "run/tasks.h"
#include "run/version.h"
#include "run/worker_run.h"

namespace mirevo {
namespace {

constexpr std::string_view kNormalTermination = "Normal termination";
/// For all workers to have ended their models, which may take a grace time and a kill.
constexpr double kWorkerStopSeconds = 20.0;
/// At the end of a task, when a worker that was not needed may still be copying a large base folder.
constexpr double kWorkerPatienceSeconds = 600.0;
constexpr double kPatienceSeconds = 3.0;  ///< for an earlier run of the setup that is just ending

std::string environmentValue(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? std::string{} : std::string(value);
}

}  // namespace

RunDriver::RunDriver() = default;

RunDriver::~RunDriver() {
  signalState.runLogDescriptor = -1;
}

int RunDriver::run(const std::string& setupFileName) {
  try {
    startMpi(state_);
    if (state_.mpiRank > 0) return runWorker(state_.mpi);
    openRun(setupFileName);
    const std::string setupText = readSetupText(setupFileName);
    config_ = readSetup(setupFileName, setupText, state_.log, state_.mpiInUse);
    buildModel();
    logSetup();
    openResults();
    // Not before earlier results have been renamed: where they lie in the base folder, workers look at them.
    if (state_.mpiInUse) beginWorkers(state_.mpi, {config_.setupFile, setupText});
    state_.progress.writeMessage("Title: " + config_.title);
    state_.progress.writeStatus(taskName(config_));
    state_.progress.progressEvaluationLabel(config_.plannedEvaluations());
    finish(runTask({config_, parameters_->searchSpace(), *evaluator_, state_.log,
                    [this](const SearchSummary& summary) { reporter_->takeBestOf(summary); }, filePrefix_,
                    runner_->observedSeries()}));
    return 0;
  } catch (const FatalError& error) {
    return endInError(error.message(), error.detail());
  } catch (const RunCancelled& cancelled) {
    return endCancelled(cancelled.what());
  } catch (const std::bad_alloc&) {
    return endInError(
        evaluator_ ? "Error: Unable to allocate memory" : "Error: Unable to allocate memory in MIREVO setup", {});
  } catch (const std::exception& error) {
    return endInError("Error: Unexpected failure", error.what());
  }
}

void RunDriver::openRun(const std::string& setupFileName) {
  installSignalHandlers();
  const SetupLocation setup = locateSetup(setupFileName);
  filePrefix_ = setup.folder + "/" + setup.name;
  if (!lock_.take(setup.file, kPatienceSeconds)) {
    fatalError("Error: Another run of this setup is in progress",
               setup.file + ": both would work in the same folders. Wait for it, or run a copy under another name.");
  }
  const std::string logFile = filePrefix_ + ".log";
  const std::string keptLog = keepEarlierFile(logFile);
  std::string reason;
  if (!state_.log.open(logFile, reason)) fatalError("Error: Unable to open " + logFile, reason);
  signalState.runLogDescriptor = state_.log.descriptor();
  state_.log.line(fmt::format("Mirevo {}, started {}", programVersion(), dateAndTimeNow()));
  state_.log.line("Setup file: " + setup.file);
  if (!keptLog.empty()) state_.log.line("The log of the earlier run was kept as " + keptLog);

  const std::string problems = state_.progress.progressInit(logFile, environmentValue("VOLK_PROGRESS"));
  for (const std::string_view problem : splitLines(problems)) {
    state_.log.warning(problem);
    showMessage(problem);
  }
  state_.progress.progressStart(fmt::format("{} on {}, process {}", dateAndTimeWithZone(), hostName(), ::getpid()));
}

void RunDriver::buildModel() {
  parameters_ = std::make_unique<ParameterModel>(config_.parameters, config_.constraints);
  aggregator_ = std::make_unique<ObjectiveAggregator>(config_.objectives, config_.aggregationMethod);
  launcher_ = std::make_unique<PosixProcessLauncher>();
  signalState.haltProcesses = haltProcessesFromSignal;
  const int slotCount = state_.mpiInUse ? 0 : config_.simultaneousSimulations;  // the master runs no model
  runner_ = std::make_unique<ModelRunner>(describeModel(config_), *parameters_, *aggregator_, *launcher_,
                                          launcherSettings(config_, slotCount));
}

void RunDriver::logSetup() {
  state_.log.line("");
  state_.log.line(setupSummary(config_, parameters_->searchSpace(), parameters_->evaluationOrder()));
  for (const std::string& text : unusedParameterWarnings(config_.parameters, runner_->templates())) {
    state_.log.warning(text);
  }
  for (const ParameterTemplate& parameterTemplate : runner_->templates()) {
    for (const std::string& text : parameterTemplate.narrowPlaceholderWarnings(config_.parameters)) {
      state_.log.warning(text);
    }
  }
  if (state_.mpiInUse) {
    state_.log.line(fmt::format("MPI job: this master and {} workers, each of which runs one model at a time",
                                state_.mpiProcessCount - 1));
  }
  state_.log.line("");
}

void RunDriver::openResults() {
  state_.objectiveValues.resize(config_.objectives.size());
  const SearchSpace& space = parameters_->searchSpace();
  const std::string failedRunPath = std::filesystem::path(filePrefix_).replace_filename("calSimErr.dat").string();
  keepEarlierFile(failedRunPath);
  failedRunFile_ = std::make_unique<FailedRunFile>(failedRunPath, config_.setupName, space.names);

  openResultFile();
  if (const std::string kept = keepEarlierFile(filePrefix_ + "_Saved"); !kept.empty()) {
    state_.log.line("The saved output files of the earlier run were kept as " + kept);
  }
  reporter_ = std::make_unique<RunReporter>(state_, results_, *failedRunFile_, space);
  openSeries();
  failedRunPolicy_.emplace(config_.plannedEvaluations());
  if (state_.mpiInUse) {
    evaluator_ = std::make_unique<MpiEvaluator>(*runner_, state_.mpi, *reporter_, *failedRunPolicy_);
  } else {
    evaluator_ =
        std::make_unique<LocalEvaluator>(*runner_, *reporter_, *failedRunPolicy_, config_.simultaneousSimulations);
  }
}

void RunDriver::openResultFile() {
  const std::string_view ending = resultFileEnding(config_);
  if (ending.empty()) return;
  const std::string path = filePrefix_ + std::string(ending);
  if (const std::string kept = keepEarlierFile(path); !kept.empty()) {
    state_.log.line("The results of the earlier run were kept as " + kept);
  }
  ResultColumns columns;
  columns.parameters = parameters_->searchSpace().names;
  for (const OutputMeasure& measure : config_.measures) columns.measures.push_back(measure.name);
  for (const ObjectiveFunction& objective : config_.objectives) columns.objectives.push_back(objective.name);
  const std::vector<std::string> head{config_.title,
                                      fmt::format("Mirevo {}", programVersion()),
                                      taskName(config_),
                                      fmt::format("Random seed: {}", config_.randomSeed),
                                      "Setup file: " + config_.setupFile,
                                      "Started: " + dateAndTimeNow()};
  results_.open(path, head, columns);
}

void RunDriver::openSeries() {
  const std::string path = filePrefix_ + "_Series.dat";
  keepEarlierFile(path);
  if (runner_->shownMeasures().empty()) return;
  RecordedSeries run;
  run.headLines = {
      columnName(config_.title), fmt::format("Mirevo {}", programVersion()), "Setup file: " + config_.setupFile,
      fmt::format("Evaluation period: {} to {}", formatDate(config_.period.start), formatDate(config_.period.end))};
  run.measures = seriesNames(config_.measures, runner_->shownMeasures());
  run.observations = runner_->readShownObservations();
  run.periodFirst = secondNumber(config_.period.start);
  run.periodLast = secondNumber(config_.period.end);
  series_ = std::make_unique<SeriesRecorder>(path, std::move(run), runTimeClock,
                                             [this](std::string_view text) { state_.log.warning(text); });
  reporter_->recordSeries(*series_);
}

std::vector<std::string> RunDriver::closingLines(std::string_view terminationMessage) const {
  std::vector<std::string> lines{std::string(terminationMessage)};
  if (!reporter_ || !reporter_->best()) return lines;
  const RunReporter::Best& best = *reporter_->best();
  lines.push_back(fmt::format("Best evaluation: {}", best.number));
  lines.push_back("Best aggregate: " + formatReal(best.aggregate));
  const std::vector<std::string>& names = parameters_->searchSpace().names;
  for (std::size_t i = 0; i < names.size(); ++i) {
    lines.push_back(fmt::format("Best {} = {}", names[i], formatReal(best.parameterValues[i])));
  }
  return lines;
}

bool RunDriver::closeResults(std::string_view terminationMessage, std::string& reason,
                             std::span<const std::string> report) {
  if (reporter_) reporter_->settle(*aggregator_);
  if (series_) series_->finish(reporter_->best());
  std::vector<std::string> lines = closingLines(terminationMessage);
  lines.insert(lines.end(), report.begin(), report.end());
  return results_.finish(lines, reason);
}

void RunDriver::reportRun(RunStateShown state, std::string_view message) {
  if (!config_.writesReport || results_.path().empty()) return;
  std::string reason;
  if (!writeReport(config_, filePrefix_, RunEnding{state, std::string(message)}, reason)) {
    state_.log.warning("The report cannot be written: " + reason);
  }
}

void RunDriver::finish(const TaskOutcome& outcome) {
  std::string reason;
  if (!closeResults(outcome.terminationMessage, reason, outcome.report)) {
    fatalError("Error: Unable to write to " + results_.path(), reason);
  }
  reportRun(RunStateShown::finished, outcome.terminationMessage);
  state_.log.line("");
  state_.log.line(
      fmt::format("{} model evaluations, {} of them failed", reporter_->evaluationCount(), reporter_->failedCount()));
  state_.log.line("");
  state_.log.line(kNormalTermination);
  if (!state_.log.writeError().empty()) {
    fatalError("Error: Unable to write to " + state_.log.path(), state_.log.writeError());
  }
  signalState.runLogDescriptor = -1;
  leaveJob(0, kNormalTermination);
  state_.log.close();
  state_.progress.progressEnd(kNormalTermination);
}

int RunDriver::endInError(std::string_view message, std::string_view detail) {
  std::string text(trimTrailing(message));
  if (!text.empty()) {
    if (!detail.empty()) text.append("\n").append(detail);
    if (reporter_ && reporter_->failedCount() > 0) text += "\nfailed model runs are described in calSimErr.dat";
    state_.log.line("");
    state_.log.line(text);
    showMessage(text);
  }
  std::string reason;
  closeResults(message, reason);              // the run has failed already, with the first reason
  if (launcher_) launcher_->haltProcesses();  // no model waits for the report
  reportRun(RunStateShown::failed, text);
  return endEarly(message);
}

int RunDriver::endCancelled(std::string_view message) {
  showMessage(message);
  std::string reason;
  if (!closeResults(message, reason)) {
    state_.log.line(fmt::format("Error: Unable to write to {}\n{}", results_.path(), reason));
  }
  if (launcher_) launcher_->haltProcesses();
  reportRun(RunStateShown::cancelled, message);
  return endEarly(message);
}

int RunDriver::endEarly(std::string_view ending) {
  signalState.runLogDescriptor = -1;
  state_.log.close();
  if (launcher_) launcher_->haltProcesses();
  leaveJob(1, ending);
  state_.progress.progressEnd(ending);
  return 1;
}

void RunDriver::leaveJob(int exitCode, std::string_view ending) {
  if (!state_.mpiInUse) return;
  std::string reason = "a worker did not answer the request to stop";
  const auto warn = [this, exitCode](const std::string& text) {
    if (exitCode != 0) return;  // the run has failed already, with the first reason
    state_.log.warning(text);
    showMessage("Warning: " + text);
  };
  try {
    if (stopWorkers(state_.mpi, exitCode == 0 ? kWorkerPatienceSeconds : kWorkerStopSeconds, warn)) {
      state_.mpi.finalise(kWorkerStopSeconds);
      return;
    }
  } catch (const FatalError& error) {
    reason = error.message() + "\n" + error.detail();
  }
  showMessage("Warning: All processes of the MPI job are aborted: " + reason);
  state_.progress.progressEnd(ending);
  state_.mpi.abort(exitCode);
}

}  // namespace mirevo

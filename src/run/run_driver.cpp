#include "run/run_driver.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <new>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/file_lock.h"
#include "common/progress_messages.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "common/version.h"
#include "evaluation/local_evaluator.h"
#include "evaluation/ranks/rank_evaluator.h"
#include "measures/item_names.h"
#include "platform/processes/child_guard.h"
#include "platform/processes/posix_process_launcher.h"
#include "platform/processes/process_folder.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/front_end.h"
#include "report/run_report.h"
#include "run/job_end.h"
#include "run/results/earlier_sample_file.h"
#include "run/results/record_file.h"
#include "run/results/shared_files.h"
#include "run/run_findings.h"
#include "run/run_model.h"
#include "run/run_series.h"
#include "run/setup/setup_reader.h"
#include "run/setup/setup_summary.h"
#include "run/signal_handlers.h"
#include "run/stop_run.h"
#include "run/worker_run.h"

namespace mirevo {
namespace {

using progress::kNormalTermination;

std::string environmentValue(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? std::string{} : std::string(value);
}

constexpr std::string_view kAnotherRun = "Error: Another run of this setup is in progress";

/// Runs that share a file by the names of their setups must not be going on at the same time. Of two that begin
/// together the one with the shorter name waits longer, so that not both give up.
void awaitRunsThatShare(const std::string& setupFile, const std::string& prefix) {
  const double start = runTimeClock();
  for (std::string other; !(other = runningPrefixThatShares(prefix)).empty();) {
    const bool isShorter = prefix.size() < other.size();
    if (runTimeClock() - start >= (isShorter ? 2.0 : 1.0) * kLockPatienceSeconds) {
      fatalError(kAnotherRun, fmt::format("{}: a run{} of {}.kdx, which has results with the same names, {}*. Wait for "
                                          "it, or run a copy under another name.",
                                          setupFile, FileLock::holderOf(runFilePath(other, run_files::kRunLock)), other,
                                          isShorter ? other : prefix));
    }
    ::usleep(kLockPauseMicroseconds);
  }
}

}  // namespace

RunDriver::RunDriver() = default;

RunDriver::~RunDriver() {
  signalState.runLogDescriptor = -1;
  signalState.resultFileDescriptor = -1;
}

int RunDriver::run(const std::string& setupFileName) {
  try {
    startJob();
    if (state_.mpiRank > 0) return runWorker(*state_.job);
    openRun(setupFileName);
    const std::string setupText = readSetupText(setupFileName);
    config_ = readSetup(setupFileName, setupText, state_.log, state_.job->hasWorkers());
    isSetupRead_ = true;
    buildModel();
    logSetup();
    openResults();
    // After earlier results have been renamed: if they are in the base folder, workers examine them.
    beginWorkers(*state_.job, {config_.setupFile, setupText});
    state_.progress.writeMessage(std::string(progress::kTitle) + config_.title);
    state_.progress.writeStatus(config_.taskDescription());
    state_.progress.progressEvaluationLabel(config_.plannedModelRuns());
    finish(runTask());
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

void RunDriver::startJob() {
  state_.job = joinJob();
  state_.mpiRank = state_.job->rank();
  state_.mpiProcessCount = state_.job->processCount();
  state_.mpiInUse = state_.job->hasWorkers();
}

void RunDriver::openRun(const std::string& setupFileName) {
  installSignalHandlers();
  const SetupLocation setup = locateSetup(setupFileName);
  filePrefix_ = setup.folder + "/" + setup.name;
  requireSetupFile(setup);
  std::error_code ignored;
  if (!runLock_.take(runFilePath(filePrefix_, run_files::kRunLock), {}, kLockPatienceSeconds)) {
    fatalError(kAnotherRun,
               fmt::format("{}: another run{} writes the files {}*. Wait for it, or run a copy under another name.",
                           setup.file, runLock_.holder(), filePrefix_));
  }
  awaitRunsThatShare(setup.file, filePrefix_);
  const std::string logFile = runFilePath(filePrefix_, run_files::kLog);
  requireReplaceable(logFile, run_files::kLog);
  const std::string keptLog = RunLog::isOfNoRun(logFile) ? std::string() : keepEarlierFile(logFile);
  std::string reason;
  if (!state_.log.open(logFile, reason)) {
    fatalError("Error: Unable to open " + logFile,
               reason + ": a run writes its log and its results beside the setup, in a folder that must be writable");
  }
  signalState.runLogDescriptor = state_.log.descriptor();
  state_.log.line(fmt::format("Mirevo {}, started {}", programVersion(), dateAndTimeNow()));
  state_.log.line("Setup file: " + setup.file);
  if (!keptLog.empty()) state_.log.line("The log of the earlier run was kept as " + keptLog);

  // Where the name of the setup is mistyped, nothing more is made than a log and a message file.
  const std::string terminationLog = runFilePath(filePrefix_, run_files::kTerminationLog);
  const bool leavesEnding =
      std::filesystem::exists(setup.file, ignored) || std::filesystem::exists(terminationLog, ignored);
  std::string keptTerminationLog;
  const std::string terminationLogProblem =
      leavesEnding ? openTerminationLog(terminationLog, &keptTerminationLog) : std::string();
  logKept(terminationLog, keptTerminationLog, state_.log);
  const std::string destination = environmentValue("VOLK_PROGRESS");
  const std::string progressProblems = state_.progress.progressInit(logFile, destination);
  if (wantsLiveLine(destination)) {
    liveLine_.emplace();
    state_.progress.passRecordsTo([this](std::string_view record) { liveLine_->take(record); });
  }
  state_.progress.progressStart(dateAndTimeWithZone(), hostName(), ::getpid());
  state_.log.passWarningsTo([this](std::string_view text) { state_.progress.writeMessage(text); });
  for (const std::string_view problems :
       {std::string_view(terminationLogProblem), std::string_view(progressProblems)}) {
    for (const std::string_view problem : splitLines(problems)) warn(problem);
  }
  if (!runLock_.warning().empty()) warn(runLock_.warning());
}

/// In the log and to the user.
void RunDriver::warn(std::string_view text) {
  state_.log.warning(text);
  tellWarning(text);
}

void RunDriver::tellWarning(std::string_view text) {
  state_.lastTold = text;
  showMessage(text, {}, MessageType::warning);
}

/// The workers lock the process folders, each its own, on the machine where that is. The master, which begins earlier,
/// finds out whether another run works in any of them and whether they can be locked.
void RunDriver::lockProcessFoldersOfJob(const std::string& prefix) {
  std::error_code ignored;
  if (!std::filesystem::is_directory(std::filesystem::path(prefix).parent_path(), ignored)) return;  // only there
  for (const int count : {state_.job->processCount(), 1}) {  // first all of them, then the master's own number alone
    if (processLock_.take(processLockPath(prefix), {0, count}, kLockPatienceSeconds)) continue;
    fatalError("Error: Another run works in the same process folders",
               processFoldersInUse(prefix, processLock_.holder()));
  }
  if (!processLock_.warning().empty()) warn(processLock_.warning());
}

void RunDriver::buildModel() {
  parameters_ = std::make_unique<ParameterModel>(config_.parameters, config_.constraints);
  aggregator_ = std::make_unique<ObjectiveAggregator>(config_.objectives, config_.aggregationMethod);
  // Before the process folders are made, so that a run that cannot be continued changes nothing.
  results_.emplace(config_, parameters_->searchSpace(), filePrefix_);
  results_->requireReplaceableFiles(config_);
  if (config_.task) {
    config_.task->continueFrom(results_->earlierSearches());
    config_.task->requireSets(parameters_->searchSpace(), parameters_->feasibility());
  }
  launcher_ = std::make_unique<PosixProcessLauncher>();
  signalState.haltProcesses = haltProcessesFromSignal;
  const int slotCount = state_.job->hasWorkers() ? 0 : config_.simultaneousSimulations;  // the master runs no model
  LauncherSettings settings = launcherSettings(config_, slotCount);
  settings.warn = [this](std::string_view text) { warn(text); };
  if (state_.job->hasWorkers()) lockProcessFoldersOfJob(settings.processFolderPrefix);
  settings.tellOfFolders = [this](const FoldersMade& made) { tellOfFolders(made); };
  settings.isCancelled = [this] {  // copying a large model takes time
    if (!state_.progress.isCancelled()) return false;
    state_.log.line("Simulation cancelled");
    state_.progress.writeMessage("Simulation cancelled");
    return true;
  };
  config_.measures = withItemNumbers(config_.measures);
  runner_ = std::make_unique<ModelRunner>(describeModel(config_), *parameters_, *aggregator_, *launcher_, settings);
  results_->requireSameTimes(config_, runner_->output().observedSeries());
}

/// Of what takes long only.
void RunDriver::tellOfFolders(const FoldersMade& made) {
  const bool isDone = made.share >= 1.0;
  if (made.seconds - toldOfFolders_ < 1.0 && !(isDone && toldOfFolders_ > 0.0)) return;
  toldOfFolders_ = made.seconds;
  const std::string folders = made.folders == 1 ? "1 process folder" : fmt::format("{} process folders", made.folders);
  state_.progress.writeStatus(fmt::format("Copying the model to {}: {:.0f} %", folders, made.share * 100.0));
  if (!isDone) return;
  const double megabytes = static_cast<double>(made.bytes) / 1e6;
  state_.log.line(
      fmt::format("Making {} of the model's {:.1f} MB took {:.1f} s: {} files were copied, {} were there "
                  "and unchanged",
                  folders, megabytes, made.seconds, made.files - made.keptFiles, made.keptFiles));
}

void RunDriver::logSetup() {
  state_.log.line("");
  state_.log.line(setupSummary(config_, parameters_->searchSpace(), parameters_->evaluationOrder()));
  for (const std::string& text : modelDoubts(config_, *parameters_, *runner_)) state_.log.warning(text);
  if (state_.job->hasWorkers()) {
    const int workers = state_.job->processCount() - 1;
    state_.log.line(fmt::format("{} job: this master and {} workers, each of which runs one model at a time",
                                state_.job->means(), workers));
    if (const int mostUsed = config_.mostAtOnce(); mostUsed < workers) {
      state_.log.warning(fmt::format("Only {} can be used by the evaluations of this run{}",
                                     countText(static_cast<std::size_t>(mostUsed), "worker"),
                                     config_.task->mayHaveInitialSample() ? ", but for an initial sample" : ""));
    }
    if (config_.maxWorkerSilence > 0.0) {
      state_.log.line(fmt::format("The set of a worker that gives no sign of life for {:g} s goes to another one",
                                  config_.maxWorkerSilence));
    }
  }
  state_.log.line("");
}

void RunDriver::openResults() {
  hasBegun_ = true;
  state_.objectiveValues.resize(config_.objectives.size());
  results_->setSources(runner_->output().sources());
  results_->open(config_, runner_->output().observedSeries(), *aggregator_, state_.log);
  putEarlierReportAside();
  signalState.resultFileDescriptor = results_->table().descriptor();
  reporter_ = std::make_unique<RunReporter>(state_, results_->table(), results_->failedRuns(),
                                            parameters_->searchSpace(), results_->simulatedValues(), &results_->pairs(),
                                            &results_->unkeptFiles(), runner_->output().sources());
  reporter_->keepSettings(results_->settings());
  if (!config_.validationPeriods.empty()) reporter_->keepJudged();
  EarlierEvaluations* const earlier = results_->earlierEvaluations();
  series_ = openSeries(config_, parameters_->searchSpace(), runner_->output(),
                       runFilePath(filePrefix_, run_files::kSeries), earlier != nullptr, state_.log);
  if (series_) reporter_->recordSeries(*series_);
  scenarioSeries_ = openScenarioSeries(config_, runner_->output(), runFilePath(filePrefix_, run_files::kScenarioSeries),
                                       earlier != nullptr, state_.log);
  if (scenarioSeries_) reporter_->recordScenarios(*scenarioSeries_);
  openHook();
  failedRunPolicy_.emplace(config_.plannedEvaluations(), config_.failedRunFolders);
  if (state_.job->hasWorkers()) {
    state_.workers.emplace(*state_.job, config_.maxWorkerSilence, state_.clock);
    evaluator_ = std::make_unique<RankEvaluator>(*runner_, *state_.job, *state_.workers, *reporter_, *failedRunPolicy_,
                                                 earlier, &slotUse_);
  } else {
    evaluator_ = std::make_unique<LocalEvaluator>(*runner_, *reporter_, *failedRunPolicy_,
                                                  config_.simultaneousSimulations, earlier, &slotUse_);
  }
}

void RunDriver::openHook() {
  if (trim(config_.improvementCommand).empty()) return;
  hook_ = std::make_unique<ImprovementHook>(config_, state_.log);
  reporter_->followBest(
      [this](const EvaluationResult& result) {
        hook_->improved(hookValues(resultRow(reporter_->best()->parameterValues, result)));
      },
      [this] { hook_->look(); });
}

HookValues RunDriver::hookValues(const ResultRow& row) const {
  HookValues values{row.number, row.aggregate, {}, {}, {}};
  const std::vector<double> all = allModelValues(*parameters_, row.parameters);
  for (std::size_t i = 0; i < all.size(); ++i) values.parameters.emplace_back(config_.parameters[i].name, all[i]);
  for (std::size_t i = 0; i < row.measures.size(); ++i) {
    values.measures.emplace_back(config_.measures[i].name, row.measures[i]);
  }
  for (std::size_t i = 0; i < row.objectives.size(); ++i) {
    values.objectives.emplace_back(config_.objectives[i].name, row.objectives[i]);
  }
  return values;
}

void RunDriver::noteBestForHook() {
  if (!hook_ || !reporter_->best()) return;
  const BestEvaluation& best = *reporter_->best();
  auto row = results_->table().rowOf(best.number);
  if (!row) return;
  row->aggregate = best.aggregate;
  bestAtEnd_ = hookValues(*row);
}

void RunDriver::finishHook(std::string_view state) {
  if (!hook_) return;
  hook_->finish(state, bestAtEnd_, state_.job->hasWorkers(), [this] { return state_.progress.isCancelled(); });
  hook_.reset();
}

/// If the run were killed, an earlier report would be taken for its own. That of a run that goes on is removed, as it
/// can be made again at any time; one of another task is kept.
void RunDriver::putEarlierReportAside() {
  const std::string path = runFilePath(filePrefix_, run_files::kReport);
  std::string reason;
  std::error_code ignored;
  if (results_->earlierEvaluations() != nullptr && isReportOf(path, config_.task->facts().name.name, reason)) {
    std::filesystem::remove(path, ignored);
  } else {
    if (!reason.empty() && reason != std::strerror(ENOENT)) {
      state_.log.warning(fmt::format("{}: {}. Of which task it is is not known", path, reason));
    }
    keepEarlierFile(path, state_.log);
  }
}

TaskContext RunDriver::taskContext() {
  return {parameters_->searchSpace(),
          config_.parameters,
          config_.measures,
          config_.objectives,
          *evaluator_,
          state_.log,
          [this](const SearchSummary& summary) { reporter_->takeBestOf(summary); },
          filePrefix_,
          runner_->output().observedSeries(),
          parameterFields(*parameters_, widestPlaceholders(runner_->templates(), config_.parameters.size())),
          [this](std::span<const double> values) { return aggregator_->aggregate(values); },
          parameters_->feasibility(),
          [this](std::string_view text) { warn(text); },
          [this](std::span<const double> variable) { return otherValueTexts(*parameters_, variable); },
          [this](std::span<const int> numbers, std::size_t first, std::size_t count) {
            return results_->simulatedValues()->columns(numbers, first, count);
          },
          config_.validationPeriods,
          [this](const std::string& file) {
            return readEarlierSample(file, config_, parameters_->searchSpace(), parameters_->feasibility(),
                                     runner_->output().observedSeries());
          },
          runner_->output().validationObservations(),
          config_.aggregationMethod};
}

const TaskOutcome& RunDriver::runTask() {
  if (!config_.task) {
    outcome_ = TaskOutcome{std::string(kEndOfTask)};
    return *outcome_;
  }
  outcome_ = config_.task->run(taskContext());
  const bool hasWorkers = state_.job->hasWorkers();
  const int slots = hasWorkers ? state_.job->processCount() - 1 : config_.simultaneousSimulations;
  if (const std::string use = slotUse_.text(slots, hasWorkers ? "workers" : "slots"); !use.empty()) {
    state_.log.line(use);
  }
  writeFiles(outcome_->files);
  return *outcome_;
}

void RunDriver::writeFiles(std::span<const TaskFile> files) {
  for (const TaskFile& file : files) {
    writeBesideResults(file.path, file.content, state_.log);
    const auto lines = std::count(file.content.begin(), file.content.end(), '\n');
    results_->record().record().lines.emplace_back(fileNameOf(file.path), static_cast<int>(lines));
  }
}

/// Marked as those of an unfinished run, unless the task itself had come to its end.
std::optional<TaskOutcome> RunDriver::statisticsOfEarlyEnd() {
  if (outcome_ || !evaluator_ || !config_.task) return outcome_;
  const UnfinishedBatch made = evaluator_->takeUnfinished();
  const auto ofBatch =
      std::count_if(made.results.begin(), made.results.end(), [](const auto& result) { return result.ok(); });
  const auto succeeded = config_.task->unfinishedEvaluations(made).value_or(static_cast<int>(ofBatch));
  if (succeeded == 0) return std::nullopt;
  auto outcome = config_.task->unfinishedOutcome(taskContext(), made);
  if (!outcome) return std::nullopt;
  const std::string mark =
      fmt::format("Unfinished run: statistics of {} of {} evaluations", succeeded, config_.plannedEvaluations());
  outcome->report.insert(outcome->report.begin(), mark);
  for (DataTable& table : outcome->tables) table.headLines.insert(table.headLines.begin(), mark);
  for (TaskFile& file : outcome->files) file.content.insert(0, "# " + mark + "\n");
  state_.log.line("");
  for (const std::string& line : outcome->report) state_.log.reportLine(line);
  return outcome;
}

std::vector<std::string> RunDriver::keepStatistics() {
  std::vector<std::string> report;
  try {
    const auto outcome = statisticsOfEarlyEnd();
    if (!outcome || outcome->report.empty()) return {};
    report = outcome->report;
    if (!outcome_) writeFiles(outcome->files);
    results_->writeTables(outcome->tables, state_.log);
    if (!outcome_) results_->record().record().analysed = reporter_->evaluationCount() - reporter_->failedCount();
  } catch (const FatalError& error) {
    state_.log.warning(fmt::format("The statistics lack a part: {}\n{}", error.message(), error.detail()));
  } catch (const std::exception& error) {
    state_.log.warning(std::string("The statistics lack a part: ") + error.what());
  }
  return report;
}

/// Adds to the record what is known at the end of the run.
void RunDriver::completeRecord(const Ending& ending) {
  RunRecord& record = results_->record().record();
  record.stage = ending.stage;
  record.message = ending.message;
  record.ended = ending.time;
  record.warningCount = state_.log.warningCount();
  record.warnings = state_.log.warnings();
  if (reporter_) addFindings(*reporter_, *aggregator_, config_.objectives, record);
}

std::optional<RunDriver::Unwritten> RunDriver::closeResults(const Ending& ending, std::span<const std::string> report) {
  if (reporter_) reporter_->settle(*aggregator_);
  if (series_) series_->finish(reporter_->best());
  std::vector<std::string> lines{ending.closingLine, "Ended: " + ending.time};
  if (reporter_)
    addFindings(*reporter_, *aggregator_, *parameters_, config_.measures, config_.validationPeriods, lines);
  lines.insert(lines.end(), report.begin(), report.end());
  const EndingSignalsHeld held;
  signalState.resultFileDescriptor = -1;
  if (!results_) return std::nullopt;
  std::optional<Unwritten> unwritten;
  std::string reason;
  if (!results_->settings().putBack(reason)) unwritten = {results_->settings().path(), reason};
  if (!results_->table().finish(lines, reason)) unwritten = {results_->table().path(), reason};
  if (reporter_ && !results_->pairs().finish(reporter_->numbersWithPairs(), reason) && !unwritten) {
    unwritten = {results_->pairs().path(), reason};
  }
  completeRecord(ending);
  if (!results_->record().end(reason) && !unwritten) unwritten = {results_->record().path(), reason};
  return unwritten;
}

void RunDriver::reportRun() {
  const bool hasTables = outcome_ && !outcome_->tables.empty();
  if (!config_.writesReport || !reporter_ || (reporter_->evaluationCount() == 0 && !hasTables)) return;
  std::string reason;
  if (!writeReport(config_, filePrefix_, reason)) {
    state_.log.warning("The report cannot be written: " + reason);
  }
}

void RunDriver::finish(const TaskOutcome& outcome) {
  stopWorkersOf(state_);
  results_->close();
  logDifferences();
  results_->writeTables(outcome.tables, state_.log);
  noteBestForHook();
  const Ending ending{RunStage::finished, outcome.terminationMessage, outcome.terminationMessage};
  if (const auto unwritten = closeResults(ending, outcome.report)) {
    fatalError("Error: Unable to write to " + unwritten->path, unwritten->reason);
  }
  reportRun();
  // The command may take long, and what becomes of it is told by the log: the workers do not wait for it.
  const bool hasHook = hook_ != nullptr;
  if (hasHook) leaveJob(state_, 0);
  finishHook("finished");
  state_.log.line("");
  for (const std::string& line : reporter_->comparisonLines()) state_.log.line(line);
  const int count = reporter_->evaluationCount();
  state_.log.line(count == 1 ? fmt::format("1 model evaluation, {} failed", reporter_->failedCount())
                             : fmt::format("{} model evaluations, {} of them failed", count, reporter_->failedCount()));
  if (reporter_->repeatCount() > 0) {
    state_.log.line(
        fmt::format("{} of them {} the result of an earlier evaluation of the same set, without a model "
                    "run (column Repeats of {})",
                    reporter_->repeatCount(), reporter_->repeatCount() == 1 ? "has" : "have",
                    fileNameOf(results_->table().path())));
  }
  if (reporter_->replayedCount() > 0) {
    state_.log.line(fmt::format("{} of them {} taken from the earlier run", reporter_->replayedCount(),
                                reporter_->replayedCount() == 1 ? "was" : "were"));
  }
  if (reporter_->lostRunCount() > 0) {
    state_.log.line(fmt::format("{} made once more, as the worker that had it was lost",
                                countText(static_cast<std::size_t>(reporter_->lostRunCount()), "evaluation")));
  }
  logFailures();
  if (state_.log.warningCount() > 0) {
    state_.log.line(whereWarningsAre());
  }
  state_.log.line("");
  state_.log.line(kNormalTermination);
  if (!state_.log.writeError().empty()) {
    fatalError("Error: Unable to write to " + state_.log.path(), state_.log.writeError());
  }
  signalState.runLogDescriptor = -1;
  if (!hasHook) leaveJob(state_, 0);
  state_.log.close();
  if (!state_.log.writeError().empty()) {
    showMessage(fmt::format("Warning: The end of {} may be missing: {}", state_.log.path(), state_.log.writeError()));
  }
  endProgress(kNormalTermination);
  if (count == 0 && outcome.tables.empty()) {
    showMessage("Nothing was run: the setup selects no task or no search", {}, MessageType::warning);
  }
  tellOfBestThatDiffers();
  tellOfWarnings();
}

std::string RunDriver::warningCountText() const {
  return countText(static_cast<std::size_t>(state_.log.warningCount()), "warning");
}

std::string RunDriver::whereWarningsAre() const {
  return warningCountText() + ": the lines above that begin with \"Warning: \"";
}

/// Says on standard error how many warnings there are and where. The first is mostly of the setup, the last of what the
/// run has found.
void RunDriver::tellOfWarnings() const {
  if (state_.log.warningCount() == 0) return;
  showMessage(fmt::format("{} in {}{}: {}", warningCountText(), state_.log.path(),
                          state_.log.warningCount() == 1 ? "" : "; the first", state_.log.warnings().front()),
              {}, MessageType::warning);
  if (state_.log.warningCount() > 1 && state_.log.lastWarning() != state_.lastTold) {
    showMessage("The last of them: " + state_.log.lastWarning(), {}, MessageType::warning);
  }
}

/// Writes the reasons of the failures to the log, and how often each occurred.
void RunDriver::logFailures() {
  if (reporter_->failedCount() == 0) return;
  state_.log.line("Why evaluations failed:");
  for (const std::string& line : reporter_->failures().lines()) state_.log.line(line);
}

/// Warns of evaluations that differ from the first successful run, and of the best if it is one of them, which is known
/// when the aggregates are.
void RunDriver::logDifferences() {
  if (!reporter_ || std::exchange(hasLoggedDifferences_, true)) return;
  reporter_->settle(*aggregator_);
  for (const std::string& text : reporter_->differenceWarnings()) state_.log.warning(text);
  if (const std::string text = reporter_->unkeptWarning(); !text.empty()) state_.log.warning(text);
  if (const std::string text = reporter_->absentWarning(); !text.empty()) state_.log.warning(text);
  for (const std::string& text : reporter_->differencesOfBest()) state_.log.warning(text);
  if (const auto text = reporter_->processesLeftWarning()) state_.log.warning(*text);
  const std::vector<std::string> lines = validationFindings(*reporter_, config_.measures, config_.validationPeriods);
  if (!lines.empty()) state_.log.line("");
  for (const std::string& line : lines) state_.log.line(line);
}

/// After the message that ends an unfinished run, which is the first thing that the user reads.
void RunDriver::tellOfBestThatDiffers() {
  if (!reporter_) return;
  for (const std::string& text : reporter_->differencesOfBest()) tellWarning(text);
}

/// Nothing that goes wrong here may hide why the run ended.
void RunDriver::closeResultsOfEarlyEnd(const Ending& ending, std::span<const std::string> report) {
  try {
    const auto unwritten = closeResults(ending, report);
    if (!unwritten || ending.stage == RunStage::failed) return;  // the first reason counts
    state_.log.line(fmt::format("Error: Unable to write to {}\n{}", unwritten->path, unwritten->reason));
  } catch (const std::exception& error) {
    state_.log.warning(std::string("The results may lack their end: ") + error.what());
  }
}

int RunDriver::endInError(std::string_view message, std::string_view detail) {
  const std::string text(trimTrailing(message));
  std::string explained = text;
  std::vector<std::string> statistics;
  if (!text.empty()) {
    std::string details(detail);
    if (reporter_ && reporter_->failedCount() > 0) {
      details += fmt::format("{}failed evaluations are described in {}", details.empty() ? "" : "\n",
                             fileNameOf(results_->failedRuns().paths().forPeople));
    }
    if (!details.empty()) explained += "\n" + details;
    statistics = keepStatistics();
    logDifferences();
    endLogInError(text, details);
    showMessage(explained);
    tellOfBestThatDiffers();
  }
  stopWorkersOf(state_);
  noteBestForHook();
  closeResultsOfEarlyEnd({RunStage::failed, std::string(message), explained}, statistics);
  if (launcher_) launcher_->haltProcesses();  // before the report, which takes time
  reportRun();
  return endEarly(message, "failed");
}

/// What explains the message stands above it.
void RunDriver::endLogInError(std::string_view message, std::string_view details) {
  const EndingSignalsHeld held;  // or a signal's message could come below
  if (state_.log.warningCount() > 0) state_.log.line(whereWarningsAre());
  if (reporter_) logFailures();
  if (!details.empty()) state_.log.line(fmt::format("\n{}", details));
  if (!hasBegun_) state_.log.markAsOfNoRun(isSetupRead_ ? "The run did not begin" : "The setup is refused");
  state_.log.line(fmt::format("\n{}", message));
  closeLog();
}

/// The message that ends the run is the log's last record. Whatever is warned of afterwards goes to the user and the
/// message file alone.
void RunDriver::closeLog() {
  signalState.runLogDescriptor = -1;
  state_.log.close();
  state_.log.passWarningsTo([this](std::string_view text) {
    state_.progress.writeMessage(text);
    showMessage(text, {}, MessageType::warning);
  });
}

int RunDriver::endCancelled(std::string_view message) {
  stopWorkersOf(state_);  // the log has the message already
  showMessage(message, {}, MessageType::information);
  const std::vector<std::string> statistics = keepStatistics();
  logDifferences();
  tellOfBestThatDiffers();
  noteBestForHook();
  closeResultsOfEarlyEnd({RunStage::cancelled, std::string(message), std::string(message)}, statistics);
  {
    const EndingSignalsHeld held;
    // The evaluator has written it, and more may have come since.
    if (state_.log.lastRecord() != message) state_.log.line(fmt::format("\n{}", message));
    closeLog();
  }
  if (launcher_) launcher_->haltProcesses();
  reportRun();
  return endEarly(message, "cancelled");
}

int RunDriver::endEarly(std::string_view ending, std::string_view state) {
  closeLog();
  if (launcher_) launcher_->haltProcesses();
  // Of a cancelled job the workers end their models meanwhile, and their time goes on. After an error they may need far
  // longer than the command has.
  if (state == "cancelled") finishHook(state);
  leaveJob(state_, 1);
  finishHook(state);
  endProgress(ending);
  tellOfWarnings();
  return 1;
}

void RunDriver::endProgress(std::string_view ending) {
  state_.progress.progressEnd(ending);
  if (const std::string problem = state_.progress.takeProblem(); !problem.empty()) showMessage("Warning: " + problem);
}

}  // namespace mirevo

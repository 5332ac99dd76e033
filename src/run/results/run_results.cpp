#include "run/results/run_results.h"

#include <algorithm>
#include <filesystem>
#include <set>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "common/version.h"
#include "evaluation/run_comparison.h"
#include "measures/kept_steps.h"
#include "run/results/record_file.h"
#include "run/results/run_record.h"
#include "run/results/shared_files.h"

namespace mirevo {
namespace {

/// The head of the result file.
std::vector<std::string> headLines(const RunConfig& config, const RunRecord& record) {
  std::vector<std::string> lines{config.title, fmt::format("Mirevo {}", programVersion()), config.taskDescription()};
  if (record.seed) lines.push_back(fmt::format("Random seed: {}", *record.seed));
  lines.push_back("Setup file: " + config.setupFile);
  if (!record.started.empty()) lines.push_back("Started: " + record.started);
  for (const std::string& time : record.restarted) lines.push_back("Restarted: " + time);
  return lines;
}

/// Over a table that is for programs.
std::vector<std::string> tableHeadLines(const RunConfig& config) {
  return {columnName(config.title), fmt::format("Mirevo {}", programVersion()), "Setup file: " + config.setupFile};
}

const ResultFileNames& namesOf(const RunConfig& config) {
  return config.task ? config.task->facts().resultFiles : run_files::kPlain;
}

/// The files of series that analyses write, a number each: bands, or Sobol' indices. All of a task have the same mark.
std::vector<RunFile> seriesFilesOf(const ResultFileNames& names) {
  if (names.results == run_files::kSensitivity.results) return {run_files::kSobolSeries};
  return {run_files::kBand, run_files::kTotalBand};
}

}  // namespace

RunResults::RunResults(const RunConfig& config, const SearchSpace& space, const std::string& filePrefix)
    : space_(space),
      filePrefix_(filePrefix),
      tableHead_(tableHeadLines(config)),
      columns_(resultColumns(config, space)),
      names_(namesOf(config)),
      files_(restartFiles(filePrefix, names_)),
      settings_(files_.settings),
      table_(files_.checksums, tableHead_),
      failedRuns_({pathBeside(filePrefix, run_files::kFailedRuns), files_.failures}, config.setupName, space.names,
                  tableHead_),
      pairs_(files_.pairs, tableHead_),
      unkeptFiles_(files_.unkept, tableHead_),
      record_(files_.record, tableHead_) {
  if (config.task && config.restart != RestartMode::startAfresh) {
    auto record = record_.readEarlier();
    earlierRunHasStatistics_ = record && record->analysed;
    const bool isDamaged = !record && readFileIfThere(files_.record);
    earlierRun_ = findEarlierRun(files_, config, columns_, std::move(record));
    if (earlierRun_ && isDamaged) {
      earlierRun_->notes.push_back(fmt::format("Restart: {} is damaged and written again", files_.record));
    }
  }
}

std::vector<EarlierSearch> RunResults::earlierSearches() const {
  return earlierRun_ ? earlierRun_->searches : std::vector<EarlierSearch>{};
}

void RunResults::makeValuesFile(const RunConfig& config, std::span<const ObservedSeries> observed) {
  if (!config.keepsSimulatedValues() && !config.usesExactMeasures()) return;
  const SeriesPrecision precision = config.task->keptPrecision();
  simulatedValues_.emplace(files_.simulatedValues, simulatedValueCount(observed, precision), precision,
                           config.usesExactMeasures() ? config.measures.size() : 0, config.task->readsSimulatedValues(),
                           config.task->keptSteps() ? std::optional(checksumOfTimes(observed)) : std::nullopt);
}

void RunResults::requireSameTimes(const RunConfig& config, std::span<const ObservedSeries> observed) {
  if (!earlierRun_) return;
  makeValuesFile(config, observed);
  if (!simulatedValues_ || !simulatedValues_->hasOtherTimes()) return;
  refuseToGoOn(
      fmt::format("{} has the values at other times: the steps of the simulated files in the model's folder, or "
                  "the observations, have changed",
                  files_.simulatedValues));
}

void RunResults::open(const RunConfig& config, std::span<const ObservedSeries> observed,
                      const ObjectiveAggregator& aggregator, RunLog& log) {
  if (!config.task) return;
  lockFailedRuns(log);
  makeValuesFile(config, observed);
  if (earlierRun_) {
    goOn(config, aggregator, log);
  } else {
    if (config.restart != RestartMode::startAfresh)
      log.line("Restart: there are no earlier results to go on from, the run starts afresh");
    if (config.restart != RestartMode::startAfresh) warnOfLostRows(log);
    startAfresh(config, log);
  }
}

/// Before what is left is kept under numbered names.
void RunResults::warnOfLostRows(RunLog& log) const {
  std::string ignored;
  std::error_code failed;
  const std::size_t lost = readRowChecksums(readTextFile(files_.checksums, ignored).value_or("")).size();
  const std::uintmax_t size = std::filesystem::file_size(files_.results, failed);
  // A kill may leave one checksum without its row behind a head.
  if (failed || lost == 0 || (lost == 1 && size > 0)) return;
  log.warning(
      fmt::format("{} has no rows, though {} has checksums of {}: something has emptied it, and these "
                  "evaluations are lost",
                  files_.results, fileNameOf(files_.checksums), lost));
}

std::vector<std::string> RunResults::seriesPaths(const RunConfig& config) const {
  const TaskReport task = config.task->report();
  const int count = task.hasBands || task.sobol != nullptr ? static_cast<int>(config.measures.size()) : 0;
  std::vector<std::string> paths;
  for (const RunFile& file : seriesFilesOf(names_)) {
    for (int number = 1; number <= count; ++number) paths.push_back(runFilePath(filePrefix_, file, number));
  }
  return paths;
}

std::vector<std::string> RunResults::pathsBesideResults() const {
  std::vector<std::string> paths{files_.record, files_.failures, files_.pairs, files_.checksums, files_.unkept};
  for (const RunFile& table : names_.tables) paths.push_back(runFilePath(filePrefix_, table));
  return paths;
}

void RunResults::requireReplaceableFiles(const RunConfig& config) const {
  if (!config.task) return;
  std::vector<RunFile> files{names_.results,     names_.restart,          names_.simulatedValues,
                             names_.record,      names_.failures,         names_.pairs,
                             names_.checksums,   run_files::kSeries,      run_files::kScenarioSeries,
                             run_files::kReport, run_files::kSavedFolder, run_files::kOwnFailedRuns,
                             names_.unkept};
  files.insert(files.end(), names_.tables.begin(), names_.tables.end());
  for (const RunFile& file : files) requireReplaceable(runFilePath(filePrefix_, file), file);
  requireReplaceable(pathBeside(filePrefix_, run_files::kFailedRuns), run_files::kFailedRuns);
  for (const std::string& path : seriesPaths(config)) requireReplaceable(path, seriesFilesOf(names_).front());
}

/// `calSimErr.dat` is one per folder, and runs of several setups may be going on in it.
void RunResults::lockFailedRuns(RunLog& log) {
  const std::string own = runFilePath(filePrefix_, run_files::kOwnFailedRuns);
  if (failedRunsLock_.take(pathBeside(filePrefix_, run_files::kFailedRunsLock), {}, 0.0)) {
    if (!failedRunsLock_.warning().empty()) log.warning(failedRunsLock_.warning());
    keepEarlierFile(own, log);  // it would be taken for this run's
    return;
  }
  log.line(fmt::format("{} is that of another run{} in this folder: failed evaluations of this one are described in {}",
                       fileNameOf(failedRuns_.paths().forPeople), failedRunsLock_.holder(), fileNameOf(own)));
  failedRuns_.describeIn(own);
}

void RunResults::close() {
  failedRuns_.close();
  unkeptFiles_.close();
  if (simulatedValues_) simulatedValues_->close();
}

void RunResults::writeTables(std::span<const DataTable> tables, RunLog& log) const {
  for (const DataTable& table : tables) {
    const std::string path = runFilePath(filePrefix_, table.file);
    std::vector<std::string> head = tableHead_;
    head.push_back(rowCountLine(table));
    const auto content = [&] { return [parts = DataTableParts(table, head)]() mutable { return parts.next(); }; };
    if (hasContent(path, content())) continue;  // of a run that is walked through again
    keepEarlierFile(path, log);
    std::string reason;
    if (!replaceFile(path, content(), reason)) fatalError("Error: Unable to write to " + path, reason);
  }
}

/// Those of every measure that earlier runs had.
std::vector<std::string> RunResults::earlierSeries(RunLog& log) const {
  std::vector<std::string> paths;
  for (const RunFile& file : seriesFilesOf(names_)) {
    for (const auto& [path, digits] : numberedEntries(runFilePath(filePrefix_, file), file.extension)) {
      std::string reason;
      const auto head = readFileHead(path, reason);
      if (!head) log.warning(fmt::format("{}: {}. It may be of an earlier run, and is not kept", path, reason));
      if (head && head->starts_with(file.mark)) paths.push_back(path);
    }
  }
  std::sort(paths.begin(), paths.end());
  return paths;
}

void RunResults::keepEarlierFiles(const RunConfig& config, RunLog& log) const {
  std::vector<std::string> paths{failedRuns_.paths().forPeople, files_.results, files_.settings,
                                 files_.simulatedValues};
  for (std::string& path : pathsBesideResults()) paths.push_back(std::move(path));
  keepEarlierResults(paths, config.setupFile, log);
  if (!(names_.results == run_files::kOptimisation.results)) {
    for (const std::string& path : earlierSeries(log)) keepEarlierFile(path, log);
  }
  keepEarlierFile(runFilePath(filePrefix_, run_files::kSavedFolder), log);
  const std::string failedFolders = runFilePath(processFolderPrefix(config), run_files::kFailedFolder);
  for (const std::string& problem : removeFailedRunFolders(failedFolders, {})) log.warning(problem);
}

void RunResults::startAfresh(const RunConfig& config, RunLog& log) {
  keepEarlierFiles(config, log);
  // Before there is a result, so that none is ever without the settings that it depends on.
  settings_.write(config);
  if (simulatedValues_) simulatedValues_->create();
  RunRecord record = recordOf(config, log);
  record.started = dateAndTimeNow();
  record_.begin(record);
  table_.open(files_.results, headLines(config, record), columns_);
}

void RunResults::setSources(std::span<const MeasureSource> sources) {
  for (std::size_t i = 0; i < sources.size(); ++i) {
    if (sources[i].isSeries) compared_[static_cast<int>(i) + 1] = {sources[i].simulated, sources[i].observed};
  }
}

/// What is known of a run when it begins.
RunRecord RunResults::recordOf(const RunConfig& config, const RunLog& log) const {
  RunRecord record;
  record.warningCount = log.warningCount();
  record.warnings = log.warnings();
  record.compared = compared_;
  if (config.task) record.task = config.task->facts().name.name;
  record.program = programVersion();
  record.plannedEvaluations = config.plannedModelRuns();
  if (config.drawsRandomNumbers()) record.seed = config.task->randomSeed;
  return record;
}

void RunResults::removeStatistics(const RunConfig& config) const {
  std::error_code ignored;
  for (const RunFile& table : names_.tables) std::filesystem::remove(runFilePath(filePrefix_, table), ignored);
  for (const std::string& path : seriesPaths(config)) std::filesystem::remove(path, ignored);
}

/// Further runs must not be judged by another run than those before: the first successful one is repeated if its pairs
/// are lost. Returns its number then, and otherwise 0.
int RunResults::restorePairs(const RunConfig& config, const ResultRows& rows, EarlierPairs& earlier,
                             RunLog& log) const {
  const std::size_t count = pairedCount(measureSources(config.measures, config.measureFile, config.baseFolder));
  const int first = firstWithoutPairs(rows, earlier.pairs, count);
  std::erase_if(earlier.pairs, [&](const auto& entry) {
    const std::size_t index = rows.find(entry.first);
    return index == rows.size() || !rows.isOk(index) || entry.first == first;
  });
  constexpr const char* kKnown = "is known only as far as the file still says";
  if (first != 0) {
    log.warning(
        fmt::format("{} does not have the pairs of evaluation No. {}, the first successful run, with which others are "
                    "compared: its model run is repeated. Which other evaluations of the earlier run differ from it {}",
                    pairs_.path(), first, kKnown));
  } else if (earlier.lostRows > 0) {
    log.warning(fmt::format(
        "Rows of {} that are cut off or damaged: {}. Which evaluations of the earlier run differ from the first "
        "successful run {}",
        pairs_.path(), earlier.lostRows, kKnown));
  }
  return first;
}

void RunResults::goOn(const RunConfig& config, const ObjectiveAggregator& aggregator, RunLog& log) {
  EarlierRun run = *std::exchange(earlierRun_, std::nullopt);
  std::vector<std::string> paths = pathsBesideResults();
  paths.push_back(failedRuns_.paths().forPeople);
  keepResultsOfAnother(files_.results, paths, config.setupFile, log);
  if (earlierRunHasStatistics_) removeStatistics(config);
  std::map<int, std::vector<double>> failedSets;
  std::set<int> failed;
  for (std::size_t i = 0; i < run.rows.size(); ++i) {
    if (run.rows.isOk(i)) continue;
    failed.insert(run.rows.number(i));
    failedSets[run.rows.number(i)] = run.rows[i].parameters;
  }
  const std::size_t succeeded = run.rows.size() - failed.size();
  const FailedRunFile::Earlier earlier = failedRuns_.readEarlier(failed);
  BesideRows beside;
  for (const FailureRow& row : earlier.rows) beside.failures[row.number] = row.failure;
  std::size_t withoutValues = 0;
  if (simulatedValues_) {
    beside.keptValues = simulatedValues_->takeUp(run.rows);
    withoutValues = succeeded - beside.keptValues.size();
    // Evaluations without them are repeated.
    run.rows.keepIf([&](std::size_t i) { return !run.rows.isOk(i) || beside.keptValues.contains(run.rows.number(i)); });
  }
  EarlierPairs earlierPairs = pairs_.readEarlier();
  const int repeated = restorePairs(config, run.rows, earlierPairs, log);
  beside.pairs = earlierPairs.pairs;

  RunRecord record = recordOf(config, log);
  record.started = run.started;
  record.restarted = run.restarted;
  record.restarted.push_back(dateAndTimeNow());
  record_.begin(record);
  table_.open(files_.results, headLines(config, record), columns_, run.rows);
  // Only now: were the run killed before, rows that are gone from the table would still be in it.
  logKept(failedRuns_.paths().forPeople, failedRuns_.continueBehind(earlier.rows, failedSets), log);
  pairs_.continueBehind(std::move(earlierPairs.pairs));
  const std::string failedFolders = runFilePath(processFolderPrefix(config), run_files::kFailedFolder);
  for (const std::string& problem : removeFailedRunFolders(failedFolders, failed)) log.warning(problem);
  // With a raised budget in it, rows that the smaller one had ended would be taken for the search's.
  settings_.write(config);
  for (const std::string& note : run.notes) log.line(note);
  if (earlier.unknown > 0) {
    log.line(fmt::format("Restart: why evaluations failed is not known any more of {}: {} does not say it",
                         earlier.unknown, files_.failures));
  }
  if (withoutValues > 0) {
    log.line(fmt::format(
        "Restart: {} evaluations are made again: {} does not hold what it keeps of them beside their rows, or, "
        "as one of an earlier version, not with all digits",
        withoutValues, files_.simulatedValues));
  }
  log.line(fmt::format("Restart: {} evaluations are taken from {}", run.rows.size(), files_.results));
  std::set<std::string> names;
  for (const SavedOutputFile& file : config.savedOutputFiles) {
    names.emplace(trimTrailing(file.fileName).substr(config.baseFolder.size()));
  }
  const auto hasSucceeded = [&run](int number) {
    const std::size_t index = run.rows.find(number);
    return index < run.rows.size() && run.rows.isOk(index);
  };
  std::set<int> again = unkeptFiles_.goOn(hasSucceeded, names);
  if (!again.empty()) {
    log.line(
        fmt::format("Restart: model runs that are made again for output files that could not be kept, see {}: {}; the "
                    "results stay as they are",
                    fileNameOf(files_.unkept), again.size()));
  }
  earlierEvaluations_.emplace(space_, aggregator, earlierRecords(std::move(run.rows), std::move(beside)));
  if (repeated != 0) earlierEvaluations_->repeatRun(repeated);
  earlierEvaluations_->runAgain(std::move(again));
}

}  // namespace mirevo

#include "report/run_sources.h"

#include <algorithm>
#include <array>
#include <ctime>
#include <filesystem>
#include <sys/stat.h>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/file_lock.h"
#include "common/files.h"
#include "common/run_files.h"
#include "run/results/shared_files.h"
#include "run/tasks/tasks.h"

namespace mirevo {
namespace {

/// Local time at which the file was last written; empty where there is none.
std::string timeOfFile(const std::string& path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return {};
  std::tm local{};
  ::localtime_r(&status.st_mtime, &local);
  std::array<char, 40> text{};
  return {text.data(), std::strftime(text.data(), text.size(), "%Y-%m-%d %H:%M:%S", &local)};
}

template <class Content, class Read>
OptionalSource<Content> readSource(const std::string& path, Read read) {
  OptionalSource<Content> source;
  source.file = fileNameOf(path);
  if (const auto text = readTextFile(path, source.reason)) source.content = read(*text);
  return source;
}

std::optional<RunRecord> readRecord(const std::string& path, std::string& fault) {
  const auto text = readTextFile(path, fault);
  auto record = readRunRecord(text.value_or(""));
  std::error_code ignored;
  if (record || !std::filesystem::exists(path, ignored)) {
    fault.clear();
  } else {
    fault = fmt::format("{}: {}", fileNameOf(path), text ? "it is damaged" : fault);
  }
  return record;
}

/// Why results are not those of the task: the other one writes files of the same names.
std::string ofAnotherTask(const std::string& path, const std::string& key, const Task& wanted) {
  const auto all = tasks().all();
  const auto other =
      std::find_if(all.begin(), all.end(), [&key](const auto& task) { return task->facts().name.name == key; });
  const std::string setting = other == all.end() || !(*other)->facts().name.code
                                  ? fmt::format("Option = '{}'", key)
                                  : fmt::format("Option = {}", *(*other)->facts().name.code);
  return fmt::format(
      "{}: these are results of another task ({}), and the setup now selects {}. For their report, set {} "
      "again",
      path, other == all.end() ? std::string_view(key) : (*other)->facts().longName, wanted.facts().longName, setting);
}

std::string ofAnotherSetup(const std::string& path, const std::string& setup) {
  return fmt::format("{}: it is of another setup, {}. Give one of the setups another name", path, setup);
}

void checkRowsOf(const std::string& checksumFile, const RunConfig& config, RunSources& sources) {
  std::error_code ignored;
  std::string reason;
  const auto text = readTextFile(checksumFile, reason);
  if (!text && std::filesystem::exists(checksumFile, ignored)) {
    sources.checksumFault = fmt::format("{}: {}", fileNameOf(checksumFile), reason);
  }
  sources.rowFaults =
      checkRows(sources.results.rows, readRowChecksums(text.value_or("")), config, RowOrigin::perhapsOther).faults;
}

}  // namespace

std::optional<RunSources> readRunSources(const RunConfig& config, const SearchSpace& space,
                                         const std::string& filePrefix, std::string& reason) {
  const ResultFileNames* names = config.task ? &config.task->facts().resultFiles : nullptr;
  if (!names) {
    reason = "the setup names no task that has results";
    return std::nullopt;
  }
  const std::string path = runFilePath(filePrefix, names->results);
  const auto text = readTextFile(path, reason);
  if (!text) {
    reason = path + ": " + reason;
    return std::nullopt;
  }
  RunSources sources;
  sources.setup = setupNamedIn(*text);
  sources.isOfOtherSetup = !sources.setup.empty() && !isSameSetup(sources.setup, config.setupFile);
  sources.results = readResultTable(*text, resultColumns(config, space));
  // GLUE of an earlier run makes no evaluation.
  const bool mayHaveNone = config.task->report().isGlue && config.plannedEvaluations() == 0;
  if (sources.results.rows.empty() && sources.results.rowsOfOtherColumns == 0 && !mayHaveNone) {
    reason = sources.isOfOtherSetup ? ofAnotherSetup(path, sources.setup)
                                    : path + ": it holds no evaluation, so there is nothing to report";
    return std::nullopt;
  }
  auto record = readRecord(runFilePath(filePrefix, names->record), sources.recordFault);
  if (record && !record->task.empty() && record->task != config.task->facts().name.name) {
    reason =
        sources.isOfOtherSetup ? ofAnotherSetup(path, sources.setup) : ofAnotherTask(path, record->task, *config.task);
    return std::nullopt;
  }
  const bool isGoingOn = FileLock::isHeld(runFilePath(filePrefix, run_files::kRunLock));
  // Runs that keep checksums have an account, too.
  std::error_code ignored;
  if (!record && !isGoingOn && sources.recordFault.empty() &&
      std::filesystem::exists(runFilePath(filePrefix, names->checksums), ignored)) {
    sources.recordFault = fileNameOf(runFilePath(filePrefix, names->record)) + ": it is not there";
  }
  if (record && !record->stage && !isGoingOn && !sources.results.closingLines.empty()) {
    sources.recordFault = fileNameOf(runFilePath(filePrefix, names->record)) + ": it lacks its end";
    record.reset();
  }
  if (!record) {
    record = recordOfEarlierVersion(sources.results);
    if (isGoingOn) record->stage.reset();
  }
  sources.record = *std::move(record);
  sources.stage = sources.record.stage.value_or(isGoingOn ? RunStage::running : RunStage::cutOff);
  if (sources.stage != RunStage::running) checkRowsOf(runFilePath(filePrefix, names->checksums), config, sources);
  putInOrder(sources.results.rows);
  if (sources.stage == RunStage::running) return sources;
  sources.ended = sources.record.ended.empty() ? timeOfFile(path) : sources.record.ended;
  return sources;
}

OptionalSource<std::vector<FailureRow>> readFailures(const std::string& filePrefix, const ResultFileNames& names) {
  return readSource<std::vector<FailureRow>>(runFilePath(filePrefix, names.failures), readFailureTable);
}

OptionalSource<PairsByNumber> readPairs(const std::string& filePrefix, const ResultFileNames& names) {
  return readSource<PairsByNumber>(runFilePath(filePrefix, names.pairs), readPairsTable);
}

OptionalSource<RestartSettings> readSettings(const std::string& filePrefix, const ResultFileNames& names) {
  const std::string path = runFilePath(filePrefix, names.restart);
  OptionalSource<RestartSettings> source{{}, fileNameOf(path), {}};
  std::string reason;
  if (const auto text = readTextFile(path, reason)) {
    source.content = parseRestartSettings(*text);
    reason = "it is cut off or damaged";
  }
  if (!source.content) source.reason = fmt::format("{}: {}", source.file, reason);
  return source;
}

OptionalSource<std::vector<ScenarioSeries>> readScenarios(const std::string& filePrefix) {
  return readSource<std::vector<ScenarioSeries>>(runFilePath(filePrefix, run_files::kScenarioSeries),
                                                 readScenarioSeries);
}

OptionalSource<SeriesTable> readSeries(const std::string& filePrefix) {
  return readSource<SeriesTable>(runFilePath(filePrefix, run_files::kSeries), readSeriesTable);
}

}  // namespace mirevo

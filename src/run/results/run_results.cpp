#include "run/results/run_results.h"

#include <filesystem>
#include <set>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/version.h"
#include "run/results/record_file.h"
#include "run/setup/setup_summary.h"

namespace mirevo {
namespace {

ResultColumns resultColumns(const RunConfig& config, const SearchSpace& space) {
  ResultColumns columns;
  columns.parameters = space.names;
  for (const OutputMeasure& measure : config.measures) columns.measures.push_back(measure.name);
  for (const ObjectiveFunction& objective : config.objectives) columns.objectives.push_back(objective.name);
  return columns;
}

/// The head of the result file but for when the run was started.
std::vector<std::string> headLines(const RunConfig& config) {
  std::vector<std::string> lines{config.title, fmt::format("Mirevo {}", programVersion()), taskName(config)};
  if (config.drawsRandomNumbers()) lines.push_back(fmt::format("Random seed: {}", config.randomSeed));
  lines.push_back("Setup file: " + config.setupFile);
  return lines;
}

}  // namespace

RunResults::RunResults(const RunConfig& config, const SearchSpace& space, const std::string& filePrefix)
    : space_(space),
      filePrefix_(filePrefix),
      columns_(resultColumns(config, space)),
      failedRuns_(std::filesystem::path(filePrefix).replace_filename(kFailedRunFileName).string(), config.setupName,
                  space.names) {
  const std::string_view ending = resultFileEnding(config);
  if (ending.empty()) return;
  files_ = restartFiles(filePrefix + std::string(ending));
  if (config.restart != 0) earlierRun_ = findEarlierRun(*files_, config, columns_);
}

std::vector<EarlierSearch> RunResults::earlierSearches() const {
  return earlierRun_ ? earlierRun_->searches : std::vector<EarlierSearch>{};
}

void RunResults::open(const RunConfig& config, std::span<const ObservedSeries> observed,
                      const ObjectiveAggregator& aggregator, RunLog& log) {
  if (!files_) return;
  if (keepsSimulatedValues(config)) {
    std::size_t count = 0;
    for (const ObservedSeries& series : observed) count += series.values.size();
    simulatedValues_.emplace(files_->simulatedValues, count);
  }
  if (earlierRun_) {
    goOn(config, aggregator, log);
  } else {
    if (config.restart != 0) log.line("Restart: there are no earlier results to go on from, the run begins anew");
    beginAnew(config, log);
  }
}

void RunResults::close() {
  failedRuns_.close();
  if (simulatedValues_) simulatedValues_->close();
}

void RunResults::beginAnew(const RunConfig& config, RunLog& log) {
  keepEarlierFile(failedRuns_.path());
  if (const std::string kept = keepEarlierFile(files_->results); !kept.empty()) {
    log.line("The results of the earlier run were kept as " + kept);
  }
  keepEarlierFile(files_->settings);
  keepEarlierFile(files_->simulatedValues);
  if (const std::string kept = keepEarlierFile(filePrefix_ + "_Saved"); !kept.empty()) {
    log.line("The saved output files of the earlier run were kept as " + kept);
  }
  for (const std::string& problem : removeFailedRunFolders(processFolderPrefix(config) + "_Failed", {}))
    log.warning(problem);
  // Before there is a result, so that none is ever without the settings that it depends on.
  writeRestartSettings(files_->settings, config);
  if (simulatedValues_) simulatedValues_->create();
  std::vector<std::string> head = headLines(config);
  head.push_back("Started: " + dateAndTimeNow());
  table_.open(files_->results, head, columns_);
}

void RunResults::goOn(const RunConfig& config, const ObjectiveAggregator& aggregator, RunLog& log) {
  EarlierRun run = *std::exchange(earlierRun_, std::nullopt);
  std::set<int> failed;
  std::set<int> succeeded;
  for (const ResultTable::Row& row : run.rows) (row.ok ? succeeded : failed).insert(row.number);
  const std::map<int, EvaluationFailure> failures = failedRuns_.takeUp(failed);
  for (const std::string& problem : removeFailedRunFolders(processFolderPrefix(config) + "_Failed", failed))
    log.warning(problem);
  std::optional<std::map<int, std::vector<double>>> values;
  if (simulatedValues_) values = simulatedValues_->takeUp(succeeded);
  auto records = earlierRecords(run, columns_, failures, std::move(values));

  std::vector<std::string> head = headLines(config);
  head.insert(head.end(), run.history.begin(), run.history.end());
  head.push_back("Restarted: " + dateAndTimeNow());
  table_.open(files_->results, head, columns_, run.rows);
  // Only now: with a raised budget in it, rows that the smaller one had ended would be taken for the search's.
  writeRestartSettings(files_->settings, config);
  for (const std::string& note : run.notes) log.line(note);
  log.line(fmt::format("Restart: {} evaluations are taken from {}", records.size(), files_->results));
  earlierEvaluations_.emplace(space_, aggregator, std::move(records));
}

}  // namespace mirevo

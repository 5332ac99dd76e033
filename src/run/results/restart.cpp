#include "run/results/restart.h"

#include <algorithm>
#include <iterator>
#include <span>
#include <utility>

#include <fmt/core.h>

#include "algorithms/searches/dds.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "run/results/restart_settings.h"

namespace mirevo {
namespace {

constexpr std::string_view kRefusal = "Error: Unable to continue the earlier run";
constexpr std::string_view kRemedy = "Restart = 0 begins anew and keeps the earlier results under a numbered name.";
constexpr std::size_t kMostChangesShown = 20;
constexpr std::int32_t kRepeatFailed = 2;  ///< value of `Restart`

[[noreturn]] void refuse(std::string_view detail) {
  fatalError(kRefusal, fmt::format("{}\n{}", detail, kRemedy));
}

RestartSettings readSettings(const std::string& path) {
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text)
    refuse(fmt::format("{}: {}: with what settings the earlier results were computed is not known", path, reason));
  auto settings = parseRestartSettings(*text);
  if (!settings) refuse(fmt::format("{} is damaged: with what settings the results were computed is not known", path));
  return *std::move(settings);
}

void requireSameSettings(const RestartSettings& then, const RestartSettings& now) {
  const std::vector<std::string> changes = changedSettings(then, now);
  if (changes.empty()) return;
  std::string detail = "the setup is another one than that of the earlier run:";
  for (std::size_t i = 0; i < std::min(changes.size(), kMostChangesShown); ++i) detail += "\n   " + changes[i];
  if (changes.size() > kMostChangesShown) detail += fmt::format("\n   and {} more", changes.size() - kMostChangesShown);
  refuse(detail);
}

/// In the order of their numbers, each number once.
void putInOrder(std::vector<ResultTable::Row>& rows) {
  std::stable_sort(rows.begin(), rows.end(), [](const auto& a, const auto& b) { return a.number < b.number; });
  rows.erase(std::unique(rows.begin(), rows.end(), [](const auto& a, const auto& b) { return a.number == b.number; }),
             rows.end());
}

/// The last evaluation before which none is missing.
int lastWithoutGap(std::span<const ResultTable::Row> rows) {
  int last = 0;
  while (last < std::ssize(rows) && rows[static_cast<std::size_t>(last)].number == last + 1) ++last;
  return last;
}

int populationSize(const OptimisationConfig& search) {
  return search.algorithmType == AlgorithmType::sce ? search.sce.complexCount * search.sce.pointsPerComplex
                                                    : search.pse.populationSize;
}

/// SCE and PSE go on behind a raised budget as if it had been so high from the start.
void raiseBudgetOfPopulation(const OptimisationConfig& search, int earlierBudget, EarlierRun& run) {
  if (earlierBudget < populationSize(search)) {
    refuse(
        fmt::format("Max_No_Evaluations: {} then, {} now: only a search whose budget held its initial sample of {} "
                    "sets can be taken further",
                    earlierBudget, search.stopping.maxEvaluations, populationSize(search)));
  }
  // What lies behind the earlier budget is the final model run of the search that used it up.
  const auto isObsolete = [earlierBudget](const ResultTable::Row& row) { return row.number > earlierBudget; };
  run.rows.erase(std::remove_if(run.rows.begin(), run.rows.end(), isObsolete), run.rows.end());
  run.notes.push_back(fmt::format("Max_No_Evaluations was raised from {} to {}: the search goes on where it ended",
                                  earlierBudget, search.stopping.maxEvaluations));
}

/// DDS perturbs ever fewer parameters as its budget is used up, so that another budget is another search: it starts
/// from the best set of the one before, whose rows are kept.
void raiseBudgetOfDds(const OptimisationConfig& search, int earlierBudget, EarlierRun& run) {
  const int before = run.searches.empty() ? 0 : run.searches.back().lastEvaluation;
  const int last = lastWithoutGap(run.rows);
  if (last <= before) return;  // it had not begun
  const bool isFirst = run.searches.empty();
  const int startPoints =
      isFirst && !search.initialSample.includeInitialParameters ? ddsStartPointCount(earlierBudget) : 1;
  run.searches.push_back({earlierBudget, std::min(earlierBudget, std::max(last, before + startPoints))});
  run.notes.push_back(
      fmt::format("Max_No_Evaluations was raised from {} to {}: as the probabilities of Dynamically Dimensioned Search "
                  "depend on it, "
                  "a new search starts from the best of the first {} evaluations, which are kept",
                  earlierBudget, search.stopping.maxEvaluations, run.searches.back().lastEvaluation));
}

/// The failed model runs behind which no evaluation succeeded: whatever stopped the run may be put right by now.
void dropFailuresAtEnd(EarlierRun& run) {
  const auto isOk = [](const ResultTable::Row& row) { return row.ok; };
  const auto end = std::find_if(run.rows.rbegin(), run.rows.rend(), isOk).base();
  const auto count = std::distance(end, run.rows.end());
  run.rows.erase(end, run.rows.end());
  run.notes.push_back(fmt::format("Restart = 2: {} failed evaluations at the end are made again", count));
}

std::vector<std::string> historyOf(const ResultTable& table) {
  std::vector<std::string> history;
  for (const std::string& line : table.headLines) {
    if (line.starts_with("Started: ") || line.starts_with("Restarted: ")) history.push_back(line);
  }
  return history;
}

}  // namespace

RestartFiles restartFiles(const std::string& resultFile) {
  const std::string stem = resultFile.substr(0, resultFile.rfind('.'));
  return {resultFile, stem + "_Restart.dat", stem + "_Simulated.bin"};
}

std::optional<EarlierRun> findEarlierRun(const RestartFiles& files, const RunConfig& config,
                                         const ResultColumns& columns) {
  const auto text = readFileIfThere(files.results);
  ResultTable table = readResultTable(text.value_or(""));
  // More than a beginning that was cut off: there may be days of work behind a header row that cannot be read.
  if (!table.hasHeader() && table.unusableLines > 1) refuse(files.results + " has no header row that can be read");
  if (table.rows.empty()) return std::nullopt;
  const RestartSettings then = readSettings(files.settings);
  const RestartSettings now = restartSettings(config);
  requireSameSettings(then, now);
  const std::size_t expected =
      columns.parameters.size() + columns.measures.size() + columns.objectives.size() + 1;  // the aggregate
  if (table.columns.size() != expected) refuse(files.results + " has other columns than the setup asks for");

  EarlierRun run{std::move(table.rows), historyOf(table), then.searches, {}};
  putInOrder(run.rows);
  if (table.unusableLines > 0) {
    run.notes.push_back(
        fmt::format("Rows of {} that were cut off or damaged are made again: {}", files.results, table.unusableLines));
  }
  if (config.restart == kRepeatFailed) dropFailuresAtEnd(run);
  const auto earlierBudget = searchBudget(then);
  const OptimisationConfig& search = config.optimisation;
  if (earlierBudget && search.stopping.maxEvaluations > *earlierBudget) {
    const bool isDds = search.algorithmType == AlgorithmType::dds;
    (isDds ? raiseBudgetOfDds : raiseBudgetOfPopulation)(search, *earlierBudget, run);
  }
  return run;
}

std::map<int, EarlierEvaluations::Record> earlierRecords(
    EarlierRun& run, const ResultColumns& columns, const std::map<int, EvaluationFailure>& failures,
    std::optional<std::map<int, std::vector<double>>> simulatedValues) {
  if (simulatedValues) {
    const auto isIncomplete = [&](const ResultTable::Row& row) {
      return row.ok && simulatedValues->count(row.number) == 0;
    };
    run.rows.erase(std::remove_if(run.rows.begin(), run.rows.end(), isIncomplete), run.rows.end());
  }
  std::map<int, EarlierEvaluations::Record> records;
  for (const ResultTable::Row& row : run.rows) {
    EarlierEvaluations::Record& record = records[row.number];
    auto next = row.values.begin();
    const auto take = [&next](std::size_t count) {
      const auto first = std::exchange(next, next + static_cast<std::ptrdiff_t>(count));
      return std::vector<double>(first, next);
    };
    record.parameterValues = take(columns.parameters.size());
    record.result.number = row.number;
    record.result.measureValues = take(columns.measures.size());
    record.result.objectiveValues = take(columns.objectives.size());
    if (!row.ok) {
      const auto failure = failures.find(row.number);
      record.result.failure =
          failure != failures.end()
              ? failure->second
              : EvaluationFailure{EvaluationFailure::Kind::notKnown, "failed in the earlier run", {}};
    } else if (simulatedValues) {
      record.result.simulatedValues = std::move(simulatedValues->at(row.number));
    }
  }
  return records;
}

void writeRestartSettings(const std::string& path, const RunConfig& config) {
  std::string reason;
  if (!replaceFile(path, formatRestartSettings(restartSettings(config)), reason)) {
    fatalError("Error: Unable to write to " + path, reason);
  }
}

}  // namespace mirevo

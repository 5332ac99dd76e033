#include "run/results/run_record.h"

#include <algorithm>
#include <array>
#include <cstdint>

#include "common/data_table.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::array kStages{RunStage::running, RunStage::finished, RunStage::cancelled, RunStage::failed,
                             RunStage::cutOff};
constexpr std::array<std::string_view, kStages.size()> kStageKeys{"running", "finished", "cancelled", "failed",
                                                                  "cut off"};

const std::vector<std::string>& columns() {
  static const std::vector<std::string> kColumns{"Key", "Value"};
  return kColumns;
}

namespace key {
constexpr std::string_view kTask = "task";
constexpr std::string_view kProgram = "program";
constexpr std::string_view kStarted = "started";
constexpr std::string_view kRestarted = "restarted";  ///< a row each time
constexpr std::string_view kPlanned = "plannedEvaluations";
constexpr std::string_view kSeed = "seed";
constexpr std::string_view kSimulated = "simulated.";  ///< with the number of the measure behind it
constexpr std::string_view kObserved = "observed.";
constexpr std::string_view kWarnings = "warnings";
constexpr std::string_view kWarning = "warning";  ///< a row each
constexpr std::string_view kInitial = "initialEvaluation";
constexpr std::string_view kBest = "bestEvaluation";
constexpr std::string_view kBestAggregate = "bestAggregate";
constexpr std::string_view kEvaluations = "evaluations";
constexpr std::string_view kFailed = "failed";
constexpr std::string_view kRepeats = "repeats";
constexpr std::string_view kAnalysed = "analysedEvaluations";
/// With the key of the kind, or the name of the objective function, behind it.
constexpr std::string_view kFailedBy = "failed.";
constexpr std::string_view kLostRuns = "lostRuns";
constexpr std::string_view kSigma = "sigma.";
constexpr std::string_view kMu = "mu.";
constexpr std::string_view kLines = "lines.";  ///< with the name of the file behind it
constexpr std::string_view kEnded = "ended";
constexpr std::string_view kState = "state";
constexpr std::string_view kMessage = "message";
}  // namespace key

/// The rows of a record being written.
struct Rows {
  std::vector<std::vector<DataTable::Cell>> rows;

  void add(std::string_view key, DataTable::Cell value) { rows.push_back({std::string(key), std::move(value)}); }
  void addCount(std::string_view key, int number) { add(key, std::int64_t{number}); }
  void addText(std::string_view key, std::string_view text) {
    if (!text.empty()) add(key, std::string(text));
  }
};

std::string joined(std::string_view front, std::string_view name) {
  return std::string(front).append(name);
}

/// The name behind `front` in a key; nothing for another key.
std::optional<std::string> nameBehind(std::string_view front, std::string_view key) {
  if (!key.starts_with(front)) return std::nullopt;
  return std::string(key.substr(front.size()));
}

int numberIn(std::string_view text) {
  return parseInteger(text).value_or(0);
}

RunRecord::Scale& scaleOf(RunRecord& record, std::string objective) {
  for (RunRecord::Scale& scale : record.scales) {
    if (scale.objective == objective) return scale;
  }
  return record.scales.emplace_back(RunRecord::Scale{std::move(objective), 0.0, 0.0});
}

std::optional<RunStage> stageOfKey(std::string_view text) {
  const auto found = std::find(kStageKeys.begin(), kStageKeys.end(), text);
  if (found == kStageKeys.end()) return std::nullopt;
  return kStages[static_cast<std::size_t>(found - kStageKeys.begin())];
}

void takeRow(const std::string& name, const std::string& value, RunRecord& record) {
  const auto number = [&value] { return parseInteger(value); };
  const auto real = [&value] { return realCell(value).value_or(0.0); };
  const auto best = [&record]() -> ShownEvaluation& { return record.best ? *record.best : record.best.emplace(); };
  if (name == key::kTask) record.task = value;
  if (name == key::kProgram) record.program = value;
  if (name == key::kStarted) record.started = value;
  if (name == key::kRestarted) record.restarted.push_back(value);
  if (name == key::kPlanned) record.plannedEvaluations = number().value_or(0);
  if (name == key::kSeed) record.seed = number();
  if (auto measure = nameBehind(key::kSimulated, name)) record.compared[numberIn(*measure)].simulated = value;
  if (auto measure = nameBehind(key::kObserved, name)) record.compared[numberIn(*measure)].observed = value;
  if (name == key::kWarnings) record.warningCount = number().value_or(0);
  if (name == key::kWarning) record.warnings.push_back(value);
  if (name == key::kInitial) record.initialEvaluation = number();
  if (name == key::kBest) best().number = number().value_or(0);
  if (name == key::kBestAggregate) best().aggregate = real();
  if (name == key::kEvaluations) record.evaluations = number();
  if (name == key::kFailed) record.failed = number();
  if (name == key::kRepeats) record.repeats = number().value_or(0);
  if (name == key::kAnalysed) record.analysed = number();
  if (auto kind = nameBehind(key::kFailedBy, name)) record.failuresByKind.emplace_back(*kind, number().value_or(0));
  if (name == key::kLostRuns) record.lostRuns = number().value_or(0);
  if (auto objective = nameBehind(key::kSigma, name)) scaleOf(record, *objective).sigma = real();
  if (auto objective = nameBehind(key::kMu, name)) scaleOf(record, *objective).mu = real();
  if (auto file = nameBehind(key::kLines, name)) record.lines.emplace_back(*file, number().value_or(0));
  if (name == key::kEnded) record.ended = value;
  if (name == key::kState) record.stage = stageOfKey(value);
  if (name == key::kMessage) record.message = value;
}

}  // namespace

std::optional<int> RunRecord::linesOf(std::string_view file) const {
  const auto found = std::find_if(lines.begin(), lines.end(), [file](const auto& one) { return one.first == file; });
  return found == lines.end() ? std::nullopt : std::optional(found->second);
}

std::string_view runStageKey(RunStage stage) {
  return kStageKeys.at(static_cast<std::size_t>(stage));
}

std::string runRecordText(const RunRecord& record, const std::vector<std::string>& headLines) {
  Rows rows;
  rows.addText(key::kTask, record.task);
  rows.addText(key::kProgram, record.program);
  rows.addText(key::kStarted, record.started);
  for (const std::string& time : record.restarted) rows.addText(key::kRestarted, time);
  if (record.plannedEvaluations > 0) rows.addCount(key::kPlanned, record.plannedEvaluations);
  if (record.seed) rows.addCount(key::kSeed, *record.seed);
  for (const auto& [measure, compared] : record.compared) {
    rows.addText(joined(key::kSimulated, std::to_string(measure)), compared.simulated);
    rows.addText(joined(key::kObserved, std::to_string(measure)), compared.observed);
  }
  if (record.warningCount > 0) rows.addCount(key::kWarnings, record.warningCount);
  for (const std::string& text : record.warnings) rows.addText(key::kWarning, text);
  if (record.stage) {
    if (record.initialEvaluation) rows.addCount(key::kInitial, *record.initialEvaluation);
    if (record.best) {
      rows.addCount(key::kBest, record.best->number);
      rows.add(key::kBestAggregate, record.best->aggregate);
    }
    if (record.evaluations) rows.addCount(key::kEvaluations, *record.evaluations);
    if (record.failed) rows.addCount(key::kFailed, *record.failed);
    for (const auto& [kind, count] : record.failuresByKind) rows.addCount(joined(key::kFailedBy, kind), count);
    if (record.repeats > 0) rows.addCount(key::kRepeats, record.repeats);
    if (record.lostRuns > 0) rows.addCount(key::kLostRuns, record.lostRuns);
    if (record.analysed) rows.addCount(key::kAnalysed, *record.analysed);
    for (const RunRecord::Scale& scale : record.scales) {
      rows.add(joined(key::kSigma, scale.objective), scale.sigma);
      rows.add(joined(key::kMu, scale.objective), scale.mu);
    }
    for (const auto& [file, count] : record.lines) rows.addCount(joined(key::kLines, file), count);
    rows.addText(key::kEnded, record.ended);
    rows.addText(key::kState, runStageKey(*record.stage));
    rows.addText(key::kMessage, record.message);
  }
  return dataTableText({{}, headLines, columns(), std::move(rows.rows)});
}

std::optional<RunRecord> readRunRecord(std::string_view text) {
  const ReadTable table = readDataTable(text);
  if (table.columns != columns()) return std::nullopt;
  RunRecord record;
  for (const std::vector<std::string>& cells : table.rows) takeRow(cells[0], cells[1], record);
  return record;
}

std::string endingBeforeMessage(RunStage stage) {
  const std::string message = dataTableRow({std::string(key::kMessage), std::string()});
  return dataTableRow({std::string(key::kState), std::string(runStageKey(stage))}) +
         message.substr(0, message.size() - 1);
}

RunRecord recordOfEarlierVersion(const ResultTable& results) {
  RunRecord record;
  for (const std::string& line : results.headLines) {
    if (auto time = nameBehind("Started: ", line)) record.started = std::move(*time);
    if (auto time = nameBehind("Restarted: ", line)) record.restarted.push_back(std::move(*time));
  }
  if (results.closingLines.empty()) return record;
  record.stage = RunStage::finished;
  record.message = results.closingLines.front();
  for (const std::string& line : results.closingLines) {
    if (auto time = nameBehind("Ended: ", line); time && record.ended.empty()) record.ended = std::move(*time);
    const auto number = nameBehind("Best evaluation: ", line);
    if (number && !record.best) record.best = ShownEvaluation{parseInteger(*number).value_or(0), 0.0};
  }
  return record;
}

}  // namespace mirevo

#include "run/results/failed_run_file.h"

#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/processes/folder_tree.h"

namespace mirevo {
namespace {

constexpr std::string_view kIndent = "   ";

}  // namespace

FailedRunFile::FailedRunFile(FailedRunPaths paths, std::string setupName, std::vector<std::string> names,
                             std::vector<std::string> tableHead)
    : paths_(std::move(paths)),
      setupName_(std::move(setupName)),
      names_(std::move(names)),
      tableHead_(std::move(tableHead)) {}

std::string FailedRunFile::headLine() const {
  return fmt::format("# Failed evaluations of {}\n", withValidUtf8(setupName_));
}

FailedRunFile::Earlier FailedRunFile::readEarlier(const std::set<int>& numbers) const {
  readFileIfThere(paths_.forPeople);  // one that cannot be read ends the run before anything is written
  Earlier earlier;
  std::set<int> missing = numbers;
  for (FailureRow& row : readFailureTable(readFileIfThere(paths_.table).value_or(""))) {
    if (missing.erase(row.number) > 0) earlier.rows.push_back(std::move(row));
  }
  earlier.unknown = missing.size();
  for (const int number : missing) {
    earlier.rows.push_back({number, {EvaluationFailure::Kind::notKnown, "failed in the earlier run", {}}});
  }
  return earlier;
}

std::string FailedRunFile::continueBehind(std::span<const FailureRow> rows,
                                          const std::map<int, std::vector<double>>& parameterValues) {
  std::string table = failureTableHead(tableHead_);
  std::string records = headLine();
  for (const FailureRow& row : rows) {
    table += failureRowText(row);
    records += record(parameterValues.at(row.number), row);
  }
  std::string kept;
  if (readFileIfThere(paths_.forPeople) != records) kept = keepEarlierFile(paths_.forPeople);
  if (rows.empty() && !readFileIfThere(paths_.table)) return kept;  // they appear with the first failure
  table_.openToContinue(paths_.table, table);
  forPeople_.openToContinue(paths_.forPeople, records);
  return kept;
}

void FailedRunFile::add(std::span<const double> parameterValues, const EvaluationResult& result) {
  const FailureRow row{result.number, *result.failure};
  std::string text = record(parameterValues, row);
  std::string line = failureRowText(row);
  if (!forPeople_.isOpen()) {
    forPeople_.open(paths_.forPeople);
    text.insert(0, headLine());
  }
  if (!table_.isOpen()) {
    table_.open(paths_.table);
    line.insert(0, failureTableHead(tableHead_));
  }
  forPeople_.append(text);
  table_.append(line);
}

void FailedRunFile::close() {
  forPeople_.close();
  table_.close();
}

std::string FailedRunFile::record(std::span<const double> parameterValues, const FailureRow& row) const {
  const EvaluationFailure& failure = row.failure;
  std::string text = fmt::format("\nEvaluation No. {} ({})\n{}{}\n", row.number, failureKindName(failure.kind), kIndent,
                                 withoutLineEnds(failure.reason));
  for (std::size_t i = 0; i < names_.size(); ++i) {
    text += fmt::format("{}{} = {}\n", kIndent, names_[i], formatReal(parameterValues[i]));
  }
  if (!failure.lastOutput.empty()) {
    text += fmt::format("{}Last output:\n", kIndent);
    for (const std::string& line : failure.lastOutput) text += fmt::format("{}| {}\n", kIndent, line);
  }
  return withValidUtf8(text);  // a model may write in another encoding
}

std::vector<std::string> removeFailedRunFolders(const std::string& prefix, const std::set<int>& numbers) {
  std::vector<std::string> problems;
  for (const auto& [path, digits] : numberedEntries(prefix, {})) {
    const auto number = parseInteger(digits);
    const bool isMade = number && std::to_string(*number) == digits;
    if (!isMade || numbers.count(*number) > 0) continue;
    if (const auto why = whyNotReplaceable(path, run_files::kFailedFolder); !why.empty()) {
      problems.push_back(fmt::format("{} was not removed. {}", path, why));
      continue;
    }
    try {
      removeTree(path);
    } catch (const FatalError& error) {
      problems.push_back(fmt::format("{} was not removed: {}", path, error.message()));
    }
  }
  return problems;
}

}  // namespace mirevo

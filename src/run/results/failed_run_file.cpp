#include "run/results/failed_run_file.h"

#include <algorithm>
#include <filesystem>
#include <optional>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kHeading = "Evaluation No. ";
constexpr std::string_view kIndent = "   ";

std::string onOneLine(std::string text) {
  std::replace(text.begin(), text.end(), '\n', ' ');
  return text;
}

/// A record of the file, `text` without the blank line before it.
struct FailureRecord {
  int number = 0;
  EvaluationFailure failure;
  std::string_view text;
};

std::optional<FailureRecord> readRecord(std::string_view text) {
  const std::vector<std::string_view> lines = splitLines(text);
  if (lines.size() < 2 || !lines[0].starts_with(kHeading)) return std::nullopt;
  const std::string_view heading = lines[0].substr(kHeading.size());
  const std::size_t open = heading.find(" (");
  const auto number = parseInteger(heading.substr(0, open));
  if (!number || open == std::string_view::npos || !heading.ends_with(')')) return std::nullopt;
  const auto kind = failureKindCalled(heading.substr(open + 2, heading.size() - open - 3));
  if (!kind) return std::nullopt;
  return FailureRecord{*number, {*kind, std::string(trim(lines[1])), {}}, text};
}

/// Every record of the file's text that can be read.
std::vector<FailureRecord> readRecords(std::string_view text) {
  std::vector<FailureRecord> records;
  const std::string start = fmt::format("\n{}", kHeading);
  std::size_t begin = text.find(start);
  while (begin != std::string_view::npos) {
    const std::size_t next = text.find(start, begin + 1);
    const std::size_t length = next == std::string_view::npos ? std::string_view::npos : next - begin - 1;
    if (auto record = readRecord(text.substr(begin + 1, length))) records.push_back(std::move(*record));
    begin = next;
  }
  return records;
}

}  // namespace

FailedRunFile::FailedRunFile(std::string path, std::string setupName, std::vector<std::string> names)
    : path_(std::move(path)), setupName_(std::move(setupName)), names_(std::move(names)) {}

std::string FailedRunFile::headLine() const {
  return fmt::format("# Failed evaluations of {}\n", setupName_);
}

std::map<int, EvaluationFailure> FailedRunFile::takeUp(const std::set<int>& numbers) {
  std::string reason;
  const auto text = readFileIfThere(path_);
  if (!text || !text->starts_with(headLine())) {
    keepEarlierFile(path_);
    return {};
  }
  std::map<int, EvaluationFailure> failures;
  std::string kept = headLine();
  for (FailureRecord& record : readRecords(*text)) {
    if (numbers.count(record.number) == 0) continue;
    if (failures.emplace(record.number, std::move(record.failure)).second) kept.append("\n").append(record.text);
  }
  if (!kept.ends_with('\n')) kept += '\n';
  if (kept != *text && !replaceFile(path_, kept, reason)) fatalError("Error: Unable to write to " + path_, reason);
  file_.openToContinue(path_);
  return failures;
}

void FailedRunFile::add(std::span<const double> parameterValues, const EvaluationResult& result) {
  std::string record;
  if (!file_.isOpen()) {
    file_.open(path_);
    record = headLine();
  }
  record += fmt::format("\n{}{} ({})\n{}{}\n", kHeading, result.number, failureKindName(result.failure->kind), kIndent,
                        onOneLine(result.failure->reason));
  for (std::size_t i = 0; i < names_.size(); ++i) {
    record += fmt::format("{}{} = {}\n", kIndent, names_[i], formatReal(parameterValues[i]));
  }
  if (!result.failure->lastOutput.empty()) {
    record += fmt::format("{}Last output:\n", kIndent);
    for (const std::string& line : result.failure->lastOutput) record += fmt::format("{}| {}\n", kIndent, line);
  }
  file_.append(record);
}

std::vector<std::string> removeFailedRunFolders(const std::string& prefix, const std::set<int>& numbers) {
  const std::filesystem::path first(prefix);
  const std::string beginning = first.filename().string();
  std::vector<std::string> problems;
  std::error_code failed;
  std::filesystem::directory_iterator entry(first.parent_path(), failed);
  for (; !failed && entry != std::filesystem::directory_iterator(); entry.increment(failed)) {
    const std::string name = entry->path().filename().string();
    if (!name.starts_with(beginning)) continue;
    const std::string digits = name.substr(beginning.size());
    const auto number = parseInteger(digits);
    const bool isMade = number && std::to_string(*number) == digits;
    if (!isMade || numbers.count(*number) > 0) continue;
    std::error_code reason;
    std::filesystem::remove_all(entry->path(), reason);
    if (reason) problems.push_back(fmt::format("{} was not removed: {}", entry->path().string(), reason.message()));
  }
  return problems;
}

}  // namespace mirevo

#include "run/results/result_file.h"

#include <algorithm>
#include <iterator>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// `text` as comment lines: one a line of it.
std::string commentLines(std::string_view text) {
  std::string lines;
  for (const std::string_view line : splitLines(text)) lines += fmt::format("# {}\n", line);
  return lines;
}

std::string commentLines(std::span<const std::string> texts) {
  std::string lines;
  for (const std::string& text : texts) lines += text.empty() ? "#\n" : commentLines(text);
  return lines;
}

std::string rowStart(int number, bool ok) {
  return fmt::format("{}\t{}", number, ok ? "OK" : "FAILED");
}

void addColumns(std::string& row, std::span<const double> values) {
  for (const double value : values) {
    row += '\t';
    row += formatReal(value);
  }
}

}  // namespace

std::string columnName(std::string_view name) {
  std::string harmless(trim(name));
  for (char& c : harmless) {
    if (static_cast<unsigned char>(c) < ' ') c = ' ';
    if (c == '#') c = '_';   // would start a comment in the middle of the header row
    if (c == '"') c = '\'';  // would open a quoted field that swallows its neighbours
  }
  return harmless;
}

void ResultFile::open(const std::string& path, std::span<const std::string> headLines, const ResultColumns& columns,
                      std::span<const ResultTable::Row> earlierRows) {
  rows_.clear();
  aggregates_.clear();
  std::string head = commentLines(headLines);
  head += "Evaluation\tStatus";
  for (const auto* names : {&columns.parameters, &columns.measures, &columns.objectives}) {
    for (const std::string& name : *names) head += '\t' + columnName(name);
  }
  head += "\tAggregate\n";
  headLength_ = std::ssize(head);
  if (earlierRows.empty()) {
    file_.open(path);
    file_.append(head);
    return;
  }
  std::string content = std::move(head);
  for (const ResultTable::Row& row : earlierRows) {
    std::string line = rowStart(row.number, row.ok);
    addColumns(line, row.values);
    line += '\n';
    rows_.push_back({row.number, std::ssize(content), std::ssize(line)});
    content += line;
  }
  std::string reason;
  if (!replaceFile(path, content, reason)) fatalError("Error: Unable to write to " + path, reason);
  file_.openToContinue(path);
}

void ResultFile::addRow(std::span<const double> parameterValues, const EvaluationResult& result) {
  std::string row = rowStart(result.number, result.ok());
  addColumns(row, parameterValues);
  addColumns(row, result.measureValues);
  addColumns(row, result.objectiveValues);
  addColumns(row, std::span(&result.aggregate, 1));
  row += '\n';
  const std::int64_t offset = file_.size();
  file_.append(row);
  rows_.push_back({result.number, offset, static_cast<std::int64_t>(row.size())});
}

bool ResultFile::isInOrder() const {
  return std::is_sorted(rows_.begin(), rows_.end(), [](const Row& a, const Row& b) { return a.number < b.number; });
}

bool ResultFile::finish(std::span<const std::string> closingLines, std::string& reason) {
  if (!file_.isOpen()) return true;
  const std::string closing = commentLines(closingLines);
  const bool isComplete = isInOrder() && aggregates_.empty();
  bool finished = isComplete ? file_.tryAppend(closing, reason) : rewriteInOrder(closing, reason);
  std::string again;
  if (!finished && !isComplete) file_.tryAppend(closing, again);  // better out of order than without its end
  // One that was put in order has another file in its place.
  if (!file_.tryClose(again) && finished && isComplete) {
    reason = again;
    finished = false;
  }
  return finished;
}

void ResultFile::appendRow(std::string& text, std::string_view content, const Row& row) const {
  std::string_view line = content.substr(static_cast<std::size_t>(row.offset), static_cast<std::size_t>(row.length));
  const auto aggregate = aggregates_.find(row.number);
  if (aggregate == aggregates_.end()) {
    text += line;
  } else {
    text += line.substr(0, line.rfind('\t') + 1);
    text += formatReal(aggregate->second) + '\n';
  }
}

bool ResultFile::rewriteInOrder(std::string_view closing, std::string& reason) const {
  const auto content = readTextFile(path(), reason);
  if (!content) return false;
  if (std::ssize(*content) < file_.size()) {
    reason = "it was shortened by another program";
    return false;
  }
  std::vector<Row> ordered = rows_;
  std::stable_sort(ordered.begin(), ordered.end(), [](const Row& a, const Row& b) { return a.number < b.number; });
  std::string sorted;
  sorted.reserve(content->size() + closing.size());
  sorted.append(*content, 0, static_cast<std::size_t>(headLength_));
  for (const Row& row : ordered) appendRow(sorted, *content, row);
  sorted += closing;
  return replaceFile(path(), sorted, reason);
}

}  // namespace mirevo

#include "run/results/result_file.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "common/utf8.h"

namespace mirevo {
namespace {

/// The lines of `text` as comment lines.
std::string commentLines(std::string_view text) {
  std::string lines;
  for (const std::string_view line : splitLines(text)) lines += fmt::format("# {}\n", withValidUtf8(line));
  return lines;
}

std::string commentLines(std::span<const std::string> texts) {
  std::string lines;
  for (const std::string& text : texts) lines += text.empty() ? "#\n" : commentLines(text);
  return lines;
}

}  // namespace

void ResultFile::open(const std::string& path, std::span<const std::string> headLines, const ResultColumns& columns,
                      std::span<const ResultRow> earlierRows) {
  rows_.clear();
  aggregates_.clear();
  columns_ = columns;
  std::string content = commentLines(headLines) + resultHeader(columns) + '\n';
  headLength_ = std::ssize(content);
  if (earlierRows.empty()) {
    file_.open(path);
    file_.append(content);
    return;
  }
  for (const ResultRow& row : earlierRows) {
    const std::string line = resultRowText(row) + '\n';
    rows_.push_back({row.number, std::ssize(content), std::ssize(line)});
    content += line;
  }
  std::string reason;
  if (!replaceFile(path, content, reason)) fatalError("Error: Unable to write to " + path, reason);
  file_.openToContinue(path);
}

void ResultFile::addRow(const ResultRow& row) {
  const std::string line = resultRowText(row) + '\n';
  const std::int64_t offset = file_.size();
  file_.append(line);
  rows_.push_back({row.number, offset, std::ssize(line)});
}

bool ResultFile::isInOrder() const {
  return std::is_sorted(rows_.begin(), rows_.end(), [](const Place& a, const Place& b) { return a.number < b.number; });
}

bool ResultFile::finish(std::span<const std::string> closingLines, std::string& reason) {
  if (!file_.isOpen()) return true;
  const std::string closing = commentLines(closingLines);
  const bool isComplete = isInOrder() && aggregates_.empty();
  bool finished = isComplete ? file_.tryAppend(closing, reason) : rewriteInOrder(closing, reason);
  std::string again;
  if (!finished && !isComplete) file_.tryAppend(closing, again);  // better out of order than without an end
  // A file that was put in order has been replaced, so errors of the old descriptor do not matter.
  if (!file_.tryClose(again) && finished && isComplete) {
    reason = again;
    finished = false;
  }
  return finished;
}

void ResultFile::appendRow(std::string& text, std::string_view content, const Place& place) const {
  const auto length = static_cast<std::size_t>(place.length) - 1;  // without the line end
  const std::string_view line = content.substr(static_cast<std::size_t>(place.offset), length);
  const auto aggregate = aggregates_.find(place.number);
  auto row = aggregate == aggregates_.end() ? std::nullopt : readResultRow(line, columns_);
  if (row) row->aggregate = aggregate->second;
  text += row ? resultRowText(*row) : line;
  text += '\n';
}

bool ResultFile::rewriteInOrder(std::string_view closing, std::string& reason) const {
  const auto content = readTextFile(path(), reason);
  if (!content) return false;
  if (std::ssize(*content) < file_.size()) {
    reason = "it was shortened by another program";
    return false;
  }
  std::vector<Place> ordered = rows_;
  std::stable_sort(ordered.begin(), ordered.end(), [](const Place& a, const Place& b) { return a.number < b.number; });
  std::string sorted;
  sorted.reserve(content->size() + closing.size());
  sorted.append(*content, 0, static_cast<std::size_t>(headLength_));
  for (const Place& place : ordered) appendRow(sorted, *content, place);
  sorted += closing;
  return replaceFile(path(), sorted, reason);
}

}  // namespace mirevo

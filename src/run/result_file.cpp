#include "run/result_file.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fmt/format.h>

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

void addColumns(std::string& row, std::span<const double> values) {
  for (const double value : values) {
    row += '\t';
    row += formatReal(value);
  }
}

bool flushToDisk(const std::string& path) {
  const int descriptor = ::open(path.c_str(), O_WRONLY | O_CLOEXEC);
  if (descriptor < 0) return false;
  const bool flushed = ::fsync(descriptor) == 0;
  const int reason = errno;
  ::close(descriptor);
  errno = reason;
  return flushed;
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

void ResultFile::open(const std::string& path, std::span<const std::string> headLines, const ResultColumns& columns) {
  rows_.clear();
  aggregates_.clear();
  file_.open(path);
  std::string head = commentLines(headLines);
  head += "Evaluation\tStatus";
  for (const auto* names : {&columns.parameters, &columns.measures, &columns.objectives}) {
    for (const std::string& name : *names) head += '\t' + columnName(name);
  }
  head += "\tAggregate\n";
  file_.append(head);
  headLength_ = file_.size();
}

void ResultFile::addRow(std::span<const double> parameterValues, const EvaluationResult& result) {
  std::string row = fmt::format("{}\t{}", result.number, result.ok() ? "OK" : "FAILED");
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
  if (!finished && !isComplete) {
    std::string again;
    file_.tryAppend(closing, again);  // better out of order than without its end
  }
  file_.close();
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
  // Written beside it and renamed, so that there is no moment at which a row is nowhere.
  const std::string temporary = path() + ".tmp";
  struct stat status {};
  const unsigned mode = ::stat(path().c_str(), &status) == 0 ? status.st_mode : 0644;
  bool replaced = writeByUnlinkAndCreate(temporary, sorted, mode, reason);
  if (replaced) {
    replaced = flushToDisk(temporary) && ::rename(temporary.c_str(), path().c_str()) == 0;
    if (!replaced) reason = std::strerror(errno);
  }
  if (!replaced) ::unlink(temporary.c_str());
  return replaced;
}

}  // namespace mirevo

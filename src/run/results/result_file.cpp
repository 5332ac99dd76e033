#include "run/results/result_file.h"

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <optional>
#include <system_error>
#include <utility>

#include <fmt/core.h>

#include "common/checksum.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/signals/signal_state.h"

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
                      const ResultRows& earlierRows) {
  rows_.clear();
  indexOf_.clear();
  earlierAggregates_.clear();
  aggregates_.clear();
  columns_ = columns;
  columns_.hasRepeats = !earlierRows.empty() && earlierRows.repeats(0).has_value();
  std::string content = commentLines(headLines) + resultHeader(columns_) + '\n';
  headLength_ = std::ssize(content);
  if (earlierRows.empty()) {
    checksums_.open({});  // first: without a head the closing lines would make the table none of a run's
    file_.open(path);
    file_.append(content);
    return;
  }
  std::error_code failed;
  const std::uintmax_t size = std::filesystem::file_size(path, failed);
  if (!failed) content.reserve(content.size() + size);  // about as long as that of the earlier run
  rows_.reserve(earlierRows.size());
  earlierAggregates_.reserve(earlierRows.size());
  for (const ResultRow& row : earlierRows) {
    const std::string line = resultRowText(row);
    addPlace(row, std::ssize(content), line);
    earlierAggregates_.emplace_back(row.number, row.aggregate);
    content += line;
    content += '\n';
  }
  std::sort(earlierAggregates_.begin(), earlierAggregates_.end());
  const std::vector<RowChecksum> checksums = checksumsOfRows();
  checksums_.complete(checksums);
  std::string reason;
  if (!replaceFile(path, content, reason)) fatalError("Error: Unable to write to " + path, reason);
  content = {};
  checksums_.open(checksums);  // only now those of rows that are not taken up are superfluous
  file_.openToContinue(path);
}

void ResultFile::addRow(ResultRow row) {
  if (row.repeats && !columns_.hasRepeats) addRepeatsColumn();
  if (columns_.hasRepeats && !row.repeats) row.repeats = 0;
  const std::string line = resultRowText(row);
  checksums_.add({row.number, checksumOf(line)});  // before the row, which would be taken for damaged without it
  if (file_.append(line + '\n')) addPlace(row, file_.size() - std::ssize(line) - 1, line);
}

void ResultFile::addPlace(const ResultRow& row, std::int64_t offset, std::string_view line) {
  rows_.push_back(
      {offset, checksumOf(line), row.number, static_cast<std::uint32_t>(line.size() + 1), row.repeats.value_or(0) > 0});
  const auto number = static_cast<std::size_t>(row.number);
  if (indexOf_.size() <= number) indexOf_.resize(number + 1);
  if (indexOf_[number] == 0) indexOf_[number] = static_cast<std::uint32_t>(rows_.size());
}

const ResultFile::Place* ResultFile::placeOf(int number) const {
  const auto index = static_cast<std::size_t>(number);
  return index < indexOf_.size() && indexOf_[index] > 0 ? &rows_[indexOf_[index] - 1] : nullptr;
}

bool ResultFile::isRepeat(int number) const {
  const Place* const place = placeOf(number);
  return place != nullptr && place->isRepeat;
}

std::optional<ResultRow> ResultFile::rowOf(int number) const {
  std::string ignored;
  return rowOf(number, ignored);
}

std::optional<ResultRow> ResultFile::rowOf(int number, std::string& reason) const {
  const Place* const place = placeOf(number);
  if (place == nullptr) return std::nullopt;
  std::string line(static_cast<std::size_t>(place->length) - 1, '\0');
  if (!file_.tryRead(place->offset, line.data(), line.size(), reason)) return std::nullopt;
  if (checksumOf(line) != place->checksum) {
    reason = "its row is not as it was written";
    return std::nullopt;
  }
  return readResultRow(line, columns_);
}

/// Runs in which no evaluation repeats another, as most over real parameters, have files without it.
void ResultFile::addRepeatsColumn() {
  std::string reason;
  const bool isThere = file_.tryAppend({}, reason);  // put back if it was removed, as before every row
  const auto content = isThere ? readAsWritten(reason) : std::nullopt;
  if (!content) fatalError("Error: Unable to write to " + path(), reason);
  ResultColumns wider = columns_;
  wider.hasRepeats = true;
  const std::size_t headerLength = resultHeader(columns_).size() + 1;
  std::string text = content->substr(0, static_cast<std::size_t>(headLength_) - headerLength);
  text += resultHeader(wider) + '\n';
  const std::int64_t headLength = std::ssize(text);
  std::vector<RowChecksum> checksums = checksumsOfRows();  // until the rows are replaced these are right
  std::vector<RowChecksum> after;
  std::vector<Place> places;
  for (const Place& place : rows_) {
    const auto line = std::string_view(*content).substr(static_cast<std::size_t>(place.offset),
                                                        static_cast<std::size_t>(place.length) - 1);
    const std::string widened = std::string(line) + "\t0";
    places.push_back(
        {std::ssize(text), checksumOf(widened), place.number, static_cast<std::uint32_t>(widened.size() + 1), false});
    after.push_back({place.number, places.back().checksum});
    text += widened + '\n';
  }
  text += linesOfOthers(*content);
  checksums.insert(checksums.end(), after.begin(), after.end());
  const EndingSignalsHeld held;
  checksums_.open(checksums);
  if (!replaceFile(path(), text, reason)) fatalError("Error: Unable to write to " + path(), reason);
  rows_ = std::move(places);
  headLength_ = headLength;
  columns_ = std::move(wider);
  const bool isKnownToSignals = signalState.resultFileDescriptor == file_.descriptor();
  if (isKnownToSignals) signalState.resultFileDescriptor = -1;
  file_.openToContinue(std::string(path()));
  if (isKnownToSignals) signalState.resultFileDescriptor = file_.descriptor();
  checksums_.open(after);
}

void ResultFile::replaceAggregate(int number, double aggregate) {
  const auto earlier = std::lower_bound(earlierAggregates_.begin(), earlierAggregates_.end(), number,
                                        [](const auto& entry, int wanted) { return entry.first < wanted; });
  if (earlier != earlierAggregates_.end() && earlier->first == number && earlier->second == aggregate) {
    aggregates_.erase(number);
  } else {
    aggregates_[number] = aggregate;
  }
}

bool ResultFile::isInOrder() const {
  return std::is_sorted(rows_.begin(), rows_.end(), [](const Place& a, const Place& b) { return a.number < b.number; });
}

bool ResultFile::finish(std::span<const std::string> closingLines, std::string& reason) {
  if (!file_.isOpen()) return true;
  const std::string closing = commentLines(closingLines);
  std::string again;
  if (isInOrder() && aggregates_.empty()) {
    // After a failure the run has ended with an error already.
    const bool isWhole = file_.hasFailed() || readAsWritten(reason).has_value();
    const bool isAppended = file_.tryAppend(closing, isWhole ? reason : again);
    const bool isClosed = file_.tryClose(isWhole && isAppended ? reason : again);
    const bool areChecksumsClosed = checksums_.tryClose(isWhole && isAppended && isClosed ? reason : again);
    return isWhole && isAppended && isClosed && areChecksumsClosed;
  }
  const bool isRewritten = rewriteInOrder(closing, reason);
  if (!isRewritten) file_.tryAppend(closing, again);  // better out of order than without an end
  // Both files have been replaced, so that errors of the old descriptors do not matter.
  file_.tryClose(again);
  checksums_.tryClose(again);
  return isRewritten && (aggregates_.empty() || checksums_.replace(checksumsOfRows(), reason));
}

/// Whether each row is where it was written, and as it was: whatever else another program has made of the file is not
/// to be taken apart.
bool ResultFile::hasRowsAsWritten(std::string_view content, std::string& reason) const {
  for (const Place& place : rows_) {
    const std::string_view line = content.substr(std::min(content.size(), static_cast<std::size_t>(place.offset)),
                                                 static_cast<std::size_t>(place.length));
    if (line.size() == place.length && line.back() == '\n' &&
        checksumOf(line.substr(0, line.size() - 1)) == place.checksum) {
      continue;
    }
    reason = fmt::format(
        "another program has changed it: the row of evaluation No. {} is not where and as it was written. Its rows are "
        "left as they are, and a restart tells of those that do not hold",
        place.number);
    return false;
  }
  return true;
}

/// Gives a row its final aggregate; returns its line without the end.
std::string ResultFile::settleLine(std::string_view content, Place& place) const {
  const auto length = static_cast<std::size_t>(place.length) - 1;
  std::string line(content.substr(static_cast<std::size_t>(place.offset), length));
  const auto aggregate = aggregates_.find(place.number);
  auto row = aggregate == aggregates_.end() ? std::nullopt : readResultRow(line, columns_);
  if (!row) return line;
  row->aggregate = aggregate->second;
  line = resultRowText(*row);
  place.checksum = checksumOf(line);
  return line;
}

std::vector<RowChecksum> ResultFile::checksumsOfRows() const {
  std::vector<RowChecksum> checksums;
  for (const Place& place : rows_) checksums.push_back({place.number, place.checksum});
  return checksums;
}

/// What other programs have appended during the run.
std::string ResultFile::linesOfOthers(std::string_view content) const {
  std::string lines;
  std::int64_t end = headLength_;
  for (const Place& place : rows_) {
    lines += content.substr(static_cast<std::size_t>(end), static_cast<std::size_t>(place.offset - end));
    end = place.offset + place.length;
  }
  lines += content.substr(static_cast<std::size_t>(end));
  if (!lines.empty() && !lines.ends_with('\n')) lines += '\n';
  return lines;
}

/// The file's content, if it is still this file and each row is where and as it was written.
std::optional<std::string> ResultFile::readAsWritten(std::string& reason) const {
  if (!file_.isAtItsPath(reason)) return std::nullopt;
  auto content = readTextFile(path(), reason);
  if (!content) return std::nullopt;
  if (std::ssize(*content) < file_.size()) {
    reason = shortenedText(file_.size(), std::ssize(*content));
    return std::nullopt;
  }
  if (!hasRowsAsWritten(*content, reason)) return std::nullopt;
  return content;
}

bool ResultFile::rewriteInOrder(std::string_view closing, std::string& reason) {
  const auto content = readAsWritten(reason);
  if (!content) return false;
  const std::string others = linesOfOthers(*content);
  std::stable_sort(rows_.begin(), rows_.end(), [](const Place& a, const Place& b) { return a.number < b.number; });
  std::vector<RowChecksum> checksums = checksumsOfRows();
  std::string sorted;
  sorted.reserve(content->size() + closing.size());
  sorted.append(*content, 0, static_cast<std::size_t>(headLength_));
  for (Place& place : rows_) {
    const std::uint64_t before = place.checksum;
    sorted += settleLine(*content, place) + '\n';
    // Until the rows are replaced those of before are there.
    if (place.checksum != before) checksums.push_back({place.number, place.checksum});
  }
  sorted += others;
  sorted += closing;
  return checksums_.replace(checksums, reason) && replaceFile(path(), sorted, reason);
}

}  // namespace mirevo

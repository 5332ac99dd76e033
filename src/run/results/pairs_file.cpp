#include "run/results/pairs_file.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <utility>

#include "common/calendar.h"
#include "common/data_table.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "run/results/series_table.h"

namespace mirevo {
namespace {

const std::vector<std::string>& columns() {
  static const std::vector<std::string> kColumns{
      "Evaluation",    "Measure",      "Pairs",           "Missing",        "First",         "Last",
      "LeastObserved", "MeanObserved", "LargestObserved", "LeastSimulated", "MeanSimulated", "LargestSimulated"};
  return kColumns;
}

std::string rowsOf(int number, std::span<const MeasurePairs> pairs) {
  std::string text;
  for (const MeasurePairs& of : pairs) {
    text += dataTableRow({std::int64_t{number}, static_cast<std::int64_t>(of.measure) + 1,
                          static_cast<std::int64_t>(of.count), static_cast<std::int64_t>(of.missingCount),
                          isoTime(of.first), isoTime(of.last), of.observed.least, of.observed.mean, of.observed.largest,
                          of.simulated.least, of.simulated.mean, of.simulated.largest});
  }
  return text;
}

std::optional<std::size_t> countOf(const std::string& cell, int least) {
  const auto number = parseInteger(cell);
  if (!number || *number < least) return std::nullopt;
  return static_cast<std::size_t>(*number);
}

std::optional<ValueSummary> summaryOf(std::span<const std::string> cells) {
  const auto least = realCell(cells[0]);
  const auto mean = realCell(cells[1]);
  const auto largest = realCell(cells[2]);
  if (!least || !mean || !largest) return std::nullopt;
  return ValueSummary{*least, *mean, *largest};
}

}  // namespace

PairsByNumber readPairsTable(std::string_view text) {
  PairsByNumber read;
  const ReadTable table = readDataTable(text);
  if (table.columns != columns()) return read;
  for (const std::vector<std::string>& cells : table.rows) {
    const auto number = parseInteger(cells[0]);
    const auto measure = countOf(cells[1], 1);
    const auto count = countOf(cells[2], 1);
    const auto missing = countOf(cells[3], 0);
    const auto first = readIsoTime(cells[4]);
    const auto last = readIsoTime(cells[5]);
    const auto observed = summaryOf(std::span(cells).subspan(6, 3));
    const auto simulated = summaryOf(std::span(cells).subspan(9, 3));
    if (!number || !measure || !count || !missing || !first || !last || !observed || !simulated) continue;
    // A row that was written again, as its evaluation had to be repeated, replaces the first.
    std::vector<MeasurePairs>& pairs = read[*number];
    std::erase_if(pairs, [&measure](const MeasurePairs& other) { return other.measure + 1 == *measure; });
    pairs.push_back({*measure - 1, *count, *missing, *first, *last, *observed, *simulated});
  }
  return read;
}

PairsFile::PairsFile(std::string path, std::vector<std::string> tableHead)
    : path_(std::move(path)), tableHead_(std::move(tableHead)) {}

PairsByNumber PairsFile::readEarlier(const std::set<int>& numbers) const {
  PairsByNumber earlier = readPairsTable(readFileIfThere(path_).value_or(""));
  std::erase_if(earlier, [&numbers](const auto& entry) { return numbers.count(entry.first) == 0; });
  return earlier;
}

void PairsFile::continueBehind(PairsByNumber earlier) {
  const auto present = readFileIfThere(path_);
  if (earlier.empty() && !present) return;
  pairs_ = std::move(earlier);
  std::string text = dataTableHead({{}, tableHead_, columns(), {}});
  for (const auto& [number, pairs] : pairs_) text += rowsOf(number, pairs);
  std::string reason;
  if (present != text && !replaceFile(path_, text, reason)) fatalError("Error: Unable to write to " + path_, reason);
  file_.openToContinue(path_);
}

void PairsFile::add(int number, std::span<const MeasurePairs> pairs) {
  std::string text = rowsOf(number, pairs);
  if (!file_.isOpen()) {
    file_.open(path_);
    text.insert(0, dataTableHead({{}, tableHead_, columns(), {}}));
  }
  file_.append(text);
  pairs_[number].assign(pairs.begin(), pairs.end());
}

bool PairsFile::finish(const std::set<int>& numbers, std::string& reason) {
  if (!file_.isOpen()) return true;
  if (!file_.tryClose(reason)) return false;
  if (numbers.empty()) return true;
  std::string text = dataTableHead({{}, tableHead_, columns(), {}});
  for (const auto& [number, pairs] : pairs_) {
    if (numbers.count(number) > 0) text += rowsOf(number, pairs);
  }
  std::string ignored;
  return readTextFile(path_, ignored) == text || replaceFile(path_, text, reason);
}

}  // namespace mirevo

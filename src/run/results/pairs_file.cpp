#include "run/results/pairs_file.h"

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <utility>

#include "common/calendar.h"
#include "common/data_table.h"
#include "common/files.h"
#include "common/text.h"
#include "run/results/series_table.h"

namespace mirevo {
namespace {

const std::vector<std::string>& columns() {
  static const std::vector<std::string> kColumns{
      "Evaluation",    "Measure",          "Pairs",        "Missing",         "First",
      "Last",          "LeastObserved",    "MeanObserved", "LargestObserved", "LeastSimulated",
      "MeanSimulated", "LargestSimulated", "LineEnd",      "Numbers",         "Steps",
      "GapStart",      "GapEnd",           "FirstStep",    "LastStep"};
  return kColumns;
}

/// Tables of earlier versions have no last two columns.
bool areColumns(std::span<const std::string> found) {
  constexpr std::size_t kColumnsOfEarlier = 17;
  const std::vector<std::string>& all = columns();
  return found.size() >= kColumnsOfEarlier && found.size() <= all.size() &&
         std::equal(found.begin(), found.end(), all.begin());
}

std::string timeCell(std::int64_t second, bool isKnown) {
  return isKnown ? isoTime(second) : std::string();
}

std::string rowsOf(int number, std::span<const MeasurePairs> pairs) {
  std::string text;
  for (const MeasurePairs& of : pairs) {
    const bool hasPairs = of.count > 0;
    const bool hasSteps = of.file.firstStep != 0 || of.file.lastStep != 0;
    const bool hasGap = of.file.gapEnd > of.file.gapStart;
    const auto valueCell = [hasPairs](double value) { return hasPairs ? value : std::nan(""); };
    text += dataTableRow({std::int64_t{number}, static_cast<std::int64_t>(of.measure) + 1,
                          static_cast<std::int64_t>(of.count), static_cast<std::int64_t>(of.missingCount),
                          timeCell(of.first, hasPairs), timeCell(of.last, hasPairs), valueCell(of.observed.least),
                          valueCell(of.observed.mean), valueCell(of.observed.largest), valueCell(of.simulated.least),
                          valueCell(of.simulated.mean), valueCell(of.simulated.largest),
                          std::int64_t{of.file.endsLine ? 1 : 0}, static_cast<std::int64_t>(of.file.numberCount),
                          static_cast<std::int64_t>(of.file.stepCount), timeCell(of.file.gapStart, hasGap),
                          timeCell(of.file.gapEnd, hasGap), timeCell(of.file.firstStep, hasSteps),
                          timeCell(of.file.lastStep, hasSteps)});
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

std::optional<FileForm> formOf(std::span<const std::string> cells) {
  const auto ends = countOf(cells[0], 0);
  const auto numbers = countOf(cells[1], 0);
  const auto steps = countOf(cells[2], 0);
  if (!ends || *ends > 1 || !numbers || !steps) return std::nullopt;
  FileForm form{.endsLine = *ends == 1, .numberCount = *numbers, .stepCount = *steps};
  if (cells.size() > 6 && !cells[5].empty()) {
    const auto first = readIsoTime(cells[5]);
    const auto last = readIsoTime(cells[6]);
    if (!first || !last || *last < *first) return std::nullopt;
    form.firstStep = *first;
    form.lastStep = *last;
  }
  if (cells[3].empty() && cells[4].empty()) return form;
  const auto start = readIsoTime(cells[3]);
  const auto end = readIsoTime(cells[4]);
  if (!start || !end || *end <= *start) return std::nullopt;
  form.gapStart = *start;
  form.gapEnd = *end;
  return form;
}

std::optional<MeasurePairs> pairsOf(std::span<const std::string> cells) {
  const auto measure = countOf(cells[1], 1);
  const auto count = countOf(cells[2], 0);
  const auto missing = countOf(cells[3], 0);
  const auto form = formOf(cells.subspan(12));
  if (!measure || !count || !missing || !form) return std::nullopt;
  MeasurePairs pairs;
  pairs.measure = *measure - 1;
  pairs.count = *count;
  pairs.missingCount = *missing;
  pairs.file = *form;
  if (*count == 0) return pairs;
  const auto first = readIsoTime(cells[4]);
  const auto last = readIsoTime(cells[5]);
  const auto observed = summaryOf(cells.subspan(6, 3));
  const auto simulated = summaryOf(cells.subspan(9, 3));
  if (!first || !last || !observed || !simulated) return std::nullopt;
  pairs.first = *first;
  pairs.last = *last;
  pairs.observed = *observed;
  pairs.simulated = *simulated;
  return pairs;
}

/// Lines that are not for people, the header row among them.
std::size_t lineCount(std::string_view text) {
  const std::vector<std::string_view> lines = splitLines(text);
  return static_cast<std::size_t>(std::count_if(
      lines.begin(), lines.end(), [](std::string_view line) { return !line.empty() && !line.starts_with('#'); }));
}

EarlierPairs readPairs(std::string_view text) {
  EarlierPairs read;
  const ReadTable table = readDataTable(text);
  const std::size_t lines = lineCount(text);
  read.lostRows = lines - std::min<std::size_t>(lines, 1);
  if (!areColumns(table.columns)) return read;
  for (const std::vector<std::string>& cells : table.rows) {
    const auto number = parseInteger(cells[0]);
    const auto found = pairsOf(cells);
    if (!number || !found) continue;
    --read.lostRows;
    // A row that was written again, as its evaluation had to be repeated, replaces the first.
    std::vector<MeasurePairs>& pairs = read.pairs[*number];
    std::erase_if(pairs, [&found](const MeasurePairs& other) { return other.measure == found->measure; });
    pairs.push_back(*found);
  }
  return read;
}

}  // namespace

PairsByNumber readPairsTable(std::string_view text) {
  return readPairs(text).pairs;
}

std::string pairsTableText(std::span<const std::string> head, const PairsByNumber& pairs) {
  std::string text = dataTableHead({{}, {head.begin(), head.end()}, columns(), {}});
  for (const auto& [number, of] : pairs) text += rowsOf(number, of);
  return text;
}

PairsFile::PairsFile(std::string path, std::vector<std::string> tableHead)
    : path_(std::move(path)), tableHead_(std::move(tableHead)) {}

EarlierPairs PairsFile::readEarlier() const {
  return readPairs(readFileIfThere(path_).value_or(""));
}

void PairsFile::continueBehind(PairsByNumber earlier) {
  if (earlier.empty() && !readFileIfThere(path_)) return;
  pairs_ = std::move(earlier);
  file_.openToContinue(path_, pairsTableText(tableHead_, pairs_));
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
  std::erase_if(pairs_, [&numbers](const auto& entry) { return numbers.count(entry.first) == 0; });
  const std::string text = pairsTableText(tableHead_, pairs_);
  std::string ignored;
  return readTextFile(path_, ignored) == text || replaceFile(path_, text, reason);
}

}  // namespace mirevo

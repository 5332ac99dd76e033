#include "run/results/result_table.h"

#include <algorithm>
#include <functional>
#include <utility>

#include "common/checksum.h"
#include "common/data_table.h"
#include "common/text.h"

namespace mirevo {
namespace {

void noteUnusable(std::string_view line, ResultTable& table) {
  ++table.unusableLines;
  if (const auto number = parseInteger(line.substr(0, line.find('\t')))) table.numbersOfUnusable.insert(*number);
}

/// Takes a row, whose memory may be used again.
using RowSink = std::function<void(ResultRow& row)>;

/// Reads the line of a row; false if it is damaged. `row` is for its values.
bool takeRow(std::string_view line, std::size_t lineNumber, std::size_t columnCount, const ResultColumns& columns,
             ResultTable& table, ResultRow& row, const RowSink& take) {
  if (!table.hasExpectedCount) {
    const bool isWhole = cellCount(line) == columnCount;
    if (isWhole) ++table.rowsOfOtherColumns;
    return isWhole;
  }
  if (!readResultRow(line, columns, row)) return false;
  row.line = lineNumber;
  row.lineChecksum = checksumOf(line);
  take(row);
  return true;
}

ResultTable readTable(std::string_view text, const ResultColumns& expected, const RowSink& take) {
  ResultTable table;
  ResultColumns columns = expected;
  ResultRow row;
  std::size_t columnCount = 0;
  for (std::size_t lineNumber = 1; !text.empty(); ++lineNumber) {
    const std::size_t end = text.find('\n');
    const std::string_view line = trimTrailing(text.substr(0, end));
    if (end == std::string_view::npos) {
      ++table.unusableLines;
      table.hasCutRow = !line.empty() && line.front() != '#';
      return table;
    }
    text.remove_prefix(end + 1);
    if (line.empty()) continue;
    if (line.front() == '#') {
      (table.hasHeader ? table.closingLines : table.headLines).emplace_back(trim(line.substr(1)));
    } else if (table.hasHeader) {
      if (!takeRow(line, lineNumber, columnCount, columns, table, row, take)) noteUnusable(line, table);
    } else if (isResultHeader(line)) {
      table.hasHeader = true;
      columnCount = cellCount(line);
      columns = withRepeatsOf(line, std::move(columns));
      table.hasExpectedCount = columnCount == cellCount(resultHeader(columns));
      table.hasExpectedColumns = hasColumns(line, columns);
    } else {
      ++table.unusableLines;
    }
  }
  return table;
}

}  // namespace

ResultTable readResultTable(std::string_view text, const ResultColumns& columns) {
  std::vector<ResultRow> rows;
  ResultTable table = readTable(text, columns, [&rows](ResultRow& row) { rows.push_back(std::move(row)); });
  table.rows = std::move(rows);
  return table;
}

ResultTable readResultTable(std::string_view text, const ResultColumns& columns, ResultRows& rows) {
  rows = {};
  return readTable(text, columns, [&](const ResultRow& row) {
    if (rows.empty()) rows.reserve(static_cast<std::size_t>(std::count(text.begin(), text.end(), '\n')));
    rows.add(row);
  });
}

void putInOrder(std::vector<ResultRow>& rows) {
  std::stable_sort(rows.begin(), rows.end(), [](const auto& a, const auto& b) { return a.number < b.number; });
  rows.erase(std::unique(rows.begin(), rows.end(), [](const auto& a, const auto& b) { return a.number == b.number; }),
             rows.end());
}

}  // namespace mirevo

// Any bytes as a result file: no crash; cut off anywhere, it holds the first of its rows and no others; and rows
// written anew, as a restart does, are the same rows.

#include <cstdint>
#include <string>

#include "common/text.h"
#include "require.h"
#include "run/results/result_table.h"

namespace {

using mirevo::ResultColumns;
using mirevo::ResultRow;
using mirevo::ResultTable;

/// The columns of the first line that is a header row with at least one of a parameter, or none.
ResultColumns columnsOf(std::string_view text) {
  ResultColumns columns;
  for (const std::string_view line : mirevo::splitLines(text)) {
    const std::string_view header = mirevo::trimTrailing(line);
    if (!mirevo::isResultHeader(header)) continue;
    constexpr std::size_t kOthers = 3;  // number, status and aggregate
    std::string_view rest = header;
    for (std::size_t i = 0; i < mirevo::cellCount(header); ++i) {
      const std::size_t tab = rest.find('\t');
      if (i >= 2 && columns.parameters.size() + kOthers < mirevo::cellCount(header)) {
        columns.parameters.emplace_back(rest.substr(0, tab));
      }
      rest.remove_prefix(tab == rest.npos ? rest.size() : tab + 1);
    }
    break;
  }
  return columns;
}

bool isSame(const ResultRow& a, const ResultRow& b) {
  return mirevo::resultRowText(a) == mirevo::resultRowText(b);
}

void requireFirstRowsOf(const ResultTable& whole, const ResultTable& part) {
  require(part.rows.size() <= whole.rows.size());
  for (std::size_t i = 0; i < part.rows.size(); ++i) require(isSame(part.rows[i], whole.rows[i]));
}

std::string written(const ResultTable& table, ResultColumns columns) {
  columns.hasRepeats = !table.rows.empty() && table.rows.front().repeats.has_value();
  std::string text = mirevo::resultHeader(columns) + '\n';
  for (const ResultRow& row : table.rows) text += mirevo::resultRowText(row) + '\n';
  return text;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < 2) return 0;
  const std::string_view text(reinterpret_cast<const char*>(data) + 2, size - 2);
  const ResultColumns columns = columnsOf(text);
  const ResultTable table = mirevo::readResultTable(text, columns);
  require(table.rows.empty() || table.hasExpectedCount);
  for (const ResultRow& row : table.rows) {
    require(row.number >= 1 && row.parameters.size() == columns.parameters.size());
  }
  const std::size_t length = text.size() * (data[0] * 256U + data[1]) / 65535U;
  requireFirstRowsOf(table, mirevo::readResultTable(text.substr(0, length), columns));
  if (!table.hasExpectedCount) return 0;
  const ResultTable again = mirevo::readResultTable(written(table, columns), columns);
  require(again.rows.size() == table.rows.size() && again.unusableLines == 0);
  requireFirstRowsOf(table, again);
  return 0;
}

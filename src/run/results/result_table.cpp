#include "run/results/result_table.h"

#include <optional>

#include "common/data_table.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kFirstHeading = "Evaluation";
constexpr std::size_t kLeadingColumns = 2;  ///< Evaluation and Status

std::optional<ResultTable::Row> readRow(std::string_view line, std::size_t columnCount) {
  const std::vector<std::string_view> cells = splitAt(line, '\t');
  if (cells.size() != columnCount + kLeadingColumns) return std::nullopt;
  const auto number = parseInteger(cells[0]);
  const bool ok = cells[1] == "OK";
  if (!number || *number < 1 || (!ok && cells[1] != "FAILED")) return std::nullopt;
  ResultTable::Row row{*number, ok, {}};
  row.values.reserve(columnCount);
  for (std::size_t i = kLeadingColumns; i < cells.size(); ++i) {
    const auto value = realCell(cells[i]);
    if (!value) return std::nullopt;
    row.values.push_back(*value);
  }
  return row;
}

bool readHeader(std::string_view line, ResultTable& table) {
  const std::vector<std::string_view> cells = splitAt(line, '\t');
  if (cells.size() <= kLeadingColumns || cells[0] != kFirstHeading) return false;
  table.columns.assign(cells.begin() + kLeadingColumns, cells.end());
  return true;
}

}  // namespace

ResultTable readResultTable(std::string_view text) {
  ResultTable table;
  while (!text.empty()) {
    const std::size_t end = text.find('\n');
    const std::string_view line = trimTrailing(text.substr(0, end));
    if (end == std::string_view::npos) {
      ++table.unusableLines;
      return table;
    }
    text.remove_prefix(end + 1);
    if (line.empty()) continue;
    if (line.front() == '#') {
      (table.hasHeader() ? table.closingLines : table.headLines).emplace_back(trim(line.substr(1)));
    } else if (!table.hasHeader()) {
      if (!readHeader(line, table)) ++table.unusableLines;
    } else if (auto row = readRow(line, table.columns.size())) {
      table.rows.push_back(std::move(*row));
    } else {
      ++table.unusableLines;
    }
  }
  return table;
}

}  // namespace mirevo

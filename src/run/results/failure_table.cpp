#include "run/results/failure_table.h"

#include <cstdint>
#include <optional>
#include <utility>

#include "common/data_table.h"
#include "common/text.h"

namespace mirevo {
namespace {

const std::vector<std::string>& columns() {
  static const std::vector<std::string> kColumns{"Evaluation", "Kind", "Reason", "Output"};
  return kColumns;
}

/// Each line with its line end, so that a single empty one differs from none.
std::string joined(const std::vector<std::string>& lines) {
  std::string text;
  for (const std::string& line : lines) text += line + '\n';
  return text;
}

std::vector<std::string> linesOf(std::string_view text) {
  std::vector<std::string> lines;
  for (std::size_t end = text.find('\n'); end != std::string_view::npos; end = text.find('\n')) {
    lines.emplace_back(text.substr(0, end));
    text.remove_prefix(end + 1);
  }
  return lines;
}

}  // namespace

std::string failureTableHead(const std::vector<std::string>& headLines) {
  return dataTableHead({{}, headLines, columns(), {}});
}

std::string failureRowText(const FailureRow& row) {
  return dataTableRow({std::int64_t{row.number}, std::string(failureKindKey(row.failure.kind)), row.failure.reason,
                       joined(row.failure.lastOutput)});
}

std::vector<FailureRow> readFailureTable(std::string_view text) {
  std::vector<FailureRow> rows;
  ReadTable table = readDataTable(text);
  if (table.columns != columns()) return rows;
  for (std::vector<std::string>& cells : table.rows) {
    const auto number = parseInteger(cells[0]);
    const auto kind = failureKindOfKey(cells[1]);
    if (number && kind) rows.push_back({*number, {*kind, std::move(cells[2]), linesOf(cells[3])}});
  }
  return rows;
}

}  // namespace mirevo

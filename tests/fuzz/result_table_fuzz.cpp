// Any bytes as a result file: no crash; cut off anywhere, it holds the first of its rows and no others; and rows
// written anew, as a restart does, are the same rows.

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "common/text.h"
#include "run/results/result_table.h"

namespace {

using mirevo::ResultTable;

void require(bool promise) {
  if (!promise) std::abort();
}

bool isSame(const ResultTable::Row& a, const ResultTable::Row& b) {
  if (a.number != b.number || a.ok != b.ok || a.values.size() != b.values.size()) return false;
  for (std::size_t i = 0; i < a.values.size(); ++i) {
    const bool bothMissing = std::isnan(a.values[i]) && std::isnan(b.values[i]);
    if (!bothMissing && (a.values[i] != b.values[i] || std::signbit(a.values[i]) != std::signbit(b.values[i])))
      return false;
  }
  return true;
}

void requireFirstRowsOf(const ResultTable& whole, const ResultTable& part) {
  require(part.rows.size() <= whole.rows.size());
  for (std::size_t i = 0; i < part.rows.size(); ++i) require(isSame(part.rows[i], whole.rows[i]));
}

std::string written(const ResultTable& table) {
  std::string text = "Evaluation\tStatus";
  for (std::size_t i = 0; i < table.columns.size(); ++i) text += "\tcolumn";
  text += '\n';
  for (const ResultTable::Row& row : table.rows) {
    text += std::to_string(row.number) + (row.ok ? "\tOK" : "\tFAILED");
    for (const double value : row.values) text += '\t' + mirevo::formatReal(value);
    text += '\n';
  }
  return text;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < 2) return 0;
  const std::string_view text(reinterpret_cast<const char*>(data) + 2, size - 2);
  const ResultTable table = mirevo::readResultTable(text);
  require(table.rows.empty() || table.hasHeader());
  for (const ResultTable::Row& row : table.rows) {
    require(row.number >= 1 && row.values.size() == table.columns.size());
  }
  const std::size_t length = text.size() * (data[0] * 256U + data[1]) / 65535U;
  requireFirstRowsOf(table, mirevo::readResultTable(text.substr(0, length)));
  if (!table.hasHeader()) return 0;
  const ResultTable again = mirevo::readResultTable(written(table));
  require(again.rows.size() == table.rows.size() && again.unusableLines == 0);
  requireFirstRowsOf(table, again);
  return 0;
}

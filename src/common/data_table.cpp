#include "common/data_table.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "common/utf8.h"

namespace mirevo {
namespace {

constexpr std::string_view kHexDigits = "0123456789abcdef";
constexpr std::string_view kRowCount = "Rows: ";

bool hasMeaningToReaders(char c) {
  return static_cast<unsigned char>(c) < ' ' || c == '\x7F' || c == '#' || c == '"';
}

std::string escaped(std::string_view text) {
  std::string result;
  while (!text.empty()) {
    const Utf8Character first = firstCharacter(text);
    const char c = text.front();
    if (c == '\t' || c == '\n' || c == '\\') {
      result += '\\';
      result += c == '\t' ? 't' : c == '\n' ? 'n' : c;
    } else if (!first.isValid || hasMeaningToReaders(c)) {
      const auto byte = static_cast<unsigned char>(c);
      result.append("\\x") += kHexDigits[byte / 16U];
      result += kHexDigits[byte % 16U];
    } else {
      result += text.substr(0, first.bytes);
    }
    text.remove_prefix(first.bytes);
  }
  return result;
}

/// The character whose code is given by the two hexadecimal digits at the start of `text`.
std::optional<char> hexSign(std::string_view text) {
  const std::size_t high = text.size() < 2 ? std::string_view::npos : kHexDigits.find(text[0]);
  const std::size_t low = high == std::string_view::npos ? high : kHexDigits.find(text[1]);
  if (low == std::string_view::npos) return std::nullopt;
  return static_cast<char>(high * 16 + low);
}

std::string unescaped(std::string_view text) {
  std::string result;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '\\' || i + 1 == text.size()) {
      result += text[i];
      continue;
    }
    const char next = text[++i];
    if (const auto sign = next == 'x' ? hexSign(text.substr(i + 1)) : std::nullopt) {
      result += *sign;
      i += 2;
    } else {
      result += next == 't' ? '\t' : next == 'n' ? '\n' : next;
    }
  }
  return result;
}

/// As formatReal() does, without a text of its own for each.
void appendReal(std::string& row, double number) {
  constexpr std::size_t kLongest = 32;
  if (!std::isfinite(number)) {
    row += formatReal(number);
    return;
  }
  char digits[kLongest];
  row.append(digits, fmt::format_to_n(digits, kLongest, "{}", number).out);
}

void appendCell(std::string& row, const DataTable::Cell& cell) {
  struct Text {
    std::string& row;
    void operator()(std::int64_t number) const { row += std::to_string(number); }
    void operator()(double number) const { appendReal(row, number); }
    void operator()(const std::string& text) const { row += escaped(text); }
  };
  std::visit(Text{row}, cell);
}

void appendCells(std::string& row, std::span<const DataTable::Cell> cells) {
  for (std::size_t i = 0; i < cells.size(); ++i) {
    if (i > 0) row += '\t';
    appendCell(row, cells[i]);
  }
}

void appendHeadLines(std::string& text, std::span<const std::string> lines) {
  for (const std::string& line : lines) text += "# " + withValidUtf8(onOneLine(line)) + '\n';
}

std::string headerRow(const DataTable& table) {
  return dataTableRow({table.columns.begin(), table.columns.end()});
}

std::vector<std::string> cellsOf(std::string_view line) {
  std::vector<std::string> cells;
  for (const std::string_view cell : splitAt(line, '\t')) cells.push_back(unescaped(cell));
  return cells;
}

}  // namespace

std::string rowCountLine(const DataTable& table) {
  return fmt::format("{}{}", kRowCount, table.rows.size());
}

std::string dataTableRow(const std::vector<DataTable::Cell>& cells) {
  std::string row;
  appendCells(row, cells);
  return row + '\n';
}

std::string dataTableHead(const DataTable& table) {
  std::string text;
  appendHeadLines(text, table.headLines);
  return text + headerRow(table);
}

std::string dataTableText(const DataTable& table) {
  std::string text;
  DataTableParts parts(table);
  for (std::string_view part = parts.next(); !part.empty(); part = parts.next()) text += part;
  return text;
}

std::string_view DataTableParts::next() {
  constexpr std::size_t kPart = std::size_t{1} << 20;
  part_.clear();
  if (!std::exchange(hasHead_, true)) {
    appendHeadLines(part_, firstHeadLines_);
    part_ += dataTableHead(table_);
  }
  for (; row_ < table_.rows.size() && part_.size() < kPart; ++row_) {
    appendCells(part_, table_.rows[row_]);
    for (const std::vector<double>& column : table_.realColumns) {
      part_ += '\t';
      appendReal(part_, column[row_]);
    }
    part_ += '\n';
  }
  return part_;
}

std::optional<std::size_t> ReadTable::column(std::string_view name) const {
  const auto found = std::find(columns.begin(), columns.end(), name);
  if (found == columns.end()) return std::nullopt;
  return static_cast<std::size_t>(found - columns.begin());
}

ReadTable readDataTable(std::string_view text) {
  ReadTable table;
  std::size_t number = 0;
  for (std::size_t end = text.find('\n'); end != std::string_view::npos; end = text.find('\n')) {
    std::string_view line = text.substr(0, end);
    text.remove_prefix(end + 1);
    ++number;
    if (!line.empty() && line.back() == '\r') line.remove_suffix(1);
    if (line.empty()) continue;
    if (line.front() == '#') {
      if (table.columns.empty()) table.headLines.emplace_back(trim(line.substr(1)));
    } else if (table.columns.empty()) {
      table.columns = cellsOf(line);
    } else if (auto cells = cellsOf(line); cells.size() == table.columns.size()) {
      table.rows.push_back(std::move(cells));
    } else {
      table.isDamaged = true;
      if (table.oddLine == 0) {
        table.oddLine = number;
        table.oddCells = cells.size();
      }
    }
  }
  if (!text.empty() || table.columns.empty()) table.isDamaged = true;
  for (const std::string& line : table.headLines) {
    if (!line.starts_with(kRowCount)) continue;
    const auto count = parseInteger(std::string_view(line).substr(kRowCount.size()));
    if (count && static_cast<std::size_t>(*count) != table.rows.size()) table.isDamaged = true;
  }
  return table;
}

ReadTable readGivenTable(std::string_view text, const char* refusal, const std::string& fileName) {
  std::string complete(text);
  if (!complete.ends_with('\n')) complete += '\n';
  ReadTable table = readDataTable(complete);
  if (!table.isDamaged) return table;
  if (table.oddLine > 0) {
    fatalError(refusal, fmt::format("{}:{}: expected {} separated by tabs, as in the header row, found {}", fileName,
                                    table.oddLine, countText(table.columns.size(), "cell"), table.oddCells));
  }
  if (table.columns.empty()) fatalError(refusal, fileName + ": expected a tab-separated table, found no header row");
  fatalError(refusal, fmt::format("{}: expected as many rows as its head says, found {}: the file has not been written "
                                  "or copied to its end",
                                  fileName, table.rows.size()));
}

std::optional<double> realCell(std::string_view cell) {
  if (cell == "NaN") return std::numeric_limits<double>::quiet_NaN();
  if (cell == "Inf") return std::numeric_limits<double>::infinity();
  if (cell == "-Inf") return -std::numeric_limits<double>::infinity();
  return parseReal(cell);
}

}  // namespace mirevo

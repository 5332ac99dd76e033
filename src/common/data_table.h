#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "common/run_files.h"

namespace mirevo {

/// A table for programs to read: what a run found, typed and at full precision. As a file it is tab-separated text
/// below `#` lines, which spreadsheets, R and pandas read as it stands.
struct DataTable {
  using Cell = std::variant<std::int64_t, double, std::string>;

  RunFile file;
  std::vector<std::string> headLines;  ///< for people, without "# "
  std::vector<std::string> columns;
  std::vector<std::vector<Cell>> rows;  ///< one cell per column
};

/// The table as text: `#` head lines, a header row, one line per row. Reals read back as the same 64 bits ("NaN",
/// "Inf", "-Inf" for the others). In a text a tab, a line end or a backslash is written as `\t`, `\n` or `\\`, and any
/// other sign that a reader of tables takes for something else as `\x` and two hexadecimal digits: control characters,
/// `#`, which begins a comment, `"`, which opens a quoted cell, and bytes that are not UTF-8. All of it reads back as
/// it was.
std::string dataTableText(const DataTable& table);
/// One row as dataTableText() has it, line end included.
std::string dataTableRow(const std::vector<DataTable::Cell>& cells);
/// The `#` lines and the header row alone: the beginning of a file that grows row by row.
std::string dataTableHead(const DataTable& table);

/// A table read back; all cells are texts, taken as the reader wants them.
struct ReadTable {
  std::vector<std::string> headLines;
  std::vector<std::string> columns;
  std::vector<std::vector<std::string>> rows;  ///< whole rows only: a last line without its line end is left out

  /// The 0-based number of a column; nothing when there is none of that name.
  std::optional<std::size_t> column(std::string_view name) const;
};

/// Reads the text of a table. Any text is taken; rows with another number of cells than the header row are left out.
ReadTable readDataTable(std::string_view text);

/// A cell as the number that dataTableText() wrote; nothing when it is none.
std::optional<double> realCell(std::string_view cell);

}  // namespace mirevo

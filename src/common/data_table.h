#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "common/run_files.h"

namespace mirevo {

/// A table for programs to read: what a run found, typed and at full precision. As a file it is tab-separated text
/// below `#` lines, which spreadsheets, R and pandas can read as it is.
struct DataTable {
  using Cell = std::variant<std::int64_t, double, std::string>;

  RunFile file;
  std::vector<std::string> headLines;  ///< for people, without "# "
  std::vector<std::string> columns;
  std::vector<std::vector<Cell>> rows;  ///< one cell per column, or the first ones of each row
  /// The columns behind those of `rows`, one value per row: of a large table 8 bytes each, where a cell takes 40.
  std::vector<std::vector<double>> realColumns = {};
};

/// The table as text: `#` head lines, a header row, one line per row. Reals read back as the same 64 bits ("NaN",
/// "Inf", "-Inf" for the others). In a text a tab, a line feed or a backslash is written as `\t`, `\n` or `\\`, and
/// anything else that a reader of tables could misread as `\x` and two hexadecimal digits: control characters, `#`
/// (begins a comment), `"` (opens a quoted cell), and bytes that are not UTF-8. readDataTable() restores the text.
std::string dataTableText(const DataTable& table);
/// dataTableText() a part at a time, so that a large text is never there as a whole.
class DataTableParts final {
 public:
  /// With `firstHeadLines` above those of the table. Both must outlive the object.
  explicit DataTableParts(const DataTable& table, std::span<const std::string> firstHeadLines = {})
      : table_(table), firstHeadLines_(firstHeadLines) {}
  /// The next part, which holds until the following call; empty at the end.
  std::string_view next();

 private:
  const DataTable& table_;
  std::span<const std::string> firstHeadLines_;
  std::string part_;
  std::size_t row_ = 0;
  bool hasHead_ = false;
};
/// The head line by which readDataTable() knows whether the rows behind it are complete.
std::string rowCountLine(const DataTable& table);
/// One row as in dataTableText(), line end included.
std::string dataTableRow(const std::vector<DataTable::Cell>& cells);
/// The `#` lines and the header row alone: the beginning of a file that grows row by row.
std::string dataTableHead(const DataTable& table);

/// A table read back. All cells are texts; the caller interprets them.
struct ReadTable {
  std::vector<std::string> headLines;
  std::vector<std::string> columns;
  std::vector<std::vector<std::string>> rows;  ///< complete rows only: a last line without a line end is left out
  /// The last line has no end, a row has too few or too many cells, or there are not as many rows as the head says.
  bool isDamaged = false;
  std::size_t oddLine = 0;   ///< the first with another number of cells than the header row, from 1; 0: none
  std::size_t oddCells = 0;  ///< in that line

  /// The 0-based index of a column; empty when there is none of that name.
  std::optional<std::size_t> column(std::string_view name) const;
};

/// Reads a table that somebody may have written or edited; its last line needs no line end. Throws FatalError with
/// `refusal` where rows or the header are missing or have another number of cells, naming `fileName` and the line.
ReadTable readGivenTable(std::string_view text, const char* refusal, const std::string& fileName);

/// Reads the text of a table. Accepts any text; rows with a different number of cells from the header row are left out.
ReadTable readDataTable(std::string_view text);

/// The number that dataTableText() wrote into a cell; empty when the cell is not a number.
std::optional<double> realCell(std::string_view cell);

}  // namespace mirevo

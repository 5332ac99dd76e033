#pragma once

#include <cstddef>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "run/results/result_row.h"
#include "run/results/result_rows.h"

namespace mirevo {

/// A result file as found on disk, whether its run is finished, going on or cut off.
struct ResultTable {
  std::vector<std::string> headLines;  ///< `#` lines before the header row, without "# "
  bool hasHeader = false;
  bool hasExpectedCount = false;          ///< the header row has as many columns as expected
  bool hasExpectedColumns = false;        ///< the header row has the expected names
  std::vector<ResultRow> rows;            ///< complete rows, in file order; none unless hasExpectedCount
  std::size_t rowsOfOtherColumns = 0;     ///< complete rows if the header row has a different number of columns
  std::vector<std::string> closingLines;  ///< `#` lines after the header row, without "# "
  std::size_t unusableLines = 0;          ///< rows that were cut off or damaged, and what else is no row
  bool hasCutRow = false;                 ///< the last line has no end and is no comment; it counts as unusable
  std::set<int> numbersOfUnusable;        ///< which evaluations the others of them are that begin with a number
};

/// Reads the text of a result file with these columns, or these and that of repeats. A last line without a line end
/// counts as cut off even if it can be read, since digits of its last number may be missing. Accepts any text; lines
/// that do not belong in a result file count as unusable.
ResultTable readResultTable(std::string_view text, const ResultColumns& expected);
/// The same with the rows in `rows`, for those who read many.
ResultTable readResultTable(std::string_view text, const ResultColumns& expected, ResultRows& rows);

/// Sorts the rows by number; of several with the same number the first is kept.
void putInOrder(std::vector<ResultRow>& rows);

}  // namespace mirevo

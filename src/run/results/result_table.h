#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

#include "run/results/result_row.h"

namespace mirevo {

/// A result file as it stands on disk, be its run finished, going on or cut off.
struct ResultTable {
  std::vector<std::string> headLines;     ///< `#` lines before the header row, without "# "
  bool hasHeader = false;                 ///< there is a header row
  bool hasExpectedCount = false;          ///< with as many columns as the reader expects
  bool hasExpectedColumns = false;        ///< with those columns, by their names
  std::vector<ResultRow> rows;            ///< whole rows, in the order of the file; none where the count is another
  std::size_t rowsOfOtherColumns = 0;     ///< whole rows below a header row with another count
  std::vector<std::string> closingLines;  ///< `#` lines behind the header row, without "# "
  std::size_t unusableLines = 0;          ///< rows that were cut off or damaged
};

/// Reads the text of a result file with these columns. A last line without its line end counts as cut off even where it
/// can be read: the rest of its last number may be missing. Any text is taken; what is no part of a result file counts
/// as unusable.
ResultTable readResultTable(std::string_view text, const ResultColumns& columns);

/// Brings the rows into the order of their numbers; of several with one number the first is kept.
void putInOrder(std::vector<ResultRow>& rows);

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// A result file as it stands on disk, be its run finished, going on or cut off.
struct ResultTable {
  struct Row {
    int number = 0;              ///< the evaluation's number in its run, from 1
    bool ok = false;             ///< its status
    std::vector<double> values;  ///< one a column, exactly as they were written
  };
  std::vector<std::string> headLines;     ///< `#` lines before the header row, without "# "
  std::vector<std::string> columns;       ///< headings behind Evaluation and Status; the last is Aggregate
  std::vector<Row> rows;                  ///< whole rows, in the order of the file
  std::vector<std::string> closingLines;  ///< `#` lines behind the header row, without "# "
  std::size_t unusableLines = 0;          ///< rows that were cut off or damaged

  bool hasHeader() const { return !columns.empty(); }
};

/// Reads the text of a result file. A last line without its line end counts as cut off even where it can be read: the
/// rest of its last number may be missing. Any text is taken; what is no part of a result file counts as unusable.
ResultTable readResultTable(std::string_view text);

}  // namespace mirevo

#pragma once

#include <cstdint>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "run/results/record_file.h"
#include "run/results/result_rows.h"
#include "run/results/row_checksums.h"

namespace mirevo {

/// The table of a run's evaluations: `#` head lines, a header row, one row per evaluation, `#` closing lines. Rows are
/// written as evaluations finish, so that a killed run leaves every finished one on disk; finish() puts them in the
/// order of their numbers. Beside it the checksums of the rows are kept, with which a restart checks them.
class ResultFile final {
 public:
  /// `checksums`: the path of their file; `tableHead` is over it, for people.
  ResultFile(std::string checksums, std::vector<std::string> tableHead)
      : checksums_(std::move(checksums), std::move(tableHead)) {}

  /// Creates the file with its head lines (without "# "), its header row and the rows of an earlier run, and replaces
  /// the earlier file with it, so that no row is ever missing from disk. Throws FatalError.
  void open(const std::string& path, std::span<const std::string> headLines, const ResultColumns& columns,
            const ResultRows& earlierRows = {});

  /// Writes one evaluation. The first one that repeats another gives the file the column that says so: the file is
  /// replaced with one that has it. Throws FatalError when that fails.
  void addRow(ResultRow row);

  /// The row of an evaluation, read from the file; empty if there is none, or not as it was written.
  std::optional<ResultRow> rowOf(int number) const;
  /// The same; `reason` receives why a row that is there cannot be read.
  std::optional<ResultRow> rowOf(int number, std::string& reason) const;
  /// Whether its row says that it repeats another.
  bool isRepeat(int number) const;

  /// Changes the aggregate of a row that is written already, if it is another; takes effect on disk with finish().
  void replaceAggregate(int number, double aggregate);

  /// Puts the rows and their checksums in the order of their numbers and writes the closing lines (without "# ").
  /// False, with the system's reason, when that fails; what was written before is then still there. Does nothing if the
  /// file is not open.
  bool finish(std::span<const std::string> closingLines, std::string& reason);

  bool isOpen() const { return file_.isOpen(); }
  const std::string& path() const { return file_.path(); }
  /// For signal handlers; -1 while no file is open.
  int descriptor() const { return file_.descriptor(); }

 private:
  /// Where a row is in the file, in bytes.
  struct Place {
    std::int64_t offset;
    std::uint64_t checksum;
    int number;
    std::uint32_t length;
    bool isRepeat;
  };
  void addPlace(const ResultRow& row, std::int64_t offset, std::string_view line);
  bool isInOrder() const;
  const Place* placeOf(int number) const;
  void addRepeatsColumn();
  std::optional<std::string> readAsWritten(std::string& reason) const;
  bool hasRowsAsWritten(std::string_view content, std::string& reason) const;
  std::string settleLine(std::string_view content, Place& place) const;
  std::vector<RowChecksum> checksumsOfRows() const;
  std::string linesOfOthers(std::string_view content) const;
  bool rewriteInOrder(std::string_view closing, std::string& reason);

  RecordFile file_;
  RowChecksumFile checksums_;
  ResultColumns columns_;
  std::int64_t headLength_ = 0;
  std::vector<Place> rows_;
  std::vector<std::uint32_t> indexOf_;                     ///< by number: the place in rows_, from 1; 0: none
  std::vector<std::pair<int, double>> earlierAggregates_;  ///< of the rows of an earlier run, by number
  std::map<int, double> aggregates_;                       ///< those that are to be changed, by number
};

}  // namespace mirevo

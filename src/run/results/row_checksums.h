#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "run/results/record_file.h"

namespace mirevo {

/// That of a row of a result file: checksumOf() its text without the line end.
struct RowChecksum {
  int number = 0;  ///< of the evaluation
  std::uint64_t checksum = 0;
};

/// Checksums by the number of their evaluation, which may have several: its row had each of them at some time.
class RowChecksums final {
 public:
  RowChecksums() = default;
  /// In any order.
  explicit RowChecksums(std::vector<RowChecksum> rows);

  bool empty() const { return rows_.empty(); }
  std::size_t size() const { return rows_.size(); }
  bool has(int number) const { return !of(number).empty(); }
  bool has(const RowChecksum& row) const;
  /// Those of an evaluation.
  std::span<const RowChecksum> of(int number) const;
  /// By their numbers, those of an evaluation in the order in which they were given.
  auto begin() const { return rows_.begin(); }
  auto end() const { return rows_.end(); }

 private:
  std::vector<RowChecksum> rows_;  ///< by their numbers
};

/// The checksums of a result file's rows, `<setup>_Checksums.dat` and its like, which tell whether a row is as it was
/// written. One is written before its row, so that a kill or a full disk between the two leaves a checksum without a
/// row and never the reverse.
class RowChecksumFile final {
 public:
  /// `tableHead` is over the table, for people.
  RowChecksumFile(std::string path, std::vector<std::string> tableHead);

  /// Adds to an existing file what it lacks of these rows of an earlier run. Throws FatalError.
  void complete(std::span<const RowChecksum> earlier) const;
  /// Begins the file with the rows of an earlier run, replacing an existing one. Throws FatalError.
  void open(std::span<const RowChecksum> earlier);
  /// Throws FatalError when it cannot be written.
  void add(const RowChecksum& row);
  /// Makes these the content, at the end of a run. False, with the file's name and the system's reason, when that
  /// fails.
  bool replace(std::span<const RowChecksum> rows, std::string& reason) const;
  /// False, with the file's name and the system's reason, if not everything written has reached the file.
  bool tryClose(std::string& reason);

  const std::string& path() const { return path_; }

 private:
  std::string text(std::span<const RowChecksum> rows) const;

  std::string path_;
  std::vector<std::string> tableHead_;
  RecordFile file_;
};

/// One row of the file, line end included.
std::string rowChecksumText(const RowChecksum& row);
/// What the file's text holds. Any text is taken; what is no row of it is left out.
RowChecksums readRowChecksums(std::string_view text);

}  // namespace mirevo

#pragma once

#include <functional>
#include <map>
#include <set>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "evaluation/saved_files.h"
#include "run/results/record_file.h"

namespace mirevo {

/// The files that could not be kept by the number of their evaluation.
using UnkeptByNumber = std::map<int, std::vector<UnkeptFile>>;

/// The output files of successful model runs that could not be kept, `<setup>_NotKept.dat` and its like: for programs,
/// and for a restart, which runs the model again for them. The file appears with the first of them.
class UnkeptFiles final {
 public:
  /// `tableHead` is over the table, for people.
  UnkeptFiles(std::string path, std::vector<std::string> tableHead);

  /// Continues what an interrupted run has left: the files of the evaluations that have succeeded, as the condition
  /// says of a number, that are still to be kept, `names` below the base folder. Returns the numbers of the
  /// evaluations. Throws FatalError.
  std::set<int> goOn(const std::function<bool(int)>& hasSucceeded, const std::set<std::string>& names);
  /// Notes those of an evaluation; none if it has been made again and has all. Throws FatalError when they cannot be
  /// written.
  void add(int number, std::span<const UnkeptFile> files);

  /// Throws FatalError if not all that was noted has reached the disk.
  void close() { file_.close(); }

  /// By evaluation, those that have not been kept since.
  const UnkeptByNumber& files() const { return files_; }
  const std::string& path() const { return path_; }

 private:
  std::string path_;
  std::vector<std::string> tableHead_;
  UnkeptByNumber files_;
  RecordFile file_;
};

/// The rows of the table's text that still hold. Any text is taken; what is no row is left out.
UnkeptByNumber readUnkeptTable(std::string_view text);
/// The whole table, below `head` for people.
std::string unkeptTableText(std::span<const std::string> head, const UnkeptByNumber& files);

}  // namespace mirevo

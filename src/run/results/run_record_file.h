#pragma once

#include <optional>
#include <string>
#include <vector>

#include "run/results/record_file.h"
#include "run/results/run_record.h"

namespace mirevo {

/// Keeps the record of a run on disk: written whole when the run begins and again when it ends. In between signal
/// handlers can put its ending behind it.
class RunRecordFile final {
 public:
  /// `headLines` are for people.
  RunRecordFile(std::string path, std::vector<std::string> headLines);
  ~RunRecordFile();
  RunRecordFile(const RunRecordFile&) = delete;
  RunRecordFile& operator=(const RunRecordFile&) = delete;

  const std::string& path() const { return path_; }

  /// The record of a run that an earlier one has left; nothing where there is none. Throws FatalError where there is
  /// one that cannot be read.
  std::optional<RunRecord> readEarlier() const;

  /// Writes the record of a run that begins. Throws FatalError.
  void begin(RunRecord record);
  /// What has been written, to be completed.
  RunRecord& record() { return record_; }
  /// Writes the completed record. False, with the reason, when that fails; nothing happens when it has not begun.
  bool end(std::string& reason);

 private:
  std::string path_;
  std::vector<std::string> headLines_;
  RunRecord record_;
  RecordFile file_;  ///< to which handlers append
};

}  // namespace mirevo

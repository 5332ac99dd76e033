#include "run/results/run_record_file.h"

#include <utility>

#include "common/fatal_error.h"
#include "common/files.h"
#include "platform/signals/signal_state.h"

namespace mirevo {

RunRecordFile::RunRecordFile(std::string path, std::vector<std::string> headLines)
    : path_(std::move(path)), headLines_(std::move(headLines)) {}

RunRecordFile::~RunRecordFile() {
  signalState.runRecordDescriptor = -1;
}

std::optional<RunRecord> RunRecordFile::readEarlier() const {
  return readRunRecord(readFileIfThere(path_).value_or(""));
}

void RunRecordFile::begin(RunRecord record) {
  record_ = std::move(record);
  std::string reason;
  if (!replaceFile(path_, runRecordText(record_, headLines_), reason)) {
    fatalError("Error: Unable to write to " + path_, reason);
  }
  file_.openToContinue(path_);
  signalState.runRecordDescriptor = file_.descriptor();
}

bool RunRecordFile::end(std::string& reason) {
  if (!file_.isOpen()) return true;
  const EndingSignalsHeld held;  // the run has ended by then
  signalState.runRecordDescriptor = -1;
  return replaceFile(path_, runRecordText(record_, headLines_), reason);
}

}  // namespace mirevo

#include "run/progress/progress_reporter.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <system_error>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/descriptor_output.h"
#include "common/progress_messages.h"
#include "common/run_files.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/signals/signal_state.h"

namespace mirevo {
namespace {

constexpr int kNowhere = -1;
constexpr int kStandardOutput = 0;
constexpr double kKillFileSeconds = 0.001;  ///< between two looks: it is asked for several times for each model run
constexpr std::size_t kSpeedWindow = 100;   ///< evaluations
/// Longest wait for a pipe or terminal to accept a record. After that there is no waiting until it accepts one again,
/// so that a reader that has stopped reading does not slow down the run.
constexpr int kPatienceMilliseconds = 1000;
/// Of records that are written together: bytes, which a pipe's reader gets in one piece, and seconds.
constexpr std::size_t kMostWaiting = 3500;
constexpr double kLongestWait = 0.1;

std::string baseNameOf(std::string_view runFileName) {
  for (const std::string_view ending : {run_files::kLog.extension, std::string_view(".inp")}) {
    if (!runFileName.ends_with(ending)) continue;
    runFileName.remove_suffix(ending.size());
    break;  // only one ending: the rest may be "basin.inp"
  }
  return std::string(runFileName);
}

}  // namespace

ProgressReporter::ProgressReporter(Clock clock, std::size_t mostBytes)
    : clock_(std::move(clock)), mostBytes_(mostBytes) {}

ProgressReporter::~ProgressReporter() {
  closeMessageFile();
}

bool ProgressReporter::closeMessageFile() {
  writeAdded();
  const int descriptor = std::exchange(messageUnit_, kNowhere);
  if (descriptor <= kStandardOutput) return true;
  signalState.messageFileDescriptor = -1;
  return ::close(descriptor) == 0;
}

std::string ProgressReporter::progressInit(std::string_view runFileName, std::string_view destination) {
  baseName_ = baseNameOf(runFileName);
  isOnDisk_ = false;
  std::string problems;
  const std::string killFile = runFilePath(baseName_, run_files::kKill);
  if (::unlink(killFile.c_str()) != 0 && errno != ENOENT) {
    problems = fmt::format("Unable to remove the kill file of an earlier run: {}: {}", killFile, std::strerror(errno));
  }
  if (destination == "NONE") {
    messageUnit_ = kNowhere;
  } else if (destination == "STDOUT") {
    messageUnit_ = kStandardOutput;
  } else {
    std::error_code ignored;
    if (std::filesystem::is_symlink(messageFile(), ignored)) std::filesystem::remove(messageFile(), ignored);
    // Without O_NONBLOCK opening a pipe would wait for its reader.
    messageUnit_ = ::open(messageFile().c_str(),
                          O_WRONLY | O_CREAT | O_TRUNC | O_APPEND | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, 0666);
    if (messageUnit_ >= 0) {
      struct stat status {};
      isOnDisk_ = ::fstat(messageUnit_, &status) == 0 && S_ISREG(status.st_mode);
      signalState.messageFileDescriptor = messageUnit_;
    } else {
      if (!problems.empty()) problems += '\n';
      problems += fmt::format("Unable to open TqQmon2 message file: {}: {}", messageFile(), std::strerror(errno));
    }
  }
  return problems;
}

void ProgressReporter::addRecord(std::string_view kind, std::string_view text) {
  if (messageUnit_ < 0 && !listener_) return;
  std::string record = std::string(kind) + withValidUtf8(text);
  std::replace_if(
      record.begin(), record.end(), [](char c) { return c == '\n' || c == '\r'; }, ' ');
  record += '\n';
  if (listener_) listener_(record);
  if (messageUnit_ < 0) return;
  if (messageUnit_ == kStandardOutput) {
    if (kind != progress::kMessage) return;
    record.replace(0, kind.size(), " ");  // list-directed output begins with a blank
  }
  if (isOnDisk_) summary_.take(kind, std::string_view(record).substr(kind.size(), record.size() - kind.size() - 1));
  added_ += record;
}

void ProgressReporter::writeAdded() {
  std::string records = std::exchange(added_, {});
  if (messageUnit_ >= 0 && !records.empty()) write(std::move(records));
}

void ProgressReporter::write(std::string records) {
  if (isLineUnfinished_) records.insert(records.begin(), '\n');
  const int descriptor = messageUnit_ == kStandardOutput ? STDOUT_FILENO : messageUnit_;
  const int patience = isOnDisk_ ? kAsLongAsItTakes : isReaderBusy_ ? 0 : kPatienceMilliseconds;
  // One write(2), so that a viewer never sees half a record in a file on disk.
  const OutputResult result = writeWhole(descriptor, records, patience);
  isReaderBusy_ = result.error == EAGAIN;  // the record is lost
  if (result.taken > 0) isLineUnfinished_ = result.taken < records.size();
  bytes_ += result.taken;
  // A full disk or a closed pipe ends the reporting and not the run.
  if (result.error != 0 && !isReaderBusy_) return giveUp(result.error);
  if (isOnDisk_ && bytes_ > mostBytes_) beginAnew();
}

/// In place, so that a reader that has the file open goes on, too.
void ProgressReporter::beginAnew() {
  const EndingSignalsHeld held;  // whose records come last
  if (::ftruncate(messageUnit_, 0) != 0) {
    isOnDisk_ = false;  // it is none that can be begun anew
    return;
  }
  bytes_ = 0;
  isLineUnfinished_ = false;
  mostBytes_ = std::max(mostBytes_, 4 * summary_.records().size());
  write(summary_.records());
}

void ProgressReporter::writeRecord(std::string_view kind, std::string_view text) {
  addRecord(kind, text);
  writeAdded();
}

/// A full disk or a closed pipe ends the reporting and not the run.
void ProgressReporter::giveUp(int error) {
  const std::string name = messageUnit_ == kStandardOutput ? "standard output" : messageFile();
  problem_ = fmt::format("Progress is no longer reported: unable to write to {}: {}", name, std::strerror(error));
  closeMessageFile();
}

std::string ProgressReporter::messageFile() const {
  return runFilePath(baseName_, run_files::kMessages);
}

void ProgressReporter::writeStatus(std::string_view text) {
  writeRecord(progress::kStatus, text);
}

void ProgressReporter::writeMessage(std::string_view text) {
  writeRecord(progress::kMessage, text);
}

void ProgressReporter::progressStart(std::string_view startedAt, std::string_view host, int process) {
  writeStatus(progress::kInitialisation);
  writeMessage(progress::runStartedMessage(startedAt, host, process));
  writeRecord(progress::kPercentage, "0.0");
}

void ProgressReporter::progressEvaluationLabel(int plannedEvaluations) {
  plannedEvaluations_ = plannedEvaluations;
  completedEvaluations_ = 0;
  times_.assign(1, clock_());
  writeRecord(progress::kStatusLabel, progress::kCountLabel);
  writeRecord(progress::kMessageLabel, fmt::format("{}{}", progress::kOfPlanned, plannedEvaluations));
}

void ProgressReporter::progressStep() {
  ++completedEvaluations_;
  times_.push_back(clock_());
  if (times_.size() > kSpeedWindow + 1) times_.pop_front();
  const double seconds = times_.back() - times_.front();
  if (seconds > 0.0) {
    const double perSecond = static_cast<double>(times_.size() - 1) / seconds;
    const int left = std::max(0, plannedEvaluations_ - completedEvaluations_);
    addRecord(progress::kSpeed, fmt::format("{:.6g}", perSecond));
    addRecord(progress::kTimeLeft, fmt::format("{:.0f}", left / perSecond));
  }
  addPercentage();
  writeAdded();
  isCancelled();
}

void ProgressReporter::addPercentage(bool isReplay) {
  if (plannedEvaluations_ <= 0) return;
  const double percent = std::min(100.0, 100.0 * completedEvaluations_ / plannedEvaluations_);
  std::string text = fmt::format("{:.1f}", percent);
  if (isReplay && text == percentage_) return;
  percentage_ = std::move(text);
  addRecord(progress::kPercentage, percentage_);
}

void ProgressReporter::progressReplayed(int number, bool ok) {
  ++completedEvaluations_;
  if (added_.empty()) addedSince_ = clock_();
  addRecord(progress::kMessage, progress::replayedMessage(number, ok));
  addPercentage(true);  // the next evaluation may take hours
  times_.assign(1, clock_());
  // Thousands may be replayed in a second, and a write for each would take longer than that.
  const bool mayWait = isOnDisk_ && added_.size() <= kMostWaiting && times_.front() - addedSince_ <= kLongestWait;
  if (!mayWait) writeAdded();
}

void ProgressReporter::progressBest(int number, double aggregate, std::string_view foundAt) {
  writeMessage(progress::bestMessage(aggregate, number, foundAt));
}

void ProgressReporter::progressEnd(std::string_view ending) {
  writeStatus(std::string(progress::kEnded).append(ending));
  writeRecord(progress::kPercentage, progress::kComplete);
  if (!closeMessageFile()) {
    problem_ = fmt::format("The end of the run may not be in {}: {}", messageFile(), std::strerror(errno));
  }
}

bool ProgressReporter::isCancelled() {
  if (listener_) listener_({});
  const double now = clock_();
  if (cancelled_ || now < nextLook_) return cancelled_;
  cancelled_ = ::access(runFilePath(baseName_, run_files::kKill).c_str(), F_OK) == 0;
  nextLook_ = now + kKillFileSeconds;
  return cancelled_;
}

}  // namespace mirevo

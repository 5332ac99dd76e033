#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <limits>
#include <string>
#include <string_view>
#include <utility>

#include "run/progress/record_summary.h"

namespace mirevo {

/// Tells a viewer how the run is going, and checks for the kill file that cancels it. The records and their numbers are
/// described in docs/progress-format.md.
class ProgressReporter final {
 public:
  /// Seconds from an arbitrary origin, never decreasing.
  using Clock = std::function<double()>;
  static constexpr std::size_t kMostBytes = 16'000'000;

  /// `mostBytes`: a message file that has become longer is begun anew, with what its records say in short.
  explicit ProgressReporter(Clock clock, std::size_t mostBytes = kMostBytes);
  ~ProgressReporter();
  ProgressReporter(const ProgressReporter&) = delete;
  ProgressReporter& operator=(const ProgressReporter&) = delete;

  /// Chooses where records go by `destination`, the value of VOLK_PROGRESS ("NONE", "STDOUT", anything else a message
  /// file), and removes the kill file of an earlier run. `runFileName` is the path of the run's log or input file.
  /// Returns the problems, one per line; empty when all is well. The run goes on in any case.
  std::string progressInit(std::string_view runFileName, std::string_view destination);

  /// From now on `listener` gets every record as it is in a message file, whether or not one is written, and an empty
  /// one whenever the run looks for its kill file, so that it can tell the time.
  void passRecordsTo(std::function<void(std::string_view)> listener) { listener_ = std::move(listener); }

  void writeStatus(std::string_view text);
  void writeMessage(std::string_view text);

  /// Writes the first records; `startedAt` is in the form of dateAndTimeWithZone().
  void progressStart(std::string_view startedAt, std::string_view host, int process);
  /// Before the first evaluation: `plannedEvaluations` is the number up to which progressStep() counts.
  void progressEvaluationLabel(int plannedEvaluations);
  /// After each completed evaluation: speed, time left and percentage; then looks for the kill file.
  void progressStep();
  /// After an evaluation whose result was taken from an earlier run: it is counted but does not enter the speed.
  void progressReplayed(int number, bool ok);
  /// A new best evaluation: its number, aggregate, and when it was found, in the form of dateAndTimeWithZone(), or
  /// empty for one of an earlier run.
  void progressBest(int number, double aggregate, std::string_view foundAt);
  /// Writes the last records; `ending` says how the run ended ("Normal termination").
  void progressEnd(std::string_view ending);

  /// A problem since the last call: records could not be written, with the system's reason, and no more will be. Empty
  /// when all is well; the run goes on in any case.
  std::string takeProblem() { return std::exchange(problem_, {}); }

  /// Whether the kill file has appeared; looks at most once a millisecond. Once true it stays true, and the disk is not
  /// checked again.
  bool isCancelled();

 private:
  /// Of a replay only one that is another than the last.
  void addPercentage(bool isReplay = false);
  /// Adds a record to those that the next writeAdded() writes.
  void addRecord(std::string_view kind, std::string_view text);
  void writeAdded();
  void writeRecord(std::string_view kind, std::string_view text);
  void write(std::string records);
  void beginAnew();
  /// False, with errno set, when what was written may not be in the file.
  bool closeMessageFile();
  void giveUp(int error);
  std::string messageFile() const;

  Clock clock_;
  std::function<void(std::string_view)> listener_;
  std::string baseName_;
  std::string problem_;
  std::string added_;        ///< records that are not written yet
  double addedSince_ = 0.0;  ///< the first of these
  std::size_t mostBytes_;
  std::size_t bytes_ = 0;   ///< of the message file
  std::string percentage_;  ///< that was written last
  RecordSummary summary_;
  int messageUnit_ = -1;           ///< < 0 nowhere, 0 standard output, > 0 the message file's descriptor
  bool isOnDisk_ = false;          ///< the message file is no pipe
  bool isReaderBusy_ = false;      ///< the reader has not accepted the latest record
  bool isLineUnfinished_ = false;  ///< the reader has accepted only part of a record
  bool cancelled_ = false;
  double nextLook_ = -std::numeric_limits<double>::infinity();  ///< at the kill file, by clock_
  int plannedEvaluations_ = 0;
  int completedEvaluations_ = 0;
  /// The start time and the times at which the latest evaluations were completed, oldest first. The speed is computed
  /// over these, so that it follows a model that becomes slower, and slots that end together do not make it jump.
  std::deque<double> times_;
};

}  // namespace mirevo

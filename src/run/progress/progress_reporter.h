#pragma once

#include <deque>
#include <functional>
#include <string>
#include <string_view>
#include <utility>

namespace mirevo {

/// Tells an outside viewer how the run is going, and learns from a kill file that the run is to stop. The records and
/// their numbers are described in docs/progress-format.md.
class ProgressReporter final {
 public:
  /// Seconds from any origin, never running backwards.
  using Clock = std::function<double()>;

  explicit ProgressReporter(Clock clock);
  ~ProgressReporter();
  ProgressReporter(const ProgressReporter&) = delete;
  ProgressReporter& operator=(const ProgressReporter&) = delete;

  /// Chooses where records go by `destination`, the value of VOLK_PROGRESS ("NONE", "STDOUT", anything else a message
  /// file), and removes the kill file of an earlier run. `runFileName` is the path of the run's log or input file.
  /// Returns what there is to report, one line a problem; empty when all is well. The run goes on in any case.
  std::string progressInit(std::string_view runFileName, std::string_view destination);

  void writeStatus(std::string_view text);
  void writeMessage(std::string_view text);

  /// The first records; `startedAt` as dateAndTimeWithZone() says it.
  void progressStart(std::string_view startedAt, std::string_view host, int process);
  /// Before the first evaluation: `plannedEvaluations` is what progressStep() counts towards.
  void progressEvaluationLabel(int plannedEvaluations);
  /// After each completed evaluation: speed, time left and percentage; then looks for the kill file.
  void progressStep();
  /// After an evaluation whose result was taken from an earlier run: it is counted, but says nothing of the speed.
  void progressReplayed(int number, bool ok);
  /// A new best evaluation: its number, aggregate, and when it was found, as dateAndTimeWithZone() says it; empty for
  /// one of an earlier run.
  void progressBest(int number, double aggregate, std::string_view foundAt);
  /// The last records; `ending` says how the run ended ("Normal termination").
  void progressEnd(std::string_view ending);

  /// What there is to report since the last call: that records could not be written, with the system's reason, and are
  /// written no more. Empty when all is well; the run goes on in any case.
  std::string takeProblem() { return std::exchange(problem_, {}); }

  /// Whether the run was told to stop. Once it has been, it stays so and the disk is not asked again.
  bool isCancelled();

 private:
  void writePercentage();
  void writeRecord(std::string_view kind, std::string_view text);
  /// False, with errno set, when what was written may not be in the file.
  bool closeMessageFile();
  void giveUp(int error);
  std::string messageFile() const;

  Clock clock_;
  std::string baseName_;
  std::string problem_;
  int messageUnit_ = -1;           ///< < 0 nowhere, 0 standard output, > 0 the message file's descriptor
  bool isReaderBusy_ = false;      ///< it has not taken the latest record
  bool isLineUnfinished_ = false;  ///< it has taken a part of the latest that it took any of
  bool cancelled_ = false;
  int plannedEvaluations_ = 0;
  int completedEvaluations_ = 0;
  /// When the counting began and the latest evaluations were completed, oldest first: the speed is taken over these, so
  /// that it follows a model that becomes slower, and slots that end together do not make it jump.
  std::deque<double> times_;
};

}  // namespace mirevo

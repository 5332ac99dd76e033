#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// How far the model runs of a run kept its slots busy, and how evenly its batches could be divided among them. Times
/// are in seconds from any origin.
class SlotUse final {
 public:
  void runStarted(double now);
  /// A model run has ended; its results may still have to be read.
  void runEnded(double now);
  /// What has been started since the last call was a batch: all of it ended before anything else began.
  void endBatch();
  /// What has been started since the last call was none.
  void endPart() {
    hasParts_ = hasParts_ || startedCount_ > 0;
    startedCount_ = 0;
  }

  /// The share of the time between the start of the first and the end of the last model run in which a slot had one;
  /// empty before a run has ended.
  std::optional<double> busyShare(int slotCount) const;
  /// By how much of the slots' time the batches could have filled, with runs of equal length; 1 without a batch.
  double evenness(int slotCount) const;
  /// A line for the log, without its full stop; `what`: "slots". Empty for a single slot, and without a model run.
  std::string text(int slotCount, std::string_view what) const;

 private:
  std::vector<int> evenNumbers() const;
  void advance(double now);

  int runningCount_ = 0;
  int startedCount_ = 0;  ///< since the last batch
  double busySeconds_ = 0.0;
  double first_ = 0.0;
  double now_ = 0.0;
  double busyUntilLastEnd_ = 0.0;
  std::optional<double> lastEnd_;
  bool hasStarted_ = false;
  bool hasParts_ = false;       ///< model runs were made that belong to no batch
  std::map<int, int> batches_;  ///< number of batches by their model runs
};

}  // namespace mirevo

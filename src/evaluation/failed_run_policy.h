#pragma once

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// The message of a run that ends because of them.
inline constexpr const char* kTooManyFailures = "Error: Unable to continue. No of failed simulations too high.";

/// Counts the failed evaluations of a run against their limit, a tenth (rounded down) of the evaluations planned.
class FailedRunPolicy final {
 public:
  /// `foldersToKeep`: the number of failed model runs, counted from the first, whose process folder is kept.
  explicit FailedRunPolicy(int plannedEvaluations, int foldersToKeep = 0)
      : planned_(plannedEvaluations), limit_(plannedEvaluations / 10), foldersLeft_(foldersToKeep) {}

  /// Counts the failure of the evaluation with this number. Throws FatalError with "Error: Unable to continue. No of
  /// failed simulations too high." when the count exceeds the limit; the detail holds the evidence of this failure.
  void countFailure(int number, const EvaluationFailure& failure);

  /// Whether to keep the folder of a failed run that is about to be counted.
  bool isFolderWanted(const EvaluationFailure& failure) const { return foldersLeft_ > 0 && failure.isOfModelRun(); }

  int failedCount() const { return failedCount_; }
  int limit() const { return limit_; }

 private:
  int planned_;
  int limit_;
  int foldersLeft_;
  int failedCount_ = 0;
  int notRunCount_ = 0;  ///< of them, those whose parameter set cannot be run
};

}  // namespace mirevo

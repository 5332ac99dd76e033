#pragma once

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// Counts the failed evaluations of a run against their limit, a tenth (rounded down) of the evaluations planned.
class FailedRunPolicy final {
 public:
  /// `foldersToKeep`: of so many failed model runs, the first ones, the process folder is to be kept.
  explicit FailedRunPolicy(int plannedEvaluations, int foldersToKeep = 0)
      : planned_(plannedEvaluations), limit_(plannedEvaluations / 10), foldersLeft_(foldersToKeep) {}

  /// Counts one failure, of the evaluation with that number. Throws FatalError with "Error: Unable to continue. No of
  /// failed simulations too high." when the count exceeds the limit; the detail holds the evidence of this failure.
  void countFailure(int number, const EvaluationFailure& failure);

  /// Whether the folder of a failed run that is about to be counted is one to keep.
  bool isFolderWanted(const EvaluationFailure& failure) const { return foldersLeft_ > 0 && failure.isOfModelRun(); }

  int failedCount() const { return failedCount_; }
  int limit() const { return limit_; }

 private:
  int planned_;
  int limit_;
  int foldersLeft_;
  int failedCount_ = 0;
};

}  // namespace mirevo

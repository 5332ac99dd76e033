#pragma once

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// Counts the failed evaluations of a run against their limit, a tenth (rounded down) of the evaluations planned.
class FailedRunPolicy final {
 public:
  explicit FailedRunPolicy(int plannedEvaluations) : planned_(plannedEvaluations), limit_(plannedEvaluations / 10) {}

  /// Counts one failure, of the evaluation with that number. Throws FatalError with "Error: Unable to continue. No of
  /// failed simulations too high." when the count exceeds the limit; the detail holds the evidence of this failure.
  void countFailure(int number, const EvaluationFailure& failure);

  int failedCount() const { return failedCount_; }
  int limit() const { return limit_; }

 private:
  int planned_;
  int limit_;
  int failedCount_ = 0;
};

}  // namespace mirevo

#pragma once

namespace mirevo {

/// Counts the failed evaluations of a run against their limit, a tenth (rounded down) of the evaluations planned.
class FailedRunPolicy final {
 public:
  explicit FailedRunPolicy(int plannedEvaluations) : limit_(plannedEvaluations / 10) {}

  /// Counts one failure. Throws FatalError with "Error: Unable to continue. No of failed simulations too high." when
  /// the count exceeds the limit.
  void countFailure();

  int failedCount() const { return failedCount_; }
  int limit() const { return limit_; }

 private:
  int limit_;
  int failedCount_ = 0;
};

}  // namespace mirevo

#pragma once

#include <optional>
#include <string>
#include <vector>

#include "evaluation/evaluation_observer.h"
#include "parameters/search_space.h"
#include "run/failed_run_file.h"
#include "run/result_file.h"
#include "run/run_state.h"

namespace mirevo {

/// The reporting of a run: log, progress, result file and the file of failed runs.
class RunReporter final : public EvaluationObserver {
 public:
  /// The result file is open; all must outlive the reporter.
  RunReporter(RunState& state, ResultFile& results, FailedRunFile& failedRuns, const SearchSpace& space);

  void message(std::string_view text) override;
  void warning(std::string_view text) override;
  void evaluationFinished(std::span<const double> set, const EvaluationResult& result) override;
  bool isCancelled() override { return state_.progress.isCancelled(); }

  /// The evaluation with the smallest aggregate, the first of equals.
  struct Best {
    int number = 0;
    double aggregate = 0.0;
    std::vector<double> parameterValues;  ///< model scale, one a variable parameter
  };
  const std::optional<Best>& best() const { return best_; }

  int evaluationCount() const { return evaluationCount_; }
  int failedCount() const { return failedCount_; }
  const std::string& lastFailureReason() const { return lastFailureReason_; }

 private:
  RunState& state_;
  ResultFile& results_;
  FailedRunFile& failedRuns_;
  const SearchSpace& space_;
  std::optional<Best> best_;
  int evaluationCount_ = 0;
  int failedCount_ = 0;
  std::string lastFailureReason_;
};

}  // namespace mirevo

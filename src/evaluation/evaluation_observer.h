#pragma once

#include <span>
#include <string>
#include <string_view>

#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"
#include "evaluation/run_comparison.h"

namespace mirevo {

/// Is told what the evaluation loops do, reports and records it, and knows whether the run was cancelled.
class EvaluationObserver {
 public:
  EvaluationObserver() = default;
  EvaluationObserver(const EvaluationObserver&) = delete;
  EvaluationObserver& operator=(const EvaluationObserver&) = delete;
  virtual ~EvaluationObserver() = default;

  /// A message of the run, for the log and the progress viewer.
  virtual void message(std::string_view text) = 0;
  /// A warning for the log alone.
  virtual void warning(std::string_view text) = 0;
  /// A warning for the log that the user gets at once, too: the run may be in vain.
  virtual void urgentWarning(std::string_view text) { warning(text); }
  /// A model run has left processes that had to be ended; `text` names the evaluation and them.
  virtual void processesLeft(std::string_view text) { warning(text); }
  /// A process of the job is lost and another runs the set that it had; `text` names the process and the evaluation.
  virtual void runLost(std::string_view text) { warning(text); }
  /// A model run has not left an output file that is to be kept; `text` names the evaluation and says why. `name`: the
  /// file below the base folder, with its leading "/".
  virtual void fileAbsent(const std::string& name, std::string_view text) {
    static_cast<void>(name);
    warning(text);
  }
  /// Writes a finished evaluation to disk. Called before anything reports its end, so that nothing is reported as done
  /// that a full disk or a kill could still destroy.
  virtual void recordEvaluation(std::span<const double> set, const EvaluationResult& result) {
    static_cast<void>(set);
    static_cast<void>(result);
  }
  /// The same of an evaluation that has the result of an earlier one of the same set, No. `original`, without a model
  /// run.
  virtual void recordRepeat(std::span<const double> set, const EvaluationResult& result, int original) {
    static_cast<void>(original);
    recordEvaluation(set, result);
  }
  /// Reads back what was recorded of a successful evaluation: fills in all that its result then had, except for its
  /// number and its aggregate. False where that cannot be had, and if the model got other values than it gets with
  /// `set` (search scale).
  virtual bool recall(int number, std::span<const double> set, EvaluationResult& result) {
    static_cast<void>(number);
    static_cast<void>(set);
    static_cast<void>(result);
    return false;
  }
  /// Writes to disk which output files of a successful model run could not be kept, before recordEvaluation() of it;
  /// none for a run that was made again for such files and has them now.
  virtual void recordUnkeptFiles(int number, std::span<const UnkeptFile> files) {
    static_cast<void>(number);
    static_cast<void>(files);
  }
  /// Whether what recordEvaluation() has written of the simulated values is read again when they are needed, so that
  /// results need not hold them.
  virtual bool readsSimulatedValues() const { return false; }
  /// An evaluation has finished, in order of arrival; `set` is on the search scale. Called before its result is used.
  virtual void evaluationFinished(std::span<const double> set, const EvaluationResult& result) = 0;
  /// An evaluation has its result from an earlier run instead of the model. It counts like any other.
  virtual void evaluationReplayed(std::span<const double> set, const EvaluationResult& result) {
    evaluationFinished(set, result);
  }
  /// Something has become known of how evaluations that have been reported compare with the first successful
  /// run.
  virtual void runCompared(const ComparisonFindings& found) { static_cast<void>(found); }
  /// Whether the run was cancelled from outside. Once true it stays true.
  virtual bool isCancelled() = 0;
};

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "measures/period_series.h"

namespace mirevo {

/// Every measure, objective function and aggregate of a failed evaluation: worse than any real result.
inline constexpr double kFailedRunValue = 1.0e30;

/// Why an evaluation failed, and what its batch said last.
struct EvaluationFailure {
  enum class Kind {
    constraintsViolated,
    equationNotFinite,
    couldNotStart,
    exitCode,
    signal,
    timedOut,
    resultsNotWritten,
    resultsNotReadable,
    resultNotFinite,
    notKnown,  ///< of an earlier run, whose evidence is gone
  };
  Kind kind = Kind::exitCode;
  std::string reason;                   ///< one line for a person
  std::vector<std::string> lastOutput;  ///< the last lines that the batch printed

  /// Whether the model was run, or was to be: its folder may then tell more.
  bool isOfModelRun() const { return kind != Kind::constraintsViolated && kind != Kind::equationNotFinite; }
};

/// What a kind of failure is called, "batch ran too long".
std::string_view failureKindName(EvaluationFailure::Kind kind);
/// What files call it, "timedOut"; the same in every version of the program.
std::string_view failureKindKey(EvaluationFailure::Kind kind);
/// The kind of that key; nothing for another text.
std::optional<EvaluationFailure::Kind> failureKindOfKey(std::string_view key);

/// A measure some of whose observations the model run has no value for; the rest of them is what was judged.
struct UnusedObservations {
  std::size_t measure = 0;    ///< 0-based
  std::size_t usedCount = 0;  ///< observations that were judged
  std::string text;           ///< what the log should say of it, one line
};

/// What one parameter set yielded.
struct EvaluationResult {
  int number = 0;                       ///< the set's number in the run, from 1
  std::vector<double> measureValues;    ///< one an output measure
  std::vector<double> objectiveValues;  ///< one an objective function
  double aggregate = kFailedRunValue;   ///< what the searches minimise
  /// Where the task asks for them: the simulated values at the observation times of ModelRunner::observedSeries(), one
  /// series after another, NaN where the model has none. Empty for a failed evaluation.
  std::vector<double> simulatedValues;
  /// Of an evaluation that may be shown as the initial or the best one: its simulated series, one a pair of
  /// ModelRunner::shownMeasures(). Empty for all others, and when the evaluation was reported.
  std::vector<PeriodSeries> shownSeries;
  std::optional<EvaluationFailure> failure;
  std::vector<UnusedObservations> unusedObservations;
  std::vector<std::string> warnings;  ///< what the log should say of the run, one line each

  bool ok() const { return !failure.has_value(); }
};

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "evaluation/saved_files.h"
#include "measures/file_form.h"
#include "measures/period_series.h"
#include "measures/series_tables.h"

namespace mirevo {

/// The value of every measure, objective function and aggregate of a failed evaluation: worse than any real result.
inline constexpr double kFailedRunValue = 1.0e30;

/// Why an evaluation failed, and the last output of its batch.
struct EvaluationFailure {
  enum class Kind {
    constraintsViolated,
    equationNotFinite,
    valueNotWritable,
    couldNotStart,
    exitCode,
    signal,
    timedOut,
    resultsNotWritten,
    resultsNotReadable,
    resultNotFinite,
    resultsCutOff,
    tooFewPairs,
    notKnown,  ///< failed in an earlier run, whose evidence is gone
    notMade,   ///< the run ended before it; never in files
  };
  Kind kind = Kind::exitCode;
  std::string reason;                   ///< one line for a person
  std::vector<std::string> lastOutput;  ///< the last lines that the batch printed

  /// Whether the set violates a constraint, or has no finite value in one or in an equation.
  bool isOfConstraints() const { return kind == Kind::constraintsViolated || kind == Kind::equationNotFinite; }
  /// Whether the model was run, or should have been: its folder may then tell more.
  bool isOfModelRun() const { return !isOfConstraints() && kind != Kind::valueNotWritable; }
};

/// The name of a kind of failure for people, "batch ran too long".
std::string_view failureKindName(EvaluationFailure::Kind kind);
/// Its key in files, "timedOut"; the same in every version of the program.
std::string_view failureKindKey(EvaluationFailure::Kind kind);
/// The kind with this key; empty for any other text.
std::optional<EvaluationFailure::Kind> failureKindOfKey(std::string_view key);

/// A measure for some of whose observations the model run has no value; it is judged by the others.
struct UnusedObservations {
  std::size_t measure = 0;    ///< 0-based; behind the measures those in validation periods
  std::size_t usedCount = 0;  ///< observations that were used
  std::string text;           ///< one line for the log
};

/// The observations that a validation value is of, and those without a simulated value.
struct ValidationPairs {
  std::size_t count = 0;
  std::size_t missingCount = 0;

  bool operator==(const ValidationPairs&) const = default;
};

/// Least, mean and largest of some values.
struct ValueSummary {
  double least = 0.0;
  double mean = 0.0;
  double largest = 0.0;

  bool operator==(const ValueSummary&) const = default;
};

/// What a measure judges a model run by: the pairs of simulated and observed values, and the file that the run wrote.
/// Of the measures that read the output-measure file only the first has it, and no pairs; the others have at least one.
struct MeasurePairs {
  std::size_t measure = 0;  ///< 0-based
  std::size_t count = 0;
  std::size_t missingCount = 0;  ///< observations in the period without a simulated value
  std::int64_t first = 0;        ///< secondNumber() of the first pair
  std::int64_t last = 0;
  ValueSummary observed;  ///< in the pairs
  ValueSummary simulated;
  FileForm file;

  bool operator==(const MeasurePairs&) const = default;
  /// Whether these are pairs of the same observations, as far as their number, times and values tell.
  bool hasObservationsOf(const MeasurePairs& other) const {
    return count == other.count && first == other.first && last == other.last && observed == other.observed;
  }
};

/// What one parameter set yielded.
struct EvaluationResult {
  int number = 0;                       ///< the set's number in the run, from 1
  std::vector<double> measureValues;    ///< one per output measure
  std::vector<double> objectiveValues;  ///< one per objective function
  double aggregate = kFailedRunValue;   ///< what the searches minimise
  /// One per entry of validationTargets(), NaN where there is none, as for a failed evaluation. Nothing depends on
  /// them.
  std::vector<double> validationValues;
  std::vector<ValidationPairs> validationPairs;  ///< one per value; empty if failed, and for one of an earlier run
  /// If the task asks for them, the output measures in 64 bits, from all digits of the series; a number that the model
  /// wrote is the one of `measureValues`. Empty for a failed evaluation.
  std::vector<double> exactMeasures;
  /// If the task asks for them, the simulated values at the observation times of OutputReader::observedSeries(), one
  /// series after another, NaN where the model has none; exact ones with their units, see appendSimulatedValues().
  /// Empty for a failed evaluation, and once it has been reported if EvaluationObserver::readsSimulatedValues().
  std::vector<double> simulatedValues;
  /// For an evaluation that may be shown as the initial or the best one, its simulated series, one per measure of
  /// OutputReader::shownMeasures(). Empty for all others, and once the evaluation has been reported.
  std::vector<PeriodSeries> shownSeries;
  std::optional<EvaluationFailure> failure;
  std::vector<UnusedObservations> unusedObservations;
  /// One per measure that compares series, and one if others read the output-measure file. Once the evaluation has been
  /// reported, and for one of an earlier run, only those of the first successful run, of runs that differ from it, and
  /// of runs that ended before the first successful one was known.
  std::vector<MeasurePairs> pairs;
  /// Of a run that RunComparison::judge() may find to be cut off, the last lines that its batch printed.
  std::vector<std::string> lastOutput;
  std::vector<std::string> warnings;    ///< warnings for the log, one line each
  std::vector<FileDoubt> doubts;        ///< told once in a run, whichever process has read the file
  std::vector<UnkeptFile> unkeptFiles;  ///< output files that the model run has left and that could not be kept
  std::vector<UnkeptFile> absentFiles;  ///< output files that are to be kept and that the model run has not left

  bool ok() const { return !failure.has_value(); }
  /// Makes a successful result a failed one.
  void fail(EvaluationFailure why);
};

}  // namespace mirevo

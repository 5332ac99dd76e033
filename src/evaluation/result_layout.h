#pragma once

#include "evaluation/evaluation_result.h"
#include "evaluation/message_bytes.h"

namespace mirevo {

/// Without the evaluation number, which whoever receives it knows.
template <>
struct Layout<EvaluationResult> {
  static void of(auto& archive, auto& result) {
    archive(result.measureValues, result.objectiveValues, result.aggregate, result.validationValues,
            result.validationPairs, result.exactMeasures, result.simulatedValues, result.failure,
            result.unusedObservations, result.pairs, result.lastOutput, result.warnings, result.doubts,
            result.unkeptFiles, result.absentFiles, result.shownSeries);
  }
};
template <>
struct Layout<FileDoubt> {
  static void of(auto& archive, auto& doubt) { archive(doubt.file, doubt.place, doubt.text); }
};
template <>
struct Layout<UnkeptFile> {
  static void of(auto& archive, auto& file) { archive(file.name, file.reason); }
};
template <>
struct Layout<ValidationPairs> {
  static void of(auto& archive, auto& pairs) { archive(pairs.count, pairs.missingCount); }
};
template <>
struct Layout<MeasurePairs> {
  static void of(auto& archive, auto& pairs) {
    archive(pairs.measure, pairs.count, pairs.missingCount, pairs.first, pairs.last, pairs.observed, pairs.simulated,
            pairs.file);
  }
};
template <>
struct Layout<FileForm> {
  static void of(auto& archive, auto& file) {
    archive(file.endsLine, file.numberCount, file.stepCount, file.firstStep, file.lastStep, file.gapStart, file.gapEnd);
  }
};
template <>
struct Layout<ValueSummary> {
  static void of(auto& archive, auto& values) { archive(values.least, values.mean, values.largest); }
};
template <>
struct Layout<PeriodSeries> {
  static void of(auto& archive, auto& series) { archive(series.seconds, series.values); }
};
template <>
struct Layout<EvaluationFailure> {
  static void of(auto& archive, auto& failure) {
    archive(failure.kind, failure.reason, failure.lastOutput);
    archive.require(failure.kind >= EvaluationFailure::Kind{} && failure.kind <= EvaluationFailure::Kind::notKnown);
  }
};
template <>
struct Layout<UnusedObservations> {
  static void of(auto& archive, auto& unused) { archive(unused.measure, unused.usedCount, unused.text); }
};

}  // namespace mirevo

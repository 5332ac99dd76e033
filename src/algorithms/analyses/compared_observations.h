#pragma once

#include <span>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/objective_functions.h"

namespace mirevo {

/// By which observations the runs of an analysis judge the model. Measures of different observations do not compare.
class ComparedObservations final {
 public:
  /// `results` must outlive it.
  explicit ComparedObservations(std::span<const EvaluationResult> results);

  bool areSame(std::size_t a, std::size_t b, std::size_t measure) const;
  bool areSame(std::size_t a, std::size_t b) const;
  /// How those of one run differ from those of another, which the text calls `otherName`.
  std::string differenceText(std::size_t one, std::size_t other, std::size_t measure,
                             const std::string& otherName) const;

 private:
  /// Null for a measure that compares no series.
  const MeasurePairs* pairsOf(std::size_t i, std::size_t measure) const;

  std::span<const EvaluationResult> results_;
  std::span<const MeasurePairs> initial_;  ///< of the runs that have no pairs of their own
};

/// What should be said of measures of which some runs are judged by other observations than the first successful one,
/// in an analysis that takes all runs together: one text for each, empty if there are none.
std::vector<std::string> mixedObservations(std::span<const EvaluationResult> results,
                                           std::span<const std::string> measures);

/// By result and output: why the output does not compare with that of the other run of its difference; empty if it
/// does.
using IncomparableOutputs = std::vector<std::vector<std::string>>;

/// Of objective functions, from that of their measures.
IncomparableOutputs ofObjectives(const IncomparableOutputs& ofMeasures, std::span<const ObjectiveFunction> objectives);

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <map>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// An output measure for which a model run has fewer pairs than the initial run.
struct FewerPairs {
  int number = 0;           ///< of the evaluation
  std::size_t measure = 0;  ///< 0-based
  std::size_t count = 0;
  std::size_t initialCount = 0;
  std::string text;  ///< part of a line for people
};

/// What an evaluation has revealed about the pairs of a run.
struct PairsFound {
  int initialNumber = 0;                  ///< of the initial run, if that has become known; otherwise 0
  std::vector<std::string> initialLines;  ///< then its pairs, for people
  std::vector<FewerPairs> fewer;          ///< in the order of the evaluations
  std::vector<int> others;                ///< evaluations that have as many or more, of other observations

  bool isEmpty() const { return initialNumber == 0 && fewer.empty() && others.empty(); }
};

/// The pairs of the initial run, of which later runs must have a share. Nothing is required without any.
struct RequiredPairs {
  int initialNumber = 0;
  std::vector<std::size_t> initialCounts;  ///< one per output measure, 0 for those that compare no series
};

/// Compares the pairs of model runs with those of the initial run: of the successful evaluations, the one with the
/// smallest number. What it finds does not depend on the order in which model runs end.
class InitialPairs final {
 public:
  /// Never finds anything.
  InitialPairs() = default;
  /// `measureNames`: of all output measures, some of which compare series. `isRequired`: whether a run without a share
  /// of the initial pairs fails.
  InitialPairs(std::vector<std::string> measureNames, bool isRequired)
      : measureNames_(std::move(measureNames)), isRequired_(isRequired), comparesSeries_(true) {}

  /// Takes a finished evaluation, in any order; each number once. Keeps its pairs only if they are needed to compare
  /// the evaluations of the run again: those of the initial run, of runs that have others, and of runs that ended
  /// before the initial one was known.
  PairsFound take(EvaluationResult& result);
  /// Whether no run may be judged before the initial one is known.
  bool isAwaited() const { return comparesSeries_ && isRequired_ && initialNumber_ == 0; }
  RequiredPairs required() const;

 private:
  std::vector<std::string> linesOfInitial() const;
  /// Adds what an evaluation has otherwise than the initial run; returns whether there is anything.
  bool compare(int number, std::span<const MeasurePairs> pairs, PairsFound& found) const;

  std::vector<std::string> measureNames_;
  bool isRequired_ = false;
  bool comparesSeries_ = false;
  int initialNumber_ = 0;  ///< 0: not known
  std::vector<MeasurePairs> initial_;
  int nextNumber_ = 1;                                ///< of the first evaluation that has not finished
  std::map<int, std::vector<MeasurePairs>> waiting_;  ///< of evaluations that may be the initial one
};

}  // namespace mirevo

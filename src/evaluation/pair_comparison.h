#pragma once

#include <cstddef>
#include <map>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// An output measure for which a model run has fewer pairs than the first successful run.
struct FewerPairs {
  int number = 0;           ///< of the evaluation
  std::size_t measure = 0;  ///< 0-based
  std::size_t count = 0;
  std::size_t firstCount = 0;  ///< of the first successful run
  std::string text;            ///< part of a line for people
  bool isWarnedOf = false;     ///< the log has a warning that tells how many observations the run does not use
};

/// What an evaluation has revealed about the pairs of a run.
struct PairsFound {
  int firstNumber = 0;                  ///< of the first successful run, if that has become known; otherwise 0
  std::vector<std::string> firstLines;  ///< then its pairs, for people
  std::vector<FewerPairs> fewer;        ///< in the order of the evaluations
  std::vector<int> others;              ///< evaluations that have as many or more, of other observations

  bool isEmpty() const { return firstNumber == 0 && fewer.empty() && others.empty(); }
};

/// What is known of the successful runs when a model run is started, by which it is judged.
struct RequiredPairs {
  bool anyHasSucceeded = false;
  int firstNumber = 0;  ///< of the first successful run, of whose pairs a share is required
  std::vector<std::size_t>
      firstCounts;  ///< one per output measure, 0 for those that compare no series; empty: no share
};

/// Of what other runs the judgement of a model run depends.
struct PairRules {
  bool requiresShare = false;  ///< a run without a share of the pairs of the first successful run fails
  /// A run without any pairs is a failed one after a successful run, which has shown that there can be some; before
  /// that the setup is at fault. (Otherwise the file in the base folder shows it.)
  bool requiresProof = false;
};

/// Compares the pairs of model runs with those of the first successful run: of the successful evaluations, the one with
/// the smallest number. What it finds does not depend on the order in which model runs end.
class PairComparison final {
 public:
  /// Never finds anything.
  PairComparison() = default;
  /// `measureNames`: of all output measures, some of which compare series.
  PairComparison(std::vector<std::string> measureNames, PairRules rules)
      : measureNames_(std::move(measureNames)), rules_(rules), comparesSeries_(true) {}

  /// Takes a finished evaluation, in any order; each number once. Keeps its pairs only if they are needed to compare
  /// the evaluations of the run again: those of the first successful run, of runs that have others, and of runs that
  /// ended before the first successful one was known.
  PairsFound take(EvaluationResult& result);
  /// Whether no run may be judged before the first successful one is known.
  bool isAwaited() const {
    return comparesSeries_ &&
           ((rules_.requiresShare && firstNumber_ == 0) || (rules_.requiresProof && !anyHasSucceeded_));
  }
  RequiredPairs required() const;

 private:
  std::vector<std::string> linesOfFirst() const;
  /// Adds what an evaluation has otherwise than the first successful run; returns whether there is anything.
  bool compare(int number, std::span<const MeasurePairs> pairs, PairsFound& found) const;

  std::vector<std::string> measureNames_;
  PairRules rules_;
  bool comparesSeries_ = false;
  bool anyHasSucceeded_ = false;
  int firstNumber_ = 0;  ///< 0: not known
  std::vector<MeasurePairs> first_;
  int nextNumber_ = 1;                                ///< of the first evaluation that has not finished
  std::map<int, std::vector<MeasurePairs>> waiting_;  ///< of evaluations that may be the first successful one
};

/// "The best evaluation, No. 6, is judged by fewer observations than the first successful run"
std::string bestHasFewerPairs(int number);

}  // namespace mirevo

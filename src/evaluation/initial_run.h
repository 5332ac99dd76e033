#pragma once

#include <cstddef>
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// What a measure reads, for people.
struct MeasureSource {
  std::string name;      ///< of the measure
  std::string fileName;  ///< that the model writes, below the base folder
  bool isSeries = true;
};

/// One per measure. `measureFile` is that of the measures of interface type 1.
std::vector<MeasureSource> measureSources(std::span<const OutputMeasure> measures, const std::string& measureFile,
                                          const std::string& baseFolder);

/// Something by which a model run is worth less than the initial one, perhaps.
struct RunDifference {
  enum class Kind { fewerPairs, gap, otherCount };
  int number = 0;           ///< of the evaluation
  std::size_t measure = 0;  ///< 0-based; of several that read the same file the first
  Kind kind = Kind::fewerPairs;
  std::string text;  ///< part of a line for people
};

/// How a kind of difference is spoken of.
struct DifferenceTexts {
  RunDifference::Kind kind = RunDifference::Kind::fewerPairs;
  std::string_view title;
  std::string_view ofOne;      ///< "is judged by fewer observations than the initial run"
  std::string_view ofSeveral;  ///< "are judged ..."
  bool isWarnedOf = false;     ///< each; of fewer pairs other warnings tell
};
/// All kinds.
std::span<const DifferenceTexts> differenceTexts();

/// In what a run differs from the initial one.
std::vector<RunDifference> findDifferences(int number, std::span<const MeasurePairs> pairs, int initialNumber,
                                           std::span<const MeasurePairs> initial,
                                           std::span<const MeasureSource> sources);

/// A sentence, without its full stop, for each kind of difference of the best evaluation, which has that number;
/// `differences` may be those of others, too.
std::vector<std::string> sentencesOnBest(int best, std::span<const RunDifference> differences);

/// What an evaluation has revealed by its pairs.
struct RunComparison {
  int initialNumber = 0;                   ///< of the initial run, if that has become known; otherwise 0
  std::vector<std::string> initialLines;   ///< then its pairs and files, for people
  std::vector<RunDifference> differences;  ///< in the order of the evaluations
  std::string doubtOfInitial;              ///< a warning

  bool isEmpty() const { return initialNumber == 0 && differences.empty() && doubtOfInitial.empty(); }
};

/// What of the initial run other model runs are judged by.
struct InitialStandard {
  int initialNumber = 0;                     ///< 0: not known
  std::vector<std::size_t> initialCounts;    ///< pairs, one per output measure, if a run needs a share of them
  std::vector<std::size_t> withoutLineEnds;  ///< measures whose file the initial run left without a line end
};

/// Compares the pairs of model runs, and the files that they wrote, with those of the initial run: of the successful
/// evaluations, the one with the smallest number. What it finds does not depend on the order in which model runs end.
class InitialRun final {
 public:
  /// Never finds anything.
  InitialRun() = default;
  /// `sources`: of all output measures. `isRequired`: whether a run without a share of the initial pairs fails.
  InitialRun(std::vector<MeasureSource> sources, bool isRequired);

  /// Whether it is known whether the result counts; makes it a failed one if it does not, as one of its files lacks the
  /// last line end that the initial run's has, and so is cut off. Otherwise the initial run must end first, which is
  /// one of the evaluations with smaller numbers, none of which needs to wait for this one.
  bool judge(int number, EvaluationResult& result) const;

  /// Takes a finished evaluation, in any order; each number once. Keeps its pairs only if they are needed to compare
  /// the evaluations of the run again: those of the initial run, of runs that differ, and of runs that ended before
  /// the initial one was known.
  RunComparison take(EvaluationResult& result);
  /// Whether no run may be judged before the initial one is known.
  bool isAwaited() const { return isRequired_ && initialNumber_ == 0; }
  InitialStandard standard() const;

 private:
  const MeasurePairs* initialOf(std::size_t measure) const;
  std::vector<std::string> linesOfInitial() const;
  void compare(int number, std::span<const MeasurePairs> pairs, RunComparison& found);

  std::vector<MeasureSource> sources_;
  bool isRequired_ = false;
  int initialNumber_ = 0;  ///< 0: not known
  std::vector<MeasurePairs> initial_;
  bool isInitialDoubted_ = false;
  int nextNumber_ = 1;                                ///< of the first evaluation that has not finished
  std::map<int, std::vector<MeasurePairs>> waiting_;  ///< of evaluations that may be the initial one
};

}  // namespace mirevo

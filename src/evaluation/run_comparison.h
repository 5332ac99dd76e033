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
  std::string simulated = {};  ///< of a series, what is compared: "simulated.csv, item No. 1 (discharge)"
  std::string observed = {};   ///< with what, and the time span of that file
};

/// One per measure. `measureFile` is that of the measures of interface type 1.
std::vector<MeasureSource> measureSources(std::span<const OutputMeasure> measures, const std::string& measureFile,
                                          const std::string& baseFolder);

/// One line for people: what a measure compares, and the pairs and values of a model run; of one that compares series.
std::string comparisonText(const MeasureSource& source, const MeasurePairs& pairs);

/// How many MeasurePairs a successful run has.
std::size_t pairedCount(std::span<const MeasureSource> sources);

/// Something by which a model run is worth less than the first successful one, perhaps.
struct RunDifference {
  enum class Kind { fewerPairs, fewerThanAnother, gap, otherCount };
  int number = 0;           ///< of the evaluation
  std::size_t measure = 0;  ///< 0-based; of several that read the same file the first
  Kind kind = Kind::fewerPairs;
  std::string text;     ///< part of a line for people
  bool isTold = false;  ///< the log has a warning that tells how many observations the run does not use
};

/// How a kind of difference is spoken of.
struct DifferenceTexts {
  RunDifference::Kind kind = RunDifference::Kind::fewerPairs;
  std::string_view title;
  std::string_view ofOne;      ///< "is judged by fewer observations than the first successful run"
  std::string_view ofSeveral;  ///< "are judged ..."
  bool isWarnedOf = false;     ///< each; of fewer pairs other warnings tell
};
/// All kinds.
std::span<const DifferenceTexts> differenceTexts();

/// In what a run differs from the first successful one.
std::vector<RunDifference> findDifferences(int number, std::span<const MeasurePairs> pairs, int firstNumber,
                                           std::span<const MeasurePairs> first, std::span<const MeasureSource> sources);

/// In what the best evaluation, which has no fewer pairs of a measure than the first successful run, has fewer than
/// another. `pairs`, by number: those of the first successful run, of runs that differ from it or have others, and of
/// no run before it.
std::vector<RunDifference> findLackOfBest(int best, const std::map<int, std::vector<MeasurePairs>>& pairs,
                                          std::span<const MeasureSource> sources);

/// A sentence, without its full stop, for each kind of difference of the best evaluation, which has that number;
/// `differences` may be those of others, too. What precedes the colon depends on kind and number alone.
std::vector<std::string> sentencesOnBest(int best, std::span<const RunDifference> differences);

/// What an evaluation has revealed by its pairs and files.
struct ComparisonFindings {
  int firstNumber = 0;                     ///< of the first successful run, if that has become known; otherwise 0
  std::vector<std::string> firstLines;     ///< then its pairs and files, for people
  std::vector<RunDifference> differences;  ///< in the order of the evaluations
  std::vector<int> others;   ///< evaluations without such a difference that have pairs of other observations
  std::string doubtOfFirst;  ///< a warning

  bool isEmpty() const { return firstNumber == 0 && differences.empty() && others.empty() && doubtOfFirst.empty(); }
};

/// What is known of the successful runs when a model run is started, by which it is judged.
struct RunStandard {
  bool anyHasSucceeded = false;
  int firstNumber = 0;                       ///< of the first successful run; 0: not known
  std::vector<std::size_t> firstCounts;      ///< its pairs, one per output measure, 0 for those that compare no series,
                                             ///< if a run needs a share of them; otherwise empty
  std::vector<std::size_t> withoutLineEnds;  ///< measures whose file it left without a line end
};

/// Of what other runs the judgement of a model run by its pairs depends.
struct PairRules {
  bool requiresShare = false;  ///< a run without a share of the pairs of the first successful run fails
  /// A run without any pairs is a failed one after a successful run, which has shown that there can be some; before
  /// that the setup is at fault. (Otherwise the file in the base folder shows it.)
  bool requiresProof = false;
};

/// Compares the pairs of model runs, and the files that they wrote, with those of the first successful run: of the
/// successful evaluations, the one with the smallest number. What it finds does not depend on the order in which model
/// runs end.
class RunComparison final {
 public:
  /// Never finds anything.
  RunComparison() = default;
  /// `sources`: of all output measures.
  RunComparison(std::vector<MeasureSource> sources, PairRules rules) : sources_(std::move(sources)), rules_(rules) {}

  /// Whether it is known whether the result counts; makes it a failed one if it does not, as one of its files lacks the
  /// last line end that the first successful run's has, and so is cut off. Otherwise that run must end first, which is
  /// one of the evaluations with smaller numbers, none of which needs to wait for this one.
  bool judge(int number, EvaluationResult& result) const;

  /// Takes a finished evaluation, in any order; each number once. Keeps its pairs only if they are needed to compare
  /// the evaluations of the run again: those of the first successful run, of runs that differ, and of runs that ended
  /// before the first successful one was known; and if `keepsPairs`.
  ComparisonFindings take(EvaluationResult& result, bool keepsPairs = false);
  /// Whether no run may be started beside another, as what it is judged by is not known.
  bool isAwaited() const {
    return (rules_.requiresShare && firstNumber_ == 0) || (rules_.requiresProof && !anyHasSucceeded_);
  }
  RunStandard standard() const;
  /// Of the first successful run; 0: not known.
  int firstNumber() const { return firstNumber_; }

 private:
  const MeasurePairs* firstOf(std::size_t measure) const;
  std::vector<std::string> linesOfFirst() const;
  /// Adds what an evaluation has otherwise than the first successful run; returns whether there is anything.
  bool compare(int number, std::span<const MeasurePairs> pairs, ComparisonFindings& found);

  std::vector<MeasureSource> sources_;
  PairRules rules_;
  bool anyHasSucceeded_ = false;
  int firstNumber_ = 0;  ///< 0: not known
  std::vector<MeasurePairs> first_;
  bool isFirstDoubted_ = false;
  int nextNumber_ = 1;                                ///< of the first evaluation that has not finished
  std::map<int, std::vector<MeasurePairs>> waiting_;  ///< of evaluations that may be the first successful one
};

}  // namespace mirevo

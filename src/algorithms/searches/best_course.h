#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The best value of a search over its evaluations: how far it moved lately, and what more of them could bring. The
/// value is the aggregate, or the sum of squares of a search that judges sets by that.
class BestCourse final {
 public:
  /// An evaluation and the best value up to it.
  struct Step {
    int evaluation = 0;
    double value = 0.0;
  };

  /// Takes the value of the next evaluation.
  void add(double value);
  /// Instead of that: so many evaluations have been made,
  void extendTo(int evaluationCount) { evaluationCount_ = evaluationCount; }
  /// and this one, behind those that were the best before, is the best of them.
  void improve(int evaluation, double value);
  /// Starts anew: all values were given another scale.
  void clear();

  int evaluationCount() const { return evaluationCount_; }
  const std::vector<Step>& steps() const { return steps_; }
  /// The best of the first `evaluations`; kFailedRunValue if none of them succeeded.
  double bestAfter(double evaluations) const;

  /// What as many evaluations again would take from the best if it went on as from the second quarter of the
  /// evaluations to the second half: D²/E, at most D, where D is the fall in the second half and E that in the second
  /// quarter; 0 or more. How well that holds: docs/algorithms/stopping.md.
  double expectedFall() const;

 private:
  int evaluationCount_ = 0;
  std::vector<Step> steps_;  ///< those at which the best fell
};

inline constexpr std::string_view kBestValue = "best value";
inline constexpr std::string_view kLeastSum = "least sum of squares";

/// Lines for people about a search that has ended. `isBudgetUsed`: it could have gone on. `isRepetition`: it is one of
/// several with other seeds, and its evaluations are counted for themselves. `value`: what the course is of.
std::vector<std::string> courseLines(const BestCourse& course, bool isBudgetUsed, bool isRepetition = false,
                                     std::string_view value = kBestValue);

}  // namespace mirevo

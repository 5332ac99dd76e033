#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// The best aggregate of a search over its evaluations: how far it moved lately, and what more of them could bring.
class BestCourse final {
 public:
  /// An evaluation and the best aggregate up to it.
  struct Step {
    int evaluation = 0;
    double aggregate = 0.0;
  };

  /// Takes the aggregate of the next evaluation.
  void add(double aggregate);
  /// Starts anew: all aggregates were given another scale.
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

/// Lines for people about a search that has ended. `isBudgetUsed`: it could have gone on. `isRepetition`: it is one of
/// several with other seeds, and its evaluations are counted for themselves.
std::vector<std::string> courseLines(const BestCourse& course, bool isBudgetUsed, bool isRepetition = false);

}  // namespace mirevo

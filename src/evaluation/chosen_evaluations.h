#pragma once

#include <optional>
#include <span>
#include <utility>
#include <vector>

namespace mirevo {

/// The evaluation that a run holds for its best.
struct BestEvaluation {
  int number = 0;
  double aggregate = 0.0;
  std::vector<double> parameterValues;  ///< model scale, one per variable parameter
};

/// Decides which evaluation of a run is its best: the one that the search took; without a search that with the smallest
/// aggregate, of equals that with the smallest number. Evaluations come in any order.
class BestChoice final {
 public:
  /// An evaluation that succeeded; one whose aggregate is not known (NaN) is no candidate. Whether it is the best now.
  bool consider(int number, double aggregate, std::span<const double> parameterValues);
  /// A search knows which of equals it took, and its final model run only repeats it: no other is the best from here
  /// on.
  void takeOfSearch(BestEvaluation best);

  const std::optional<BestEvaluation>& best() const { return best_; }

 private:
  std::optional<BestEvaluation> best_;
  bool isOfSearch_ = false;
};

/// Decides which evaluation of a run is its initial one, against which others are shown: the first with the setup's
/// initial values; without one the first that succeeded. Evaluations come in any order.
class InitialChoice final {
 public:
  /// `setupValues`: the initial values of the variable parameters, model scale.
  explicit InitialChoice(std::vector<double> setupValues) : setupValues_(std::move(setupValues)) {}

  /// An evaluation that succeeded, its values on the model scale. Whether it is the initial one now.
  bool consider(int number, std::span<const double> parameterValues);
  /// Goes on from what was chosen before.
  void resume(int number, bool hasSetupValues);

  /// Nothing before an evaluation has succeeded.
  const std::optional<int>& number() const { return number_; }
  /// Whether that one has the setup's values; else it is the first that succeeded.
  bool hasSetupValues() const { return hasSetupValues_; }

 private:
  std::vector<double> setupValues_;
  std::optional<int> number_;
  bool hasSetupValues_ = false;
};

}  // namespace mirevo

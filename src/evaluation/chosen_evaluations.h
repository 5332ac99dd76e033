#pragma once

#include <optional>
#include <span>
#include <utility>
#include <vector>

namespace mirevo {

/// The best evaluation of a run.
struct BestEvaluation {
  int number = 0;
  double aggregate = 0.0;
  std::vector<double> parameterValues;  ///< model scale, one per variable parameter
};

/// Decides which evaluation of a run is its best: the one that the search took; without a search the one with the
/// smallest aggregate, of equals the one with the smallest number. Evaluations may come in any order.
class BestChoice final {
 public:
  /// Considers a successful evaluation; one whose aggregate is unknown (NaN) is not a candidate. Whether it is the best
  /// now.
  bool consider(int number, double aggregate, std::span<const double> parameterValues);
  /// A search knows which of several equal evaluations it took, and its final model run only repeats that one: this
  /// choice is final.
  void takeOfSearch(BestEvaluation best);

  const std::optional<BestEvaluation>& best() const { return best_; }

 private:
  std::optional<BestEvaluation> best_;
  bool isOfSearch_ = false;
};

/// Decides which evaluation of a run is its initial one, with which the best is compared: the first with the initial
/// values of the setup; without one the first that succeeded. Evaluations may come in any order.
class InitialChoice final {
 public:
  /// `setupValues`: the initial values of the variable parameters, model scale.
  explicit InitialChoice(std::vector<double> setupValues) : setupValues_(std::move(setupValues)) {}

  /// Considers a successful evaluation; its values are on the model scale. Whether it is the initial one now.
  bool consider(int number, std::span<const double> parameterValues);
  /// Whether it would be; once it would not, it will never be.
  bool wouldBeInitial(int number, std::span<const double> parameterValues) const;
  /// Restores the choice of an earlier run.
  void resume(int number, bool hasSetupValues);

  /// Empty before an evaluation has succeeded.
  const std::optional<int>& number() const { return number_; }
  /// Whether it has the initial values of the setup; otherwise it is the first that succeeded.
  bool hasSetupValues() const { return hasSetupValues_; }

 private:
  bool isOfSetup(std::span<const double> parameterValues) const;

  std::vector<double> setupValues_;
  std::optional<int> number_;
  bool hasSetupValues_ = false;
};

}  // namespace mirevo

#pragma once

#include <limits>
#include <memory>
#include <optional>

#include "algorithms/searches/residual_problem.h"
#include "measures/weighted_residuals.h"
#include "run/tasks/task.h"

namespace mirevo {

/// What a search by residuals works on, and what is said of its fit: the covariance, limits and identifiability of the
/// parameters from its last Jacobian, as of a local sensitivity analysis.
class ResidualFitting final {
 public:
  /// `context` must outlive the search, but not this.
  explicit ResidualFitting(const TaskContext& context);

  ResidualProblem& problem() { return problem_; }
  const ResidualProblem& problem() const { return problem_; }

  /// Adds lines and tables to the outcome. Without a fit that has derivatives it adds the reason alone.
  void addCovariance(const TaskContext& context, TaskOutcome& outcome) const;
  double sumOfSquares() const { return problem_.fit ? problem_.fit->sum : std::numeric_limits<double>::infinity(); }
  bool hasDerivatives() const { return problem_.fit && problem_.fit->jacobian; }
  /// Names measures that are no function of the sum of squares; empty if all are.
  std::optional<std::string> otherMeasuresText(const TaskContext& context) const;

 private:
  WeightedResiduals residuals_;
  ResidualProblem problem_;
};

}  // namespace mirevo

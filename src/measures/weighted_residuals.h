#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "measures/objective_functions.h"
#include "measures/observed_series.h"
#include "measures/output_measure.h"

namespace mirevo {

/// The residuals of a model run, n of them, and the units in which the model printed what they are made of.
struct ResidualRows {
  std::vector<double> values;  ///< simulated minus observed, times the root of the weight; NaN where the run has none
  std::vector<double> units;   ///< with the same weights
};

/// The observations behind the objective functions one by one, weighted so that the sum of the squared residuals is the
/// aggregate where that is a sum of squares.
///
/// The root mean square, the sum of squared errors, the RSR and the Nash-Sutcliffe efficiencies are functions of a sum
/// of squares of their own. Their residuals are those of the transformed values, times the weight of the difference, of
/// the observation, and of the measure and its objective function in the aggregate. A term that is the root of a sum of
/// squares enters with its square, and the square of a term that is a sum of squares with the term. A number with an
/// observed value has one residual. Of any other statistic the differences count with the weights of a root mean square
/// or of an NSE, unless a measure of the former kind compares the same series.
class WeightedResiduals final {
 public:
  /// Why these measures have no residuals, for a person; empty if they have.
  static std::optional<std::string> problemOf(std::span<const OutputMeasure> measures,
                                              std::span<const ObjectiveFunction> objectives);

  /// `observed`: those whose simulated values the results keep, with exact precision. What the spans refer to must
  /// outlive the object.
  WeightedResiduals(std::span<const OutputMeasure> measures, std::span<const ObjectiveFunction> objectives,
                    AggregationMethod aggregation, std::span<const ObservedSeries> observed);

  /// The residuals of a successful run, from what EvaluationResult::simulatedValues and measureValues hold. The first
  /// run decides which observations count: those for which it has a value.
  ResidualRows of(std::span<const double> simulated, std::span<const double> measureValues);

  /// A residual's measure, and the time of its observation; empty for a number.
  struct Label {
    std::size_t measure = 0;
    std::string time;
  };
  /// Those of the rows; complete once of() has been called.
  std::vector<Label> labels() const;
  /// The measures of which the sum of squares is no function, though they are in it or in the aggregate.
  std::vector<std::size_t> otherMeasures() const { return others_; }
  /// What the residuals are divided by to be in the unit of the first measure, with its weights.
  double scale() const { return terms_.empty() || !(terms_.front().factor > 0.0) ? 1.0 : terms_.front().factor; }

 private:
  struct Term {
    std::size_t measure = 0;
    const ObservedSeries* observed = nullptr;  ///< null: a number
    std::size_t first = 0;                     ///< of its simulated values; the units follow them
    double weight = 1.0;                       ///< of its sum of squares, before it is divided
    double factor = 1.0;                       ///< of the residuals, once settled
    std::vector<double> values;                ///< observed, transformed
    double epsilon = 0.0;
    std::vector<std::size_t> rows;  ///< the observations that count
  };

  void addTerm(std::size_t measure, double weight, std::span<const ObservedSeries> observed);
  void settle(std::span<const double> simulated);
  void appendRows(const Term& term, std::span<const double> simulated, ResidualRows& rows) const;

  std::span<const OutputMeasure> measures_;
  std::vector<Term> terms_;
  std::vector<std::size_t> others_;
  bool isSettled_ = false;
};

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "common/settings/code_name.h"
#include "measures/output_measure.h"

namespace mirevo {

enum class FunctionType : std::int32_t { sum = 0, sumOfAbsolutes = 1, sumOfSquares = 2 };
inline constexpr CodeName kFunctionTypeNames[] = {{0, "sum"}, {1, "sum of absolute values"}, {2, "sum of squares"}};

enum class AggregationMethod : std::int32_t { none = 0, commonDistance = 1, commonProbability = 2, zero = 3 };
inline constexpr CodeName kAggregationMethodNames[] = {
    {0, "none"}, {1, "common distance"}, {2, "common probability"}, {3, "zero"}};

/// An output measure in an objective function.
struct MeasureTerm {
  std::size_t index = 0;                     ///< 0-based, of the run's output measures
  double weight = 1.0;                       ///< of the contribution
  double (*contribution)(double) = nullptr;  ///< what a value of the measure counts as; null: as it is

  // An index is a plain term.
  // NOLINTNEXTLINE(google-explicit-constructor)
  MeasureTerm(std::size_t measureIndex) : index(measureIndex) {}
  /// The term of a measure with this index: of a statistic without a code its contribution, with the measure's weight.
  MeasureTerm(std::size_t measureIndex, const OutputMeasure& measure);

  bool operator==(const MeasureTerm&) const = default;

  double valueOf(double measureValue) const {
    return contribution == nullptr ? measureValue : weight * contribution(measureValue);
  }
};

/// Combines output measures into one value, which has a weight in the aggregate.
struct ObjectiveFunction {
  std::string name;
  FunctionType functionType = FunctionType::sum;
  double weight = 1.0;
  std::vector<MeasureTerm> measures;
  std::optional<double> standardDeviation;  ///< σ of the transformation, if the setup gives it
  std::optional<double> location;           ///< μ, likewise
};

/// The name of an aggregation method in the run log; empty for method 3.
std::string aggregationMethodName(AggregationMethod method);

/// The objective functions' values of one evaluation, in setup order.
std::vector<double> objectiveFunctionValues(std::span<const ObjectiveFunction> functions,
                                            std::span<const double> measureValues);

/// The aggregate of n objective functions, with n values, weights, σ and μ; 0 for n < 1. Method 1 deliberately adds μ
/// after the division by σ, method 2 subtracts it before.
double aggregateObjective(std::span<const double> values, std::span<const double> weights,
                          std::span<const double> sigma, std::span<const double> mu, AggregationMethod method);

/// Computes aggregates with the transformation parameters, some of which may be known only after the initial sample.
class ObjectiveAggregator final {
 public:
  ObjectiveAggregator(std::span<const ObjectiveFunction> functions, AggregationMethod method);

  /// Whether every σ and μ that the method needs is known.
  bool isSettled() const;
  /// The aggregate; NaN unless isSettled().
  double aggregate(std::span<const double> objectiveValues) const;
  /// Determines the missing σ and μ from the initial sample: one row of objective values per successful evaluation, at
  /// least two. σ is the standard deviation of the sample (divisor n - 1). μ is its mean on the probability scale, and
  /// on the distance scale μ_i = max_j(best_j/σ_j) - best_i/σ_i, so that the best values of all objective functions are
  /// at the same distance from zero. Throws FatalError naming an objective function that is constant over the sample.
  void fit(std::span<const std::vector<double>> sample);

  /// The scale of each objective function as a line for people, once all are known; empty if the method has no scale.
  std::vector<std::string> scaleLines() const;

  AggregationMethod method() const { return method_; }
  const std::vector<double>& sigma() const { return sigma_; }
  const std::vector<double>& mu() const { return mu_; }

 private:
  AggregationMethod method_;
  std::vector<std::string> names_;
  std::vector<double> weights_;
  std::vector<double> sigma_;  ///< NaN while unknown
  std::vector<double> mu_;     ///< NaN while unknown
};

}  // namespace mirevo

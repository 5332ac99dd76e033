#pragma once

#include <memory>
#include <span>
#include <string>
#include <variant>
#include <vector>

#include "parameters/feasibility.h"
#include "parameters/search_space.h"

namespace mirevo {

/// Why a parameter set cannot be run.
struct ParameterFailure {
  enum class Kind { constraintViolated, equationNotFinite };
  Kind kind = Kind::constraintViolated;
  std::string detail;  ///< one line: which constraint or equation, with the values of its sides
};

/// Whether a constraint is violated by the values of its two equations. A code outside 0..3 never reports a violation.
bool CheckConstraint(double left, double right, LogicalOperator logicalOperator);

/// All parameters of the model: the search space, the order of evaluation, the compiled equations and constraints.
class ParameterModel final {
 public:
  /// Builds the search space, compiles every equation once, refuses illegal relationships, orders the dependent
  /// parameters and compiles the constraints, in this order. Throws FatalError with the fixed texts; the detail names
  /// the parameter or constraint. The initial value, bounds and transformation of a dependent parameter are not used.
  ParameterModel(std::vector<ModelParameter> parameters, std::vector<InternalConstraint> constraints);
  ~ParameterModel();
  ParameterModel(const ParameterModel&) = delete;
  ParameterModel& operator=(const ParameterModel&) = delete;

  const std::vector<ModelParameter>& parameters() const;
  const SearchSpace& searchSpace() const;
  /// A permutation of 1..N: every dependent parameter comes after those that its equation names.
  const std::vector<int>& evaluationOrder() const;

  /// The full parameter vector of a model run (model scale, one value per parameter in setup order), or why the set
  /// cannot be run: an equation without a finite value, or a violated constraint. The vector stays valid until the next
  /// call. `set` has one value per variable parameter, on the search scale.
  std::variant<std::span<const double>, ParameterFailure> MapToModelValues(std::span<const double> set);

  /// Whether sets can be run, as MapToModelValues() says, whose last vector a test makes invalid; without a test if
  /// there are neither constraints nor dependent parameters. The model must outlive it.
  Feasibility feasibility();

 private:
  class Implementation;
  std::unique_ptr<Implementation> implementation_;
};

/// All parameters on the model scale, in setup order, for values of the variable ones on that scale; NaN where they
/// cannot be had.
std::vector<double> allModelValues(ParameterModel& model, std::span<const double> variable);

/// For people, the parameters that are not variable: "K = 3 (fixed)".
std::vector<std::string> otherValueTexts(ParameterModel& model, std::span<const double> variable);

}  // namespace mirevo

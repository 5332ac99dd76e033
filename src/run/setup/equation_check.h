#pragma once

#include <memory>
#include <span>
#include <string>
#include <vector>

#include "parameters/model_parameter.h"
#include "run/access/setup_access.h"

namespace mirevo {

class ExpressionEvaluator;

/// Refuses equations that cannot be computed, with their location in the setup.
class EquationCheck final {
 public:
  explicit EquationCheck(std::span<const ModelParameter> parameters);
  ~EquationCheck();
  EquationCheck(const EquationCheck&) = delete;
  EquationCheck& operator=(const EquationCheck&) = delete;

  /// Checks the equation of each dependent parameter, then that they can be ordered. `sections` are those of the
  /// parameters.
  void checkDependentParameters(std::span<const ModelParameter> parameters,
                                std::span<const SetupSection> sections) const;
  void checkConstraint(const InternalConstraint& constraint, const SetupSection& section) const;

 private:
  std::vector<std::string> names_;
  std::vector<double> values_;
  std::unique_ptr<ExpressionEvaluator> evaluator_;
};

}  // namespace mirevo

#include "parameters/parameter_model.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>
#include <optional>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "common/utf8.h"
#include "parameters/dependency_order.h"
#include "platform/equations/expression_evaluator.h"

namespace mirevo {
namespace {

std::vector<std::string> namesOf(std::span<const ModelParameter> parameters) {
  std::vector<std::string> names;
  names.reserve(parameters.size());
  for (const ModelParameter& parameter : parameters) names.emplace_back(trimTrailing(parameter.name));
  return names;
}

double valueOf(const CompiledExpression& expression, std::string_view equation) {
  const std::optional<double> value = expression.evaluate();
  if (!value) failEvaluation(equation);
  return *value;
}

}  // namespace

bool CheckConstraint(double left, double right, LogicalOperator logicalOperator) {
  switch (logicalOperator) {
    case LogicalOperator::less:
      return left >= right;
    case LogicalOperator::lessOrEqual:
      return left > right;
    case LogicalOperator::greater:
      return left <= right;
    case LogicalOperator::greaterOrEqual:
      return left < right;
  }
  return false;
}

class ParameterModel::Implementation {
 public:
  Implementation(std::vector<ModelParameter> parameters, std::vector<InternalConstraint> constraints);

  void assignVariableParameters(std::span<const double> set);
  void assignFixedParameters();
  std::optional<ParameterFailure> assignDependentParameters();
  std::optional<ParameterFailure> checkConstraints() const;
  double violationAmount() const;
  std::vector<ConstraintMargin> margins() const;
  std::vector<std::string> constraintTexts() const;
  std::size_t constraintCount() const { return constraints_.size(); }
  bool hasConstraints() const { return !constraints_.empty(); }
  bool hasEquations() const {
    return std::any_of(equations_.begin(), equations_.end(), [](const auto& equation) { return equation != nullptr; });
  }

  const std::vector<ModelParameter> parameters_;
  const SearchSpace space_;
  std::vector<int> order_;  ///< 1-based
  std::vector<double> values_;

 private:
  struct CompiledConstraint {
    InternalConstraint constraint;
    std::unique_ptr<CompiledExpression> left;
    std::unique_ptr<CompiledExpression> right;
  };

  void compileEquations();
  void compileConstraints(std::vector<InternalConstraint> constraints);

  const std::vector<std::string> names_;
  ExpressionEvaluator evaluator_;
  std::vector<std::unique_ptr<CompiledExpression>> equations_;  ///< one per parameter, null unless dependent
  std::vector<CompiledConstraint> constraints_;
};

ParameterModel::Implementation::Implementation(std::vector<ModelParameter> parameters,
                                               std::vector<InternalConstraint> constraints)
    : parameters_(std::move(parameters)),
      space_(BuildSearchSpace(parameters_)),
      values_(parameters_.size(), 0.0),
      names_(namesOf(parameters_)),
      evaluator_(names_, values_) {
  compileEquations();
  std::vector<std::vector<std::size_t>> named(parameters_.size());
  for (std::size_t i = 0; i < named.size(); ++i) {
    if (equations_[i]) named[i] = equations_[i]->variables();
  }
  order_ = OrderDependentParameters(parameters_, named);
  compileConstraints(std::move(constraints));
}

void ParameterModel::Implementation::compileEquations() {
  equations_.resize(parameters_.size());
  for (std::size_t i = 0; i < parameters_.size(); ++i) {
    if (parameters_[i].parameterType != ParameterType::dependent) continue;
    try {
      equations_[i] = evaluator_.compile(parameters_[i].equation);
    } catch (const FatalError& error) {
      fatalError(error.message(),
                 fmt::format("equation of the dependent parameter \"{}\"\n{}", names_[i], error.detail()));
    }
  }
}

void ParameterModel::Implementation::compileConstraints(std::vector<InternalConstraint> constraints) {
  for (InternalConstraint& constraint : constraints) {
    CompiledConstraint compiled;
    const auto compileSide = [&](std::string_view side, const std::string& equation) {
      try {
        return evaluator_.compile(equation);
      } catch (const FatalError& error) {
        fatalError("Error: Invalid equation for internal constraints",
                   fmt::format("{} equation of constraint {}\n{}\n{}", side, constraints_.size() + 1, error.message(),
                               error.detail()));
      }
    };
    compiled.left = compileSide("left", constraint.leftEquation);
    compiled.right = compileSide("right", constraint.rightEquation);
    compiled.constraint = std::move(constraint);
    constraints_.push_back(std::move(compiled));
  }
}

void ParameterModel::Implementation::assignVariableParameters(std::span<const double> set) {
  std::size_t k = 0;
  for (const int number : order_) {
    const auto i = static_cast<std::size_t>(number) - 1;
    if (parameters_[i].parameterType != ParameterType::variable) continue;
    values_[i] = toModelScale(space_, k, set[k]);
    ++k;
  }
}

void ParameterModel::Implementation::assignFixedParameters() {
  for (const int number : order_) {
    const auto i = static_cast<std::size_t>(number) - 1;
    if (parameters_[i].parameterType == ParameterType::fixed) values_[i] = parameters_[i].initialValue;
  }
}

std::optional<ParameterFailure> ParameterModel::Implementation::assignDependentParameters() {
  for (const int number : order_) {
    const auto i = static_cast<std::size_t>(number) - 1;
    if (!equations_[i]) continue;
    values_[i] = valueOf(*equations_[i], parameters_[i].equation);
    if (!std::isfinite(values_[i])) {
      return ParameterFailure{ParameterFailure::Kind::equationNotFinite,
                              fmt::format("the equation of parameter \"{}\" gives {}: {}", names_[i],
                                          formatReal(values_[i]), quoted(trim(parameters_[i].equation)))};
    }
  }
  return std::nullopt;
}

std::optional<ParameterFailure> ParameterModel::Implementation::checkConstraints() const {
  for (std::size_t c = 0; c < constraints_.size(); ++c) {
    const InternalConstraint& constraint = constraints_[c].constraint;
    const double left = valueOf(*constraints_[c].left, constraint.leftEquation);
    const double right = valueOf(*constraints_[c].right, constraint.rightEquation);
    const std::string_view symbol = codeName(kLogicalOperatorNames, constraint.logicalOperator);
    // A side that is NaN would satisfy every comparison; such a set is not run. Infinite sides are compared.
    const bool undefined = !symbol.empty() && (std::isnan(left) || std::isnan(right));
    if (!undefined && !CheckConstraint(left, right, constraint.logicalOperator)) continue;
    return ParameterFailure{
        undefined ? ParameterFailure::Kind::equationNotFinite : ParameterFailure::Kind::constraintViolated,
        fmt::format("constraint {} ({} {} {}): left side {}, right side {}", c + 1, trim(constraint.leftEquation),
                    symbol, trim(constraint.rightEquation), formatReal(left), formatReal(right))};
  }
  return std::nullopt;
}

/// The sum over the violated constraints of the difference of their sides, as a share of both.
double ParameterModel::Implementation::violationAmount() const {
  constexpr double kLeast = 1.0e-9;  // sides that must not be equal
  double sum = 0.0;
  for (const CompiledConstraint& compiled : constraints_) {
    const double left = valueOf(*compiled.left, compiled.constraint.leftEquation);
    const double right = valueOf(*compiled.right, compiled.constraint.rightEquation);
    if (!CheckConstraint(left, right, compiled.constraint.logicalOperator)) continue;
    const double share = std::abs(left - right) / (std::abs(left) + std::abs(right));
    sum += std::isfinite(share) ? std::max(kLeast, share) : kLeast;
  }
  return sum > 0.0 ? sum : std::numeric_limits<double>::infinity();
}

std::vector<ConstraintMargin> ParameterModel::Implementation::margins() const {
  std::vector<ConstraintMargin> found;
  for (const CompiledConstraint& compiled : constraints_) {
    const double left = valueOf(*compiled.left, compiled.constraint.leftEquation);
    const double right = valueOf(*compiled.right, compiled.constraint.rightEquation);
    const LogicalOperator kind = compiled.constraint.logicalOperator;
    const bool isBelow = kind == LogicalOperator::less || kind == LogicalOperator::lessOrEqual;
    const double value = isBelow ? right - left : left - right;
    ConstraintMargin& margin = found.emplace_back();
    margin.isStrict = kind == LogicalOperator::less || kind == LogicalOperator::greater;
    margin.size = std::abs(left) + std::abs(right);
    if (std::isfinite(value)) margin.value = value;
  }
  return found;
}

std::vector<std::string> ParameterModel::Implementation::constraintTexts() const {
  std::vector<std::string> texts;
  for (std::size_t c = 0; c < constraints_.size(); ++c) {
    const InternalConstraint& constraint = constraints_[c].constraint;
    texts.push_back(fmt::format("constraint {} ({} {} {})", c + 1, trim(constraint.leftEquation),
                                codeName(kLogicalOperatorNames, constraint.logicalOperator),
                                trim(constraint.rightEquation)));
  }
  return texts;
}

ParameterModel::ParameterModel(std::vector<ModelParameter> parameters, std::vector<InternalConstraint> constraints) {
  if (parameters.empty()) fatalError("Error: No model parameters defined");
  implementation_ = std::make_unique<Implementation>(std::move(parameters), std::move(constraints));
}

ParameterModel::~ParameterModel() = default;

const std::vector<ModelParameter>& ParameterModel::parameters() const {
  return implementation_->parameters_;
}
const SearchSpace& ParameterModel::searchSpace() const {
  return implementation_->space_;
}
const std::vector<int>& ParameterModel::evaluationOrder() const {
  return implementation_->order_;
}

std::variant<std::span<const double>, ParameterFailure> ParameterModel::MapToModelValues(std::span<const double> set) {
  assert(set.size() == searchSpace().size());
  implementation_->assignVariableParameters(set);
  implementation_->assignFixedParameters();
  if (auto failure = implementation_->assignDependentParameters()) return *std::move(failure);
  if (auto failure = implementation_->checkConstraints()) return *std::move(failure);
  return std::span<const double>(implementation_->values_);
}

Feasibility ParameterModel::feasibility() {
  const bool hasConstraints = implementation_->hasConstraints();
  if (!hasConstraints && !implementation_->hasEquations()) return {};
  Feasibility feasibility(
      [this](std::span<const double> set) -> std::optional<std::string> {
        const auto mapped = MapToModelValues(set);
        const auto* failure = std::get_if<ParameterFailure>(&mapped);
        return failure == nullptr ? std::nullopt : std::optional(failure->detail);
      },
      hasConstraints,
      [this](std::span<const double> set) {
        const auto mapped = MapToModelValues(set);
        const auto* failure = std::get_if<ParameterFailure>(&mapped);
        if (failure == nullptr) return 0.0;
        return failure->kind == ParameterFailure::Kind::constraintViolated ? implementation_->violationAmount()
                                                                           : std::numeric_limits<double>::infinity();
      });
  feasibility.setMargins(
      [this](std::span<const double> set) {
        implementation_->assignVariableParameters(set);
        implementation_->assignFixedParameters();
        const bool isDefined = !implementation_->assignDependentParameters();
        return isDefined ? implementation_->margins()
                         : std::vector<ConstraintMargin>(implementation_->constraintCount());
      },
      implementation_->constraintTexts());
  return feasibility;
}

std::vector<double> allModelValues(ParameterModel& model, std::span<const double> variable) {
  const std::vector<ModelParameter>& parameters = model.parameters();
  ParameterSet set;
  std::size_t next = 0;
  bool failed = false;
  for (const ModelParameter& parameter : parameters) {
    if (parameter.parameterType != ParameterType::variable) continue;
    set.push_back(TransformParameterValue(variable[next++], parameter.lowerBound, parameter.transformationType,
                                          TransformDirection::forward, failed));
  }
  const auto mapped = model.MapToModelValues(set);
  const auto* values = std::get_if<std::span<const double>>(&mapped);
  std::vector<double> all(parameters.size(), std::numeric_limits<double>::quiet_NaN());
  if (values != nullptr && !failed) all.assign(values->begin(), values->end());
  next = 0;
  for (std::size_t i = 0; i < all.size(); ++i) {
    if (parameters[i].parameterType == ParameterType::fixed) all[i] = parameters[i].initialValue;
    // Exactly, where the transformation rounds.
    if (parameters[i].parameterType == ParameterType::variable) all[i] = variable[next++];
  }
  return all;
}

std::vector<std::string> otherValueTexts(ParameterModel& model, std::span<const double> variable) {
  const std::vector<double> values = allModelValues(model, variable);
  std::vector<std::string> texts;
  for (std::size_t i = 0; i < values.size(); ++i) {
    const ModelParameter& parameter = model.parameters()[i];
    if (parameter.parameterType == ParameterType::variable) continue;
    const char* const kind = parameter.parameterType == ParameterType::fixed ? "fixed" : "dependent";
    texts.push_back(fmt::format("{} = {} ({})", parameter.name, formatReal(values[i]), kind));
  }
  return texts;
}

}  // namespace mirevo

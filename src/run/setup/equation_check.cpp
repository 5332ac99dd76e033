#include "run/setup/equation_check.h"

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "parameters/dependency_order.h"
#include "parameters/parameter_model.h"
#include "platform/equations/expression_evaluator.h"

namespace mirevo {

EquationCheck::EquationCheck(std::span<const ModelParameter> parameters) : values_(parameters.size()) {
  for (const ModelParameter& parameter : parameters) names_.push_back(parameter.name);
  evaluator_ = std::make_unique<ExpressionEvaluator>(names_, values_);
}

EquationCheck::~EquationCheck() = default;

void EquationCheck::checkDependentParameters(std::span<const ModelParameter> parameters,
                                             std::span<const SetupSection> sections) const {
  constexpr std::string_view kKeyword = "Parameter_Equation";
  std::vector<std::vector<std::size_t>> named(parameters.size());
  for (std::size_t i = 0; i < parameters.size(); ++i) {
    if (parameters[i].parameterType != ParameterType::dependent) continue;
    sections[i].checkAt(kKeyword, [&] { named[i] = evaluator_->compile(parameters[i].equation)->variables(); });
  }
  if (const auto illegal = findIllegalRelationship(parameters, named)) {
    sections[illegal->parameter].refuse(illegal->message, kKeyword, illegal->detail);
  }
}

namespace {

/// Whether the value is that of a comparison, 0 or 1: one stands outside all brackets.
bool isComparison(std::string_view equation) {
  int depth = 0;
  bool found = false;
  for (std::size_t i = 0; i < equation.size(); ++i) {
    const char c = equation[i];
    if (c == '(') ++depth;
    if (c == ')') --depth;
    if (c == '?' || c == '"') return false;  // a conditional, or a name in quotes that may hold anything
    const bool isOperator =
        c == '<' || c == '>' || equation.substr(i).starts_with("==") || equation.substr(i).starts_with("!=");
    found = found || (depth == 0 && isOperator);
  }
  return found;
}

/// Warns of a comparison that is compared with a number, where the result does not depend on it.
void warnOfComparedComparison(const InternalConstraint& constraint, const SetupSection& section) {
  const auto warn = [&section](std::string_view keyword, bool ofFalse, bool ofTrue) {
    if (ofFalse != ofTrue) return;
    section.warn(keyword,
                 fmt::format("the value of a comparison is 0 or 1, with which this constraint is always {}: are "
                             "two constraints meant?",
                             ofTrue ? "violated" : "met"));
  };
  if (const auto limit = parseReal(trim(constraint.rightEquation)); limit && isComparison(constraint.leftEquation)) {
    warn("Left_Equation", CheckConstraint(0.0, *limit, constraint.logicalOperator),
         CheckConstraint(1.0, *limit, constraint.logicalOperator));
  }
  if (const auto limit = parseReal(trim(constraint.leftEquation)); limit && isComparison(constraint.rightEquation)) {
    warn("Right_Equation", CheckConstraint(*limit, 0.0, constraint.logicalOperator),
         CheckConstraint(*limit, 1.0, constraint.logicalOperator));
  }
}

}  // namespace

void EquationCheck::checkConstraint(const InternalConstraint& constraint, const SetupSection& section) const {
  const std::pair<std::string_view, const std::string&> sides[] = {{"Left_Equation", constraint.leftEquation},
                                                                   {"Right_Equation", constraint.rightEquation}};
  bool namesParameter = false;
  for (const auto& [keyword, equation] : sides) {
    try {
      const auto compiled = evaluator_->compile(equation);
      namesParameter = namesParameter || !compiled->variables().empty();
    } catch (const FatalError& error) {
      section.refuse("Error: Invalid equation for internal constraints", keyword,
                     fmt::format("{}\n{}", error.message(), error.detail()));
    }
  }
  if (!namesParameter) section.warn("Left_Equation", "no side of the constraint names a parameter");
  warnOfComparedComparison(constraint, section);
}

}  // namespace mirevo

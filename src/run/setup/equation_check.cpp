#include "run/setup/equation_check.h"

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "parameters/dependency_order.h"
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

void EquationCheck::checkConstraint(const InternalConstraint& constraint, const SetupSection& section) const {
  const std::pair<std::string_view, const std::string&> sides[] = {{"Left_Equation", constraint.leftEquation},
                                                                   {"Right_Equation", constraint.rightEquation}};
  for (const auto& [keyword, equation] : sides) {
    try {
      evaluator_->compile(equation);
    } catch (const FatalError& error) {
      section.refuse("Error: Invalid equation for internal constraints", keyword,
                     fmt::format("{}\n{}", error.message(), error.detail()));
    }
  }
}

}  // namespace mirevo

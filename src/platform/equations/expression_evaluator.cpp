#include "platform/equations/expression_evaluator.h"

#include <algorithm>
#include <cassert>

#include <fmt/core.h>
#include <muParser.h>

#include "common/fatal_error.h"
#include "common/text.h"
#include "common/utf8.h"
#include "platform/equations/equation_functions.h"
#include "platform/equations/equation_text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMaximumNameLength = 255;
/// Longest equation that is shown with a mark below the position of an error.
constexpr std::size_t kMaximumShownEquation = 160;

std::string describe(std::string_view equation, const EquationError& error) {
  const std::size_t column = characterCount(equation.substr(0, error.position));
  std::string detail = fmt::format("column {}: {}", column + 1, error.what);
  if (!equation.empty() && equation.size() <= kMaximumShownEquation) {
    detail += fmt::format("\n    {}\n    {}^", equation, std::string(column, ' '));
  }
  if (!error.remedy.empty()) detail += "\n" + error.remedy;
  return detail;
}

[[noreturn]] void failCreation(std::string_view equation, std::string_view detail) {
  fatalError(fmt::format("Error: Unable to create the expression {} in equation parser", quoted(equation)), detail);
}

/// A parser that knows the functions of the equation language and nothing else.
mu::Parser createParser() {
  std::optional<mu::Parser> parser;
  try {
    parser.emplace();
  } catch (const mu::ParserError& error) {
    fatalError("Error: Unable to create COM object for equation parser", error.GetMsg());
  }
  try {
    parser->ClearFun();
    parser->ClearConst();
    parser->ClearInfixOprt();
    parser->DefineInfixOprt("-", [](double value) { return -value; });
    parser->DefineInfixOprt("!", [](double value) { return value == 0.0 ? 1.0 : 0.0; });
    parser->DefineInfixOprt("!!", [](double value) { return value == 0.0 ? 0.0 : 1.0; });
    parser->DefineInfixOprt("-!", [](double value) { return value == 0.0 ? -1.0 : -0.0; });
    parser->DefineInfixOprt("-!!", [](double value) { return value == 0.0 ? -0.0 : -1.0; });
    for (const EquationFunction& function : equationFunctions()) {
      const std::string name(function.name);
      if (function.unary != nullptr) parser->DefineFun(name, function.unary);
      if (function.binary != nullptr) parser->DefineFun(name, function.binary);
      if (function.anyCount != nullptr) parser->DefineFun(name, function.anyCount);
    }
  } catch (const mu::ParserError& error) {
    fatalError("Error: Unable to create set of predefined functions for equation parser", error.GetMsg());
  }
  // The optimizer reassociates products with constants; equations must be computed as they are written.
  parser->EnableOptimizer(false);
  return *parser;
}

class MuParserExpression final : public CompiledExpression {
 public:
  /// `prototype` has the functions; `values` are bound by address. Throws mu::ParserError.
  MuParserExpression(const mu::Parser& prototype, TranslatedEquation equation, std::span<double> values)
      : parser_(prototype), variables_(std::move(equation.variables)) {
    for (const std::size_t variable : variables_) {
      parser_.DefineVar(fmt::format("v{}", variable), &values[variable]);
    }
    for (std::size_t k = 0; k < equation.numbers.size(); ++k) {
      parser_.DefineConst(fmt::format("c{}", k), equation.numbers[k]);
    }
    parser_.SetExpr(equation.text);
    parser_.Eval();  // compiles: later evaluations run the parser's byte code
  }

  std::optional<double> evaluate() const override {
    try {
      return parser_.Eval();
    } catch (const mu::ParserError&) {
      return std::nullopt;
    }
  }
  const std::vector<std::size_t>& variables() const override { return variables_; }

 private:
  mu::Parser parser_;
  std::vector<std::size_t> variables_;
};

}  // namespace

bool CompiledExpression::names(std::size_t variable) const {
  return std::binary_search(variables().begin(), variables().end(), variable);
}

class ExpressionEvaluator::Implementation {
 public:
  mu::Parser prototype = createParser();
  EquationNames names;
  std::span<double> values;
};

ExpressionEvaluator::ExpressionEvaluator(std::span<const std::string> names, std::span<double> values)
    : implementation_(std::make_unique<Implementation>()) {
  assert(names.size() == values.size());
  implementation_->values = values;
  for (const std::string& name : names) {
    const std::string_view trimmed = trimTrailing(name);
    const auto refuse = [trimmed](std::string_view reason) {
      fatalError(fmt::format("Error: Unable to create the parameter {} in equation parser", trimmed), reason);
    };
    if (trimmed.empty()) refuse("the name is empty");
    if (trimmed.size() > kMaximumNameLength) refuse("the name is longer than 255 bytes");
    if (std::any_of(trimmed.begin(), trimmed.end(), [](char c) { return static_cast<unsigned char>(c) < 0x20; })) {
      refuse("the name contains a control character");
    }
    if (!implementation_->names.add(name)) refuse("the name is used more than once");
  }
}

ExpressionEvaluator::~ExpressionEvaluator() = default;

std::unique_ptr<CompiledExpression> ExpressionEvaluator::compile(std::string_view equation) const {
  equation = trim(equation);
  TranslatedEquation translated;
  try {
    translated = translateEquation(equation, implementation_->names);
  } catch (const EquationError& error) {
    failCreation(equation, describe(equation, error));
  }
  try {
    return std::make_unique<MuParserExpression>(implementation_->prototype, std::move(translated),
                                                implementation_->values);
  } catch (const mu::ParserError& error) {
    failCreation(equation, error.GetMsg());
  }
}

double ExpressionEvaluator::EvaluateExpression(std::string_view equation) const {
  const std::optional<double> value = compile(equation)->evaluate();
  if (!value) failEvaluation(equation);
  return *value;
}

bool ExpressionEvaluator::NameAppearsIn(std::string_view equation, std::string_view name) const {
  const auto expression = compile(equation);
  const std::ptrdiff_t index = implementation_->names.find(name);
  if (index < 0) {
    fatalError(
        fmt::format("Error: In the check of {}appear in expression {}", trimTrailing(name), quoted(trim(equation))),
        "no parameter has this name");
  }
  return expression->names(static_cast<std::size_t>(index));
}

void failEvaluation(std::string_view equation) {
  fatalError(fmt::format("Error: Unable to evaluate the expression {} in equation parser", quoted(trim(equation))));
}

}  // namespace mirevo

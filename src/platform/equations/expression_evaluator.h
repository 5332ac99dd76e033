#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace mirevo {

/// An equation compiled once over the variables of an ExpressionEvaluator.
class CompiledExpression {
 public:
  CompiledExpression() = default;
  CompiledExpression(const CompiledExpression&) = delete;
  CompiledExpression& operator=(const CompiledExpression&) = delete;
  virtual ~CompiledExpression() = default;

  /// The value for the current values of the variables; empty when it cannot be computed. NaN and infinity are values.
  virtual std::optional<double> evaluate() const = 0;
  /// The 0-based indices of the variables that occur, ascending, each once.
  virtual const std::vector<std::size_t>& variables() const = 0;
  /// Whether the variable with that 0-based index occurs.
  bool names(std::size_t variable) const;
};

/// Compiles equations over named 64-bit variables that the caller owns and changes between evaluations. The equation
/// language is described in docs/algorithms/parameters.md; no result depends on the locale.
class ExpressionEvaluator final {
 public:
  /// `names[i]` is the variable whose value is `values[i]`; both must outlive the evaluator and what it compiles.
  /// Trailing blanks of a name do not count. Throws FatalError with "Error: Unable to create the parameter ..." for a
  /// name that cannot be a variable: empty, longer than 255 bytes, with a control character, or used twice.
  ExpressionEvaluator(std::span<const std::string> names, std::span<double> values);
  ~ExpressionEvaluator();
  ExpressionEvaluator(const ExpressionEvaluator&) = delete;
  ExpressionEvaluator& operator=(const ExpressionEvaluator&) = delete;

  /// Throws FatalError with "Error: Unable to create the expression ..." whose detail says what is wrong and where.
  std::unique_ptr<CompiledExpression> compile(std::string_view equation) const;

  /// Compiles and evaluates once. Throws FatalError with "Error: Unable to create the expression ..." or "Error: Unable
  /// to evaluate the expression ...".
  double EvaluateExpression(std::string_view equation) const;

  /// Whether the variable with this name occurs in the equation, as a name of its own and not as part of another.
  /// Throws FatalError with "Error: In the check of ..." for a name that is not a variable, and like compile().
  bool NameAppearsIn(std::string_view equation, std::string_view name) const;

 private:
  class Implementation;
  std::unique_ptr<Implementation> implementation_;
};

/// Throws FatalError: the expression was compiled but has no value.
[[noreturn]] void failEvaluation(std::string_view equation);

}  // namespace mirevo

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

  /// The value with the variables as they are now; nothing when it cannot be computed. NaN and infinity are values.
  virtual std::optional<double> evaluate() const = 0;
  /// Whether the variable with that 0-based index occurs.
  virtual bool names(std::size_t variable) const = 0;
};

/// Compiles equations over named 64-bit variables that the caller owns and changes between evaluations.
class ExpressionEvaluator final {
 public:
  /// `names[i]` is the variable whose value is `values[i]`; both must outlive the evaluator and what it compiles.
  /// Throws FatalError with "Error: Unable to create the parameter ..." for a name that cannot be a variable.
  ExpressionEvaluator(std::span<const std::string> names, std::span<double> values);
  ~ExpressionEvaluator();
  ExpressionEvaluator(const ExpressionEvaluator&) = delete;
  ExpressionEvaluator& operator=(const ExpressionEvaluator&) = delete;

  /// Throws FatalError with "Error: Unable to create the expression ..." whose detail says what is wrong and where.
  std::unique_ptr<CompiledExpression> compile(std::string_view equation) const;

 private:
  class Implementation;
  std::unique_ptr<Implementation> implementation_;
};

}  // namespace mirevo

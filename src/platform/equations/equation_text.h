#pragma once

#include <cstddef>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/equations/equation_functions.h"

namespace mirevo {

/// Longest equation, in bytes.
inline constexpr std::size_t kMaximumEquationLength = 10000;
/// The largest number of nested brackets, and of conditionals in an equation.
inline constexpr int kMaximumEquationNesting = 100;

/// What is wrong with an equation. `position` is a 0-based byte offset.
struct EquationError {
  std::size_t position = 0;
  std::string what;
  std::string remedy;  ///< empty when there is nothing to advise
};

/// An equation in a form that the parser library accepts whatever the names of the parameters: variable i is `v<i>`,
/// the k-th number is `c<k>`, functions keep their names.
struct TranslatedEquation {
  std::string text;
  std::vector<double> numbers;
  std::vector<std::size_t> variables;  ///< indices of those that occur, ascending, each once
};

/// The variables of equations, by name.
class EquationNames final {
 public:
  /// False when the name is taken already.
  bool add(const std::string& name);
  /// The 0-based index of the name, or -1; trailing blanks do not count.
  std::ptrdiff_t find(std::string_view name) const;
  const std::vector<std::string>& all() const { return names_; }

 private:
  std::vector<std::string> names_;
  std::unordered_map<std::string, std::size_t> index_;
};

/// Checks the whole syntax of an equation and translates it; the grammar is in docs/algorithms/parameters.md. Throws
/// EquationError. Works without recursion, so that no text can exhaust the stack.
TranslatedEquation translateEquation(std::string_view equation, const EquationNames& names);

}  // namespace mirevo

// Any text as an equation: it is compiled and evaluated, or refused with a FatalError; nothing else may happen.

#include <cstdint>
#include <cstdlib>
#include <string_view>
#include <vector>

#include "common/fatal_error.h"
#include "platform/equations/expression_evaluator.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static std::vector<std::string> names{"a", "b", "max", "x 1", "2k", "e"};
  static std::vector<double> values{1.5, -2, 0, 1e300, 7, 3};
  static const mirevo::ExpressionEvaluator evaluator(names, values);
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  try {
    const auto expression = evaluator.compile(text);
    if (!expression->evaluate()) std::abort();
    for (const std::size_t variable : expression->variables()) {
      if (variable >= names.size()) std::abort();
    }
  } catch (const mirevo::FatalError& error) {
    // The library agrees with the check of the syntax that went before it, whose details begin with a column.
    if (!error.detail().starts_with("column ")) std::abort();
  }
  return 0;
}

#pragma once

#include <cstddef>
#include <vector>

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// Bounds and start point on the search scale; one entry per variable parameter.
struct SearchBounds {
  std::vector<double> lower;
  std::vector<double> upper;
  std::vector<double> initial;
  /// Whether the model takes the parameter in whole steps from the lower bound; values in between are truncated. Empty
  /// if there is no such parameter.
  std::vector<bool> isInteger{};

  std::size_t size() const { return lower.size(); }
};

/// An axis-parallel box of the search space; n values each.
struct Box {
  std::vector<double> lower;
  std::vector<double> upper;
};

/// Whether objective value `a` is strictly better (smaller) than `b`. Not-a-number is worse than every number.
bool isBetter(double a, double b);

/// Whether a result says anything about its point: the evaluation did not fail and its value is a number.
bool isUsable(const EvaluationResult& result);

}  // namespace mirevo

#include "algorithms/numbers/search_bounds.h"

#include <cmath>

namespace mirevo {

bool isBetter(double a, double b) {
  return a < b || (std::isnan(b) && !std::isnan(a));
}

bool isUsable(const EvaluationResult& result) {
  return result.ok() && !std::isnan(result.aggregate);
}

}  // namespace mirevo

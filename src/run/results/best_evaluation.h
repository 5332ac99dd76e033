#pragma once

#include <vector>

namespace mirevo {

/// The evaluation that a run holds for its best.
struct BestEvaluation {
  int number = 0;
  double aggregate = 0.0;
  std::vector<double> parameterValues;  ///< model scale, one a variable parameter
};

}  // namespace mirevo

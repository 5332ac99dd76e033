#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"
#include "measures/weighted_residuals.h"
#include "parameters/parameter_fields.h"
#include "parameters/search_space.h"

namespace mirevo {

/// The derivatives of m residuals by p parameters on the search scale, by differences.
struct DifferenceJacobian {
  ParameterSet base;                         ///< where the differences were taken
  int evaluation = 0;                        ///< the number of its run
  std::vector<std::vector<double>> columns;  ///< p of m; 0 where a column is not known
  std::vector<double> widths;                ///< of the differences, p; 0 for a column that is not of these runs
  std::vector<std::string> problems;         ///< why a column is not known, p; empty where it is
};

/// The parameters of least squares, and the model linearised near them.
struct ResidualFit {
  ParameterSet set;
  int evaluation = 0;                                  ///< the number of its run
  double sum = 0.0;                                    ///< of squares, with that of the prior values
  ResidualRows rows;                                   ///< with the finest units of the runs so far
  std::shared_ptr<const DifferenceJacobian> jacobian;  ///< the last one made by differences
};

/// What a search by residuals works on besides the problem of every search.
struct ResidualProblem {
  SearchSpace space;
  ParameterFields fields = {};
  /// The residuals of a successful run, as many of each; one that lacks some has NaN there.
  std::function<ResidualRows(const EvaluationResult&)> residualsOf;
  /// The fit so far, complete after every step, for what follows the search.
  std::optional<ResidualFit> fit = std::nullopt;
  int evaluationCount = 0;  ///< in batches that came to their end
};

}  // namespace mirevo

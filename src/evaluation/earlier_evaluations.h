#pragma once

#include <map>
#include <optional>
#include <span>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/objective_functions.h"
#include "parameters/search_space.h"

namespace mirevo {

/// What an earlier, interrupted run of the same setup has found. Every task is deterministic: taking its results from
/// here, a run walks through the past of the earlier one without a model run and goes on where that was cut off.
class EarlierEvaluations final {
 public:
  struct Record {
    std::vector<double> parameterValues;  ///< model scale, one a variable parameter
    EvaluationResult result;              ///< with every value but the aggregate
  };

  /// `records` by their evaluation number. The aggregator must outlive this.
  EarlierEvaluations(SearchSpace space, const ObjectiveAggregator& aggregator, std::map<int, Record> records);

  /// Takes out the result of the evaluation with that number, its aggregate as it is to be at this point of the run;
  /// nothing where the earlier run did not come to it. `set` is on the search scale. Throws FatalError when the earlier
  /// run has evaluated another set under that number.
  std::optional<EvaluationResult> take(int number, std::span<const double> set);

 private:
  void requireSameValues(int number, std::span<const double> earlier, std::span<const double> set) const;

  SearchSpace space_;
  const ObjectiveAggregator& aggregator_;
  std::map<int, Record> records_;
};

}  // namespace mirevo

#pragma once

#include <map>
#include <optional>
#include <set>
#include <span>
#include <utility>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/objective_functions.h"
#include "parameters/search_space.h"

namespace mirevo {

/// The results of an earlier, interrupted run of the same setup. Every task is deterministic: by taking these results a
/// run repeats the course of the earlier one without model runs and continues where that was cut off.
class EarlierEvaluations final {
 public:
  struct Record {
    std::vector<double> parameterValues;  ///< model scale, one per variable parameter
    EvaluationResult result;              ///< complete except for the aggregate
    bool isRepeat = false;                ///< it had its result from an evaluation before it, without a model run
    bool repeatsRun = false;              ///< the model is run again, for pairs that are lost; the result stays
  };

  /// `records` by evaluation number. The aggregator must outlive the object.
  EarlierEvaluations(SearchSpace space, const ObjectiveAggregator& aggregator, std::map<int, Record> records);

  /// Removes and returns the result of the evaluation with this number, with the aggregate that it has at this point of
  /// the run; empty if the earlier run did not make it. `set` is on the search scale. Throws FatalError if the earlier
  /// run evaluated another set under this number.
  std::optional<EvaluationResult> take(int number, std::span<const double> set);
  /// Whether the evaluation with this number needs a model run before its result is taken.
  bool repeatsRun(int number) const;
  /// Whether it had its result from an evaluation before it; of one that has not been taken.
  bool isRepeat(int number) const;
  /// Those of an evaluation that has not been taken; otherwise nullptr.
  const std::vector<double>* measuresOf(int number) const;

  /// The evaluations whose model is run again for the output files that it leaves; their results are the earlier ones.
  void runAgain(std::set<int> numbers) { runAgain_ = std::move(numbers); }
  bool isRunAgain(int number) const { return runAgain_.contains(number); }

 private:
  void requireSameValues(int number, std::span<const double> earlier, std::span<const double> set) const;

  SearchSpace space_;
  const ObjectiveAggregator& aggregator_;
  std::map<int, Record> records_;
  std::set<int> runAgain_;
};

}  // namespace mirevo

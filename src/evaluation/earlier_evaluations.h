#pragma once

#include <map>
#include <memory>
#include <optional>
#include <set>
#include <span>
#include <utility>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/objective_functions.h"
#include "parameters/search_space.h"

namespace mirevo {

/// An evaluation of an earlier run.
struct EarlierRecord {
  std::vector<double> parameterValues;  ///< model scale, one per variable parameter
  EvaluationResult result;              ///< complete except for the aggregate
  bool isRepeat = false;                ///< it had its result from an evaluation before it, without a model run
};

/// The evaluations of an earlier run by their numbers. There may be millions, of which a run takes one after another.
class EarlierRecords {
 public:
  EarlierRecords() = default;
  EarlierRecords(const EarlierRecords&) = delete;
  EarlierRecords& operator=(const EarlierRecords&) = delete;
  virtual ~EarlierRecords() = default;

  /// Removes and returns one; empty if it is not there.
  virtual std::optional<EarlierRecord> take(int number) = 0;
  /// The output measures of one that has not been taken; otherwise empty.
  virtual std::vector<double> measuresOf(int number) const = 0;
  /// Whether one that has not been taken had its result from an evaluation before it, without a model run.
  virtual bool isRepeat(int number) const = 0;
};

/// The results of an earlier, interrupted run of the same setup. Every task is deterministic: by taking these results a
/// run repeats the course of the earlier one without model runs and continues where that was cut off.
class EarlierEvaluations final {
 public:
  using Record = EarlierRecord;

  /// The aggregator must outlive the object.
  EarlierEvaluations(SearchSpace space, const ObjectiveAggregator& aggregator, std::unique_ptr<EarlierRecords> records);
  /// `records` by evaluation number.
  EarlierEvaluations(SearchSpace space, const ObjectiveAggregator& aggregator, std::map<int, Record> records);

  /// Removes and returns the result of the evaluation with this number, with the aggregate that it has at this point of
  /// the run; empty if the earlier run did not make it. `set` is on the search scale. Throws FatalError if the earlier
  /// run evaluated another set under this number.
  std::optional<EvaluationResult> take(int number, std::span<const double> set);
  /// Whether the evaluation with this number needs a model run before its result is taken.
  bool repeatsRun(int number) const { return repeated_.contains(number); }
  /// Whether it had its result from an evaluation before it; of one that has not been taken.
  bool isRepeat(int number) const { return records_->isRepeat(number); }
  /// Those of an evaluation that has not been taken; otherwise empty.
  std::vector<double> measuresOf(int number) const { return records_->measuresOf(number); }

  /// The model of this evaluation is run again, for pairs that are lost; its result stays.
  void repeatRun(int number) { repeated_.insert(number); }

  /// The evaluations whose model is run again for the output files that it leaves; their results are the earlier ones.
  void runAgain(std::set<int> numbers) { runAgain_ = std::move(numbers); }
  bool isRunAgain(int number) const { return runAgain_.contains(number); }

 private:
  void requireSameValues(int number, std::span<const double> earlier, std::span<const double> set) const;

  SearchSpace space_;
  const ObjectiveAggregator& aggregator_;
  std::unique_ptr<EarlierRecords> records_;
  std::set<int> repeated_;
  std::set<int> runAgain_;
};

}  // namespace mirevo

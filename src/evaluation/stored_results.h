#pragma once

#include <map>
#include <utility>
#include <vector>

#include "evaluation/earlier_evaluations.h"
#include "evaluation/evaluator.h"
#include "parameters/search_space.h"

namespace mirevo {

/// Answers with the results of evaluations that were made before, by their numbers, if they were of the same sets.
class StoredResults final : public Evaluator {
 public:
  using Record = EarlierEvaluations::Record;

  /// `missing` is the answer where there is no result.
  StoredResults(SearchSpace space, std::map<int, Record> records, EvaluationResult missing)
      : space_(std::move(space)), records_(std::move(records)), missing_(std::move(missing)) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets,
                                                      DispatchMode /*mode*/) override {
    std::vector<EvaluationResult> results;
    for (const ParameterSet& set : sets) {
      const auto found = records_.find(++count_);
      const bool isThere = found != records_.end();
      const bool isOther = isThere && findOtherValue(space_, set, found->second.parameterValues).has_value();
      if (isOther) ofOtherSets_.push_back(count_);
      results.push_back(isThere && !isOther ? found->second.result : missing_);
      results.back().number = count_;
    }
    return results;
  }

  /// The numbers of the evaluations that were asked for with another set.
  const std::vector<int>& ofOtherSets() const { return ofOtherSets_; }

 private:
  SearchSpace space_;
  std::map<int, Record> records_;
  EvaluationResult missing_;
  std::vector<int> ofOtherSets_;
  int count_ = 0;
};

}  // namespace mirevo

#pragma once

#include <span>
#include <vector>

#include "algorithms/searches/best_course.h"
#include "evaluation/evaluator.h"

namespace mirevo {

/// Passes everything on to another evaluator and keeps the course of the best value.
class WatchedEvaluator final : public Evaluator {
 public:
  explicit WatchedEvaluator(Evaluator& evaluator) : evaluator_(evaluator) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override {
    std::vector<EvaluationResult> results = evaluator_.evaluateParameterSets(sets, mode);
    for (const EvaluationResult& result : results) course_.add(result.aggregate);
    return results;
  }
  void submit(std::span<const ParameterSet> sets) override { evaluator_.submit(sets); }
  EvaluationResult awaitFirst() override {
    EvaluationResult result = evaluator_.awaitFirst();
    course_.add(result.aggregate);
    return result;
  }
  UnfinishedBatch takeUnfinished() override { return evaluator_.takeUnfinished(); }
  /// The aggregates before the scale was known are not comparable with the others. A search that goes on from an
  /// earlier one has it already.
  void settleAggregates(std::span<EvaluationResult> sample) override {
    evaluator_.settleAggregates(sample);
    if (course_.evaluationCount() > std::ssize(sample)) return;
    course_.clear();
    for (const EvaluationResult& result : sample) course_.add(result.aggregate);
  }

  const BestCourse& course() const { return course_; }

 private:
  Evaluator& evaluator_;
  BestCourse course_;
};

}  // namespace mirevo

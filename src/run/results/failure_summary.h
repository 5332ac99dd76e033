#pragma once

#include <map>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"

namespace mirevo {

/// Why the evaluations of a run failed, and how often for each reason.
class FailureSummary final {
 public:
  struct Count {
    int count = 0;
    int firstNumber = 0;
    std::string firstReason;
  };

  void add(int number, const EvaluationFailure& failure);
  /// One line per kind of failure, the most frequent first, with the reason of the first such evaluation.
  std::vector<std::string> lines() const;
  const std::map<EvaluationFailure::Kind, Count>& counts() const { return counts_; }

 private:
  std::map<EvaluationFailure::Kind, Count> counts_;
};

}  // namespace mirevo

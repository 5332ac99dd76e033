#include "run/results/failure_summary.h"

#include <algorithm>
#include <utility>

#include <fmt/core.h>

namespace mirevo {

void FailureSummary::add(int number, const EvaluationFailure& failure) {
  Count& count = counts_[failure.kind];
  ++count.count;
  if (count.firstNumber != 0 && count.firstNumber < number) return;  // evaluations arrive in any order
  count.firstNumber = number;
  count.firstReason = failure.reason;
}

std::vector<std::string> FailureSummary::lines() const {
  std::vector<std::pair<EvaluationFailure::Kind, Count>> ordered(counts_.begin(), counts_.end());
  std::stable_sort(ordered.begin(), ordered.end(),
                   [](const auto& a, const auto& b) { return a.second.count > b.second.count; });
  std::vector<std::string> lines;
  lines.reserve(ordered.size());
  for (const auto& [kind, count] : ordered) {
    lines.push_back(fmt::format("   {} x {}; first No. {}: {}", count.count, failureKindName(kind), count.firstNumber,
                                count.firstReason));
  }
  return lines;
}

}  // namespace mirevo

#include "evaluation/pair_comparison.h"

#include <algorithm>
#include <string_view>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/text.h"

namespace mirevo {
namespace {

std::string rangeText(std::string_view what, const ValueSummary& range) {
  return fmt::format("{} {:.6g} to {:.6g}, mean {:.6g}", what, range.least, range.largest, range.mean);
}

/// "1 pair", "9 pairs"
std::string countText(std::size_t count, std::string_view what) {
  return fmt::format("{} {}{}", count, what, count == 1 ? "" : "s");
}

}  // namespace

PairsFound PairComparison::take(EvaluationResult& result) {
  PairsFound found;
  if (!comparesSeries_) return found;
  if (!result.ok()) result.pairs.clear();
  anyHasSucceeded_ = anyHasSucceeded_ || result.ok();
  if (firstNumber_ != 0) {
    if (!compare(result.number, result.pairs, found)) result.pairs.clear();
    return found;
  }
  waiting_[result.number] = result.pairs;
  // Evaluations without pairs have failed, or are of an earlier version of the program, which did not keep them.
  for (auto next = waiting_.find(nextNumber_); next != waiting_.end(); next = waiting_.find(++nextNumber_)) {
    if (!next->second.empty()) {
      firstNumber_ = next->first;
      first_ = std::move(next->second);
      waiting_.erase(next);
      break;
    }
    waiting_.erase(next);
  }
  if (firstNumber_ == 0) return found;
  found.firstNumber = firstNumber_;
  found.firstLines = linesOfFirst();
  for (const auto& [number, pairs] : waiting_) compare(number, pairs, found);
  waiting_.clear();
  return found;
}

RequiredPairs PairComparison::required() const {
  RequiredPairs required;
  required.anyHasSucceeded = anyHasSucceeded_;
  if (!rules_.requiresShare || firstNumber_ == 0) return required;
  required.firstNumber = firstNumber_;
  required.firstCounts.assign(measureNames_.size(), 0);
  for (const MeasurePairs& pairs : first_) required.firstCounts.at(pairs.measure) = pairs.count;
  return required;
}

std::vector<std::string> PairComparison::linesOfFirst() const {
  std::vector<std::string> lines{fmt::format(
      "Pairs of simulated and observed values in evaluation No. {}, the first successful run:", firstNumber_)};
  for (const MeasurePairs& pairs : first_) {
    lines.push_back(fmt::format("   {}: {}, {} without a simulated value, {} to {}",
                                trimTrailing(measureNames_.at(pairs.measure)), countText(pairs.count, "pair"),
                                countText(pairs.missingCount, "observation"), formatDate(dateOfSecond(pairs.first)),
                                formatDate(dateOfSecond(pairs.last))));
    lines.push_back(
        fmt::format("      {}; {}", rangeText("observed", pairs.observed), rangeText("simulated", pairs.simulated)));
  }
  return lines;
}

bool PairComparison::compare(int number, std::span<const MeasurePairs> pairs, PairsFound& found) const {
  bool hasFewer = false;
  bool hasOthers = false;
  for (const MeasurePairs& each : pairs) {
    const auto first = std::find_if(first_.begin(), first_.end(),
                                    [&each](const MeasurePairs& other) { return other.measure == each.measure; });
    if (first == first_.end() || each.hasObservationsOf(*first)) continue;
    hasOthers = true;
    if (each.count >= first->count) continue;
    hasFewer = true;
    found.fewer.push_back({number, each.measure, each.count, first->count,
                           fmt::format("output measure \"{}\" has {}, {} in the first successful run, No. {}",
                                       trimTrailing(measureNames_.at(each.measure)), countText(each.count, "pair"),
                                       first->count, firstNumber_)});
  }
  if (hasOthers && !hasFewer) found.others.push_back(number);
  return hasOthers;
}

std::string bestHasFewerPairs(int number) {
  return fmt::format("The best evaluation, No. {}, is judged by fewer observations than the first successful run",
                     number);
}

}  // namespace mirevo

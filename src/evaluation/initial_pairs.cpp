#include "evaluation/initial_pairs.h"

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

PairsFound InitialPairs::take(EvaluationResult& result) {
  PairsFound found;
  if (!comparesSeries_) return found;
  if (!result.ok()) result.pairs.clear();
  if (initialNumber_ != 0) {
    found.fewer = findFewer(result.number, result.pairs);
    if (found.fewer.empty()) result.pairs.clear();
    return found;
  }
  waiting_[result.number] = result.pairs;
  // Evaluations without pairs have failed, or are of an earlier version of the program, which did not keep them.
  for (auto next = waiting_.find(nextNumber_); next != waiting_.end(); next = waiting_.find(++nextNumber_)) {
    if (!next->second.empty()) {
      initialNumber_ = next->first;
      initial_ = std::move(next->second);
      waiting_.erase(next);
      break;
    }
    waiting_.erase(next);
  }
  if (initialNumber_ == 0) return found;
  found.initialNumber = initialNumber_;
  found.initialLines = linesOfInitial();
  for (const auto& [number, pairs] : waiting_) {
    for (FewerPairs& fewer : findFewer(number, pairs)) found.fewer.push_back(std::move(fewer));
  }
  waiting_.clear();
  return found;
}

RequiredPairs InitialPairs::required() const {
  if (!isRequired_ || initialNumber_ == 0) return {};
  RequiredPairs required{initialNumber_, std::vector<std::size_t>(measureNames_.size(), 0)};
  for (const MeasurePairs& pairs : initial_) required.initialCounts.at(pairs.measure) = pairs.count;
  return required;
}

std::vector<std::string> InitialPairs::linesOfInitial() const {
  std::vector<std::string> lines{
      fmt::format("Pairs of simulated and observed values in evaluation No. {}, the initial run:", initialNumber_)};
  for (const MeasurePairs& pairs : initial_) {
    lines.push_back(fmt::format("   {}: {}, {} without a simulated value, {} to {}",
                                trimTrailing(measureNames_.at(pairs.measure)), countText(pairs.count, "pair"),
                                countText(pairs.missingCount, "observation"), formatDate(dateOfSecond(pairs.first)),
                                formatDate(dateOfSecond(pairs.last))));
    lines.push_back(
        fmt::format("      {}; {}", rangeText("observed", pairs.observed), rangeText("simulated", pairs.simulated)));
  }
  return lines;
}

std::vector<FewerPairs> InitialPairs::findFewer(int number, std::span<const MeasurePairs> pairs) const {
  std::vector<FewerPairs> fewer;
  for (const MeasurePairs& found : pairs) {
    const auto initial = std::find_if(initial_.begin(), initial_.end(),
                                      [&found](const MeasurePairs& other) { return other.measure == found.measure; });
    if (initial == initial_.end() || found.count >= initial->count) continue;
    fewer.push_back({number, found.measure, found.count, initial->count,
                     fmt::format("output measure \"{}\" has {}, {} in the initial run, No. {}",
                                 trimTrailing(measureNames_.at(found.measure)), countText(found.count, "pair"),
                                 initial->count, initialNumber_)});
  }
  return fewer;
}

}  // namespace mirevo

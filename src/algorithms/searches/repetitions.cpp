#include "algorithms/searches/repetitions.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <iterator>

#include <fmt/core.h>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/uniform_generator.h"
#include "common/column_heading.h"
#include "common/rounded_text.h"
#include "common/run_files.h"

namespace mirevo {

std::int32_t repetitionSeed(std::int32_t seed, std::int32_t index) {
  constexpr std::int64_t kLargest = std::numeric_limits<std::int32_t>::max();
  std::int64_t size = std::abs(std::int64_t{seed}) + index;
  if (index > 0 && size > kLargest) size -= UniformGenerator::kSeedPeriod;
  return static_cast<std::int32_t>(seed < 0 ? -size : size);
}

std::vector<int> sameSearches(std::span<const Repetition> repetitions) {
  std::vector<int> same(repetitions.size(), 0);
  for (std::size_t i = 0; i < repetitions.size(); ++i) {
    const std::vector<ParameterSet>& starts = repetitions[i].starts;
    if (starts.empty()) continue;
    const auto before = repetitions.first(i);
    const auto first = std::ranges::find(before, starts, &Repetition::starts);
    if (first != before.end()) same[i] = static_cast<int>(first - before.begin()) + 1;
  }
  return same;
}

std::string seedsText(std::int32_t seed, std::int32_t count) {
  if (count == 1) return fmt::format("seed {}", seed);
  return fmt::format("seeds {} to {}", seed, repetitionSeed(seed, count - 1));
}

NearlyEqual nearlyEqual(double least, std::span<const double> starts) {
  std::vector<double> known;
  std::ranges::copy_if(starts, std::back_inserter(known), [](double value) { return std::isfinite(value); });
  std::ranges::sort(known);
  const double fall = known.empty() ? 0.0 : std::max(0.0, sortedQuantile(known, 0.5) - least);
  double share = kNearlyEqualShare * std::abs(least);
  if (least < 0.0 && !known.empty()) share = std::min(share, kNearlyEqualShare * fall);
  const double nearZero = kNearlyEqualFall * fall;
  NearlyEqual nearly{std::max(share, nearZero), least > 0.0 && share >= nearZero};
  const auto atStart = static_cast<std::size_t>(
      std::ranges::count_if(known, [&](double start) { return start <= least + nearly.tolerance; }));
  if (2 * atStart >= starts.size()) nearly.atStart = atStart;
  return nearly;
}

FrontAgreement frontAgreement(std::span<const double> hypervolumes, double ofAll, std::size_t sizeOfAll,
                              std::int64_t loops) {
  using Verdict = FrontAgreement::Verdict;
  const double least = (1.0 - kNearlyEqualShare) * ofAll;
  FrontAgreement found;
  found.near = static_cast<std::size_t>(
      std::ranges::count_if(hypervolumes, [least](double hypervolume) { return hypervolume >= least; }));
  if (hypervolumes.size() < 2 || !(ofAll > 0.0)) return found;
  found.verdict = loops == 0                         ? Verdict::noSearch
                  : found.near < hypervolumes.size() ? Verdict::differ
                  : sizeOfAll == 1                   ? Verdict::oneSet
                                                     : Verdict::agree;
  return found;
}

std::string NearlyEqual::text() const {
  return isOfLeast ? fmt::format("{:g} % of the least", 100.0 * kNearlyEqualShare)
                   : fmt::format("{} of the least", roundedText(tolerance, 3));
}

DataTable repetitionTable(std::span<const Repetition> repetitions, const SearchSpace& space) {
  const bool hasFronts = std::ranges::any_of(repetitions, [](const Repetition& one) { return one.front.has_value(); });
  DataTable table{run_files::kRepetitions,
                  {"Repetitions of the search, each with a seed of its own: the best evaluation of each, its aggregate "
                   "and its parameters (model scale). Loops 0 and no termination: it had not ended"},
                  {"Repetition", "Seed", "Evaluations", "Best_Evaluation", "Aggregate", "Loops", "Start_Aggregate"},
                  {}};
  if (hasFronts) {
    table.headLines.emplace_back(
        "The best evaluation is that of its front that is nearest to the ideal point of the front of all. Hypervolume: "
        "of its front, as a share of the box between that point and the reference point");
    table.columns.emplace_back("Hypervolume");
  }
  const bool hasSums = std::ranges::any_of(repetitions, &Repetition::isJudgedBySums);
  if (hasSums) {
    table.headLines.emplace_back(
        "The search judges sets by the sum of squares, not by the aggregate: that of the best set, and the least of "
        "the sets that it began with; NaN: it had not ended");
    table.columns.insert(table.columns.end(), {"Sum_of_Squares", "Start_Sum_of_Squares"});
  }
  const std::vector<int> same = sameSearches(repetitions);
  const bool hasSame = std::ranges::any_of(same, [](int other) { return other != 0; });
  if (hasSame) {
    table.headLines.emplace_back(
        "Same_As: the earlier repetition that started from the same sets and thus is the same search; 0: none");
    table.columns.emplace_back("Same_As");
  }
  const std::string lastColumn = "Termination";
  std::vector<std::string> taken = table.columns;
  taken.push_back(lastColumn);
  for (const std::string& name : space.names) {
    table.columns.push_back(columnHeading(name, taken));
    taken.push_back(table.columns.back());
  }
  table.columns.push_back(lastColumn);
  for (std::size_t i = 0; i < repetitions.size(); ++i) {
    const Repetition& repetition = repetitions[i];
    std::vector<DataTable::Cell>& row = table.rows.emplace_back();
    row = {static_cast<std::int64_t>(i + 1),
           std::int64_t{repetition.seed},
           std::int64_t{repetition.evaluations},
           std::int64_t{repetition.bestEvaluation},
           repetition.aggregate,
           std::int64_t{repetition.loops},
           repetition.startAggregate};
    if (hasFronts) row.emplace_back(repetition.front ? repetition.front->hypervolume : 0.0);
    if (hasSums) row.insert(row.end(), {repetition.sumOfSquares, repetition.startSum});
    if (hasSame) row.emplace_back(std::int64_t{same[i]});
    for (std::size_t k = 0; k < space.size(); ++k) {
      row.emplace_back(repetition.best.empty() ? std::numeric_limits<double>::quiet_NaN()
                                               : toModelScale(space, k, repetition.best[k]));
    }
    row.emplace_back(repetition.termination);
  }
  return table;
}

DataTable repetitionRowTable(std::span<const RepetitionStretch> stretches) {
  DataTable table{run_files::kRepetitionRows,
                  {"Which evaluations belong to which repetition of the search. The last of an unfinished run may have "
                   "no results"},
                  {"Repetition", "First_Evaluation", "Last_Evaluation"},
                  {}};
  for (const RepetitionStretch& stretch : stretches) {
    table.rows.push_back({std::int64_t{stretch.repetition}, std::int64_t{stretch.first}, std::int64_t{stretch.last}});
  }
  return table;
}

}  // namespace mirevo

#include "algorithms/searches/repetitions.h"

#include <cmath>
#include <cstdlib>

#include <fmt/core.h>

#include "common/run_files.h"

namespace mirevo {
namespace {

/// Of the generator of a run: seeds that differ by this have the same stream.
constexpr std::int64_t kSeedPeriod = 259200;

}  // namespace

std::int32_t repetitionSeed(std::int32_t seed, std::int32_t index) {
  constexpr std::int64_t kLargest = std::numeric_limits<std::int32_t>::max();
  std::int64_t size = std::abs(std::int64_t{seed}) + index;
  if (index > 0 && size > kLargest) size -= kSeedPeriod;
  return static_cast<std::int32_t>(seed < 0 ? -size : size);
}

std::string seedsText(std::int32_t seed, std::int32_t count) {
  if (count == 1) return fmt::format("seed {}", seed);
  return fmt::format("seeds {} to {}", seed, repetitionSeed(seed, count - 1));
}

DataTable repetitionTable(std::span<const Repetition> repetitions, const SearchSpace& space) {
  DataTable table{run_files::kRepetitions,
                  {"Repetitions of the search, each with a seed of its own: the best evaluation of each, its aggregate "
                   "and its parameters (model scale). Loops 0 and no termination: it had not ended"},
                  {"Repetition", "Seed", "Evaluations", "Best_Evaluation", "Aggregate", "Loops"},
                  {}};
  table.columns.insert(table.columns.end(), space.names.begin(), space.names.end());
  table.columns.emplace_back("Termination");
  std::int64_t number = 0;
  for (const Repetition& repetition : repetitions) {
    std::vector<DataTable::Cell>& row = table.rows.emplace_back();
    row = {++number,
           std::int64_t{repetition.seed},
           std::int64_t{repetition.evaluations},
           std::int64_t{repetition.bestEvaluation},
           repetition.aggregate,
           std::int64_t{repetition.loops}};
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

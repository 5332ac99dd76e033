#pragma once

#include <cstddef>
#include <deque>
#include <functional>
#include <span>
#include <vector>

#include "algorithms/pareto/pareto_archive.h"
#include "algorithms/searches/pareto_search.h"
#include "algorithms/searches/repetitions.h"

namespace mirevo {

/// What the repetitions of a search for a front work on: each has a front of its own. That of all of them is an archive
/// of its own, in which the sets are in the order of their numbers.
class RepeatedFronts final {
 public:
  explicit RepeatedFronts(std::size_t count) : problems_(count) {}

  ParetoProblem& problem(std::size_t index) { return problems_[index]; }
  const ParetoProblem& problem(std::size_t index) const { return problems_[index]; }

  /// Describes the front of each of the repetitions beside that of all of them, `ofAll`, whose scale they have, and
  /// takes its compromise as its best set. `reference`: as that of FrontScale. `aggregate` of the objectives' values.
  void describe(const ParetoArchive& ofAll, std::span<const double> reference,
                const std::function<double(std::span<const double>)>& aggregate,
                std::span<Repetition> repetitions) const;

 private:
  std::deque<ParetoProblem> problems_;  ///< where they stay
};

/// Puts the next evaluation into an archive.
void addToArchive(ParetoArchive& archive, const ParameterSet& set, const EvaluationResult& result);

}  // namespace mirevo

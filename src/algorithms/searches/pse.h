#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/searches/pse_keywords.h"
#include "algorithms/searches/pse_moves.h"

namespace mirevo {

/// Population Simplex Evolution: the step of SCE made by all points of one population at once, a whole generation in
/// one batch. A loop is one generation: N offspring by PseMoves, N being the size of the population, all of them made
/// from the population as the generation before has left it.
///
/// With a surrogate model the most promising of several offspring of a point is run, and a quarter of the generation
/// goes to the points where the model predicts the lowest values around each of the best points. What the alternatives
/// cost is measured in docs/algorithms/surrogate.md.
class Pse final : public PseMoves {
 public:
  Pse(const PseSettings& settings, const SimplexSettings& simplex, SearchProblem problem);

 private:
  void makeLoop() override;

  Offspring mostPromisingOffspring(std::size_t parent);
  void proposePredictedMinima(std::vector<Offspring>& offspring);
  void replaceParents(std::span<const Offspring> offspring, std::span<const ParameterSet> proposals);
};

/// PSE as a setup selects it.
class PseMethod final : public SimplexMethod {
 public:
  static const PseRefusals kRefusals;

  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::vector<SearchAdvice> advice(std::size_t n) const override;
  std::int64_t populationSize() const override { return settings.populationSize; }
  double evaluationsPerLoop() const override { return settings.populationSize; }
  /// PSE asks the surrogate model once per generation, SCE at every step.
  double loopsBefore(double sets) const override;
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;

  PseSettings settings;
};

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "algorithms/population_search.h"

namespace mirevo {

/// Population Simplex Evolution: the moves of SCE on one population without complexes, a whole generation in one batch.
///
/// A loop, one generation, makes an offspring of every point u of the population. It draws q − 1 distinct points better
/// than u, better ones more often (for the few best, of which there are too few, any others); with their centroid g the
/// offspring is
///   with `reflectionProbability` the reflection g − a·(u − g), which takes u's place when better;
///   with `contractionProbability` the contraction g + c·(u − g), which takes u's place when better;
///   else a mutation, a random point of the simplex's box widened by a twentieth of its width on either side, always
///   taken but for the best point, which it takes the place of only when better: it keeps the population from
///   collapsing too soon.
/// Coordinates outside the bounds are reflected at them. a and c are those of SCE. The best point never worsens.
/// With a surrogate model the most promising of several offspring of every point is run; where the model fitted around
/// the best point predicts least is run in place of the worst point's. What the alternatives cost is measured in
/// docs/algorithms/pse.md and docs/algorithms/surrogate.md.
class Pse final : public PopulationSearch {
 public:
  Pse(const PseSettings& settings, const SimplexSettings& simplex, SearchProblem problem);

 private:
  struct Offspring {
    ParameterSet set;
    std::size_t parent = 0;  ///< place of u in the population
    bool isMutation = false;
  };

  bool areSettingsValid() const override;
  std::size_t populationSize() const override { return static_cast<std::size_t>(settings_.populationSize); }
  void makeLoop() override;

  std::vector<std::size_t> drawOthers(std::size_t parent);
  Offspring makeOffspring(std::size_t parent);
  Offspring mostPromisingOffspring(std::size_t parent);
  void replaceParents(std::span<const Offspring> offspring, std::span<const ParameterSet> proposals);

  PseSettings settings_;
  SimplexSettings simplex_;
};

}  // namespace mirevo

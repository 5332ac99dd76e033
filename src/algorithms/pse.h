#pragma once

#include <cstddef>

#include "algorithms/population_search.h"

namespace mirevo {

/// Population Simplex Evolution: the moves of SCE on one population without complexes, in large batches.
///
/// A loop, one generation, makes N offspring for a population of N, in four batches of a quarter each. Every offspring
/// draws a simplex of q distinct points, better points more often, and is to take the place of its worst point u; with
/// the centroid g of the others it is
///   with `reflectionProbability` the reflection g − a·(u − g), taken when better than u;
///   with `contractionProbability` the contraction g + c·(u − g), taken when better than u;
///   else a mutation, a random point of the simplex's box widened by a twentieth of its width on either side, always
///   taken: it keeps the population from collapsing too soon.
/// Coordinates outside the bounds are reflected at them. a and c are those of SCE. As u is never the best point, the
/// best point never worsens. What the alternatives cost is measured in docs/algorithms/pse.md.
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

  void makeBatch(std::size_t count);
  Offspring makeOffspring();

  PseSettings settings_;
  SimplexSettings simplex_;
};

}  // namespace mirevo

#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "algorithms/searches/population_method.h"
#include "algorithms/searches/population_search.h"

namespace mirevo {

struct PseSettings {
  std::int32_t populationSize = 50;
  double reflectionProbability = 0.7;   ///< of the move that is due, at first a reflection
  double contractionProbability = 0.0;  ///< of an immediate contraction; the remainder to 1 is that of an immediate
                                        ///< mutation
  double expansionShare = 0.0;          ///< of the reflections those that are expansions
};

/// The moves of Population Simplex Evolution: how a point of the population gets an offspring, and what becomes of it.
/// When offspring are made and evaluated is left to the searches that derive from this.
///
/// The best q − 1 points stay as they are; every other point u has an offspring, and the q − 1 worst have two. For
/// each, q − 1 distinct points better than u are drawn, the i-th best of the population's N with a probability
/// proportional to N + 1 − i, as SCE draws those of a simplex of which u is the worst. Let g be their centroid. The
/// step of a point, spread over its offspring, is
///   the reflection g − a·(u − g); when it has failed the contraction g + c·(u − g); when both have failed a mutation,
///   accepted even if worse: u is stuck.
/// A mutation that is due is made. Otherwise the reflection or contraction that is due is made with
/// `reflectionProbability`, an immediate contraction with `contractionProbability`, and an immediate mutation with the
/// remaining probability. Of the reflections a share of `expansionShare` goes farther, as the expansion of Nelder and
/// Mead (1965), doi:10.1093/comjnl/7.4.308, does, but without a reflection before it; one outside the bounds or the
/// constraints is a reflection after all. The offspring replaces u if it is better. A new point begins a step. A
/// mutation is normally distributed about g, independently in every parameter, which restores the directions that the
/// linear moves lose. It also replaces a reflection outside the bounds. A reflection that violates a constraint is
/// halved once, and then a mutation replaces it; a contraction is drawn back towards g, or u if g violates one, too; a
/// mutation is drawn again. c is that of SCE, a is 1.1 times that of SCE. What the alternatives cost is measured in
/// docs/algorithms/pse.md.
class PseMoves : public PopulationSearch {
 protected:
  struct Offspring {
    ParameterSet set;
    std::size_t parent = 0;      ///< index of u in the population
    int failedMoves = 0;         ///< in the parent's step, if this offspring fails
    bool isTakenAnyway = false;  ///< accepted even if worse than u
  };

  PseMoves(const PseSettings& settings, const SimplexSettings& simplex, SearchProblem problem);

  /// The parents of N offspring, best first: indices in the population, which is sorted best first.
  std::vector<std::size_t> chooseParents() const;
  /// Of the parent with this index, from the population as it is, sorted best first.
  Offspring makeOffspring(std::size_t parent);
  /// Puts the offspring in the place of its parent if it is accepted; returns whether it is. Otherwise the parent's
  /// move has failed. `isReplaced`: the parent has been replaced since the offspring was made, whose move then was not
  /// that of the point which is there now.
  bool settle(const Offspring& child, EvaluationResult result, bool isReplaced);

  bool areSettingsValid() const override;

 private:
  std::size_t populationSize() const override { return static_cast<std::size_t>(settings_.populationSize); }

  std::vector<std::size_t> drawOthers(std::size_t parent);
  ParameterSet reflection(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g);
  std::optional<ParameterSet> rayPoint(std::size_t parent, std::span<const double> g, double length);
  ParameterSet mutation(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g);
  ParameterSet drawMutation(std::span<const std::size_t> simplex, const Box& box, std::span<const double> g);

  PseSettings settings_;
  SimplexSettings simplex_;
};

}  // namespace mirevo

#pragma once

#include <cstddef>
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
};

/// Population Simplex Evolution: the step of SCE made by all points of one population at once, a whole generation in
/// one batch.
///
/// A loop, one generation, makes as many offspring as the population has points. The best q − 1 points stay as they
/// are; every other point u has an offspring, and the q − 1 worst have two. For each, q − 1 distinct points better than
/// u are drawn, the i-th best of the population's N with a probability proportional to N + 1 − i, as SCE draws those of
/// a simplex of which u is the worst. Let g be their centroid. The step of a point, spread over generations, is
///   the reflection g − a·(u − g); when it has failed the contraction g + c·(u − g); when both have failed a mutation,
///   accepted even if worse: u is stuck.
/// A mutation that is due is made. Otherwise the reflection or contraction that is due is made with
/// `reflectionProbability`, an immediate contraction with `contractionProbability`, and an immediate mutation with the
/// remaining probability. The offspring replaces u if it is better. A new point begins a step. A mutation is normally
/// distributed about g, independently in every parameter, which restores the directions that the linear moves lose. It
/// also replaces a reflection outside the bounds. A reflection that violates a constraint is halved once, and then a
/// mutation replaces it; a contraction is drawn back towards g, or u if g violates one, too; a mutation is drawn again.
/// c is that of SCE, a is 1.1 times that of SCE. With a surrogate model the most promising of several offspring of a
/// point is run, and a quarter of the generation goes to the points where the model predicts the lowest values around
/// each of the best points. What the alternatives cost is measured in docs/algorithms/pse.md and
/// docs/algorithms/surrogate.md.
class Pse final : public PopulationSearch {
 public:
  Pse(const PseSettings& settings, const SimplexSettings& simplex, SearchProblem problem);

 private:
  struct Offspring {
    ParameterSet set;
    std::size_t parent = 0;      ///< index of u in the population
    int failedMoves = 0;         ///< in the parent's step, if this offspring fails
    bool isTakenAnyway = false;  ///< accepted even if worse than u
  };

  bool areSettingsValid() const override;
  std::size_t populationSize() const override { return static_cast<std::size_t>(settings_.populationSize); }
  void makeLoop() override;

  std::vector<std::size_t> chooseParents() const;
  std::vector<std::size_t> drawOthers(std::size_t parent);
  Offspring makeOffspring(std::size_t parent);
  Offspring mostPromisingOffspring(std::size_t parent);
  ParameterSet reflection(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g);
  ParameterSet mutation(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g);
  ParameterSet drawMutation(std::span<const std::size_t> simplex, const Box& box, std::span<const double> g);
  void proposePredictedMinima(std::vector<Offspring>& offspring);
  void replaceParents(std::span<const Offspring> offspring, std::span<const ParameterSet> proposals);

  PseSettings settings_;
  SimplexSettings simplex_;
};

/// PSE as a setup selects it.
class PseMethod final : public PopulationMethod {
 public:
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

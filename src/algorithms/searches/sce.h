#pragma once

#include <vector>

#include "algorithms/searches/population_method.h"
#include "algorithms/searches/population_search.h"

namespace mirevo {

struct SceSettings {
  std::int32_t complexCount = 2;
  std::int32_t pointsPerComplex = 5;
  std::int32_t evolutionSteps = 5;    ///< per complex and shuffling loop
  bool usesPublishedFactors = false;  ///< a = 1 and c = 1/2, as in the paper
};

/// Shuffled Complex Evolution after Duan, Sorooshian and Gupta (1992), doi:10.1029/91WR02985, and (1993),
/// doi:10.1007/BF00939380.
///
/// The p·m points, sorted best first, are dealt into p complexes of m points: complex k takes ranks k, k + p, k + 2p
/// and so on. Every complex makes the same number of evolution steps on its own, then the complexes are shuffled
/// together. A step draws q points, better points more often, and moves the worst of them, u, with the centroid g of
/// the others:
///   reflection g − a·(u − g), accepted if better than u (outside the bounds, a random point of the box of the complex
///   replaces it); else contraction g + c·(u − g), accepted if better than u; else a random point of the box of the
///   complex, always accepted unless its evaluation failed.
/// A reflection that violates a constraint is halved, at most twice, and then a random point replaces it; a contraction
/// is drawn back towards g, or u if g violates one, too; a random point is drawn again. The paper has a = 1 and c =
/// 1/2, which can be selected. Here a = 0.75 + 0.5/n (at most 1) and c = 0.45 − 0.1/n, which needs about a seventh
/// fewer evaluations on the test functions (docs/algorithms/sce.md). With a surrogate model a complex looks at
/// reflections and contractions of several subcomplexes, runs the most promising one first and its counterpart next,
/// and of several random points runs the most promising. In every step the complex that holds the best point of the
/// loop first proposes the point where the model predicts the lowest value around its own best point. Complexes are
/// independent of each other between two shuffles and advance together: the batch of a step holds the current proposal
/// of every complex. Points, values and random numbers do not depend on how the batch is run.
class Sce final : public PopulationSearch {
 public:
  Sce(const SceSettings& settings, const SimplexSettings& simplex, SearchProblem problem);

 private:
  /// The worst point of q points drawn from a complex, and the centroid of the others.
  struct Subcomplex {
    std::size_t worst = 0;         ///< index of u in the complex
    std::vector<double> centroid;  ///< g
  };
  /// The points of one complex, best first, and the step that it is making.
  struct Complex {
    Population points;
    Subcomplex current;
    ParameterSet first;             ///< reflection, or contraction where a surrogate model prefers it
    ParameterSet second;            ///< the other of the two
    bool isFirstPredicted = false;  ///< whether `first` is the minimum predicted by a surrogate model
    bool isMoved = false;           ///< whether this step has replaced a point
  };
  /// A way to propose a point to replace u; the step tries them one after the other.
  using Proposal = ParameterSet (Sce::*)(const Complex&);
  enum class Acceptance { whenBetter, always };

  bool areSettingsValid() const override;
  std::size_t populationSize() const override;
  void makeLoop() override;

  void dealIntoComplexes();
  void makeEvolutionStep();
  void shuffle();

  Subcomplex drawSubcomplex(const Complex& complex);
  void chooseSubcomplex(Complex& complex);
  void proposePredictedMinimum(Complex& complex);
  void tryProposals(Proposal propose, Acceptance acceptance);
  ParameterSet firstProposal(const Complex& complex) { return complex.first; }
  ParameterSet secondProposal(const Complex& complex) { return complex.second; }
  double reflectionLength() const;
  double contractionLength() const;
  ParameterSet reflection(const Complex& complex);
  ParameterSet contraction(const Complex& complex);
  ParameterSet mutation(const Complex& complex);
  ParameterSet randomPoint(const Complex& complex);

  SceSettings settings_;
  SimplexSettings simplex_;
  std::vector<Complex> complexes_;
};

/// SCE as a setup selects it.
class SceMethod final : public SimplexMethod {
 public:
  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::vector<SearchAdvice> advice(std::size_t n) const override;
  std::int64_t populationSize() const override;
  double evaluationsPerLoop() const override;
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;

  SceSettings settings;
};

}  // namespace mirevo

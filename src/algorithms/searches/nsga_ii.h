#pragma once

#include <cstdint>
#include <memory>
#include <string_view>
#include <utility>
#include <vector>

#include "algorithms/searches/pareto_search.h"
#include "algorithms/searches/population_method.h"

namespace mirevo {

/// The defaults are those of the publication.
struct NsgaIiSettings {
  std::int32_t populationSize = 100;
  double crossoverProbability = 0.9;
  double crossoverIndex = 20.0;      ///< η_c: the larger, the nearer to their parents are the children
  double mutationProbability = 0.0;  ///< of each parameter; 0: 1/n
  double mutationIndex = 20.0;       ///< η_m: the larger, the smaller are mutations
};

/// NSGA-II: Deb, Pratap, Agarwal and Meyarivan (2002), doi:10.1109/4235.996017. A loop is one generation, all of it one
/// batch: parents by binary tournaments with the crowded comparison, simulated binary crossover, polynomial mutation;
/// of parents and children the better ones by rank, and in the last rank by crowding distance, are the next population.
///
/// What the paper leaves open: every member has the same number of tournaments, pairs being drawn without repetition
/// until all members have had theirs. Differs from it in two ways: a child that equals a parent gets one more mutation,
/// as it would tell nothing, and a child that cannot be run is made again and finally drawn back towards its parent.
class NsgaIi final : public ParetoSearch {
 public:
  NsgaIi(const NsgaIiSettings& settings, const ParetoSettings& pareto, SearchProblem problem);

  SearchStatus initialise() override;
  SearchStatus advance() override;

 private:
  using Pair = std::pair<ParameterSet, ParameterSet>;

  bool areSettingsValid() const;
  double mutationProbability() const;
  std::vector<ParameterSet> makeChildren();
  const ParameterSet& drawParent();
  Pair makePair(const ParameterSet& first, const ParameterSet& second);
  void mutate(ParameterSet& set);
  void mutateOne(ParameterSet& set, std::size_t j);
  /// Whether member `a` of the population is ahead of `b` by rank and then by crowding.
  bool isAhead(std::size_t a, std::size_t b) const;
  void selectPopulation(std::vector<ParetoPoint> points);
  void noteSpread();

  NsgaIiSettings settings_;
  std::vector<int> ranks_;         ///< of the members of the population
  std::vector<double> crowding_;   ///< likewise
  std::vector<std::size_t> pool_;  ///< members that wait for a tournament
};

/// The children of two values of a parameter by simulated binary crossover within bounds (Deb 2000,
/// doi:10.1016/S0045-7825(99)00389-8), the lesser first; `deviate` in (0, 1).
std::pair<double, double> simulatedBinaryCrossover(double a, double b, double lower, double upper, double index,
                                                   double deviate);

/// The value after a polynomial mutation within bounds (same paper).
double polynomialMutation(double value, double lower, double upper, double index, double deviate);

/// NSGA-II as a setup selects it.
class NsgaIiMethod final : public PopulationMethod {
 public:
  static constexpr ParetoRefusals kRefusals{
      "Error: No. of evaluations of the hypervolume criterion in NSGA-II algorithm invalid",
      "Error: Hypervolume convergence criterion in NSGA-II algorithm invalid"};

  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::vector<SearchAdvice> advice(std::size_t n) const override;
  std::int64_t populationSize() const override { return settings.populationSize; }
  double evaluationsPerLoop() const override { return settings.populationSize; }
  /// With the test of the hypervolume, this begins anew: a search that it has ended goes on.
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const override;
  const ParetoSettings* paretoSettings() const override { return &pareto; }
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;

  NsgaIiSettings settings;
  ParetoSettings pareto;
};

}  // namespace mirevo

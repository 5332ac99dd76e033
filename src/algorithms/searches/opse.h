#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <vector>

#include "algorithms/searches/pse_keywords.h"
#include "algorithms/searches/pse_moves.h"

namespace mirevo {

struct OpseSettings : PseSettings {
  std::int32_t setsInFlight = 25;  ///< W, at least 1
};

/// Overlapping Population Simplex Evolution: the moves of PSE without the barrier between its generations. W sets are
/// in flight, submitted and their results not taken. Results are taken in the order of submission alone, and every one
/// that is taken makes room for the next offspring, made from the population with the results taken so far. So a set is
/// proposed from the results of all sets up to W before it, whatever the order in which model runs end: the search
/// depends on its settings and its random numbers, and on neither the number of slots nor their speed.
///
/// What differs from PSE: parents are chosen for one pass after the other over the population, each as PSE chooses
/// those of a generation, but an offspring is made when its turn comes; a result counts as soon as it is taken. A loop
/// is N results, N being the size of the population. The initial sample is one batch, as the scale of the objective
/// functions may depend on all of it. When a stopping test ends the search, what is in flight is still taken. What W
/// costs is measured in docs/algorithms/opse.md.
class Opse final : public PseMoves {
 public:
  Opse(const OpseSettings& settings, const SimplexSettings& simplex, SearchProblem problem);

 private:
  /// Where a point of the population is and what replaced it: offspring in flight, and parents whose turn has yet to
  /// come, are known by their seat, as places change with every point that is replaced.
  struct Seat {
    std::size_t place = 0;         ///< index in the population, which is kept sorted best first
    std::size_t replacements = 0;  ///< how often its point has been replaced
  };
  struct InFlight {
    Offspring child;
    std::size_t seat = 0;          ///< of its parent
    std::size_t replacements = 0;  ///< of the seat when it was made
  };

  bool areSettingsValid() const override { return settings_.setsInFlight >= 1 && PseMoves::areSettingsValid(); }
  void makeLoop() override;
  void finish() override;

  void seatPopulation();
  void fillWindow();
  std::size_t nextParent();
  void takeFirst();
  void moveToItsPlace(std::size_t place);
  void swapPlaces(std::size_t a, std::size_t b);

  OpseSettings settings_;
  std::vector<Seat> seats_;
  std::vector<std::size_t> seatAt_;  ///< by place
  std::deque<std::size_t> parents_;  ///< seats whose turn comes in this pass, in order
  std::deque<InFlight> inFlight_;    ///< in the order of submission
};

/// OPSE as a setup selects it.
class OpseMethod final : public SimplexMethod {
 public:
  static const PseRefusals kRefusals;

  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::vector<SearchAdvice> advice(std::size_t n) const override;
  std::int64_t populationSize() const override { return settings.populationSize; }
  double evaluationsPerLoop() const override { return settings.populationSize; }
  std::int64_t mostAtOnce() const override { return std::max(settings.populationSize, settings.setsInFlight); }
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;

  OpseSettings settings;
};

}  // namespace mirevo

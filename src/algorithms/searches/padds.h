#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <vector>

#include "algorithms/searches/dds.h"
#include "algorithms/searches/pareto_search.h"

namespace mirevo {

/// By what the member of the front that is perturbed is drawn.
enum class PaddsSelection : std::int32_t { hypervolume, crowding, random };
inline constexpr CodeName kPaddsSelectionNames[] = {
    {std::nullopt, "hypervolume"}, {std::nullopt, "crowding"}, {std::nullopt, "random"}};

struct PaddsSettings {
  double perturbation = 0.2;  ///< neighbourhood size r, as a fraction of a parameter's range
  int candidates = 1;         ///< that may be under way at a time
  PaddsSelection selection = PaddsSelection::hypervolume;
};

/// Pareto Archived Dynamically Dimensioned Search: Asadzadeh and Tolson (2013), doi:10.1080/0305215X.2012.748046. A
/// candidate is a set of the front perturbed as DDS does, ever fewer parameters as the budget is used up. A set that
/// has joined the front is perturbed next; otherwise one is drawn from the front with a probability proportional to
/// what it contributes to the hypervolume, or to its crowding distance, or all alike. With several candidates at a time
/// they are taken in the order in which they were made: what a candidate is made from depends on those taken before it
/// was made, never on time.
///
/// What the paper leaves open: the hypervolume is that of the front scaled to 0 to 1, up to
/// FrontScale::kUsualReference; by crowding the ends of the front weigh as much as the largest distance between them.
/// With three or more objectives the set is drawn among kMostDrawn spread over the front, by hypervolume at most
/// mostPointsOfHypervolume(), which bounds the time with many objectives. Candidates that are under way at an end by
/// the hypervolume belong to the search. What differs of the perturbation is said at Dds. A raised budget begins the
/// decrease anew, with the front as it is.
class Padds final : public ParetoSearch {
 public:
  Padds(const PaddsSettings& settings, const ParetoSettings& pareto, SearchProblem problem);

  SearchStatus initialise() override;
  SearchStatus advance() override;

  static constexpr std::size_t kMostDrawn = 100;

 private:
  std::vector<ParameterSet> startPoints();
  /// The number of the last evaluation before which candidates are made in the current search, and its whole budget.
  EarlierSearch searchAt(int evaluation) const;
  ParameterSet drawCandidate(int evaluation);
  ParameterSet drawOrigin();
  void drawWeights();
  void takeFirst();
  int madeCount() const { return summary_.evaluationCount + static_cast<int>(underWay_.size()); }

  PaddsSettings settings_;
  std::deque<ParameterSet> underWay_;  ///< submitted and not taken, in order
  std::deque<ParameterSet> joined_;    ///< joined the front and were not perturbed yet, in order
  std::vector<std::size_t> drawable_;  ///< members of the front that may be drawn
  std::vector<double> weights_;        ///< of these; empty when the front has changed
};

/// PADDS as a setup selects it.
class PaddsMethod final : public DdsMethod {
 public:
  static constexpr ParetoRefusals kRefusals{
      "Error: No. of evaluations of the hypervolume criterion in PADDS algorithm invalid",
      "Error: Hypervolume convergence criterion in PADDS algorithm invalid"};

  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::string_view budgetRefusal() const override;
  std::int64_t mostAtOnce() const override { return settings.candidates; }
  /// As that of DDS, but the front goes on.
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const override;
  const ParetoSettings* paretoSettings() const override { return &pareto; }
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;
  SearchSummary run(SearchProblem problem, const PeriodicStep& periodicStep) const override;

  PaddsSelection selection = PaddsSelection::hypervolume;
  ParetoSettings pareto;
};

}  // namespace mirevo

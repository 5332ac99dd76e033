#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <vector>

#include "algorithms/searches/feasible_points.h"
#include "algorithms/searches/population.h"
#include "algorithms/searches/search_algorithm.h"
#include "algorithms/searches/search_problem.h"
#include "algorithms/searches/stopping_criteria.h"

namespace mirevo {

struct PredictedMinimum;

/// Statuses of a search step.
inline constexpr SearchStatus kSearchSettingsInvalid = 1;
inline constexpr SearchStatus kSearchNotInitialised = 2;

/// What SCE, PSE and OPSE have in common: the initial sample, the batches within the evaluation budget, the stopping
/// tests and the summary. The budget is never exceeded: a batch is cut to what is left of it, in the order of its
/// proposals.
class PopulationSearch : public SearchAlgorithm {
 public:
  SearchStatus initialise() final;
  SearchStatus advance() final;
  bool isTerminated() const final { return stopping_.isMet(); }
  const SearchSummary& summary() const final { return summary_; }

  /// Best first.
  const Population& population() const { return population_; }

 protected:
  explicit PopulationSearch(SearchProblem problem);

  virtual bool areSettingsValid() const = 0;
  virtual std::size_t populationSize() const = 0;
  /// Makes one loop over `population_`, which is sorted best first before the call and need not be afterwards.
  virtual void makeLoop() = 0;
  /// Takes what is still evaluated when the search ends.
  virtual void finish() {}

  /// Evaluates proposals in one batch. The results are in the order of the proposals; empty for a proposal that was not
  /// run because the budget is used up.
  std::vector<std::optional<EvaluationResult>> evaluate(std::span<const ParameterSet> proposals);
  /// Hands over a proposal that is evaluated beside those submitted before; setsLeft() must not be 0.
  void submit(const ParameterSet& proposal);
  /// The result of the proposal that was submitted first of those not taken yet.
  EvaluationResult awaitFirst();
  /// What is left of the budget when all that is submitted has been evaluated.
  int setsLeft() const { return problem_.stopping.maxEvaluations - summary_.evaluationCount - submittedCount_; }
  /// How many proposals the search should make for each one that is evaluated: more than one where a surrogate model
  /// chooses among them.
  std::size_t proposalsPerRun() const;
  /// Indices of the `count` most promising proposals, in ascending order.
  std::vector<std::size_t> mostPromising(std::span<const ParameterSet> proposals, std::size_t count);
  /// The point where the surrogate model fitted around each of `centres` predicts the lowest value; left out where it
  /// has been run already. Empty if no surrogate model is in use.
  std::vector<PredictedMinimum> predictedMinima(std::span<const Individual> centres);
  bool isBudgetUsedUp() const { return summary_.evaluationCount >= problem_.stopping.maxEvaluations; }

  const SearchBounds& bounds() const { return problem_.bounds; }
  double draw() { return problem_.random.next(); }
  bool isWithinBounds(const ParameterSet& set) const;
  /// Puts a point that rounding may have carried past a bound back on it.
  ParameterSet clampedToBounds(ParameterSet set) const;
  /// A uniformly random point of a box.
  ParameterSet drawFrom(const Box& box) { return drawUniformly(box.lower, box.upper, problem_.random); }
  /// Every proposal passes one of these: FeasiblePoints::draw(), shortened() and drawnBack().
  ParameterSet drawFeasible(const std::function<ParameterSet()>& drawPoint, std::span<const double> origin) {
    return feasible_.draw(drawPoint, origin);
  }
  std::optional<ParameterSet> shortened(ParameterSet point, std::span<const double> origin, int mostHalvings) {
    return feasible_.shortened(std::move(point), origin, mostHalvings);
  }
  ParameterSet drawnBack(ParameterSet point, std::initializer_list<std::span<const double>> origins) {
    return clampedToBounds(feasible_.drawnBack(std::move(point), origins));
  }
  /// Indices of `count` distinct members among the best `size` of m = `ranked` members sorted best first, drawn one
  /// after the other, the i-th best with a probability proportional to m + 1 − i; returned in ascending order.
  std::vector<std::size_t> drawSimplex(std::size_t count, std::size_t size, std::size_t ranked);

  Population population_;

 private:
  bool isProblemValid() const;
  std::vector<EvaluationResult> run(std::span<const ParameterSet> sets, DispatchMode mode);
  bool isSelecting() const;
  void noteLoop();

  SearchProblem problem_;
  FeasiblePoints feasible_;
  StoppingTests stopping_;
  SearchSummary summary_;
  int submittedCount_ = 0;  ///< proposals that are submitted and not taken yet
};

}  // namespace mirevo

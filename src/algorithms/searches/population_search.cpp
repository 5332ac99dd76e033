#include "algorithms/searches/population_search.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <numeric>
#include <utility>

#include "algorithms/searches/initial_sample.h"
#include "algorithms/surrogate/proposal_selector.h"

namespace mirevo {

PopulationSearch::PopulationSearch(SearchProblem problem)
    : problem_(std::move(problem)), feasible_(problem_.feasibility), stopping_(problem_.stopping) {}

bool PopulationSearch::isProblemValid() const {
  const SearchBounds& b = problem_.bounds;
  const std::size_t n = b.size();
  if (n == 0 || b.upper.size() != n || b.initial.size() != n || problem_.stopping.maxEvaluations <= 0) return false;
  for (std::size_t j = 0; j < n; ++j) {
    if (!std::isfinite(b.lower[j]) || !std::isfinite(b.upper[j]) || !(b.lower[j] <= b.upper[j])) return false;
  }
  return true;
}

SearchStatus PopulationSearch::initialise() {
  if (!isProblemValid() || !areSettingsValid()) return kSearchSettingsInvalid;
  const std::size_t count = std::min(populationSize(), static_cast<std::size_t>(problem_.stopping.maxEvaluations));
  std::vector<ParameterSet> sample =
      drawInitialSample(problem_.initialSample, problem_.givenSample, problem_.bounds, count, problem_.random);
  feasible_.replaceInSample(sample, givenSetCount(problem_.initialSample, problem_.givenSample.size(), count),
                            problem_.bounds, problem_.random);
  std::vector<EvaluationResult> results = run(sample, DispatchMode::task);
  problem_.evaluator.settleAggregates(results);
  for (std::size_t i = 0; i < count && problem_.selector; ++i) problem_.selector->note(sample[i], results[i]);
  population_.clear();
  population_.reserve(2 * count);
  for (std::size_t i = 0; i < count; ++i) {
    population_.push_back({std::move(sample[i]), std::move(results[i])});
  }
  sortBestFirst(population_);
  noteLoop();
  return kSearchOk;
}

SearchStatus PopulationSearch::advance() {
  if (population_.empty()) return kSearchNotInitialised;
  if (!isBudgetUsedUp()) makeLoop();
  sortBestFirst(population_);
  ++summary_.loopCount;
  noteLoop();
  stopping_.update(population_.front().value(), summary_.evaluationCount, summary_.populationRange);
  summary_.terminationMessage = stopping_.message();
  summary_.notes = stopping_.reasons();
  if (!isTerminated() || submittedCount_ == 0) return kSearchOk;
  finish();
  sortBestFirst(population_);
  noteLoop();
  return kSearchOk;
}

/// Updates the summary from the sorted population.
void PopulationSearch::noteLoop() {
  summary_.populationSpread = populationSpread(population_, static_cast<int>(problem_.bounds.size()));
  summary_.populationRange = normalisedPopulationRange(population_, problem_.bounds);
  summary_.replacedCount = feasible_.replacedCount();
  summary_.returnedCount = feasible_.returnedCount();
  const Individual& best = population_.front();
  if (summary_.best.empty() || isBetter(best.value(), summary_.bestResult.aggregate)) {
    summary_.best = best.set;
    summary_.bestResult = best.result;
  }
}

std::vector<EvaluationResult> PopulationSearch::run(std::span<const ParameterSet> sets, DispatchMode mode) {
  if (sets.empty()) return {};
  std::vector<EvaluationResult> results = problem_.evaluator.evaluateParameterSets(sets, mode);
  assert(results.size() == sets.size());
  summary_.evaluationCount += static_cast<int>(sets.size());
  return results;
}

std::vector<std::optional<EvaluationResult>> PopulationSearch::evaluate(std::span<const ParameterSet> proposals) {
  std::vector<std::optional<EvaluationResult>> results(proposals.size());
  const int left = std::max(0, problem_.stopping.maxEvaluations - summary_.evaluationCount);
  const std::size_t count = std::min(proposals.size(), static_cast<std::size_t>(left));
  const DispatchMode mode = isSelecting() ? DispatchMode::surrogateSelected : DispatchMode::task;
  std::vector<EvaluationResult> made = run(proposals.first(count), mode);
  for (std::size_t i = 0; i < made.size() && problem_.selector; ++i) problem_.selector->note(proposals[i], made[i]);
  for (std::size_t i = 0; i < made.size(); ++i) results[i] = std::move(made[i]);
  return results;
}

void PopulationSearch::submit(const ParameterSet& proposal) {
  assert(setsLeft() > 0);
  problem_.evaluator.submit({&proposal, 1});
  ++submittedCount_;
}

EvaluationResult PopulationSearch::awaitFirst() {
  EvaluationResult result = problem_.evaluator.awaitFirst();
  --submittedCount_;
  ++summary_.evaluationCount;
  return result;
}

bool PopulationSearch::isSelecting() const {
  return problem_.selector != nullptr && problem_.selector->isActive(summary_.loopCount);
}

std::size_t PopulationSearch::proposalsPerRun() const {
  return isSelecting() ? problem_.selector->proposalsPerRun() : 1;
}

std::vector<std::size_t> PopulationSearch::mostPromising(std::span<const ParameterSet> proposals, std::size_t count) {
  if (isSelecting()) return problem_.selector->select(proposals, count);
  std::vector<std::size_t> places(std::min(count, proposals.size()));
  std::iota(places.begin(), places.end(), std::size_t{0});
  return places;
}

std::vector<PredictedMinimum> PopulationSearch::predictedMinima(std::span<const Individual> centres) {
  if (!isSelecting()) return {};
  std::vector<ParameterSet> sets;
  for (const Individual& centre : centres) sets.push_back(centre.set);
  return problem_.selector->minima(sets);
}

bool PopulationSearch::isWithinBounds(const ParameterSet& set) const {
  for (std::size_t j = 0; j < set.size(); ++j) {
    if (!(set[j] >= problem_.bounds.lower[j] && set[j] <= problem_.bounds.upper[j])) return false;
  }
  return true;
}

ParameterSet PopulationSearch::clampedToBounds(ParameterSet set) const {
  for (std::size_t j = 0; j < set.size(); ++j) {
    set[j] = std::clamp(set[j], problem_.bounds.lower[j], problem_.bounds.upper[j]);
  }
  return set;
}

std::vector<std::size_t> PopulationSearch::drawSimplex(std::size_t count, std::size_t size, std::size_t ranked) {
  assert(count <= size && size <= ranked);
  // Members that have been drawn get weight 0. All sums are of integers and therefore exact.
  std::vector<double> weights(size);
  for (std::size_t i = 0; i < size; ++i) weights[i] = static_cast<double>(ranked - i);
  double total = std::accumulate(weights.begin(), weights.end(), 0.0);
  std::vector<std::size_t> places;
  places.reserve(count);
  while (places.size() < count) {
    double rest = draw() * total;
    std::size_t place = 0;
    while (rest >= weights[place]) rest -= weights[place++];
    total -= weights[place];
    weights[place] = 0.0;
    places.push_back(place);
  }
  std::sort(places.begin(), places.end());
  return places;
}

}  // namespace mirevo

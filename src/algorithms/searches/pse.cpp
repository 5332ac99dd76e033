#include "algorithms/searches/pse.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "algorithms/surrogate/proposal_selector.h"

namespace mirevo {
namespace {

/// With a surrogate model, the number of points of the population for each predicted minimum that is run.
constexpr std::size_t kPointsPerMinimum = 4;

}  // namespace

Pse::Pse(const PseSettings& settings, const SimplexSettings& simplex, SearchProblem problem)
    : PseMoves(settings, simplex, std::move(problem)) {}

void Pse::makeLoop() {
  std::vector<Offspring> offspring;
  for (const std::size_t parent : chooseParents()) offspring.push_back(mostPromisingOffspring(parent));
  proposePredictedMinima(offspring);
  std::vector<ParameterSet> proposals;
  proposals.reserve(offspring.size());
  for (const Offspring& child : offspring) proposals.push_back(child.set);
  replaceParents(offspring, proposals);
}

/// With a surrogate model, the minima that it predicts around each of the best points replace offspring at positions
/// spread evenly over the generation: if they replaced those of the worst points, these would hardly ever move. A
/// minimum replaces the point around which it was predicted if it is better, so that the population stays spread.
void Pse::proposePredictedMinima(std::vector<Offspring>& offspring) {
  const std::size_t most = std::max(population_.size() / kPointsPerMinimum, std::size_t{1});
  std::vector<PredictedMinimum> minima = predictedMinima(std::span(population_).first(most));
  for (std::size_t k = 0; k < minima.size(); ++k) {
    offspring[k * offspring.size() / minima.size()] = {std::move(minima[k].set), minima[k].centre};
  }
}

/// The choice is among the offspring of one point, not of the whole population, whose most promising offspring are
/// close together.
Pse::Offspring Pse::mostPromisingOffspring(std::size_t parent) {
  std::vector<Offspring> drawn;
  std::vector<ParameterSet> proposals;
  for (std::size_t i = 0; i < proposalsPerRun(); ++i) {
    drawn.push_back(makeOffspring(parent));
    proposals.push_back(drawn.back().set);
  }
  return std::move(drawn[mostPromising(proposals, 1).front()]);
}

void Pse::replaceParents(std::span<const Offspring> offspring, std::span<const ParameterSet> proposals) {
  std::vector<std::optional<EvaluationResult>> results = evaluate(proposals);
  std::vector<bool> isReplaced(population_.size(), false);
  for (std::size_t i = 0; i < proposals.size(); ++i) {
    const Offspring& child = offspring[i];
    if (results[i] && settle(child, std::move(*results[i]), isReplaced[child.parent])) isReplaced[child.parent] = true;
  }
}

constexpr PseRefusals PseMethod::kRefusals{
    .population = "Error: Population size in PSE algorithm invalid",
    .simplex = "Error: No. of points in a simplex in PSE algorithm invalid",
    .reflection = "Error: Probability for reflection step in PSE algorithm invalid",
    .contraction = "Error: Probability for contraction step in PSE algorithm invalid",
    .expansion = "Error: Probability for expansion step in PSE algorithm invalid",
    .sum = "Error: Sum of probabilities for reflection and contraction in PSE algorithm larger than 1"};

const SearchFacts& PseMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {1, "PSE"},
                                      .longName = "Population Simplex Evolution",
                                      .runsInParallel = true,
                                      .usesSurrogate = true,
                                      .drawsInitialSample = true,
                                      .needsRanges = true,
                                      .populationKeywords = kPopulationKeyword};
  return kFacts;
}

BoundSection PseMethod::section() {
  static const SettingSection<PseMethod> section{{"OPTIMISATION_ALGORITHM/PSE_CONTROL_PARAMETERS",
                                                  "when `Algorithm_Type` is 1", "Population Simplex Evolution.",
                                                  pseKeywordRows<PseMethod>()}};
  return {section, *this};
}

std::vector<SearchAdvice> PseMethod::advice(std::size_t n) const {
  return pseAdvice(settings.populationSize, simplex.pointCount, n);
}

double PseMethod::loopsBefore(double sets) const {
  return std::ceil(sets / static_cast<double>(settings.populationSize)) - 1.0;
}

std::unique_ptr<SearchAlgorithm> PseMethod::make(SearchProblem problem) const {
  return std::make_unique<Pse>(settings, simplex, std::move(problem));
}

}  // namespace mirevo

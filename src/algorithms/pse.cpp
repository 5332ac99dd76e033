#include "algorithms/pse.h"

#include <algorithm>
#include <utility>

namespace mirevo {
namespace {

constexpr std::size_t kBatchesPerGeneration = 4;
/// Of the width of the simplex's box, added on either side of it, so that a mutation can leave it.
constexpr double kBoxWidening = 0.05;

Box widened(Box box) {
  for (std::size_t j = 0; j < box.lower.size(); ++j) {
    const double margin = kBoxWidening * (box.upper[j] - box.lower[j]);
    box.lower[j] -= margin;
    box.upper[j] += margin;
  }
  return box;
}

}  // namespace

Pse::Pse(const PseSettings& settings, const SimplexSettings& simplex, SearchProblem problem)
    : PopulationSearch(std::move(problem)), settings_(settings), simplex_(simplex) {}

bool Pse::areSettingsValid() const {
  const double r = settings_.reflectionProbability;
  const double c = settings_.contractionProbability;
  return settings_.populationSize >= 1 && simplex_.pointCount >= 2 && simplex_.pointCount <= settings_.populationSize &&
         r >= 0.0 && c >= 0.0 && r + c <= 1.0;
}

void Pse::makeLoop() {
  const std::size_t size = population_.size();
  const std::size_t batch = (size + kBatchesPerGeneration - 1) / kBatchesPerGeneration;
  for (std::size_t made = 0; made < size && !isBudgetUsedUp(); made += batch) {
    makeBatch(std::min(batch, size - made));
    sortBestFirst(population_);
  }
}

void Pse::makeBatch(std::size_t count) {
  std::vector<Offspring> offspring;
  std::vector<ParameterSet> proposals;
  for (std::size_t i = 0; i < count * proposalsPerRun(); ++i) {
    offspring.push_back(makeOffspring());
    proposals.push_back(offspring.back().set);
  }
  const std::vector<std::size_t> chosen = mostPromising(proposals, count);
  for (std::size_t i = 0; i < chosen.size(); ++i) {
    offspring[i] = offspring[chosen[i]];
    proposals[i] = offspring[i].set;
  }
  proposals.resize(chosen.size());
  std::vector<std::optional<EvaluationResult>> results = evaluate(proposals);

  std::vector<bool> isReplaced(population_.size(), false);
  for (std::size_t i = 0; i < proposals.size(); ++i) {
    if (!results[i]) continue;
    const std::size_t place = offspring[i].parent;
    Individual& parent = population_[place];
    // A mutation never takes the place of a point that this batch has just found.
    const bool isTakenAnyway = offspring[i].isMutation && !isReplaced[place] && isUsable(*results[i]);
    if (!isTakenAnyway && !isBetter(results[i]->aggregate, parent.value())) continue;
    parent = {std::move(offspring[i].set), std::move(*results[i])};
    isReplaced[place] = true;
  }
}

Pse::Offspring Pse::makeOffspring() {
  const double move = draw();
  const std::vector<std::size_t> places =
      drawSimplex(static_cast<std::size_t>(simplex_.pointCount), population_.size());
  Offspring offspring;
  offspring.parent = places.back();
  const double ofReflection = settings_.reflectionProbability;
  if (move >= ofReflection + settings_.contractionProbability) {
    offspring.isMutation = true;
    offspring.set = reflectedAtBounds(drawFrom(widened(boundingBox(population_, places))));
    return offspring;
  }
  const std::size_t n = bounds().size();
  const std::vector<double> g = centroid(population_, std::span(places).first(places.size() - 1));
  const double factor = move < ofReflection ? -reflectionFactor(n) : contractionFactor(n);
  offspring.set = reflectedAtBounds(pointOnRay(g, population_[offspring.parent].set, factor));
  return offspring;
}

}  // namespace mirevo

#include "algorithms/pse.h"

#include <algorithm>
#include <utility>

namespace mirevo {
namespace {

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
  // Worst first: what a budget cuts off a generation are the proposals for its best points.
  std::vector<Offspring> offspring;
  for (std::size_t place = population_.size(); place-- > 0;) offspring.push_back(mostPromisingOffspring(place));
  if (std::optional<ParameterSet> minimum = predictedMinimum(population_.front())) {
    offspring.front() = {std::move(*minimum), population_.size() - 1, false};
  }
  std::vector<ParameterSet> proposals;
  proposals.reserve(offspring.size());
  for (const Offspring& child : offspring) proposals.push_back(child.set);
  replaceParents(offspring, proposals);
}

/// Each point's own offspring compete, not those of the whole population: the promising ones of all lie close together.
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
    if (!results[i]) continue;
    const std::size_t place = offspring[i].parent;
    Individual& parent = population_[place];
    // A mutation takes the place neither of the best point nor of one that this generation has just found.
    const bool isTakenAnyway = offspring[i].isMutation && place > 0 && !isReplaced[place] && isUsable(*results[i]);
    if (!isTakenAnyway && !isBetter(results[i]->aggregate, parent.value())) continue;
    parent = {proposals[i], std::move(*results[i])};
    isReplaced[place] = true;
  }
}

/// The other points of the simplex: better ones than the parent, which is one of the few best where there are too few.
std::vector<std::size_t> Pse::drawOthers(std::size_t parent) {
  const auto count = static_cast<std::size_t>(simplex_.pointCount) - 1;
  if (parent >= count) return drawSimplex(count, parent);
  std::vector<std::size_t> places = drawSimplex(count, population_.size() - 1);
  for (std::size_t& place : places) place += place >= parent ? 1 : 0;
  return places;
}

Pse::Offspring Pse::makeOffspring(std::size_t parent) {
  const double move = draw();
  std::vector<std::size_t> places = drawOthers(parent);
  Offspring offspring;
  offspring.parent = parent;
  const double ofReflection = settings_.reflectionProbability;
  if (move >= ofReflection + settings_.contractionProbability) {
    offspring.isMutation = true;
    places.push_back(parent);
    offspring.set = reflectedAtBounds(drawFrom(widened(boundingBox(population_, places))));
    return offspring;
  }
  const std::size_t n = bounds().size();
  const double factor = move < ofReflection ? -reflectionFactor(n) : contractionFactor(n);
  offspring.set = reflectedAtBounds(pointOnRay(centroid(population_, places), population_[parent].set, factor));
  return offspring;
}

}  // namespace mirevo

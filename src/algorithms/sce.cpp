#include "algorithms/sce.h"

#include <algorithm>
#include <utility>

namespace mirevo {
Sce::Sce(const SceSettings& settings, const SimplexSettings& simplex, SearchProblem problem)
    : PopulationSearch(std::move(problem)), settings_(settings), simplex_(simplex) {}

bool Sce::areSettingsValid() const {
  return settings_.complexCount >= 1 && settings_.pointsPerComplex >= 2 && settings_.evolutionSteps >= 1 &&
         simplex_.pointCount >= 2 && simplex_.pointCount <= settings_.pointsPerComplex;
}

std::size_t Sce::populationSize() const {
  return static_cast<std::size_t>(settings_.complexCount) * static_cast<std::size_t>(settings_.pointsPerComplex);
}

void Sce::makeLoop() {
  dealIntoComplexes();
  for (int step = 0; step < settings_.evolutionSteps && !isBudgetUsedUp(); ++step) makeEvolutionStep();
  shuffle();
}

void Sce::dealIntoComplexes() {
  const auto p = static_cast<std::size_t>(settings_.complexCount);
  complexes_.assign(p, Complex{});
  for (std::size_t rank = 0; rank < population_.size(); ++rank) {
    complexes_[rank % p].points.push_back(std::move(population_[rank]));
  }
  population_.clear();
}

void Sce::shuffle() {
  for (Complex& complex : complexes_) {
    std::move(complex.points.begin(), complex.points.end(), std::back_inserter(population_));
  }
  complexes_.clear();
}

void Sce::makeEvolutionStep() {
  for (Complex& complex : complexes_) drawSubcomplex(complex);
  tryProposals(&Sce::reflection, Acceptance::whenBetter);
  tryProposals(&Sce::contraction, Acceptance::whenBetter);
  tryProposals(&Sce::mutation, Acceptance::always);
  for (Complex& complex : complexes_) sortBestFirst(complex.points);
}

void Sce::drawSubcomplex(Complex& complex) {
  const std::vector<std::size_t> places =
      drawSimplex(static_cast<std::size_t>(simplex_.pointCount), complex.points.size());
  complex.isMoved = false;
  complex.worst = places.back();
  complex.centroid = centroid(complex.points, std::span(places).first(places.size() - 1));
}

/// Evaluates one proposal of every complex that has not moved yet, in one batch.
void Sce::tryProposals(Proposal propose, Acceptance acceptance) {
  std::vector<Complex*> proposers;
  std::vector<ParameterSet> proposals;
  for (Complex& complex : complexes_) {
    if (complex.isMoved) continue;
    proposers.push_back(&complex);
    proposals.push_back((this->*propose)(complex));
  }
  std::vector<std::optional<EvaluationResult>> results = evaluate(proposals);
  for (std::size_t i = 0; i < proposers.size(); ++i) {
    Individual& worst = proposers[i]->points[proposers[i]->worst];
    if (!results[i]) continue;
    const bool isTakenAnyway = acceptance == Acceptance::always && isUsable(*results[i]);
    if (!isTakenAnyway && !isBetter(results[i]->aggregate, worst.value())) continue;
    worst = {std::move(proposals[i]), std::move(*results[i])};
    proposers[i]->isMoved = true;
  }
}

ParameterSet Sce::reflection(const Complex& complex) {
  const double factor = reflectionFactor(bounds().size());
  ParameterSet point = pointOnRay(complex.centroid, complex.points[complex.worst].set, -factor);
  return isWithinBounds(point) ? point : mutation(complex);
}

ParameterSet Sce::contraction(const Complex& complex) {
  const double factor = contractionFactor(bounds().size());
  return clampedToBounds(pointOnRay(complex.centroid, complex.points[complex.worst].set, factor));
}

ParameterSet Sce::mutation(const Complex& complex) {
  return drawFrom(boundingBox(complex.points));
}

}  // namespace mirevo

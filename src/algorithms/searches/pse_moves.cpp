#include "algorithms/searches/pse_moves.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include "algorithms/numbers/special_functions.h"

namespace mirevo {
namespace {

/// Standard deviation of a mutation relative to that of the simplex. With 1 the test functions take up to a tenth more
/// evaluations; with 0.8 small populations collapse.
constexpr double kMutationSpread = 0.9;

/// Length of a reflection relative to that of SCE, whose complexes keep points apart, whereas this population
/// contracts. With 1 it gets stuck in curved valleys; with 1.2 it misses optima in ten dimensions.
constexpr double kReflectionLength = 1.1;

/// Length of an expansion, in the same unit. Lengths from 2 to 5 make little difference, in bent valleys and elsewhere.
constexpr double kExpansionLength = 3.0;

/// How often a reflection is halved while it violates a constraint, before a mutation takes its place. With more, small
/// populations collapse on the constraint.
constexpr int kReflectionHalvings = 1;

constexpr int kReflectionFailed = 1;
constexpr int kContractionFailed = 2;

}  // namespace

PseMoves::PseMoves(const PseSettings& settings, const SimplexSettings& simplex, SearchProblem problem)
    : PopulationSearch(std::move(problem)), settings_(settings), simplex_(simplex) {}

bool PseMoves::areSettingsValid() const {
  const double r = settings_.reflectionProbability;
  const double c = settings_.contractionProbability;
  return settings_.populationSize >= 1 && simplex_.pointCount >= 2 && simplex_.pointCount <= settings_.populationSize &&
         r >= 0.0 && c >= 0.0 && r + c <= 1.0 && settings_.expansionShare >= 0.0 && settings_.expansionShare <= 1.0;
}

/// The parents of a generation, best first, so that a budget cuts off the offspring of the worst. The best points have
/// too few points better than themselves for a simplex; the worst have a second offspring instead.
std::vector<std::size_t> PseMoves::chooseParents() const {
  const std::size_t size = population_.size();
  // Less than half, so that the best of the parents, whose simplex has no choice, has only one offspring.
  const std::size_t unmoved = std::min(static_cast<std::size_t>(simplex_.pointCount) - 1, (size - 1) / 2);
  std::vector<std::size_t> parents;
  parents.reserve(size);
  for (std::size_t place = unmoved; place < size; ++place) {
    parents.insert(parents.end(), place < size - unmoved ? 1 : 2, place);
  }
  return parents;
}

bool PseMoves::settle(const Offspring& child, EvaluationResult result, bool isReplaced) {
  Individual& parent = population_[child.parent];
  // Neither the best point nor one that has just been found is replaced by a worse one.
  const bool isTakenAnyway = child.isTakenAnyway && child.parent > 0 && !isReplaced && isUsable(result);
  if (isTakenAnyway || isBetter(result.aggregate, parent.value())) {
    parent = {child.set, std::move(result)};
    return true;
  }
  if (!isReplaced) parent.failedMoves = std::max(parent.failedMoves, child.failedMoves);
  return false;
}

/// The other points of the simplex: points better than the parent, or any if a small population has too few.
std::vector<std::size_t> PseMoves::drawOthers(std::size_t parent) {
  const auto count = static_cast<std::size_t>(simplex_.pointCount) - 1;
  const std::size_t size = population_.size();
  if (parent >= count) return drawSimplex(count, parent, size);
  std::vector<std::size_t> places = drawSimplex(count, size - 1, size);
  for (std::size_t& place : places) place += place >= parent ? 1 : 0;
  return places;
}

PseMoves::Offspring PseMoves::makeOffspring(std::size_t parent) {
  const double move = draw();
  const std::vector<std::size_t> others = drawOthers(parent);
  const std::vector<double> g = centroid(population_, others);
  const Individual& u = population_[parent];
  if (u.failedMoves == kContractionFailed) return {mutation(parent, others, g), parent, kContractionFailed, true};
  if (move >= settings_.reflectionProbability + settings_.contractionProbability) {
    return {mutation(parent, others, g), parent};
  }
  if (move >= settings_.reflectionProbability || u.failedMoves == kReflectionFailed) {
    ParameterSet point = clampedToBounds(pointOnRay(g, u.set, contractionFactor(bounds().size())));
    return {drawnBack(std::move(point), {g, u.set}), parent, kContractionFailed};
  }
  return {reflection(parent, others, g), parent, kReflectionFailed};
}

ParameterSet PseMoves::reflection(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g) {
  std::optional<ParameterSet> point;
  // Without expansions no number is drawn, so that settings without them give what they always gave.
  const bool isExpansion = settings_.expansionShare > 0.0 && draw() < settings_.expansionShare;
  if (isExpansion) point = rayPoint(parent, g, kExpansionLength);
  if (!point) point = rayPoint(parent, g, kReflectionLength);
  return point ? *point : mutation(parent, others, g);
}

/// The reflection of that length; empty outside the bounds and the constraints.
std::optional<ParameterSet> PseMoves::rayPoint(std::size_t parent, std::span<const double> g, double length) {
  ParameterSet point = pointOnRay(g, population_[parent].set, -length * reflectionFactor(bounds().size()));
  return isWithinBounds(point) ? shortened(std::move(point), g, kReflectionHalvings) : std::nullopt;
}

ParameterSet PseMoves::mutation(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g) {
  std::vector<std::size_t> simplex(others.begin(), others.end());
  simplex.push_back(parent);
  const Box box = boundingBox(population_, simplex);
  return drawFeasible([&] { return drawMutation(simplex, box, g); }, population_[parent].set);
}

/// Normally distributed about g in every parameter, with a standard deviation proportional to that of the simplex about
/// g. A value outside the bounds is instead drawn uniformly from the range of the simplex.
ParameterSet PseMoves::drawMutation(std::span<const std::size_t> simplex, const Box& box, std::span<const double> g) {
  ParameterSet point(g.begin(), g.end());
  for (std::size_t j = 0; j < point.size(); ++j) {
    double squares = 0.0;
    for (const std::size_t place : simplex) {
      const double distance = population_[place].set[j] - g[j];
      squares += distance * distance;
    }
    int fault = 0;
    const double deviate = normalQuantile(draw(), fault);
    point[j] += kMutationSpread * std::sqrt(squares / static_cast<double>(simplex.size())) * deviate;
    const bool isOutside = !(point[j] >= bounds().lower[j] && point[j] <= bounds().upper[j]);
    if (isOutside) point[j] = box.lower[j] + draw() * (box.upper[j] - box.lower[j]);
  }
  return clampedToBounds(std::move(point));
}

}  // namespace mirevo

#include "algorithms/searches/pse.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/special_functions.h"
#include "algorithms/surrogate/proposal_selector.h"

namespace mirevo {
namespace {

/// Standard deviation of a mutation relative to that of the simplex. With 1 the test functions take up to a tenth more
/// evaluations; with 0.8 small populations collapse.
constexpr double kMutationSpread = 0.9;

/// Length of a reflection relative to that of SCE, whose complexes keep points apart, whereas this population
/// contracts. With 1 it gets stuck in curved valleys; with 1.2 it misses optima in ten dimensions.
constexpr double kReflectionLength = 1.1;

/// How often a reflection is halved while it violates a constraint, before a mutation takes its place. With more, small
/// populations collapse on the constraint.
constexpr int kReflectionHalvings = 1;

/// With a surrogate model, the number of points of the population for each predicted minimum that is run.
constexpr std::size_t kPointsPerMinimum = 4;

constexpr std::string_view kPopulationKeyword = "Population_Size";
constexpr std::string_view kSimplexKeyword = "No_Points_Simplex";
constexpr std::string_view kContractionKeyword = "Prob_Contraction";
constexpr std::string_view kSimplexRefusal = "Error: No. of points in a simplex in PSE algorithm invalid";

std::optional<SettingRefusal> validateProbabilities(const PseSettings& settings) {
  if (settings.reflectionProbability + settings.contractionProbability <= 1.0) return std::nullopt;
  return SettingRefusal{"Error: Sum of probabilities for reflection and contraction in PSE algorithm larger than 1",
                        kContractionKeyword,
                        fmt::format("expected at most 1 with Prob_Reflection, found {} + {}",
                                    settings.reflectionProbability, settings.contractionProbability)};
}

constexpr int kReflectionFailed = 1;
constexpr int kContractionFailed = 2;

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

/// The parents of a generation, best first, so that a budget cuts off the offspring of the worst. The best points have
/// too few points better than themselves for a simplex; the worst have a second offspring instead.
std::vector<std::size_t> Pse::chooseParents() const {
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
    if (!results[i]) continue;
    const Offspring& child = offspring[i];
    Individual& parent = population_[child.parent];
    // Neither the best point nor one that this generation has just found is replaced by a worse one.
    const bool isTakenAnyway =
        child.isTakenAnyway && child.parent > 0 && !isReplaced[child.parent] && isUsable(*results[i]);
    if (isTakenAnyway || isBetter(results[i]->aggregate, parent.value())) {
      parent = {proposals[i], std::move(*results[i])};
      isReplaced[child.parent] = true;
    } else if (!isReplaced[child.parent]) {
      parent.failedMoves = std::max(parent.failedMoves, child.failedMoves);
    }
  }
}

/// The other points of the simplex: points better than the parent, or any if a small population has too few.
std::vector<std::size_t> Pse::drawOthers(std::size_t parent) {
  const auto count = static_cast<std::size_t>(simplex_.pointCount) - 1;
  const std::size_t size = population_.size();
  if (parent >= count) return drawSimplex(count, parent, size);
  std::vector<std::size_t> places = drawSimplex(count, size - 1, size);
  for (std::size_t& place : places) place += place >= parent ? 1 : 0;
  return places;
}

Pse::Offspring Pse::makeOffspring(std::size_t parent) {
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

ParameterSet Pse::reflection(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g) {
  const ParameterSet& u = population_[parent].set;
  ParameterSet point = pointOnRay(g, u, -kReflectionLength * reflectionFactor(bounds().size()));
  const std::optional<ParameterSet> drawn =
      isWithinBounds(point) ? shortened(std::move(point), g, kReflectionHalvings) : std::nullopt;
  return drawn ? *drawn : mutation(parent, others, g);
}

ParameterSet Pse::mutation(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g) {
  std::vector<std::size_t> simplex(others.begin(), others.end());
  simplex.push_back(parent);
  const Box box = boundingBox(population_, simplex);
  return drawFeasible([&] { return drawMutation(simplex, box, g); }, population_[parent].set);
}

/// Normally distributed about g in every parameter, with a standard deviation proportional to that of the simplex about
/// g. A value outside the bounds is instead drawn uniformly from the range of the simplex.
ParameterSet Pse::drawMutation(std::span<const std::size_t> simplex, const Box& box, std::span<const double> g) {
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
  static const SettingSection<PseMethod> section{
      {"OPTIMISATION_ALGORITHM/PSE_CONTROL_PARAMETERS",
       "when `Algorithm_Type` is 1",
       "Population Simplex Evolution.",
       {setting<PseMethod>([](auto& m) -> auto& { return m.settings.populationSize; },
                           {.name = kPopulationKeyword,
                            .range = from(1),
                            .refusal = "Error: Population size in PSE algorithm invalid",
                            .meaning = "Points of the population and model runs of a generation."}),
        checked<PseMethod>(setting<PseMethod>([](auto& m) -> auto& { return m.simplex.pointCount; },
                                              {.name = kSimplexKeyword,
                                               .range = from(2),
                                               .refusal = kSimplexRefusal,
                                               .meaning = "Points in a simplex, at most those of the population. The "
                                                          "same setting as SCE's `No_Points_Subcomplex`."}),
                           [](const PseMethod& m) {
                             return validateSimplex(m.simplex, m.settings.populationSize, "the population",
                                                    kSimplexKeyword, kSimplexRefusal);
                           }),
        setting<PseMethod>([](auto& m) -> auto& { return m.settings.reflectionProbability; },
                           {.name = "Prob_Reflection",
                            .defaultValue = "0.7",
                            .range = kFraction,
                            .refusal = "Error: Probability for reflection step in PSE algorithm invalid",
                            .meaning = "Probability of the move that is due: a reflection, after it a contraction."}),
        checked<PseMethod>(
            setting<PseMethod>([](auto& m) -> auto& { return m.settings.contractionProbability; },
                               {.name = kContractionKeyword,
                                .defaultValue = "0",
                                .range = kFraction,
                                .refusal = "Error: Probability for contraction step in PSE algorithm invalid",
                                .meaning = "Probability of an immediate contraction; the remainder to 1 is the "
                                           "probability of an immediate mutation."}),
            [](const PseMethod& m) { return validateProbabilities(m.settings); })}}};
  return {section, *this};
}

std::vector<SearchAdvice> PseMethod::advice(std::size_t n) const {
  const auto count = static_cast<std::int64_t>(n);
  return {{kPopulationKeyword, settings.populationSize, 4 * (2 * count + 1)},
          {kSimplexKeyword, simplex.pointCount, count + 1}};
}

double PseMethod::loopsBefore(double sets) const {
  return std::ceil(sets / static_cast<double>(settings.populationSize)) - 1.0;
}

std::unique_ptr<SearchAlgorithm> PseMethod::make(SearchProblem problem) const {
  return std::make_unique<Pse>(settings, simplex, std::move(problem));
}

}  // namespace mirevo

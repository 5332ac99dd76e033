#include "algorithms/searches/pse.h"

#include <algorithm>
#include <cmath>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/special_functions.h"
#include "algorithms/surrogate/proposal_selector.h"

namespace mirevo {
namespace {

/// Standard deviation of a mutation, in those of the simplex. With 1 the test functions take up to a tenth more
/// evaluations; with 0.8 small populations collapse.
constexpr double kMutationSpread = 0.9;

/// Length of a reflection in those of SCE, whose complexes keep points apart that this population draws together. With
/// 1 it comes to rest in curved valleys; with 1.2 it loses valleys in ten dimensions.
constexpr double kReflectionLength = 1.1;

/// With a surrogate model: of a generation one run in so many goes to its predicted minima.
constexpr std::size_t kPointsPerMinimum = 4;

constexpr std::string_view kPopulationKeyword = "Population_Size";
constexpr std::string_view kSimplexKeyword = "No_Points_Simplex";
constexpr std::string_view kContractionKeyword = "Prob_Contraction";
constexpr std::string_view kSimplexRefusal = "Error: No. of points in a simplex in PSE algorithm invalid";

/// That a simplex has no more points than the population.
std::optional<SettingRefusal> validatePseControl(const PseMethod& method) {
  const std::int32_t points = method.settings.populationSize;
  if (method.simplex.pointCount <= points) return std::nullopt;
  return SettingRefusal{
      std::string(kSimplexRefusal), kSimplexKeyword,
      fmt::format("expected at most the {} points of the population, found {}", points, method.simplex.pointCount)};
}

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

/// With a surrogate model, runs where it predicts least around each of the best points take the turns of offspring
/// spread evenly over the generation: were they those of the worst points, these would hardly ever move. They replace
/// the points around which they were predicted when better, so that the population stays spread.
void Pse::proposePredictedMinima(std::vector<Offspring>& offspring) {
  const std::size_t most = std::max(population_.size() / kPointsPerMinimum, std::size_t{1});
  std::vector<PredictedMinimum> minima = predictedMinima(std::span(population_).first(most));
  for (std::size_t k = 0; k < minima.size(); ++k) {
    offspring[k * offspring.size() / minima.size()] = {std::move(minima[k].set), minima[k].centre};
  }
}

/// The parents of a generation, best first: what a budget cuts off are the offspring of the worst. The best points have
/// too few better ones for a simplex that is worse than them alone, and their turns go to the worst.
std::vector<std::size_t> Pse::chooseParents() const {
  const std::size_t size = population_.size();
  // Less than half, so that the best of the parents, whose simplex has no choice, has a single offspring.
  const std::size_t unmoved = std::min(static_cast<std::size_t>(simplex_.pointCount) - 1, (size - 1) / 2);
  std::vector<std::size_t> parents;
  parents.reserve(size);
  for (std::size_t place = unmoved; place < size; ++place) {
    parents.insert(parents.end(), place < size - unmoved ? 1 : 2, place);
  }
  return parents;
}

/// A point's own offspring compete, not those of the whole population: the promising ones of all lie close together.
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
    // Neither the best point nor one that this generation has just found gives way to a worse one.
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

/// The other points of the simplex: better ones than the parent; any where a small population has too few.
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
    const ParameterSet point = pointOnRay(g, u.set, contractionFactor(bounds().size()));
    return {clampedToBounds(point), parent, kContractionFailed};
  }
  return {reflection(parent, others, g), parent, kReflectionFailed};
}

ParameterSet Pse::reflection(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g) {
  ParameterSet point = pointOnRay(g, population_[parent].set, -kReflectionLength * reflectionFactor(bounds().size()));
  return isWithinBounds(point) ? point : mutation(parent, others, g);
}

/// Normally distributed about g in every parameter, with a standard deviation after that of the simplex about g. What
/// would leave the bounds is drawn evenly from the range of the simplex.
ParameterSet Pse::mutation(std::size_t parent, std::span<const std::size_t> others, std::span<const double> g) {
  std::vector<std::size_t> simplex(others.begin(), others.end());
  simplex.push_back(parent);
  const Box box = boundingBox(population_, simplex);
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
                                      .needsRanges = true};
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
                           [](const PseMethod& m) { return validatePseControl(m); }),
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

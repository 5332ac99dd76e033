#include "algorithms/searches/sce.h"

#include <algorithm>
#include <utility>

#include "algorithms/surrogate/proposal_selector.h"

namespace mirevo {
namespace {

/// How often a reflection is halved while it violates a constraint, before a random point takes its place. A random
/// point at once takes up to three quarters more evaluations; with halving until the constraint is met small complexes
/// collapse on it.
constexpr int kReflectionHalvings = 2;

constexpr std::string_view kPointsKeyword = "No_Points_Complex";
constexpr std::string_view kSubcomplexKeyword = "No_Points_Subcomplex";
constexpr std::string_view kSubcomplexRefusal = "Error: No. of points in a subcomplex in SCE algorithm invalid";

}  // namespace

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
  for (int step = 0; step < settings_.evolutionSteps && !isBudgetUsedUp(); ++step) {
    for (Complex& complex : complexes_) chooseSubcomplex(complex);
    proposePredictedMinimum(complexes_.front());
    makeEvolutionStep();
  }
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
  tryProposals(&Sce::firstProposal, Acceptance::whenBetter);
  tryProposals(&Sce::secondProposal, Acceptance::whenBetter);
  tryProposals(&Sce::mutation, Acceptance::always);
  for (Complex& complex : complexes_) sortBestFirst(complex.points);
}

Sce::Subcomplex Sce::drawSubcomplex(const Complex& complex) {
  const std::vector<std::size_t> places =
      drawSimplex(static_cast<std::size_t>(simplex_.pointCount), complex.points.size(), complex.points.size());
  return {places.back(), centroid(complex.points, std::span(places).first(places.size() - 1))};
}

/// Draws the subcomplex of a step. A surrogate model chooses the most promising of the reflections and contractions of
/// several subcomplexes; it is tried first, and its counterpart second.
void Sce::chooseSubcomplex(Complex& complex) {
  const std::size_t count = proposalsPerRun();
  std::vector<Subcomplex> drawn;
  std::vector<ParameterSet> proposals;
  while (proposals.size() < count) {
    complex.current = drawSubcomplex(complex);
    drawn.push_back(complex.current);
    proposals.push_back(reflection(complex));
    if (proposals.size() < count) proposals.push_back(contraction(complex));
  }
  const std::size_t chosen = mostPromising(proposals, 1).front();
  complex.isMoved = false;
  complex.isFirstPredicted = false;
  complex.current = std::move(drawn[chosen / 2]);
  complex.first = std::move(proposals[chosen]);
  complex.second = chosen % 2 == 0 ? contraction(complex) : std::move(proposals[chosen - 1]);
}

/// With a surrogate model the complex that holds the best point first tries the predicted minimum, and then what it
/// would have tried first. A minimum that is better than the best point replaces that one and not the worst: it tells
/// much about the valley and nothing about the rest of the complex, which the loss of its worst point would contract.
void Sce::proposePredictedMinimum(Complex& complex) {
  std::vector<PredictedMinimum> minima = predictedMinima(std::span(complex.points).first(1));
  if (minima.empty()) return;
  complex.second = std::exchange(complex.first, std::move(minima.front().set));
  complex.isFirstPredicted = true;
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
    if (!results[i]) continue;
    Complex& complex = *proposers[i];
    Individual& best = complex.points.front();
    Individual& worst = complex.points[complex.current.worst];
    const bool isTakenAnyway = acceptance == Acceptance::always && isUsable(*results[i]);
    if (!isTakenAnyway && !isBetter(results[i]->aggregate, worst.value())) continue;
    const bool isRefined =
        propose == &Sce::firstProposal && complex.isFirstPredicted && isBetter(results[i]->aggregate, best.value());
    (isRefined ? best : worst) = {std::move(proposals[i]), std::move(*results[i])};
    complex.isMoved = true;
  }
}

double Sce::reflectionLength() const {
  return settings_.usesPublishedFactors ? 1.0 : reflectionFactor(bounds().size());
}

double Sce::contractionLength() const {
  return settings_.usesPublishedFactors ? 0.5 : contractionFactor(bounds().size());
}

ParameterSet Sce::reflection(const Complex& complex) {
  const std::vector<double>& g = complex.current.centroid;
  const ParameterSet& u = complex.points[complex.current.worst].set;
  ParameterSet point = pointOnRay(g, u, -reflectionLength());
  const std::optional<ParameterSet> drawn =
      isWithinBounds(point) ? shortened(std::move(point), g, kReflectionHalvings) : std::nullopt;
  return drawn ? *drawn : randomPoint(complex);
}

ParameterSet Sce::contraction(const Complex& complex) {
  const std::vector<double>& g = complex.current.centroid;
  const ParameterSet& u = complex.points[complex.current.worst].set;
  return drawnBack(clampedToBounds(pointOnRay(g, u, contractionLength())), {g, u});
}

ParameterSet Sce::mutation(const Complex& complex) {
  std::vector<ParameterSet> drawn;
  for (std::size_t i = 0; i < proposalsPerRun(); ++i) drawn.push_back(randomPoint(complex));
  return drawn[mostPromising(drawn, 1).front()];
}

/// A random point of the box of the complex; the best point of the complex can be run, unless none can.
ParameterSet Sce::randomPoint(const Complex& complex) {
  const Box box = boundingBox(complex.points);
  return drawFeasible([&] { return drawFrom(box); }, complex.points.front().set);
}

const SearchFacts& SceMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {0, "SCE"},
                                      .longName = "Shuffled Complex Evolution",
                                      .usesSurrogate = true,
                                      .drawsInitialSample = true,
                                      .needsRanges = true,
                                      .runsAtOnceUnderMpi = "one proposal of each complex",
                                      .populationKeywords = "No_Complexes times No_Points_Complex"};
  return kFacts;
}

BoundSection SceMethod::section() {
  static const SettingSection<SceMethod> section{
      {"OPTIMISATION_ALGORITHM/SCE_CONTROL_PARAMETERS",
       "when `Algorithm_Type` is 0",
       "Shuffled Complex Evolution.",
       {setting<SceMethod>([](auto& m) -> auto& { return m.settings.complexCount; },
                           {.name = "No_Complexes",
                            .range = from(1),
                            .refusal = "Error: No. of complexes in SCE algorithm invalid",
                            .meaning = "Complexes, p."}),
        setting<SceMethod>([](auto& m) -> auto& { return m.settings.pointsPerComplex; },
                           {.name = kPointsKeyword,
                            .range = from(2),
                            .refusal = "Error: No. of points in a complex in SCE algorithm invalid",
                            .meaning = "Points in a complex, m; 2n + 1 for n variable parameters is usual."}),
        checked<SceMethod>(
            setting<SceMethod>([](auto& m) -> auto& { return m.simplex.pointCount; },
                               {.name = kSubcomplexKeyword,
                                .range = from(2),
                                .refusal = kSubcomplexRefusal,
                                .meaning = "Points in a subcomplex, q, at most those of a complex; n + 1 is usual."}),
            [](const SceMethod& m) {
              return validateSimplex(m.simplex, m.settings.pointsPerComplex, "a complex", kSubcomplexKeyword,
                                     kSubcomplexRefusal);
            }),
        setting<SceMethod>([](auto& m) -> auto& { return m.settings.evolutionSteps; },
                           {.name = "No_Evaluation_Steps",
                            .range = from(1),
                            .refusal = "Error: No. of evaluation steps in SCE algorithm invalid",
                            .meaning = "Evolution steps of a complex between two shuffles; 2n + 1 is usual."}),
        setting<SceMethod>([](auto& m) -> auto& { return m.settings.usesPublishedFactors; },
                           {.name = "Published_Factors",
                            .defaultValue = "0",
                            .meaning = "Whether reflections and contractions are as long as in the papers. They are "
                                       "shorter otherwise, which takes fewer model runs and with 2 complexes misses a "
                                       "few more optima among many."})}}};
  return {section, *this};
}

std::vector<SearchAdvice> SceMethod::advice(std::size_t n) const {
  const auto count = static_cast<std::int64_t>(n);
  return {{kPointsKeyword, settings.pointsPerComplex, 2 * count + 1},
          {kSubcomplexKeyword, simplex.pointCount, count + 1}};
}

std::int64_t SceMethod::populationSize() const {
  return std::int64_t{settings.complexCount} * settings.pointsPerComplex;
}

double SceMethod::evaluationsPerLoop() const {
  return static_cast<double>(settings.complexCount) * settings.evolutionSteps;
}

std::unique_ptr<SearchAlgorithm> SceMethod::make(SearchProblem problem) const {
  return std::make_unique<Sce>(settings, simplex, std::move(problem));
}

}  // namespace mirevo

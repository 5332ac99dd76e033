#include "algorithms/searches/nsga_ii.h"

#include <algorithm>
#include <cmath>
#include <numeric>

#include "algorithms/searches/initial_sample.h"
#include "algorithms/searches/population.h"
#include "algorithms/searches/population_search.h"
#include "algorithms/searches/pse_keywords.h"

namespace mirevo {
namespace {

constexpr double kSameValue = 1.0e-14;  ///< values of two parents that are nearer have no children of their own
constexpr std::int64_t kFewestMembers = 20;

/// How far a child is from the middle of its parents, in halves of their distance, if `beta` is that of the bound.
double spreadFactor(double beta, double index, double deviate) {
  const double alpha = 2.0 - std::pow(beta, -(index + 1.0));
  const double power = 1.0 / (index + 1.0);
  return deviate <= 1.0 / alpha ? std::pow(deviate * alpha, power) : std::pow(1.0 / (2.0 - deviate * alpha), power);
}

}  // namespace

std::pair<double, double> simulatedBinaryCrossover(double a, double b, double lower, double upper, double index,
                                                   double deviate) {
  const double low = std::min(a, b);
  const double high = std::max(a, b);
  const double distance = high - low;
  const double toLower = spreadFactor(1.0 + 2.0 * (low - lower) / distance, index, deviate);
  const double toUpper = spreadFactor(1.0 + 2.0 * (upper - high) / distance, index, deviate);
  return {std::clamp(0.5 * (low + high - toLower * distance), lower, upper),
          std::clamp(0.5 * (low + high + toUpper * distance), lower, upper)};
}

double polynomialMutation(double value, double lower, double upper, double index, double deviate) {
  const double range = upper - lower;
  const double power = 1.0 / (index + 1.0);
  double step = 0.0;
  if (deviate < 0.5) {
    const double rest = 1.0 - (value - lower) / range;
    step = std::pow(2.0 * deviate + (1.0 - 2.0 * deviate) * std::pow(rest, index + 1.0), power) - 1.0;
  } else {
    const double rest = 1.0 - (upper - value) / range;
    step = 1.0 - std::pow(2.0 * (1.0 - deviate) + 2.0 * (deviate - 0.5) * std::pow(rest, index + 1.0), power);
  }
  return std::clamp(value + step * range, lower, upper);
}

NsgaIi::NsgaIi(const NsgaIiSettings& settings, const ParetoSettings& pareto, SearchProblem problem)
    : ParetoSearch(pareto, std::move(problem)), settings_(settings) {}

bool NsgaIi::areSettingsValid() const {
  return settings_.populationSize >= 2 && settings_.crossoverIndex >= 0.0 && settings_.mutationIndex >= 0.0;
}

SearchStatus NsgaIi::initialise() {
  if (!isProblemValid() || !areSettingsValid()) return kSearchSettingsInvalid;
  const auto count = static_cast<std::size_t>(std::min(settings_.populationSize, problem_.stopping.maxEvaluations));
  std::vector<ParameterSet> sample =
      drawInitialSample(problem_.initialSample, problem_.givenSample, problem_.bounds, count, problem_.random);
  const std::size_t given = givenSetCount(problem_.initialSample, problem_.givenSample.size(), count);
  feasible_.replaceInSample(sample, given, problem_.bounds, problem_.random);
  selectPopulation(runSample(sample));
  if (budgetLeft() <= 0) checkEnd();
  return kSearchOk;
}

SearchStatus NsgaIi::advance() {
  if (problem_.pareto->population.empty()) return kSearchNotInitialised;
  if (isTerminated()) return kSearchOk;
  std::vector<ParameterSet> children = makeChildren();
  children.resize(std::min(children.size(), static_cast<std::size_t>(std::max(0, budgetLeft()))));
  std::vector<ParetoPoint> points = problem_.pareto->population;
  for (ParetoPoint& child : run(children)) points.push_back(std::move(child));
  selectPopulation(std::move(points));
  ++summary_.loopCount;
  checkEnd();
  return kSearchOk;
}

bool NsgaIi::isAhead(std::size_t a, std::size_t b) const {
  if (ranks_[a] != ranks_[b]) return ranks_[a] < ranks_[b];
  return crowding_[a] > crowding_[b];
}

/// The winner of the next tournament.
const ParameterSet& NsgaIi::drawParent() {
  const std::vector<ParetoPoint>& members = problem_.pareto->population;
  if (pool_.size() < 2) {
    pool_.resize(members.size());
    std::iota(pool_.begin(), pool_.end(), std::size_t{0});
    for (std::size_t i = pool_.size(); i > 1; --i) {
      const auto other = static_cast<std::size_t>(problem_.random.next() * static_cast<double>(i));
      std::swap(pool_[i - 1], pool_[std::min(other, i - 1)]);
    }
  }
  const std::size_t a = pool_.back();
  pool_.pop_back();
  if (pool_.empty()) return members[a].set;  // a population of one
  const std::size_t b = pool_.back();
  pool_.pop_back();
  if (isAhead(a, b)) return members[a].set;
  if (isAhead(b, a)) return members[b].set;
  return members[problem_.random.next() < 0.5 ? a : b].set;
}

std::vector<ParameterSet> NsgaIi::makeChildren() {
  const auto count = static_cast<std::size_t>(settings_.populationSize);
  pool_.clear();
  std::vector<ParameterSet> children;
  while (children.size() < count) {
    const ParameterSet first = drawParent();
    const ParameterSet second = drawParent();
    const Pair pair = makePair(first, second);
    bool isFirst = true;
    children.push_back(feasible_.draw(
        [&] { return std::exchange(isFirst, false) ? pair.first : makePair(first, second).first; }, first));
    if (children.size() == count) break;
    isFirst = true;
    children.push_back(feasible_.draw(
        [&] { return std::exchange(isFirst, false) ? pair.second : makePair(first, second).second; }, second));
  }
  return children;
}

NsgaIi::Pair NsgaIi::makePair(const ParameterSet& first, const ParameterSet& second) {
  UniformGenerator& random = problem_.random;
  const SearchBounds& b = problem_.bounds;
  Pair children{first, second};
  if (random.next() < settings_.crossoverProbability) {
    for (std::size_t j = 0; j < first.size(); ++j) {
      if (!(random.next() < 0.5) || std::abs(first[j] - second[j]) <= kSameValue * (b.upper[j] - b.lower[j])) continue;
      auto [low, high] = simulatedBinaryCrossover(first[j], second[j], b.lower[j], b.upper[j], settings_.crossoverIndex,
                                                  random.next());
      if (random.next() < 0.5) std::swap(low, high);
      children.first[j] = low;
      children.second[j] = high;
    }
  }
  for (ParameterSet* child : {&children.first, &children.second}) {
    mutate(*child);
    if (*child != first && *child != second) continue;
    const auto j = static_cast<std::size_t>(random.next() * static_cast<double>(child->size()));
    mutateOne(*child, std::min(j, child->size() - 1));
  }
  return children;
}

double NsgaIi::mutationProbability() const {
  return settings_.mutationProbability > 0.0 ? settings_.mutationProbability
                                             : 1.0 / static_cast<double>(problem_.bounds.size());
}

void NsgaIi::mutate(ParameterSet& set) {
  const double probability = mutationProbability();
  for (std::size_t j = 0; j < set.size(); ++j) {
    if (problem_.random.next() < probability) mutateOne(set, j);
  }
}

void NsgaIi::mutateOne(ParameterSet& set, std::size_t j) {
  const double lower = problem_.bounds.lower[j];
  const double upper = problem_.bounds.upper[j];
  const double deviate = problem_.random.next();
  if (upper > lower) set[j] = polynomialMutation(set[j], lower, upper, settings_.mutationIndex, deviate);
}

void NsgaIi::selectPopulation(std::vector<ParetoPoint> points) {
  std::vector<ObjectivePoint> objectives;
  objectives.reserve(points.size());
  for (const ParetoPoint& point : points) objectives.push_back(point.objectives);
  const std::vector<int> ranks = nondominationRanks(objectives);
  const auto size = static_cast<std::size_t>(settings_.populationSize);
  std::vector<ParetoPoint> chosen;
  ranks_.clear();
  crowding_.clear();
  for (int rank = 1; chosen.size() < std::min(size, points.size()); ++rank) {
    std::vector<std::size_t> front;
    std::vector<std::vector<double>> values;
    for (std::size_t i = 0; i < points.size(); ++i) {
      if (ranks[i] != rank) continue;
      front.push_back(i);
      values.push_back(objectives[i].values);
    }
    const std::vector<double> crowding = crowdingDistances(values);
    std::vector<std::size_t> order(front.size());
    std::iota(order.begin(), order.end(), std::size_t{0});
    if (chosen.size() + front.size() > size) {
      std::ranges::stable_sort(order, [&crowding](std::size_t a, std::size_t b) { return crowding[a] > crowding[b]; });
      order.resize(size - chosen.size());
    }
    for (const std::size_t i : order) {
      chosen.push_back(std::move(points[front[i]]));
      ranks_.push_back(rank);
      crowding_.push_back(crowding[i]);
    }
  }
  problem_.pareto->population = std::move(chosen);
  noteSpread();
}

void NsgaIi::noteSpread() {
  Population population;
  for (const ParetoPoint& point : problem_.pareto->population) population.push_back({point.set, {}});
  summary_.populationSpread = populationSpread(population, static_cast<int>(problem_.bounds.size()));
  summary_.populationRange = normalisedPopulationRange(population, problem_.bounds);
  summary_.replacedCount = feasible_.replacedCount();
  summary_.returnedCount = feasible_.returnedCount();
}

const SearchFacts& NsgaIiMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {std::nullopt, "NSGA-II"},
                                      .longName = "Non-dominated Sorting Genetic Algorithm II",
                                      .runsInParallel = true,
                                      .drawsInitialSample = true,
                                      .needsRanges = true,
                                      .findsFront = true,
                                      .populationKeywords = kPopulationKeyword};
  return kFacts;
}

BoundSection NsgaIiMethod::section() {
  using Method = NsgaIiMethod;
  static const SettingSection<NsgaIiMethod> section{
      {"OPTIMISATION_ALGORITHM/NSGAII_CONTROL_PARAMETERS", "when `Algorithm_Type` is `'NSGA-II'`",
       "Non-dominated Sorting Genetic Algorithm II.",
       withParetoRows<Method>(
           {setting<Method>(
                [](auto& m) -> auto& { return m.settings.populationSize; },
                {.name = kPopulationKeyword,
                 .defaultValue = "100",
                 .range = between(2, 1000000),
                 .refusal = "Error: Population size in NSGA-II algorithm invalid",
                 .meaning = "Points of the population and model runs of a generation, which is one batch."}),
            setting<Method>([](auto& m) -> auto& { return m.settings.crossoverProbability; },
                            {.name = "Crossover_Probability",
                             .defaultValue = "0.9",
                             .range = kFraction,
                             .refusal = "Error: Crossover probability in NSGA-II algorithm invalid",
                             .meaning = "Share of pairs of parents whose children are crossed."}),
            setting<Method>([](auto& m) -> auto& { return m.settings.crossoverIndex; },
                            {.name = "Crossover_Index",
                             .defaultValue = "20",
                             .range = kNonNegative,
                             .refusal = "Error: Crossover index in NSGA-II algorithm invalid",
                             .meaning = "η_c: the larger, the nearer to their parents are the children."}),
            setting<Method>([](auto& m) -> auto& { return m.settings.mutationProbability; },
                            {.name = "Mutation_Probability",
                             .defaultValue = "0",
                             .range = kFraction,
                             .refusal = "Error: Mutation probability in NSGA-II algorithm invalid",
                             .meaning = "Of each parameter of a child; 0: 1/n for n variable parameters."}),
            setting<Method>([](auto& m) -> auto& { return m.settings.mutationIndex; },
                            {.name = "Mutation_Index",
                             .defaultValue = "20",
                             .range = kNonNegative,
                             .refusal = "Error: Mutation index in NSGA-II algorithm invalid",
                             .meaning = "η_m: the larger, the smaller are the mutations."})})}};
  return {section, *this};
}

std::vector<SearchAdvice> NsgaIiMethod::advice(std::size_t /*n*/) const {
  return {{kPopulationKeyword, settings.populationSize, kFewestMembers}};
}

RaisedBudget NsgaIiMethod::raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                                       const InitialSampleSettings& sample) const {
  RaisedBudget raised = PopulationMethod::raiseBudget(history, stopping, sample);
  if (!raised.refusal.empty() || pareto.hypervolumeEvaluations == 0) return raised;
  // After an end by the hypervolume the last row is that of the final model run; otherwise one run is made again.
  const int last = std::min(history.budget, history.lastRow - 1);
  const int before = history.searches.empty() ? 0 : history.searches.back().lastEvaluation;
  raised.keptEvaluations = std::max(last, before);
  if (last <= before) return raised;
  raised.earlier = EarlierSearch{history.budget, last};
  raised.note = fmt::format(
      "Max_No_Evaluations was raised from {} to {}: the search goes on with the first {} evaluations, which are kept{}",
      history.budget, stopping.maxEvaluations, last, hypervolumeNote(pareto));
  return raised;
}

std::unique_ptr<SearchAlgorithm> NsgaIiMethod::make(SearchProblem problem) const {
  return std::make_unique<NsgaIi>(settings, pareto, std::move(problem));
}

}  // namespace mirevo

#include "algorithms/searches/cma_es.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <numeric>
#include <utility>

#include <fmt/format.h>

#include "algorithms/searches/initial_sample.h"
#include "algorithms/searches/population_search.h"
#include "algorithms/searches/pse_keywords.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kPopulationRefusal = "Error: Population size in CMA-ES algorithm invalid";

/// Runs of which the log tells one by one.
constexpr int kMostNotedRuns = 40;

std::size_t populationOf(const CmaEsSettings& settings, std::size_t n) {
  return settings.populationSize > 0 ? static_cast<std::size_t>(settings.populationSize) : cmaPopulationSize(n);
}

std::vector<double> stepCounts(const SearchBounds& bounds) {
  std::vector<double> counts(bounds.size(), 0.0);
  for (std::size_t j = 0; j < bounds.isInteger.size(); ++j) {
    if (bounds.isInteger[j]) counts[j] = bounds.upper[j] - bounds.lower[j];
  }
  return counts;
}

}  // namespace

CmaEs::CmaEs(const CmaEsSettings& settings, SearchProblem problem)
    : settings_(settings),
      problem_(std::move(problem)),
      feasible_(problem_.feasibility),
      margin_(stepCounts(problem_.bounds)),
      restarts_(populationOf(settings, problem_.bounds.size()), settings.initialStep, settings.doublings) {}

bool CmaEs::isProblemValid() const {
  const SearchBounds& b = problem_.bounds;
  const std::size_t n = b.size();
  if (n == 0 || b.upper.size() != n || b.initial.size() != n || problem_.stopping.maxEvaluations <= 0) return false;
  for (std::size_t j = 0; j < n; ++j) {
    if (!std::isfinite(b.lower[j]) || !std::isfinite(b.upper[j]) || !(b.lower[j] < b.upper[j])) return false;
  }
  return restarts_.first().population >= 2 && settings_.initialStep > 0.0 && settings_.doublings >= 0;
}

std::vector<double> CmaEs::relative(const ParameterSet& set) const {
  const SearchBounds& b = problem_.bounds;
  std::vector<double> place(set.size());
  for (std::size_t j = 0; j < set.size(); ++j) place[j] = (set[j] - b.lower[j]) / (b.upper[j] - b.lower[j]);
  return place;
}

ParameterSet CmaEs::setAt(const std::vector<double>& place) const {
  const SearchBounds& b = problem_.bounds;
  ParameterSet set = CmaBounds::repaired(place);
  for (std::size_t j = 0; j < set.size(); ++j) {
    set[j] = std::clamp(b.lower[j] + set[j] * (b.upper[j] - b.lower[j]), b.lower[j], b.upper[j]);
  }
  return set;
}

SearchStatus CmaEs::initialise() {
  if (!isProblemValid()) return kSearchSettingsInvalid;
  const std::size_t count =
      std::min(restarts_.first().population, static_cast<std::size_t>(problem_.stopping.maxEvaluations));
  std::vector<ParameterSet> sample =
      drawInitialSample(problem_.initialSample, problem_.givenSample, problem_.bounds, count, problem_.random);
  const std::size_t given = givenSetCount(problem_.initialSample, problem_.givenSample.size(), count);
  feasible_.replaceInSample(sample, given, problem_.bounds, problem_.random);
  std::vector<EvaluationResult> results = run(sample);
  problem_.evaluator.settleAggregates(results);
  if (problem_.selector != nullptr) surrogate_.emplace(problem_.selector->settings(), problem_.bounds.size());
  std::size_t best = 0;
  for (std::size_t i = 0; i < count; ++i) {
    noteBest(sample[i], results[i]);
    const auto value = isUsable(results[i]) ? std::optional(results[i].aggregate) : std::nullopt;
    if (surrogate_) surrogate_->note(problem_.selector->scaled(sample[i]), value);
    if (isBetter(results[i].aggregate, results[best].aggregate)) best = i;
  }
  if (budgetLeft() <= 0) {
    summary_.terminationMessage = kBudgetUsedMessage;
  } else {
    startRun(restarts_.first(), best < given ? relative(summary_.best) : centreOf(sample, results));
  }
  return kSearchOk;
}

/// The mean of the better half of the sample, weighted as parents are.
std::vector<double> CmaEs::centreOf(std::span<const ParameterSet> sample,
                                    std::span<const EvaluationResult> results) const {
  std::vector<std::size_t> order(sample.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::stable_sort(order.begin(), order.end(), [results](std::size_t a, std::size_t b) {
    return isBetter(results[a].aggregate, results[b].aggregate);
  });
  const auto usable = static_cast<std::size_t>(std::ranges::count_if(results, isUsable));
  const CmaConstants constants = cmaConstants(problem_.bounds.size(), restarts_.first().population);
  const std::size_t count = std::min(constants.parents, usable);
  if (count == 0) return relative(summary_.best);
  std::vector<double> centre(problem_.bounds.size(), 0.0);
  double sum = 0.0;
  for (std::size_t i = 0; i < count; ++i) sum += constants.weights[i];
  for (std::size_t i = 0; i < count; ++i) {
    const std::vector<double> place = relative(sample[order[i]]);
    for (std::size_t j = 0; j < centre.size(); ++j) centre[j] += constants.weights[i] / sum * place[j];
  }
  return centre;
}

void CmaEs::startRun(const CmaRun& run, std::vector<double> mean) {
  run_ = run;
  distribution_.emplace(std::move(mean), run.sigma, run.population);
  bounds_.emplace(problem_.bounds.size());
  tests_.emplace(*distribution_);
  StoppingCriteria change = problem_.stopping;
  // A generation is smaller than a loop of the other searches.
  change.loopsConvergence =
      std::max(change.loopsConvergence,
               static_cast<std::int32_t>(CmaTests::shortHistory(problem_.bounds.size(), run.population)));
  change_.emplace(change, StoppingTests::Divisor::sizes);
  bestOfRun_ = std::numeric_limits<double>::quiet_NaN();
  startedAt_ = summary_.evaluationCount;
  ++runCount_;
}

SearchStatus CmaEs::advance() {
  if (isTerminated()) return kSearchOk;
  if (!distribution_) return kSearchNotInitialised;
  std::vector<Point> points = drawGeneration();
  const bool hasModel = surrogate_ && surrogate_->isActive(summary_.loopCount) && surrogate_->fit(*distribution_);
  std::vector<std::size_t> all(points.size());
  std::iota(all.begin(), all.end(), std::size_t{0});
  const bool isWhole = hasModel ? runWithModel(points) : runPoints(points, all);
  ++summary_.loopCount;
  noteGeneration(points);
  if (isWhole) learnFrom(points);
  if (budgetLeft() <= 0) {
    noteRun("was going on when the budget was used up");
    summary_.terminationMessage = kBudgetUsedMessage;
  } else if (!tests_->reason().empty()) {
    endRun(tests_->reason());
  } else if (change_->isMet()) {
    endRun("the change of its best value is less than Min_Change");
  } else if (summary_.evaluationCount - startedAt_ >= run_.mostEvaluations) {
    endRun("it has used up its share of the evaluations");
  }
  return kSearchOk;
}

bool CmaEs::runPoints(std::vector<Point>& points, std::span<const std::size_t> which) {
  const auto count = std::min(which.size(), static_cast<std::size_t>(std::max(0, budgetLeft())));
  std::vector<ParameterSet> sets;
  sets.reserve(count);
  for (const std::size_t i : which.first(count)) sets.push_back(points[i].set);
  std::vector<EvaluationResult> results = run(sets);
  for (std::size_t k = 0; k < count; ++k) {
    Point& point = points[which[k]];
    point.result = std::move(results[k]);
    point.isRun = true;
    point.value.reset();
    if (isUsable(point.result)) point.value = point.result.aggregate;
    noteBest(point.set, point.result);
    if (isBetter(point.result.aggregate, bestOfRun_)) bestOfRun_ = point.result.aggregate;
    if (surrogate_) surrogate_->note(problem_.selector->scaled(point.set), point.value);
  }
  return count == which.size();
}

std::vector<CmaEs::Point> CmaEs::drawGeneration() {
  std::vector<Point> points;
  for (std::size_t i = 0; i < run_.population; ++i) points.push_back(drawPoint());
  return points;
}

CmaEs::Point CmaEs::drawPoint() {
  Point point;
  const auto draw = [&] {
    point.step = distribution_->drawStep(problem_.random);
    point.place = distribution_->pointOf(point.step);
    point.set = setAt(point.place);
    return point.set;
  };
  ParameterSet set = feasible_.draw(draw, setAt(distribution_->mean()));
  if (set != point.set) {
    point.set = std::move(set);
    point.step = distribution_->stepTo(relative(point.set));
    distribution_->limitLength(point.step);
    point.place = relative(point.set);
  }
  return point;
}

void CmaEs::learnFrom(std::vector<Point>& points) {
  std::vector<double> values;
  for (const Point& point : points) {
    if (point.value) values.push_back(*point.value);
  }
  bounds_->adapt(*distribution_, values);
  for (Point& point : points) {
    point.rank = point.value ? *point.value + bounds_->penalty(point.place, *distribution_)
                             : distribution_->lengthOf(point.step);
  }
  std::stable_sort(points.begin(), points.end(), [this](const Point& a, const Point& b) { return isAhead(a, b); });
  std::vector<const std::vector<double>*> steps;
  steps.reserve(points.size());
  for (const Point& point : points) steps.push_back(&point.step);
  distribution_->update(steps);
  const Point& early = points[static_cast<std::size_t>(0.7 * static_cast<double>(points.size()))];
  if (early.value && early.rank == points.front().rank) distribution_->widen();
  margin_.keepOpen(*distribution_);
  values.clear();  // predictions tell nothing of the end of a run
  for (const Point& point : points) {
    if (point.isRun && point.value) values.push_back(*point.value);
  }
  std::sort(values.begin(), values.end());
  tests_->update(*distribution_, margin_, values);
  change_->update(bestOfRun_, 0, std::numeric_limits<double>::infinity());
}

bool CmaEs::isAhead(const Point& a, const Point& b) const {
  if (a.value.has_value() != b.value.has_value()) return a.value.has_value();
  return a.rank < b.rank;
}

void CmaEs::noteRun(std::string_view end) {
  if (runCount_ > kMostNotedRuns) {
    summary_.notes.resize(kMostNotedRuns);
    summary_.notes.push_back(fmt::format("Further runs of CMA-ES: {}", runCount_ - kMostNotedRuns));
    return;
  }
  summary_.notes.push_back(
      fmt::format("Run {} of CMA-ES: {} points in a generation, {} model evaluations, best objective value {}, {}",
                  runCount_, run_.population, summary_.evaluationCount - startedAt_, formatReal(bestOfRun_), end));
}

void CmaEs::endRun(std::string_view reason) {
  noteRun(fmt::format("ended as {}", reason));
  const int made = summary_.evaluationCount - startedAt_;
  const std::optional<CmaRun> next = restarts_.next(run_, made, problem_.random);
  if (!next) {
    summary_.terminationMessage = fmt::format("Optimisation terminated: The last run of CMA-ES ended as {}", reason);
    return;
  }
  const ParameterSet start = feasible_.draw(
      [this] { return drawUniformly(problem_.bounds.lower, problem_.bounds.upper, problem_.random); }, summary_.best);
  startRun(*next, relative(start));
}

std::vector<EvaluationResult> CmaEs::run(std::span<const ParameterSet> sets) {
  if (sets.empty()) return {};
  std::vector<EvaluationResult> results = problem_.evaluator.evaluateParameterSets(sets, DispatchMode::task);
  summary_.evaluationCount += static_cast<int>(sets.size());
  return results;
}

void CmaEs::noteBest(const ParameterSet& set, const EvaluationResult& result) {
  if (!summary_.best.empty() && !isBetter(result.aggregate, summary_.bestResult.aggregate)) return;
  summary_.best = set;
  summary_.bestResult = result;
}

void CmaEs::noteGeneration(std::span<const Point> points) {
  summary_.replacedCount = feasible_.replacedCount();
  summary_.returnedCount = feasible_.returnedCount();
  if (points.empty()) return;
  Population generation;
  for (const Point& point : points) generation.push_back({point.set, {}});
  summary_.populationSpread = populationSpread(generation, static_cast<int>(problem_.bounds.size()));
  summary_.populationRange = normalisedPopulationRange(generation, problem_.bounds);
}

const SearchFacts& CmaEsMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {std::nullopt, "CMA-ES"},
                                      .longName = "Covariance Matrix Adaptation Evolution Strategy",
                                      .runsInParallel = true,
                                      .usesSurrogate = true,
                                      .drawsInitialSample = true,
                                      .needsRanges = true,
                                      .modelChooses = "at least one",
                                      .populationKeywords = kPopulationKeyword};
  return kFacts;
}

BoundSection CmaEsMethod::section() {
  static const SettingSection<CmaEsMethod> section{
      {"OPTIMISATION_ALGORITHM/CMAES_CONTROL_PARAMETERS",
       "when `Algorithm_Type` is `'CMA-ES'`",
       "Covariance Matrix Adaptation Evolution Strategy.",
       {checked<CmaEsMethod>(
            setting<CmaEsMethod>(
                [](auto& m) -> auto& { return m.settings.populationSize; },
                {.name = kPopulationKeyword,
                 .defaultValue = "0",
                 .range = between(0, 1000000),
                 .refusal = kPopulationRefusal,
                 .meaning = "Points of a generation and model runs of a batch, λ; 0: 4 + ⌊3 ln n⌋ for n variable "
                            "parameters. More for rugged objective functions, or for more slots."}),
            [](const CmaEsMethod& m) -> std::optional<SettingRefusal> {
              if (m.settings.populationSize != 1) return std::nullopt;
              return SettingRefusal{std::string(kPopulationRefusal), kPopulationKeyword,
                                    "expected 2 or more, or 0 for the default, found 1"};
            }),
        setting<CmaEsMethod>([](auto& m) -> auto& { return m.settings.initialStep; },
                             {.name = "Initial_Step",
                              .defaultValue = "0.2",
                              .range = {.lowest = 0, .highest = 1, .lowestExcluded = true},
                              .refusal = "Error: Initial step in CMA-ES algorithm invalid",
                              .meaning = "Standard deviation of the first steps, σ, as a fraction of the range of each "
                                         "parameter. Less where the initial values are known to be good."}),
        setting<CmaEsMethod>(
            [](auto& m) -> auto& { return m.settings.doublings; },
            {.name = "Population_Doublings",
             .defaultValue = "9",
             .range = between(0, 20),
             .refusal = "Error: No. of population doublings in CMA-ES algorithm invalid",
             .meaning = "Restarts, each with twice the population of the one before, that may follow when a run has "
                        "converged; between them are restarts with small populations. 0: the search ends with its "
                        "first run."})}}};
  return {section, *this};
}

std::vector<SearchAdvice> CmaEsMethod::advice(std::size_t n) const {
  if (settings.populationSize == 0) return {};
  return {{kPopulationKeyword, settings.populationSize, static_cast<std::int64_t>(cmaPopulationSize(n))}};
}

std::int64_t CmaEsMethod::populationSize() const {
  return static_cast<std::int64_t>(populationOf(settings, variableCount_));
}

std::unique_ptr<SearchAlgorithm> CmaEsMethod::make(SearchProblem problem) const {
  return std::make_unique<CmaEs>(settings, std::move(problem));
}

}  // namespace mirevo

#include "algorithms/searches/dds.h"

#include <algorithm>
#include <cmath>
#include <iterator>
#include <utility>

#include <fmt/format.h>

namespace mirevo {

namespace {

/// Share of the budget that goes to random start points; deliberately a 32-bit number, as it decides the rounding.
constexpr float kStartPointShare = 0.005F;
constexpr int kFewestStartPoints = 5;

/// Perturbations of the same parameters that are drawn, while none can be run, before other parameters are chosen.
constexpr int kDrawsPerChoice = 10;

/// A parameter counts as held if so many of its steps were replaced, and none that was made is larger than this share
/// of their standard deviation. Five free steps are all as small in one of 10^12 searches.
constexpr int kEnoughSteps = 5;
constexpr double kHeldStep = 0.005;

bool isUsable(const SearchBounds& bounds) {
  if (bounds.lower.empty() || bounds.upper.size() != bounds.size()) return false;
  for (std::size_t j = 0; j < bounds.size(); ++j) {
    const double range = bounds.upper[j] - bounds.lower[j];
    if (!std::isfinite(range) || range < 0.0) return false;
  }
  return true;
}

/// NaN is worse than every number, so that no point without a value can remain the best.
bool isLess(double a, double b) {
  return !std::isnan(a) && (std::isnan(b) || a < b);
}
bool isNotGreater(double a, double b) {
  return !std::isnan(a) && (std::isnan(b) || a <= b);
}

/// The parameters that a candidate perturbs: each of n with the given probability, and at least one.
std::vector<std::size_t> chooseParameters(std::size_t n, double probability, const DeviateSource& deviate) {
  std::vector<std::size_t> chosen;
  for (std::size_t j = 0; j < n; ++j) {
    if (deviate() < probability) chosen.push_back(j);
  }
  if (chosen.empty()) {
    // ceil(U n) counts from 1; a deviate of 0 also selects the first parameter.
    const double position = std::ceil(deviate() * static_cast<double>(n));
    chosen.push_back(std::min(static_cast<std::size_t>(std::max(position, 1.0)), n) - 1);
  }
  return chosen;
}

}  // namespace

Dds::Dds(DdsSettings settings, int maxEvaluations, bool startFromInitial, SearchBounds bounds, Evaluator& evaluator,
         UniformGenerator& random, Feasibility feasibility)
    : settings_(settings),
      maxEvaluations_(maxEvaluations),
      startFromInitial_(startFromInitial),
      bounds_(std::move(bounds)),
      evaluator_(evaluator),
      random_(random),
      feasible_(std::move(feasibility)) {}

SearchStatus Dds::initialise() {
  if (maxEvaluations_ < 1 || !isUsable(bounds_)) return kDdsInvalidInput;
  if (startFromInitial_ && bounds_.initial.size() != bounds_.size()) return kDdsInvalidInput;
  summary_ = {};
  replacedSteps_.assign(bounds_.size(), 0);
  largestSteps_.assign(bounds_.size(), 0.0);
  std::vector<ParameterSet> points = startPoints();
  const bool areGiven = startFromInitial_ || !givenStarts_.empty();
  feasible_.replaceInSample(points, areGiven ? points.size() : 0, bounds_, random_);
  std::vector<EvaluationResult> results = evaluator_.evaluateParameterSets(points, DispatchMode::task);
  evaluator_.settleAggregates(results);
  summary_.evaluationCount = static_cast<int>(points.size());
  std::size_t best = 0;
  for (std::size_t k = 1; k < results.size(); ++k) {
    if (isLess(results[k].aggregate, results[best].aggregate)) best = k;
  }
  takeAsBest(points[best], results[best]);
  checkBudget();
  return kSearchOk;
}

SearchStatus Dds::advance() {
  if (isTerminated() || summary_.evaluationCount >= lastEvaluation_) return kSearchOk;
  if (summary_.evaluationCount == 0 || settings_.candidates < 1) return kDdsInvalidInput;
  const int last = std::min(maxEvaluations_, lastEvaluation_);
  const auto madeCount = [this] { return summary_.evaluationCount + static_cast<int>(underWay_.size()); };
  while (std::ssize(underWay_) < settings_.candidates && madeCount() < last) submitCandidate();
  do {
    takeFirstCandidate();
  } while (settings_.waitsForAll && !underWay_.empty());
  ++summary_.loopCount;
  checkBudget();
  return kSearchOk;
}

void Dds::submitCandidate() {
  const int evaluation = summary_.evaluationCount + static_cast<int>(underWay_.size()) + 1;
  ParameterSet set =
      merged_ ? feasible_.drawnBack(*std::exchange(merged_, {}), {summary_.best}) : drawCandidate(evaluation);
  underWay_.push_back({std::move(set), summary_.best, summary_.bestResult.aggregate});
  evaluator_.submit({&underWay_.back().set, 1});
}

ParameterSet Dds::drawCandidate(int evaluation) {
  const double probability = ddsInclusionProbability(evaluation, maxEvaluations_);
  ParameterSet firstDraw;
  ParameterSet candidate = ddsCandidate(
      summary_.best, bounds_, settings_.perturbation, probability, [this] { return random_.next(); }, feasible_,
      &firstDraw);
  noteSteps(firstDraw, candidate);
  return candidate;
}

void Dds::takeFirstCandidate() {
  EvaluationResult result = evaluator_.awaitFirst();
  const Candidate candidate = std::move(underWay_.front());
  underWay_.pop_front();
  ++summary_.evaluationCount;
  mergeImprovements(candidate, result.aggregate);
  // Deliberately also for an equal value: the search can then drift along a plateau.
  if (isNotGreater(result.aggregate, summary_.bestResult.aggregate)) takeAsBest(candidate.set, result);
}

void Dds::mergeImprovements(const Candidate& candidate, double value) {
  if (!isLess(value, candidate.originValue) || candidate.origin == summary_.best) return;
  const bool isBetter = isNotGreater(value, summary_.bestResult.aggregate);
  const ParameterSet& better = isBetter ? candidate.set : summary_.best;
  const ParameterSet& other = isBetter && !merged_ ? summary_.best : candidate.set;
  // One that unites improvements already gets this one, too.
  ParameterSet united = merged_ ? *merged_ : better;
  for (std::size_t j = 0; j < united.size(); ++j) {
    if (united[j] == candidate.origin[j]) united[j] = other[j];
  }
  if (united != (merged_ ? *merged_ : better)) merged_ = std::move(united);
}

std::vector<ParameterSet> Dds::startPoints() {
  if (startFromInitial_ || !givenStarts_.empty()) {
    std::vector<ParameterSet> given;
    if (startFromInitial_) given.push_back(bounds_.initial);
    given.insert(given.end(), givenStarts_.begin(), givenStarts_.end());
    given.resize(std::min(given.size(), static_cast<std::size_t>(maxEvaluations_)));
    return given;
  }
  std::vector<ParameterSet> points(static_cast<std::size_t>(ddsStartPointCount(maxEvaluations_)));
  for (ParameterSet& point : points) {
    point.resize(bounds_.size());
    for (std::size_t j = 0; j < point.size(); ++j) {
      point[j] = bounds_.lower[j] + random_.next() * (bounds_.upper[j] - bounds_.lower[j]);
    }
  }
  return points;
}

void Dds::takeAsBest(const ParameterSet& set, EvaluationResult& result) {
  summary_.best = set;
  summary_.bestResult = std::move(result);
}

void Dds::noteSteps(const ParameterSet& firstDraw, const ParameterSet& candidate) {
  for (std::size_t j = 0; j < candidate.size(); ++j) {
    if (firstDraw[j] != summary_.best[j] && firstDraw[j] != candidate[j]) ++replacedSteps_[j];
    largestSteps_[j] = std::max(largestSteps_[j], std::abs(candidate[j] - summary_.best[j]));
  }
}

std::vector<std::size_t> Dds::heldParameters() const {
  std::vector<std::size_t> held;
  for (std::size_t j = 0; j < bounds_.size(); ++j) {
    const double smallest = kHeldStep * settings_.perturbation * (bounds_.upper[j] - bounds_.lower[j]);
    if (replacedSteps_[j] >= kEnoughSteps && largestSteps_[j] <= smallest) held.push_back(j);
  }
  return held;
}

void Dds::checkBudget() {
  summary_.heldParameters = heldParameters();
  summary_.replacedCount = feasible_.replacedCount();
  summary_.returnedCount = feasible_.returnedCount();
  if (summary_.evaluationCount >= maxEvaluations_) {
    summary_.terminationMessage = kBudgetUsedMessage;
  }
}

int ddsStartPointCount(int maxEvaluations) {
  const int share = static_cast<int>(std::lround(static_cast<double>(kStartPointShare) * maxEvaluations));
  return std::min(std::max(kFewestStartPoints, share), maxEvaluations);
}

double ddsInclusionProbability(int evaluation, int maxEvaluations) {
  if (maxEvaluations <= 1) return 0.0;
  return 1.0 - std::log(static_cast<double>(evaluation)) / std::log(static_cast<double>(maxEvaluations));
}

double ddsNormalDeviate(const DeviateSource& deviate) {
  double u1 = 0.0;
  double u2 = 0.0;
  double s = 0.0;
  do {
    const double first = deviate();
    u1 = (first - 1.0) + first;
    const double second = deviate();
    u2 = (second - 1.0) + second;
    s = u1 * u1 + u2 * u2;
  } while (s >= 1.0 || s == 0.0);
  const double f = std::sqrt(-2.0 * std::log(s) / s);
  return 0.5 > deviate() ? f * u1 : f * u2;
}

double ddsReflect(double value, double lower, double upper) {
  if (value < lower) {
    const double reflected = 2.0 * lower - value;
    return reflected > upper ? lower : reflected;
  }
  if (value > upper) {
    const double reflected = 2.0 * upper - value;
    return reflected < lower ? upper : reflected;
  }
  return value;
}

ParameterSet ddsCandidate(std::span<const double> best, const SearchBounds& bounds, double r,
                          double inclusionProbability, const DeviateSource& deviate, FeasiblePoints& feasible,
                          ParameterSet* firstDraw) {
  std::vector<std::size_t> chosen;
  int draws = 0;
  const auto draw = [&] {
    if (draws++ % kDrawsPerChoice == 0) chosen = chooseParameters(best.size(), inclusionProbability, deviate);
    ParameterSet candidate(best.begin(), best.end());
    for (const std::size_t j : chosen) {
      const double range = bounds.upper[j] - bounds.lower[j];
      const double perturbed = best[j] + r * range * ddsNormalDeviate(deviate);
      candidate[j] = ddsReflect(perturbed, bounds.lower[j], bounds.upper[j]);
    }
    if (firstDraw != nullptr && draws == 1) *firstDraw = candidate;
    return candidate;
  };
  return feasible.draw(draw, best);
}

const SearchFacts& DdsMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {2, "DDS"}, .longName = "Dynamically Dimensioned Search"};
  return kFacts;
}

BoundSection DdsMethod::section() {
  static const SettingSection<DdsMethod> section{
      {"OPTIMISATION_ALGORITHM/DDS_CONTROL_PARAMETERS",
       "when `Algorithm_Type` is 2",
       "Dynamically Dimensioned Search.",
       {setting<DdsMethod>([](auto& m) -> auto& { return m.settings.perturbation; },
                           {.name = kPerturbationKeyword,
                            .defaultValue = "0.2",
                            .range = kFraction,
                            .refusal = "Error: Perturbation parameter in DDS algorithm invalid",
                            .meaning = std::string(kPerturbationMeaning)})}}};
  return {section, *this};
}

std::vector<SearchDoubt> DdsMethod::doubts() const {
  if (settings.perturbation > 0.0) return {};
  return {{kPerturbationKeyword, "0 perturbs nothing: every candidate is the best start set again"}};
}

std::string_view DdsMethod::budgetRefusal() const {
  return "Error: Maximum No. of model evaluations in DDS algorithm invalid";
}

bool DdsMethod::evaluatesSample(const InitialSampleSettings& sample) const {
  if (sample.earlierSetCount == 0) return !sample.includeInitialParameters;
  return sample.earlierSetCount + (sample.includeInitialParameters ? 1 : 0) > 1;
}

std::int64_t DdsMethod::sampleSize(const InitialSampleSettings& sample, int budget) const {
  const std::size_t given = sample.earlierSetCount + (sample.includeInitialParameters ? 1 : 0);
  return given == 0 ? ddsStartPointCount(budget) : std::min<std::int64_t>(static_cast<std::int64_t>(given), budget);
}

RaisedBudget DdsMethod::raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                                    const InitialSampleSettings& sample) const {
  RaisedBudget raised;
  const bool isFirst = history.searches.empty();
  const int before = isFirst ? 0 : history.searches.back().lastEvaluation;
  if (history.evaluations <= before) return raised;  // the latest search had not begun
  const int startPoints = isFirst ? static_cast<int>(sampleSize(sample, history.budget)) : 1;
  const int last = std::min(history.budget, std::max(history.evaluations, before + startPoints));
  raised.earlier = EarlierSearch{history.budget, last};
  // Behind a missing evaluation there may be candidates that were under way with it.
  if (last < history.budget) raised.keptEvaluations = last;
  raised.note = fmt::format(
      "Max_No_Evaluations was raised from {} to {}: as the probabilities of {} depend on it, a new search starts from "
      "the best of the first {} evaluations, which are kept",
      history.budget, stopping.maxEvaluations, facts().longName, last);
  return raised;
}

std::unique_ptr<Dds> DdsMethod::makeDds(SearchProblem problem) const {
  const bool continues = !problem.earlierSearches.empty();
  const int made = continues ? problem.earlierSearches.back().lastEvaluation : 0;
  auto dds = std::make_unique<Dds>(
      settings, problem.stopping.maxEvaluations - made, continues || problem.initialSample.includeInitialParameters,
      std::move(problem.bounds), problem.evaluator, problem.random, std::move(problem.feasibility));
  if (!continues) dds->startFrom(std::move(problem.givenSample));
  return dds;
}

std::unique_ptr<SearchAlgorithm> DdsMethod::make(SearchProblem problem) const {
  return makeDds(std::move(problem));
}

SearchSummary DdsMethod::run(SearchProblem problem, const PeriodicStep& /*periodicStep*/) const {
  const std::vector<EarlierSearch> earlier = std::exchange(problem.earlierSearches, {});
  const std::int32_t budget = problem.stopping.maxEvaluations;
  int made = 0;
  for (const EarlierSearch& search : earlier) {
    problem.stopping.maxEvaluations = search.maxEvaluations;
    const auto dds = makeDds(problem);
    dds->endAfter(search.lastEvaluation - made);
    problem.bounds.initial = runSearch(*dds, facts().name.name, {}, search.lastEvaluation - made).best;
    problem.earlierSearches.push_back(search);
    made = search.lastEvaluation;
  }
  problem.stopping.maxEvaluations = budget;
  return SearchMethod::run(std::move(problem), {});
}

}  // namespace mirevo

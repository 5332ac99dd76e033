#include "algorithms/searches/padds.h"

#include <algorithm>
#include <cmath>
#include <numeric>
#include <utility>

#include <fmt/format.h>

#include "algorithms/pareto/front_scale.h"
#include "algorithms/pareto/hypervolume.h"

namespace mirevo {

Padds::Padds(const PaddsSettings& settings, const ParetoSettings& pareto, SearchProblem problem)
    : ParetoSearch(pareto, std::move(problem)), settings_(settings) {}

std::vector<ParameterSet> Padds::startPoints() {
  std::vector<ParameterSet> points;
  if (problem_.initialSample.includeInitialParameters) points.push_back(problem_.bounds.initial);
  points.insert(points.end(), problem_.givenSample.begin(), problem_.givenSample.end());
  const EarlierSearch first = searchAt(1);
  if (points.empty()) {
    points.resize(static_cast<std::size_t>(ddsStartPointCount(first.maxEvaluations)));
    for (ParameterSet& point : points) {
      point = drawUniformly(problem_.bounds.lower, problem_.bounds.upper, problem_.random);
    }
    feasible_.replaceInSample(points, 0, problem_.bounds, problem_.random);
    return points;
  }
  points.resize(std::min(points.size(), static_cast<std::size_t>(first.maxEvaluations)));
  feasible_.replaceInSample(points, points.size(), problem_.bounds, problem_.random);
  return points;
}

SearchStatus Padds::initialise() {
  if (!isProblemValid() || settings_.candidates < 1) return kDdsInvalidInput;
  runSample(startPoints());
  checkEnd();
  return kSearchOk;
}

EarlierSearch Padds::searchAt(int evaluation) const {
  for (const EarlierSearch& search : problem_.earlierSearches) {
    if (evaluation <= search.lastEvaluation) return search;
  }
  return {problem_.stopping.maxEvaluations, problem_.stopping.maxEvaluations};
}

SearchStatus Padds::advance() {
  if (isTerminated()) return kSearchOk;
  if (summary_.evaluationCount == 0) return kDdsInvalidInput;
  const int last = searchAt(summary_.evaluationCount + 1).lastEvaluation;
  while (std::ssize(underWay_) < settings_.candidates && madeCount() < last) {
    underWay_.push_back(drawCandidate(madeCount() + 1));
    problem_.evaluator.submit({&underWay_.back(), 1});
  }
  takeFirst();
  checkEnd();
  while (isTerminated() && !underWay_.empty()) takeFirst();
  return kSearchOk;
}

void Padds::takeFirst() {
  const EvaluationResult result = problem_.evaluator.awaitFirst();
  const ParameterSet set = std::move(underWay_.front());
  underWay_.pop_front();
  bool isOnFront = false;
  take(set, result, &isOnFront);
  if (isOnFront) {
    joined_.push_back(set);
    weights_.clear();
  }
  ++summary_.loopCount;
}

ParameterSet Padds::drawCandidate(int evaluation) {
  const EarlierSearch search = searchAt(evaluation);
  int before = 0;  // evaluations of the searches that this one continues
  for (const EarlierSearch& earlier : problem_.earlierSearches) {
    if (earlier.lastEvaluation < evaluation) before = earlier.lastEvaluation;
  }
  const double probability = ddsInclusionProbability(evaluation - before, search.maxEvaluations - before);
  return ddsCandidate(
      drawOrigin(), problem_.bounds, settings_.perturbation, probability, [this] { return problem_.random.next(); },
      feasible_);
}

ParameterSet Padds::drawOrigin() {
  const std::vector<FrontMember>& members = problem_.pareto->archive.members();
  while (!joined_.empty()) {
    ParameterSet next = std::move(joined_.front());
    joined_.pop_front();
    // From the last one on: it is among those that have joined the front lately.
    const bool isLeft = std::any_of(members.rbegin(), members.rend(),
                                    [&next](const FrontMember& member) { return member.set == next; });
    if (isLeft) return next;
  }
  if (members.empty()) return summary_.best;  // all runs so far have failed
  if (weights_.empty()) drawWeights();
  double rest = problem_.random.next() * std::accumulate(weights_.begin(), weights_.end(), 0.0);
  std::size_t place = 0;
  while (place + 1 < weights_.size() && rest >= weights_[place]) rest -= weights_[place++];
  return members[drawable_[place]].set;
}

/// Determines with which weights members of the front are drawn.
void Padds::drawWeights() {
  const PointTable& front = problem_.pareto->archive.points();
  const std::size_t objectives = front.width();
  std::size_t most = objectives > 2 ? kMostDrawn : front.size();
  if (settings_.selection == PaddsSelection::hypervolume) most = std::min(most, mostPointsOfHypervolume(objectives));
  drawable_ = spreadOver(front, most);
  PointTable values;
  const FrontScale scale(front);
  for (const std::size_t i : drawable_) values.add(scale.scaled(front[i]));
  weights_.assign(values.size(), 1.0);
  if (settings_.selection == PaddsSelection::hypervolume) {
    weights_ = hypervolumeContributions(values, std::vector<double>(objectives, FrontScale::kUsualReference));
  } else if (settings_.selection == PaddsSelection::crowding) {
    weights_ = crowdingDistances(values);
    double largest = 0.0;
    for (const double weight : weights_) largest = std::isfinite(weight) ? std::max(largest, weight) : largest;
    for (double& weight : weights_) weight = std::isfinite(weight) ? weight : largest;
  }
  if (!(std::accumulate(weights_.begin(), weights_.end(), 0.0) > 0.0)) weights_.assign(values.size(), 1.0);
}

const SearchFacts& PaddsMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {std::nullopt, "PADDS"},
                                      .longName = "Pareto Archived Dynamically Dimensioned Search",
                                      .runsInParallel = true,
                                      .findsFront = true};
  return kFacts;
}

BoundSection PaddsMethod::section() {
  using Method = PaddsMethod;
  static const SettingSection<PaddsMethod> section{
      {"OPTIMISATION_ALGORITHM/PADDS_CONTROL_PARAMETERS", "when `Algorithm_Type` is `'PADDS'`",
       "Pareto Archived Dynamically Dimensioned Search.",
       withParetoRows<Method>(
           {setting<Method>([](auto& m) -> auto& { return m.settings.perturbation; },
                            {.name = kPerturbationKeyword,
                             .defaultValue = "0.2",
                             .range = kFraction,
                             .refusal = "Error: Perturbation parameter in PADDS algorithm invalid",
                             .meaning = std::string(kPerturbationMeaning)}),
            namedChoice<Method, kPaddsSelectionNames>(
                [](auto& m) -> auto& { return m.selection; },
                {.name = "Selection",
                 .defaultValue = "'hypervolume'",
                 .meaning = "By what the set of the front that is perturbed is drawn: what it contributes to the "
                            "hypervolume, its crowding distance, or all alike."}),
            setting<Method>([](auto& m) -> auto& { return m.settings.candidates; },
                            {.name = "Candidates",
                             .defaultValue = "1",
                             .range = from(1),
                             .refusal = "Error: No. of candidates in PADDS algorithm invalid",
                             .meaning = "Candidates at a time, as many evaluations as slots or ranks can work on. "
                                        "Another number is another search; the number of slots makes no difference to "
                                        "it."})})}};
  return {section, *this};
}

std::string_view PaddsMethod::budgetRefusal() const {
  return "Error: Maximum No. of model evaluations in PADDS algorithm invalid";
}

RaisedBudget PaddsMethod::raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                                      const InitialSampleSettings& sample) const {
  SearchHistory ofSearch = history;
  // After an end by the hypervolume the last row is that of the final model run; otherwise one run is made again.
  if (pareto.hypervolumeEvaluations > 0 && history.evaluations == history.lastRow) --ofSearch.evaluations;
  RaisedBudget raised = DdsMethod::raiseBudget(ofSearch, stopping, sample);
  if (raised.earlier) {
    // What follows is the final model run, or candidates that were under way.
    raised.keptEvaluations = raised.earlier->lastEvaluation;
    raised.note = fmt::format(
        "Max_No_Evaluations was raised from {} to {}: as the probabilities of {} depend on it, they begin anew with "
        "the front of the first {} evaluations, which are kept{}",
        history.budget, stopping.maxEvaluations, facts().longName, raised.earlier->lastEvaluation,
        hypervolumeNote(pareto));
  } else if (!history.searches.empty()) {
    raised.keptEvaluations = history.searches.back().lastEvaluation;
  }
  return raised;
}

std::unique_ptr<SearchAlgorithm> PaddsMethod::make(SearchProblem problem) const {
  const PaddsSettings own{settings.perturbation, settings.candidates, selection};
  return std::make_unique<Padds>(own, pareto, std::move(problem));
}

SearchSummary PaddsMethod::run(SearchProblem problem, const PeriodicStep& /*periodicStep*/) const {
  // The earlier searches are parts of this one, and not searches of their own as those of DDS.
  return SearchMethod::run(std::move(problem), {});  // NOLINT(bugprone-parent-virtual-call)
}

}  // namespace mirevo

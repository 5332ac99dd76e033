#include "algorithms/searches/pareto_search.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include <fmt/format.h>

#include "algorithms/pareto/front_scale.h"
#include "algorithms/searches/population_search.h"
#include "common/rounded_text.h"

namespace mirevo {

bool hasObjectives(const EvaluationResult& result) {
  return result.ok() && std::ranges::all_of(result.objectiveValues, [](double value) { return std::isfinite(value); });
}

ParetoSearch::ParetoSearch(ParetoSettings settings, SearchProblem problem)
    : problem_(std::move(problem)), feasible_(problem_.feasibility), settings_(std::move(settings)) {}

bool ParetoSearch::isProblemValid() const {
  const SearchBounds& b = problem_.bounds;
  const std::size_t n = b.size();
  if (n == 0 || b.upper.size() != n || b.initial.size() != n || problem_.stopping.maxEvaluations <= 0) return false;
  for (std::size_t j = 0; j < n; ++j) {
    if (!std::isfinite(b.lower[j]) || !std::isfinite(b.upper[j]) || !(b.lower[j] <= b.upper[j])) return false;
  }
  return problem_.pareto != nullptr;
}

std::vector<ParetoPoint> ParetoSearch::runSample(std::span<const ParameterSet> sets) {
  std::vector<EvaluationResult> results = problem_.evaluator.evaluateParameterSets(sets, DispatchMode::task);
  problem_.evaluator.settleAggregates(results);
  std::vector<ParetoPoint> points;
  points.reserve(sets.size());
  for (std::size_t i = 0; i < sets.size(); ++i) points.push_back(take(sets[i], results[i]));
  return points;
}

std::vector<ParetoPoint> ParetoSearch::run(std::span<const ParameterSet> sets) {
  std::vector<ParetoPoint> points;
  if (sets.empty()) return points;
  const std::vector<EvaluationResult> results = problem_.evaluator.evaluateParameterSets(sets, DispatchMode::task);
  points.reserve(sets.size());
  for (std::size_t i = 0; i < sets.size(); ++i) points.push_back(take(sets[i], results[i]));
  return points;
}

ParetoPoint ParetoSearch::take(const ParameterSet& set, const EvaluationResult& result, bool* isOnFront) {
  ++summary_.evaluationCount;
  if (summary_.best.empty() || isBetter(result.aggregate, summary_.bestResult.aggregate)) {
    summary_.best = set;
    summary_.bestResult = result;
  }
  ParetoPoint point{result.number, set, {result.objectiveValues, 0.0}};
  bool entered = false;
  if (hasObjectives(result)) {
    entered = problem_.pareto->archive.add(result.number, set, result.objectiveValues);
  } else {
    const bool isOfConstraints = !result.ok() && result.failure->isOfConstraints();
    point.objectives.violation =
        isOfConstraints ? problem_.feasibility.violationAmount(set) : std::numeric_limits<double>::infinity();
    problem_.pareto->archive.addFailed();
  }
  if (isOnFront != nullptr) *isOnFront = entered;
  return point;
}

bool ParetoSearch::hasHypervolumeSettled() {
  constexpr int kTestsOfWindow = 20;
  const int window = settings_.hypervolumeEvaluations;
  const int made = summary_.evaluationCount;
  const int before = problem_.earlierSearches.empty() ? 0 : problem_.earlierSearches.back().lastEvaluation;
  if (window == 0 || made < nextTest_ || made - before <= window) return false;
  if (problem_.pareto->archive.members().empty()) return false;
  nextTest_ = made + std::max(1, window / kTestsOfWindow);
  const ParetoArchive& archive = problem_.pareto->archive;
  const std::vector<std::vector<double>> front = archive.frontAfter(made - window);
  if (front.empty()) return false;
  const FrontScale scale(archive.points(), settings_.referencePoint);
  const double now = scale.hypervolumeShare(archive.front());
  const double then = scale.hypervolumeShare(front);
  if (!(now > 0.0) || now - then >= settings_.hypervolumeChange * now) return false;
  summary_.notes.push_back(fmt::format(
      "In the last {} evaluations the hypervolume of the front has grown by {} % (Hypervolume_Change: "
      "{} %)",
      window, roundedText(100.0 * (now - then) / now, 2), roundedText(100.0 * settings_.hypervolumeChange, 2)));
  return true;
}

std::string hypervolumeNote(const ParetoSettings& settings) {
  if (settings.hypervolumeEvaluations == 0) return {};
  return fmt::format("; the hypervolume is tested anew over the evaluations behind them (Hypervolume_Evaluations: {})",
                     settings.hypervolumeEvaluations);
}

void ParetoSearch::checkEnd() {
  summary_.replacedCount = feasible_.replacedCount();
  summary_.returnedCount = feasible_.returnedCount();
  if (budgetLeft() <= 0) {
    summary_.terminationMessage = kBudgetUsedMessage;
  } else if (hasHypervolumeSettled()) {
    summary_.terminationMessage = kHypervolumeSettledMessage;
  }
}

}  // namespace mirevo

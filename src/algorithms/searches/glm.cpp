#include "algorithms/searches/glm.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>
#include <utility>

#include <fmt/format.h>

#include "algorithms/analyses/local_sensitivity.h"
#include "algorithms/searches/glm_step.h"
#include "algorithms/searches/initial_sample.h"
#include "algorithms/searches/population_search.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Lines of which the log shows that many.
constexpr std::size_t kMostNotes = 500;
/// Batches of trial sets with ever larger lambdas before an iteration gives up.
constexpr int kMostAttempts = 3;
/// An iteration that gains less than this share of the sum of squares is near the optimum: central differences follow.
constexpr double kNearOptimum = 0.1;
/// After steps that gain less than this share of what the linear model expects of them the derivatives are made anew.
constexpr double kPoorGain = 0.25;
/// Iterations in a row that must gain less than Min_Change.
constexpr int kSmallChanges = 2;
/// And such iterations whose steps constraints have stopped, after which the run ends without having converged.
constexpr int kStoppedChanges = 5;
constexpr double kLeastLambda = 1.0e-10;
/// A step neither side of which can be run is shortened so often, each time to this share.
constexpr std::size_t kMostShortenings = 5;
constexpr double kShortening = 0.25;
constexpr std::string_view kNeitherSide = "neither side";
constexpr std::string_view kStopped = "constraints or equations stop its steps, which need not be a minimum";

double sumOfSquares(std::span<const double> values) {
  double sum = 0.0;
  for (const double value : values) sum += value * value;
  return sum;
}

std::string failureText(const EvaluationResult& result) {
  std::string text = fmt::format("evaluation {}: {}", result.number, result.failure->reason);
  for (const std::string& line : result.failure->lastOutput) text += "\n| " + line;
  return text;
}

/// The sets that the initial sample has: those given, and as many as are to be drawn.
std::size_t sampleCount(const GlmSettings& settings, const InitialSampleSettings& sample) {
  auto count = static_cast<std::size_t>(std::max(settings.sampleSize, settings.startCount));
  if (sample.generation == SampleGeneration::fromFile) return count;
  return std::max(count, sample.earlierSetCount + (sample.includeInitialParameters ? 1U : 0U));
}

}  // namespace

Glm::Glm(const GlmSettings& settings, SearchProblem problem)
    : settings_(settings),
      problem_(std::move(problem)),
      feasible_(problem_.feasibility),
      constraints_(problem_.feasibility, problem_.bounds) {}

bool Glm::isProblemValid() const {
  const SearchBounds& b = problem_.bounds;
  const std::size_t n = b.size();
  if (n == 0 || b.upper.size() != n || b.initial.size() != n || problem_.stopping.maxEvaluations <= 0) return false;
  for (std::size_t j = 0; j < n; ++j) {
    if (!std::isfinite(b.lower[j]) || !std::isfinite(b.upper[j]) || !(b.lower[j] < b.upper[j])) return false;
  }
  const auto fits = [n](const std::vector<double>& values) { return values.empty() || values.size() == n; };
  return problem_.residuals != nullptr && problem_.residuals->residualsOf && problem_.residuals->space.size() == n &&
         fits(settings_.priorValues) && fits(settings_.priorWeights);
}

/// As a share of the range, on the search scale.
double Glm::priorDistance(const ParameterSet& set, std::size_t j) const {
  const SearchBounds& b = problem_.bounds;
  double prior = b.initial[j];
  if (!settings_.priorValues.empty()) {
    prior = settings_.priorValues[j];
    if (problem_.residuals->space.transformation[j] == TransformationType::logarithmic) prior = std::log(prior);
  }
  const double weight = settings_.priorWeights.empty() ? 1.0 : settings_.priorWeights[j];
  return std::sqrt(settings_.regularisation * weight) * (set[j] - prior) / (b.upper[j] - b.lower[j]);
}

double Glm::priorSum(const ParameterSet& set) const {
  double sum = 0.0;
  if (!(settings_.regularisation > 0.0)) return sum;
  for (std::size_t j = 0; j < set.size(); ++j) sum += priorDistance(set, j) * priorDistance(set, j);
  return sum;
}

std::vector<std::optional<Glm::Point>> Glm::run(std::span<const ParameterSet> sets) {
  const auto count = std::min(sets.size(), static_cast<std::size_t>(std::max(0, budgetLeft())));
  std::vector<std::optional<Point>> points;
  if (count == 0) return points;
  std::vector<EvaluationResult> results =
      problem_.evaluator.evaluateParameterSets(sets.first(count), DispatchMode::task);
  summary_.evaluationCount += static_cast<int>(count);
  problem_.residuals->evaluationCount = summary_.evaluationCount;
  summary_.sums->course.extendTo(summary_.evaluationCount);
  if (summary_.evaluationCount == static_cast<int>(count)) problem_.evaluator.settleAggregates(results);
  for (std::size_t i = 0; i < count; ++i) {
    std::optional<Point>& point = points.emplace_back();
    if (summary_.best.empty()) {
      summary_.best = sets[i];
      summary_.bestResult = results[i];
    }
    const auto noteFailure = [this](std::string text) {
      if (firstFailure_.empty()) firstFailure_ = std::move(text);
    };
    if (!results[i].ok()) {
      noteFailure(failureText(results[i]));
      continue;
    }
    ResidualRows rows = problem_.residuals->residualsOf(results[i]);
    results[i].simulatedValues = {};
    if (!std::ranges::all_of(rows.values, [](double value) { return std::isfinite(value); })) {
      noteFailure(fmt::format("evaluation {} succeeded, but not all of its residuals are known", results[i].number));
      continue;
    }
    units_.resize(rows.units.size(), std::numeric_limits<double>::infinity());
    for (std::size_t k = 0; k < units_.size(); ++k) units_[k] = std::min(units_[k], rows.units[k]);
    const double squares = sumOfSquares(rows.values);
    const double sum = squares + priorSum(sets[i]);
    if (!std::isfinite(sum)) {
      noteFailure(
          fmt::format("evaluation {} succeeded, but its sum of squares, with that of the prior values, is beyond the "
                      "range of numbers",
                      results[i].number));
      continue;
    }
    const int ordinal = summary_.evaluationCount - static_cast<int>(count - i) + 1;
    point = Point{sets[i], std::move(results[i]), std::move(rows), squares, sum, ordinal};
  }
  return points;
}

SearchStatus Glm::initialise() {
  if (!isProblemValid()) return kSearchSettingsInvalid;
  summary_.sums.emplace();
  InitialSampleSettings sampleSettings = problem_.initialSample;
  if (sampleSettings.generation != SampleGeneration::fromFile) {
    sampleSettings.earlierSetCount = problem_.givenSample.size();
  }
  const std::size_t count =
      std::min(sampleCount(settings_, sampleSettings), static_cast<std::size_t>(problem_.stopping.maxEvaluations));
  std::vector<ParameterSet> sample =
      drawInitialSample(problem_.initialSample, problem_.givenSample, problem_.bounds, count, problem_.random);
  feasible_.replaceInSample(sample, givenSetCount(problem_.initialSample, problem_.givenSample.size(), count),
                            problem_.bounds, problem_.random);
  for (std::optional<Point>& point : run(sample)) {
    if (!point) continue;
    noteBest(*point);
    summary_.sums->start = best_->sum;
    starts_.push_back(*std::move(point));
  }
  std::stable_sort(starts_.begin(), starts_.end(), [](const Point& a, const Point& b) { return a.sum < b.sum; });
  const auto wanted = std::min(sample.size(), static_cast<std::size_t>(settings_.startCount));
  if (!starts_.empty() && starts_.size() < wanted) {
    note(fmt::format("GLM has {} in place of {}: the other runs of the initial sample failed",
                     countText(starts_.size(), "start"), wanted));
  }
  starts_.resize(std::min(starts_.size(), wanted));
  startCount_ = starts_.size();
  if (starts_.empty()) {
    summary_.failure = "No model run of the initial sample of GLM succeeded";
    summary_.failureDetail = fmt::format("{} made, none of which has residuals to start from; the first of them, {}",
                                         countText(sample.size(), "evaluation"), firstFailure_);
    end("Optimisation terminated: No model run of the initial sample succeeded");
  } else if (budgetLeft() <= 0) {
    end(std::string(kBudgetUsedMessage));
  } else {
    startNext();
  }
  return kSearchOk;
}

void Glm::startNext() {
  current_ = std::move(starts_.front());
  leastOfRuns_ = std::min(leastOfRuns_, current_->sum);
  starts_.pop_front();
  summary_.starts.push_back(current_->set);
  jacobian_.clear();
  differences_.reset();
  needsJacobian_ = true;
  isCentral_ = settings_.differences == GlmDifferences::central;
  updates_ = smallChanges_ = stoppedChanges_ = iteration_ = 0;
  lambda_ = settings_.initialLambda;
  ++runCount_;
  note(fmt::format("Run {} of GLM starts from evaluation {}: sum of squares {}", runCount_, current_->result.number,
                   formatReal(current_->sum)));
}

void Glm::note(std::string text) {
  if (summary_.notes.size() < kMostNotes) {
    summary_.notes.push_back(std::move(text));
  } else if (summary_.notes.size() == kMostNotes) {
    summary_.notes.emplace_back("Further iterations of GLM are not listed");
  }
}

void Glm::noteBest(const Point& point) {
  if (best_ && !(point.sum < best_->sum)) return;
  best_ = point;
  summary_.best = point.set;
  summary_.bestResult = point.result;
  summary_.sums->best = point.sum;
  summary_.sums->course.improve(point.ordinal, point.sum);
  problem_.residuals->fit =
      ResidualFit{point.set, point.result.number, point.sum, {point.rows.values, units_}, differences_};
}

void Glm::end(std::string message) {
  const SearchBounds& b = problem_.bounds;
  if (message == kBudgetUsedMessage && runCount_ > 0) {
    note(fmt::format("Run {} of GLM was going on when the budget was used up: sum of squares {}", runCount_,
                     formatReal(current_->sum)));
  }
  if (!starts_.empty()) {
    note(fmt::format("Warning: The budget left none for {} of {} of GLM", starts_.size(),
                     countText(startCount_, "start")));
  }
  for (std::size_t j = 0; best_ && j < b.size(); ++j) {
    const bool isAtLower = best_->set[j] <= b.lower[j];
    if (!isAtLower && !(best_->set[j] >= b.upper[j])) continue;
    note(fmt::format("The estimate of {} is at its {} bound", problem_.residuals->space.names[j],
                     isAtLower ? "lower" : "upper"));
  }
  for (const std::string& constraint : best_ ? constraints_.holdingTexts(best_->set) : std::vector<std::string>()) {
    note(fmt::format("The estimate lies at {}", constraint));
  }
  if (best_ && runCount_ > 0 && best_->sum < leastOfRuns_) {
    note(fmt::format(
        "The best set, evaluation {}, is one of the differences: sum of squares {}, {:.3g} % less than where "
        "the runs have come to. A search with it as the initial set goes on from there",
        best_->result.number, formatReal(best_->sum), 100.0 * (1.0 - best_->sum / leastOfRuns_)));
  }
  summary_.terminationMessage = std::move(message);
}

void Glm::endRun(std::string_view reason) {
  note(fmt::format("Run {} of GLM ended after {}, as {}: sum of squares {}", runCount_,
                   countText(static_cast<std::size_t>(iteration_), "iteration"), reason, formatReal(current_->sum)));
  if (reason == kStopped) {
    std::string names;
    for (const std::string& name : stoppedBy_) names += (names.empty() ? "" : ", ") + name;
    note("Its last trial sets were stopped by " + names);
  }
  std::string unknown;
  for (std::size_t j = 0; differences_ && j < differences_->problems.size(); ++j) {
    if (differences_->problems[j].empty()) continue;
    unknown += (unknown.empty() ? "" : ", ") + problem_.residuals->space.names[j];
  }
  if (!unknown.empty()) {
    note(fmt::format("Warning: Run {} of GLM need not have come to a minimum: the derivatives by {} are not known",
                     runCount_, unknown));
  }
  if (!starts_.empty()) {
    startNext();
  } else {
    end(fmt::format("Optimisation terminated: {} of GLM ended as {}", runCount_ == 1 ? "The run" : "The last run",
                    reason));
  }
}

/// The differences at the current set. Where neither side of a parameter's step can be run the step is shortened; if
/// that does not help, the parameter has no difference.
PerturbationPlan Glm::planDifferences() const {
  const ResidualProblem& residuals = *problem_.residuals;
  const Feasibility& feasibility = problem_.feasibility;
  const auto planWith = [&](double share) {
    SensitivitySettings settings;
    settings.differencing = isCentral_ ? Differencing::central : Differencing::forward;
    settings.perturbationOption = settings_.perturbationOption;
    settings.perturbationFraction = share * settings_.perturbationFraction;
    return planPerturbations(settings, residuals.space, current_->set, residuals.fields, feasibility);
  };
  std::vector<PerturbationPlan> plans{planWith(1.0)};
  if (!feasibility.isTested()) return std::move(plans.front());
  PerturbationPlan runnable;
  runnable.sets.push_back(plans.front().sets.front());
  for (std::size_t j = 0; j < problem_.bounds.size(); ++j) {
    ParameterDifference difference;
    std::optional<std::string> violation;
    double share = 1.0;
    for (std::size_t k = 0; k <= kMostShortenings; ++k, share *= kShortening) {
      if (k == plans.size()) plans.push_back(planWith(share));
      const PerturbationPlan& plan = plans[k];
      difference = plan.differences[j];
      const auto violationOf = [&](std::size_t set) {
        return set == 0 ? std::nullopt : feasibility.violation(plan.sets[set]);
      };
      violation = difference.problem.empty() ? violationOf(difference.minus) : std::nullopt;
      if (!violation && difference.problem.empty()) violation = violationOf(difference.plus);
      if (violation) continue;
      for (std::size_t* const side : {&difference.minus, &difference.plus}) {
        if (*side == 0 || !difference.problem.empty()) continue;
        runnable.sets.push_back(plan.sets[*side]);
        *side = runnable.sets.size() - 1;
      }
      break;
    }
    if (violation) {
      difference.minus = difference.plus = 0;
      difference.problem = fmt::format("{} of its step can be run ({})", kNeitherSide, *violation);
    }
    runnable.differences.push_back(std::move(difference));
  }
  return runnable;
}

/// Runs the sets of the differences and takes the columns; false if the budget ends before.
bool Glm::makeJacobian() {
  const ResidualProblem& residuals = *problem_.residuals;
  PerturbationPlan plan = planDifferences();
  const std::vector<std::optional<Point>> points = run(std::span(plan.sets).subspan(1));
  if (points.size() + 1 < plan.sets.size()) {
    noteDifferences(points);
    return false;
  }
  std::vector<std::vector<double>> outputs{current_->rows.values};
  for (const std::optional<Point>& point : points) {
    outputs.push_back(point ? point->rows.values : std::vector<double>());
  }
  const auto lacks = [&outputs](std::size_t set) { return set != 0 && outputs[set].empty(); };
  for (ParameterDifference& difference : plan.differences) {
    if (!difference.problem.empty()) continue;
    const bool lacksMinus = lacks(difference.minus);
    if (lacksMinus == lacks(difference.plus) || !difference.isCentral()) continue;
    difference.width = lacksMinus ? difference.widthAbove : difference.widthBelow;
    (lacksMinus ? difference.minus : difference.plus) = 0;
    if (!(std::abs(difference.width) > 0.0)) difference.problem = "its step is lost as it is written";
  }
  std::vector<std::vector<double>> columns = differenceColumns(plan, outputs);
  const bool isFirst = jacobian_.empty();
  jacobian_.resize(columns.size(), std::vector<double>(current_->rows.values.size(), 0.0));
  auto made = std::make_shared<DifferenceJacobian>();
  made->base = current_->set;
  made->evaluation = current_->result.number;
  for (std::size_t j = 0; j < columns.size(); ++j) {
    const ParameterDifference& difference = plan.differences[j];
    const bool isKnown = std::ranges::all_of(columns[j], [](double value) { return std::isfinite(value); });
    std::string problem = difference.problem;
    if (problem.empty() && !isKnown) problem = "the run with its step failed";
    made->problems.push_back(isKnown ? "" : problem);
    made->widths.push_back(isKnown ? difference.width : 0.0);
    if (isKnown) {
      jacobian_[j] = std::move(columns[j]);
      continue;
    }
    const bool canHavePrevious = difference.problem.empty() || difference.problem.starts_with(kNeitherSide);
    const bool hasPrevious = !isFirst && canHavePrevious && sumOfSquares(jacobian_[j]) > 0.0;
    note(fmt::format(
        "Iteration {}: no derivatives by {}, as {}; {}", iteration_, residuals.space.names[j], problem,
        hasPrevious ? "those of the iteration before are used, updated after Broyden" : "the parameter is held"));
    if (hasPrevious) {
      made->problems.back().clear();
    } else {
      std::ranges::fill(jacobian_[j], 0.0);
    }
  }
  made->columns = jacobian_;
  differences_ = std::move(made);
  needsJacobian_ = false;
  updates_ = 0;
  noteDifferences(points);
  if (best_->result.number == current_->result.number) {
    ResidualFit& fit = *problem_.residuals->fit;
    fit.jacobian = differences_;
    fit.rows.units = units_;
  }
  return true;
}

/// Where a run has come to its minimum, a difference is no better.
void Glm::noteDifferences(std::span<const std::optional<Point>> points) {
  constexpr double kNegligible = 1.0e-6;
  for (const std::optional<Point>& point : points) {
    if (point && point->sum < (1.0 - kNegligible) * best_->sum) noteBest(*point);
  }
}

/// With the rows of the prior.
GlmLinearModel Glm::linearModel() const {
  std::vector<std::vector<double>> columns = jacobian_;
  std::vector<double> residuals = current_->rows.values;
  const SearchBounds& b = problem_.bounds;
  for (std::size_t j = 0; settings_.regularisation > 0.0 && j < columns.size(); ++j) {
    const double weight = settings_.priorWeights.empty() ? 1.0 : settings_.priorWeights[j];
    const double derivative = std::sqrt(settings_.regularisation * weight) / (b.upper[j] - b.lower[j]);
    for (std::size_t k = 0; k < columns.size(); ++k) columns[k].push_back(k == j ? derivative : 0.0);
    residuals.push_back(priorDistance(current_->set, j));
  }
  for (std::size_t j = 0; j < columns.size(); ++j) {  // also by the prior
    if (sumOfSquares(jacobian_[j]) == 0.0 && !differences_->problems[j].empty()) std::ranges::fill(columns[j], 0.0);
  }
  GlmLinearModel model(std::move(columns), residuals, current_->set, b, settings_.smallestSingularValue);
  if (constraints_.areAny()) {
    std::vector<bool> isKnown;
    for (const std::string& problem : differences_->problems) isKnown.push_back(problem.empty());
    model.freeUnseen(isKnown);
  }
  return model;
}

/// First 0 and those around the last good one, then ever larger ones.
std::vector<double> Glm::lambdas(int attempt) const {
  std::vector<double> found;
  const auto count = static_cast<std::size_t>(settings_.lambdaCount);
  if (attempt == 0) {
    found.push_back(0.0);
    for (int k = 0; found.size() < count; ++k) {
      found.push_back(lambda_ * std::pow(10.0, k % 2 == 0 ? -k / 2 : (k + 1) / 2));
    }
    return found;
  }
  const auto before = settings_.lambdaCount / 2 + (attempt - 1) * settings_.lambdaCount;
  for (std::size_t k = 0; k < count; ++k) {
    found.push_back(lambda_ * std::pow(10.0, before + 1 + static_cast<int>(k)));
  }
  return found;
}

/// What keeps the set from being run.
std::vector<std::string> Glm::stoppersOf(const ParameterSet& set) const {
  std::vector<std::string> texts = constraints_.violatedTexts(set);
  if (texts.empty()) texts.emplace_back("equations without a finite value");
  return texts;
}

/// One set for each lambda, but for those that others have led to.
std::vector<ParameterSet> Glm::trialSets(GlmLinearModel& model, std::span<const double> lambdas,
                                         std::vector<Trial>& trials) {
  std::vector<ParameterSet> sets;
  for (const double lambda : lambdas) {
    ParameterSet wanted = constraints_.led(
        [&](std::span<const LinearConstraint> kept) { return model.setFor(lambda, kept); }, current_->set);
    const bool isStopped = !problem_.feasibility.holds(wanted);
    if (isStopped) stoppedBy_ = stoppersOf(wanted);
    ParameterSet set = feasible_.drawnBack(std::move(wanted), {current_->set});
    if (set == current_->set || std::ranges::find(sets, set) != sets.end()) continue;
    sets.push_back(std::move(set));
    trials.push_back({lambda, isStopped});
  }
  return sets;
}

SearchStatus Glm::advance() {
  if (summary_.evaluationCount == 0) return kSearchNotInitialised;
  if (isTerminated()) return kSearchOk;
  ++summary_.loopCount;
  ++iteration_;
  madeBefore_ = summary_.evaluationCount;
  if (needsJacobian_ && !makeJacobian()) {
    end(std::string(kBudgetUsedMessage));
    return kSearchOk;
  }
  stoppedBy_.clear();
  GlmLinearModel model = linearModel();
  const bool isWhole = std::ranges::all_of(differences_->problems, &std::string::empty);
  const bool isInert = std::ranges::all_of(jacobian_, [](const auto& column) { return sumOfSquares(column) == 0.0; });
  if (isInert && current_->squares > 0.0 && settings_.regularisation == 0.0 && isWhole) {
    refineOr("no residual changes with any parameter");
    return kSearchOk;
  }
  if (model.largestCosine(constraints_.holding(current_->set)) < settings_.minGradient) {
    refineOr(isWhole ? "the gradient is negligible" : "the gradient is negligible where it is known");
    return kSearchOk;
  }
  for (int attempt = 0; attempt < kMostAttempts; ++attempt) {
    std::vector<Trial> trials;
    const std::vector<ParameterSet> sets = trialSets(model, lambdas(attempt), trials);
    std::vector<std::optional<Point>> points = run(sets);
    const bool isCut = points.size() < sets.size();
    const auto bestOf = [&] {
      std::optional<std::size_t> found;
      for (std::size_t i = 0; i < points.size(); ++i) {
        if (points[i] && points[i]->sum < (found ? points[*found]->sum : current_->sum)) found = i;
      }
      return found;
    };
    std::optional<std::size_t> best = bestOf();
    const double gain = best ? current_->sum - points[*best]->sum : 0.0;
    if (attempt == 0 && !isCut && !sets.empty() && gain < kNearOptimum * current_->sum &&
        gain < kPoorGain * (current_->sum - model.sumOfSquaresAt(sets.front()))) {
      correctTrials(model, points, trials);
      best = bestOf();
    }
    if (best) {
      const double expected = current_->sum - model.sumOfSquaresAt(points[*best]->set);
      accept(*std::move(points[*best]), trials[*best], expected);
    }
    if (isCut || budgetLeft() <= 0) {
      if (!isTerminated()) end(std::string(kBudgetUsedMessage));
      return kSearchOk;
    }
    if (best) return kSearchOk;
    const bool isUndamped =
        attempt == 0 && !points.empty() && trials.front().lambda == 0.0 && !trials.front().isStopped;
    if (isUndamped && updates_ == 0 && isLastKind() && points.front() && isLevelWith(*points.front())) {
      takeLevel(*std::move(points.front()));
      endRun("the step to the minimum changes the sum of squares by no more than its rounding");
      return kSearchOk;
    }
  }
  note(fmt::format("Iteration {}: no step reduces the sum of squares", iteration_));
  refineOr(stoppedBy_.empty() ? "no step reduces the sum of squares any further" : kStopped);
  return kSearchOk;
}

void Glm::correctTrials(GlmLinearModel& model, std::vector<std::optional<Point>>& points, std::vector<Trial>& trials) {
  std::vector<ParameterSet> sets;
  std::vector<Trial> corrections;
  for (std::size_t i = 0; i < points.size(); ++i) {
    if (!points[i]) continue;
    std::vector<double> lack = points[i]->rows.values;
    for (std::size_t k = 0; k < lack.size(); ++k) lack[k] -= current_->rows.values[k];
    for (std::size_t j = 0; j < jacobian_.size(); ++j) {
      const double change = points[i]->set[j] - current_->set[j];
      for (std::size_t k = 0; k < lack.size(); ++k) lack[k] -= jacobian_[j][k] * change;
    }
    const double lambda = trials[i].lambda;
    ParameterSet wanted = constraints_.movedInside(
        model.correctedSet(lambda, points[i]->set, jacobian_, lack, constraints_.holding(points[i]->set)));
    const bool isStopped = trials[i].isStopped || !problem_.feasibility.holds(wanted);
    if (isStopped && stoppedBy_.empty()) stoppedBy_ = stoppersOf(wanted);
    ParameterSet set = feasible_.drawnBack(std::move(wanted), {current_->set});
    if (set == points[i]->set || set == current_->set || std::ranges::find(sets, set) != sets.end()) continue;
    sets.push_back(std::move(set));
    corrections.push_back({lambda, isStopped});
  }
  std::vector<std::optional<Point>> corrected = run(sets);
  for (std::size_t i = 0; i < corrected.size(); ++i) {
    points.push_back(std::move(corrected[i]));
    trials.push_back(corrections[i]);
  }
}

/// Where the sum of squares is flat to its last digits, the step of the linear model still has some.
bool Glm::isLevelWith(const Point& point) const {
  constexpr double kRounding = 1.0e-13;
  return point.sum <= current_->sum * (1.0 + kRounding);
}

bool Glm::isLastKind() const {
  return isCentral_ || settings_.differences == GlmDifferences::forward;
}

void Glm::takeLevel(Point point) {
  const bool isBest = best_->result.number == current_->result.number;
  current_ = std::move(point);
  if (!isBest) return;
  best_.reset();
  noteBest(*current_);
}

void Glm::refineOr(std::string_view end) {
  smallChanges_ = stoppedChanges_ = 0;
  if (updates_ > 0) {
    needsJacobian_ = true;
  } else if (settings_.differences == GlmDifferences::automatic && !isCentral_) {
    isCentral_ = needsJacobian_ = true;
  } else {
    endRun(end);
    return;
  }
  lambda_ = settings_.initialLambda;
}

void Glm::accept(Point point, const Trial& trial, double expected) {
  const double reduction = current_->sum - point.sum;
  const double share = reduction / current_->sum;
  const SearchBounds& b = problem_.bounds;
  std::vector<double> step;
  double stepSquare = 0.0;
  double largest = 0.0;
  for (std::size_t j = 0; j < b.size(); ++j) {
    step.push_back((point.set[j] - current_->set[j]) / (b.upper[j] - b.lower[j]));
    stepSquare += step[j] * step[j];
    largest = std::max(largest, std::abs(step[j]));
  }
  // Broyden's update, in shares of the ranges: the least change with which the columns explain this step.
  std::vector<double> unexplained = point.rows.values;
  for (std::size_t i = 0; i < unexplained.size(); ++i) unexplained[i] -= current_->rows.values[i];
  for (std::size_t j = 0; j < b.size(); ++j) {
    const double change = point.set[j] - current_->set[j];
    for (std::size_t i = 0; i < unexplained.size(); ++i) unexplained[i] -= jacobian_[j][i] * change;
  }
  for (std::size_t j = 0; j < b.size(); ++j) {
    const double factor = step[j] / stepSquare / (b.upper[j] - b.lower[j]);
    const bool isHeld = !differences_->problems[j].empty();
    for (std::size_t i = 0; !isHeld && i < unexplained.size(); ++i) jacobian_[j][i] += factor * unexplained[i];
  }
  note(fmt::format("Iteration {}: {} ({}), lambda {}, sum of squares {}, {:.3g} % less{}", iteration_,
                   countText(static_cast<std::size_t>(summary_.evaluationCount - madeBefore_), "model run"),
                   updates_ > 0 || differences_->evaluation != current_->result.number ? "derivatives after Broyden"
                   : isCentral_                                                        ? "central differences"
                                                                                       : "forward differences",
                   formatReal(trial.lambda), formatReal(point.sum), 100.0 * share,
                   trial.isStopped ? ", where constraints or equations stop the step" : ""));
  noteBest(point);
  current_ = std::move(point);
  leastOfRuns_ = std::min(leastOfRuns_, current_->sum);
  lambda_ = std::max(kLeastLambda, trial.lambda > 0.0 ? trial.lambda : lambda_ / 10.0);
  judge(share, largest, reduction > kPoorGain * expected, trial.isStopped);
}

/// What an accepted step leads to.
void Glm::judge(double reduction, double step, bool isAsExpected, bool isStopped) {
  if (!(current_->sum > 0.0)) {
    endRun("the sum of squares is 0");
    return;
  }
  const bool isSmall = reduction < problem_.stopping.minChange;
  const bool isFresh = updates_ == 0;
  if (isStopped) {  // its length tells nothing of a minimum
    ++updates_;
    needsJacobian_ = updates_ > settings_.broydenUpdates || !isAsExpected;
    smallChanges_ = 0;
    stoppedChanges_ = isSmall || step < settings_.minStep ? stoppedChanges_ + 1 : 0;
    if (stoppedChanges_ < kStoppedChanges) return;
    if (isFresh) updates_ = 0;  // this step's derivatives were made for it
    const int count = stoppedChanges_;
    refineOr(kStopped);
    if (!isFresh) stoppedChanges_ = count;  // the next step, with derivatives of its own, decides
    return;
  }
  stoppedChanges_ = 0;
  smallChanges_ = isSmall ? smallChanges_ + 1 : 0;
  ++updates_;
  needsJacobian_ = updates_ > settings_.broydenUpdates || !isAsExpected;
  if (step < settings_.minStep || smallChanges_ >= kSmallChanges) {
    if (isFresh) updates_ = 0;  // this step's derivatives were made for it
    const int smallChanges = smallChanges_;
    refineOr(step < settings_.minStep ? "its steps are less than Min_Step"
                                      : "the sum of squares changes by less than Min_Change");
    if (!isFresh) smallChanges_ = std::min(smallChanges, kSmallChanges - 1);  // the next step, with its own, decides
    return;
  }
  if (settings_.differences == GlmDifferences::automatic && !isCentral_ && reduction < kNearOptimum) {
    isCentral_ = needsJacobian_ = true;
  }
}

const SearchFacts& GlmMethod::facts() const {
  static constexpr SearchFacts kFacts{.name = {std::nullopt, "GLM"},
                                      .longName = "Gauss-Levenberg-Marquardt",
                                      .runsInParallel = true,
                                      .drawsInitialSample = true,
                                      .needsRanges = true,
                                      .usesResiduals = true};
  return kFacts;
}

std::optional<SettingRefusal> GlmMethod::refusalFor(const SearchSpace& space) const {
  constexpr std::string_view kRefusal = "Error: Prior values in GLM algorithm invalid";
  const std::pair<std::string_view, const std::vector<double>&> lists[] = {{"Prior_Values", settings.priorValues},
                                                                           {"Prior_Weights", settings.priorWeights}};
  for (const auto& [keyword, values] : lists) {
    if (values.empty() || values.size() == space.size()) continue;
    return SettingRefusal{
        std::string(kRefusal), keyword,
        fmt::format("expected {}, one for each variable parameter, found {}", space.size(), values.size())};
  }
  for (std::size_t j = 0; j < settings.priorValues.size(); ++j) {
    if (space.transformation[j] != TransformationType::logarithmic || settings.priorValues[j] > 0.0) continue;
    return SettingRefusal{std::string(kRefusal), "Prior_Values",
                          fmt::format("expected a value above 0 for the logarithmic parameter {}, found {}",
                                      space.names[j], formatReal(settings.priorValues[j]))};
  }
  for (const double weight : settings.priorWeights) {
    if (weight >= 0.0) continue;
    return SettingRefusal{std::string(kRefusal), "Prior_Weights",
                          fmt::format("expected weights of 0 or more, found {}", formatReal(weight))};
  }
  return std::nullopt;
}

std::vector<SearchDoubt> GlmMethod::doubts() const {
  std::vector<SearchDoubt> found;
  if (settings.regularisation > 0.0) return found;
  if (!settings.priorValues.empty()) found.push_back({"Prior_Values", "has no effect with Regularisation = 0"});
  if (!settings.priorWeights.empty()) found.push_back({"Prior_Weights", "has no effect with Regularisation = 0"});
  return found;
}

std::vector<SearchDoubt> GlmMethod::doubtsIn(const SearchSpace& space) const {
  std::string outside;
  for (std::size_t j = 0; settings.regularisation > 0.0 && j < settings.priorValues.size(); ++j) {
    const double value = settings.priorValues[j];
    const bool isLogarithmic = space.transformation[j] == TransformationType::logarithmic;
    const double scaled = isLogarithmic ? std::log(value) : value;
    if (scaled >= space.lower[j] && scaled <= space.upper[j]) continue;
    outside += fmt::format("{}{} of {}", outside.empty() ? "" : ", ", formatReal(value), space.names[j]);
  }
  if (outside.empty()) return {};
  return {{"Prior_Values", "outside the bounds, towards which the estimates are drawn: " + outside}};
}

std::int64_t GlmMethod::sampleSize(const InitialSampleSettings& sample, int /*budget*/) const {
  return static_cast<std::int64_t>(sampleCount(settings, sample));
}

std::string GlmMethod::seedDoubt(const InitialSampleSettings& sample) const {
  const std::size_t count = sampleCount(settings, sample);
  const std::size_t given = givenSetCount(sample, sample.earlierSetCount, count);
  if (given < count) return {};
  if (sample.generation == SampleGeneration::fromFile) {
    return "all sets of its sample are those of Initial_Sample_File_Name. With another Initial_Sample_Generation they "
           "are drawn";
  }
  return fmt::format("all would start from {}. A Sample_Size or Starts above {} in GLM_CONTROL_PARAMETERS draws others",
                     given == 1 ? "the one set that is given" : fmt::format("the same {} given sets", given), given);
}

RaisedBudget GlmMethod::raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                                    const InitialSampleSettings& sample) const {
  RaisedBudget raised;
  const std::int64_t count = sampleSize(sample, history.budget);
  if (history.budget < count) {
    raised.refusal = fmt::format(
        "Max_No_Evaluations: {} then, {} now: only a search whose budget held its initial sample of {} sets can be "
        "taken further",
        history.budget, stopping.maxEvaluations, count);
    return raised;
  }
  // An evaluation beyond the earlier budget is the final model run of the search that used the budget up.
  raised.keptEvaluations = history.budget;
  raised.note = fmt::format("Max_No_Evaluations was raised from {} to {}: the search goes on where it ended",
                            history.budget, stopping.maxEvaluations);
  return raised;
}

std::unique_ptr<SearchAlgorithm> GlmMethod::make(SearchProblem problem) const {
  return std::make_unique<Glm>(settings, std::move(problem));
}

}  // namespace mirevo

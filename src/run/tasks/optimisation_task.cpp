#include "run/tasks/optimisation_task.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <span>
#include <utility>

#include <fmt/format.h>

#include "algorithms/numbers/lapack_functions.h"
#include "algorithms/pareto/front_scale.h"
#include "algorithms/searches/residual_problem.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/statistics.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/simulated_room.h"
#include "run/tasks/watched_evaluator.h"

namespace mirevo {
namespace {

constexpr double kRounding = 1.0e-9;  // share of an aggregate that a function of the same squares may differ by
constexpr std::string_view kWhatGivenSets = "given sets of the initial sample";

/// Gives every set the value of a failed run, and keeps the sets.
class NoModel final : public Evaluator {
 public:
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets,
                                                      DispatchMode /*mode*/) override {
    sets_.insert(sets_.end(), sets.begin(), sets.end());
    return std::vector<EvaluationResult>(sets.size());
  }
  const std::vector<ParameterSet>& sets() const { return sets_; }

 private:
  std::vector<ParameterSet> sets_;
};

void logValues(RunLog& log, std::string_view heading, std::span<const std::string> names,
               std::span<const double> values) {
  log.line(heading);
  for (std::size_t i = 0; i < names.size() && i < values.size(); ++i) {
    log.line(fmt::format("   {} = {}", names[i], formatReal(values[i])));
  }
}

/// Where the only feasible steps of some parameters are those that leave them as they are.
void warnOfHeldParameters(const TaskContext& context, const SearchSummary& summary) {
  if (summary.heldParameters.empty()) return;
  std::string names;
  for (const std::size_t j : summary.heldParameters) {
    names += fmt::format("{}{}", names.empty() ? "" : ", ", context.space.names[j]);
  }
  context.log.warning(fmt::format(
      "Constraints or equations have kept parameters at one value or close to it, as every larger change of them was "
      "replaced: {}. A parameter that must equal an expression of others is one with Parameter_Type = 2",
      names));
}

/// Where most of a search is one set again and again: constraints with two equal sides, or bounds that they meet.
/// A population of equal points proposes nothing else, so that only those of its sample count.
bool warnOfNoWidth(const TaskContext& context, const SearchSummary& summary, std::int64_t populationSize) {
  const std::int64_t returned = 2 * std::int64_t{summary.returnedCount};
  const std::int64_t proposed =
      populationSize > 0 ? std::min<std::int64_t>(populationSize, summary.evaluationCount) : summary.evaluationCount;
  if (returned == 0 || returned < proposed || returned < summary.replacedCount) return false;
  context.log.warning(fmt::format(
      "{} of {} points that cannot be run could only be replaced by a set already evaluated: do "
      "constraints and equations leave any width? A parameter that must equal an expression of others is one with "
      "Parameter_Type = 2",
      summary.returnedCount, summary.replacedCount));
  return true;
}

/// `course`: of the aggregate.
std::vector<std::string> courseText(const BestCourse& course, const SearchSummary& summary, bool isRepetition) {
  const bool isBudgetUsed = summary.terminationMessage == kBudgetUsedMessage;
  if (!summary.sums) return courseLines(course, isBudgetUsed, isRepetition);
  std::vector<std::string> lines = courseLines(summary.sums->course, isBudgetUsed, isRepetition, kLeastSum);
  if (course.steps().empty()) return lines;
  const double least = course.steps().back().value;
  const double ofBest = summary.bestResult.aggregate;
  if (!(least < ofBest - kRounding * std::abs(ofBest))) return lines;
  lines.push_back(fmt::format(
      "The least aggregate, {}, is that of {}evaluation {}; the best set, which is that of the least sum of "
      "squares, has {}",
      formatReal(least), isRepetition ? "its " : "", course.steps().back().evaluation, formatReal(ofBest)));
  return lines;
}

/// The values of statistics that enter an objective function otherwise than as they are.
void logCriteria(const TaskContext& context, const EvaluationResult& result) {
  bool hasAny = false;
  for (std::size_t i = 0; i < context.measures.size() && i < result.measureValues.size(); ++i) {
    const OutputMeasure& measure = context.measures[i];
    if (!isCriterion(measure)) continue;
    if (!std::exchange(hasAny, true)) context.log.line("Output measures:");
    context.log.line(fmt::format("   {} = {} ({}, best {})", measure.name, formatReal(result.measureValues[i]),
                                 describeStatistic(measure), bestValue(measure)));
  }
}

void logBestSet(const TaskContext& context, const ParameterSet& best, const EvaluationResult& result) {
  std::vector<std::string> objectives;
  for (const ObjectiveFunction& objective : context.objectives) objectives.push_back(objective.name);
  const std::vector<double> values = ToModelScale(context.space, best);
  logValues(context.log, "Best parameter set:", context.space.names, values);
  const std::vector<std::string> others =
      context.otherParameters ? context.otherParameters(values) : std::vector<std::string>();
  if (!others.empty()) context.log.line("With it:");
  for (const std::string& text : others) context.log.line("   " + text);
  logCriteria(context, result);
  logValues(context.log, "Objective functions:", objectives, result.objectiveValues);
  context.log.line(fmt::format("Aggregate: {}", formatReal(result.aggregate)));
}

/// "Algorithm_Type = 'PSE', 'PDDS', 'OPSE' or 'CMA-ES', or ..."
std::string waysToRunSeveral() {
  std::string text =
      fmt::format("{} = {}", kAlgorithmTypeKeyword, searchesWith(&SearchFacts::runsInParallel, "or", "'"));
  for (const auto& search : searchMethods().all()) {
    const SearchFacts& facts = search->facts();
    if (facts.runsAtOnceUnderMpi.empty()) continue;
    text += fmt::format(", or a job of several processes (MPI), in which {} runs {} at once", facts.name.name,
                        facts.runsAtOnceUnderMpi);
  }
  return text;
}

}  // namespace

const TaskFacts& OptimisationTask::facts() const {
  static constexpr TaskFacts kFacts{{2, "optimisation"}, "parameter optimisation", run_files::kOptimisation};
  return kFacts;
}

std::optional<KeptSteps> OptimisationTask::keptSteps() const {
  if (!keepsFrontSeries_ || method->paretoSettings()->series != FrontSeries::steps) return std::nullopt;
  return KeptSteps{};
}

std::string OptimisationTask::description() const {
  return fmt::format("Parameter optimisation: {}{}{}", method->facts().longName,
                     usesSurrogate() ? " with surrogate model" : "",
                     repetitions.count > 1 ? fmt::format(", {} repetitions", repetitions.count) : "");
}

std::vector<std::string> OptimisationTask::summaryLines(const SearchSpace& space) const {
  std::vector<std::string> lines;
  if (!initialSample.earlierFile.empty()) {
    lines.push_back(fmt::format("Initial sample: {} of {}, {} of {}, run anew",
                                countText(earlierSets_.sets.size(), "set"), initialSample.earlierFile,
                                initialSample.earlierOrder == EarlierOrder::best ? "the best" : "the first",
                                countText(earlierSets_.successCount, "successful evaluation")));
  }
  if (repetitions.count > 1) lines.push_back(repetitionsText(repetitions, stopping, randomSeed));
  if (!usesSurrogate()) return lines;
  lines.push_back(fmt::format(
      "Surrogate model: {} fitted to the {} nearest sets, chooses {} of {} proposals; loops without it: {}{}",
      surrogateModelName(surrogate), neighbourhoodSize(surrogate, space.size()), method->facts().modelChooses,
      proposalsPerRun(surrogate), surrogate.initialGenerations,
      surrogate.checkInterval > 0 ? fmt::format(", then one in {}", surrogate.checkInterval) : ""));
  return lines;
}

std::optional<OneSlotOnly> OptimisationTask::needsOneSlot() const {
  if (method->facts().runsInParallel || repetitions.areSideBySide()) return std::nullopt;
  const std::string order =
      repetitions.count > 1 ? fmt::format("{} = 'side by side', ", kRepetitionOrderKeyword) : std::string();
  return OneSlotOnly{"Error: Use Population Simplex Evolution algorithm for application with multiple processors",
                     kAlgorithmTypeKeyword, order + waysToRunSeveral()};
}

int OptimisationTask::mostAtOnce() const {
  std::int64_t most = method->mostAtOnce();
  if (repetitions.areSideBySide()) {
    const SearchFacts& facts = method->facts();
    if (most == 0 && !facts.runsInParallel && facts.runsAtOnceUnderMpi.empty()) most = 1;
    most *= repetitions.count;
  }
  return most == 0 ? plannedEvaluations() : static_cast<int>(std::min<std::int64_t>(most, plannedEvaluations()));
}

/// The sets of the initial sample that are not drawn, but for the initial values; search scale.
std::vector<ParameterSet> OptimisationTask::givenSample(const SearchSpace& space) const {
  if (!method->facts().drawsInitialSample || initialSample.generation != SampleGeneration::fromFile) {
    return earlierSets_.sets;
  }
  return sampleText_ ? readInitialSample(initialSample.fileName, *sampleText_, space).sets
                     : loadInitialSample(initialSample.fileName, space).sets;
}

/// The first sets of the search, as far as they are not drawn.
std::vector<ParameterSet> OptimisationTask::givenSets(const SearchSpace& space) const {
  std::vector<ParameterSet> given;
  if (initialSample.includeInitialParameters) given.push_back(searchBounds(space).initial);
  for (ParameterSet& set : givenSample(space)) given.push_back(std::move(set));
  const auto most = static_cast<std::size_t>(
      std::min<std::int64_t>(method->sampleSize(initialSample, stopping.maxEvaluations), stopping.maxEvaluations));
  if (given.size() > most) given.resize(most);
  return given;
}

std::vector<SetDoubt> OptimisationTask::setDoubts(const SearchSpace& space, const Feasibility& feasibility) const {
  if (!method || !isSearch() || !feasibility.isTested()) return {};
  return infeasibleSets(feasibility, givenSets(space), kWhatGivenSets, stopping.maxEvaluations).doubts();
}

SearchProblem OptimisationTask::problemOf(const SearchSpace& space, const Feasibility& feasibility,
                                          Evaluator& evaluator, UniformGenerator& random) const {
  SearchProblem problem{searchBounds(space), stopping, initialSample, {}, evaluator, random};
  problem.earlierSearches = earlierSearches_;
  problem.givenSample = givenSample(space);
  problem.feasibility = feasibility;
  return problem;
}

/// Begins the same search with a generator of its own and without a model. Returns the sets that it starts from.
std::vector<ParameterSet> OptimisationTask::startOf(const SearchSpace& space, const Feasibility& feasibility,
                                                    std::int32_t seed) const {
  UniformGenerator random(seed);
  NoModel evaluator;
  SearchProblem problem = problemOf(space, feasibility, evaluator, random);
  ParetoProblem pareto;
  problem.pareto = &pareto;
  ResidualProblem residuals;  // without a model all are missing
  residuals.space = space;
  residuals.residualsOf = [](const EvaluationResult&) {
    constexpr double kMissing = std::numeric_limits<double>::quiet_NaN();
    return ResidualRows{{kMissing}, {kMissing}};
  };
  problem.residuals = &residuals;
  method->make(std::move(problem))->initialise();
  return evaluator.sets();
}

bool OptimisationTask::isSearch() const {
  return surrogateUse == SurrogateUse::no || surrogateUse == SurrogateUse::yes;
}

void OptimisationTask::requireSets(const SearchSpace& space, const Feasibility& feasibility) const {
  if (method->facts().usesResiduals || usesSurrogate()) lapack();  // missed before the model runs, if ever
  const bool drawsAnySet = !feasibility.isTested() && initialSample.generation != SampleGeneration::fromFile;
  if (drawsAnySet || !isSearch() || !earlierSearches_.empty()) return;          // a search that is continued had begun
  const std::int32_t samples = feasibility.isTested() ? repetitions.count : 1;  // otherwise all are alike
  for (std::int32_t i = 0; i < samples; ++i) startOf(space, feasibility, repetitionSeed(randomSeed, i));
}

std::optional<ParameterSet> OptimisationTask::trialSet(const SearchSpace& space, const Feasibility& feasibility) const {
  if (!isSearch()) return std::nullopt;
  const std::vector<ParameterSet> start = startOf(space, feasibility, randomSeed);
  if (std::ranges::find(start, space.initial) != start.end()) return std::nullopt;
  const auto first = std::ranges::find_if(start, [&](const ParameterSet& set) { return !feasibility.violation(set); });
  return first == start.end() ? std::nullopt : std::optional(*first);
}

SearchSummary OptimisationTask::search(const TaskContext& context, Evaluator& evaluator, std::size_t index,
                                       std::int32_t seed, const PeriodicStep& step) {
  UniformGenerator random(seed);
  SearchProblem problem = problemOf(context.space, context.feasibility, evaluator, random);
  std::optional<ProposalSelector> selector;
  if (usesSurrogate()) problem.selector = &selector.emplace(surrogate, problem.bounds, problem.feasibility);
  if (method->facts().usesResiduals) {
    if (!fittings_[index]) fittings_[index] = std::make_unique<ResidualFitting>(context);
    problem.residuals = &fittings_[index]->problem();
  }
  if (front_) problem.pareto = repeated_ ? &repeated_->front(index) : &front_->problem();
  return method->run(std::move(problem), step);
}

SearchSummary OptimisationTask::searchAll(const TaskContext& context) {
  if (context.feasibility.isTested()) {
    warnOfInfeasibleSets(context, givenSets(context.space), kWhatGivenSets, stopping.maxEvaluations);
  }
  if (repetitions.count > 1) {
    repeated_.emplace(repetitions, randomSeed);
    if (front_) repeated_->findFronts(front_->problem().archive);
    return repeated_->run(
        context,
        [&](Evaluator& evaluator, std::size_t index, std::int32_t seed, const PeriodicStep& step) {
          return search(context, evaluator, index, seed, step);
        },
        [&](std::size_t index, const SearchSummary& summary, const BestCourse& course) {
          const bool isBudgetUsed = summary.terminationMessage == kBudgetUsedMessage;
          logEnd(context, summary,
                 front_ ? frontCourseLines(repeated_->front(index).archive, referencePoint(), isBudgetUsed, true)
                        : courseText(course, summary, true));
          dropFittings();
        });
  }
  WatchedEvaluator evaluator(context.evaluator);
  SearchSummary summary =
      search(context, evaluator, 0, randomSeed, [&context](std::string_view line) { context.log.reportLine(line); });
  context.log.line("");
  const bool isBudgetUsed = summary.terminationMessage == kBudgetUsedMessage;
  logEnd(context, summary, front_ ? front_->courseLines(isBudgetUsed) : courseText(evaluator.course(), summary, false));
  return summary;
}

/// That of the best repetition of those that have ended; nullptr of a search without.
const ResidualFitting* OptimisationTask::bestFitting() const {
  return fittings_.empty() ? nullptr : fittings_[repeated_ ? repeated_->bestEnded() : 0].get();
}

/// Of the repetitions that have derivatives, whether they have ended or not, that with the least sum of squares, of
/// equals the first; 0 of a single search that has them; empty if none has.
std::optional<std::size_t> OptimisationTask::fittedRepetition() const {
  std::optional<std::size_t> best;
  for (std::size_t i = 0; i < fittings_.size(); ++i) {
    if (!fittings_[i] || !fittings_[i]->hasDerivatives()) continue;
    if (!best || fittings_[i]->sumOfSquares() < fittings_[*best]->sumOfSquares()) best = i;
  }
  return best;
}

/// Each may hold many derivatives.
void OptimisationTask::dropFittings() {
  for (std::size_t i = 0; i < fittings_.size(); ++i) {
    if (repeated_->hasEnded(i) && i != repeated_->bestEnded()) fittings_[i].reset();
  }
}

std::span<const double> OptimisationTask::referencePoint() const {
  const ParetoSettings* const pareto = method->paretoSettings();
  return pareto == nullptr ? std::span<const double>() : std::span<const double>(pareto->referencePoint);
}

/// Why a search has ended, and what is to be said of its course.
void OptimisationTask::logEnd(const TaskContext& context, const SearchSummary& summary,
                              const std::vector<std::string>& course) const {
  for (const std::string& note : summary.notes) context.log.reportLine(note);
  context.log.line(summary.terminationMessage);
  if (!summary.failure.empty()) {
    if (repetitions.count > 1) context.log.warning(summary.failure + ": " + summary.failureDetail);
    return;
  }
  for (const std::string& line : course) context.log.line(line);
  if (summary.replacedCount > 0) {
    context.log.line(fmt::format(
        "Proposed points that cannot be run (a constraint is violated, or an equation has no finite value) and were "
        "replaced before their evaluation: {}",
        summary.replacedCount));
  }
  if (!warnOfNoWidth(context, summary, method->populationSize())) warnOfHeldParameters(context, summary);
}

TaskOutcome OptimisationTask::run(const TaskContext& context) {
  if (!isSearch()) return {std::string(kEndOfTask)};

  if (method->facts().usesResiduals) {
    fittings_.resize(static_cast<std::size_t>(repetitions.count));
    fittings_.front() = std::make_unique<ResidualFitting>(context);
    if (const auto text = fittings_.front()->otherMeasuresText(context)) context.log.warning(*text);
  }
  if (const ParetoSettings* const pareto = method->paretoSettings()) {
    front_ = std::make_unique<FrontFinding>(*pareto);
    if (keepsFrontSeries_) {
      logRoomOfSimulatedValues(context, facts().resultFiles.simulatedValues,
                               static_cast<std::size_t>(plannedEvaluations()));
    }
  }
  SearchSummary summary = searchAll(context);
  if (!summary.failure.empty()) fatalError("Error: " + summary.failure, summary.failureDetail);
  hasSearched_ = true;
  TaskOutcome outcome{summary.terminationMessage};
  if (repeated_) {
    repeated_->addResults(context, referencePoint(), outcome);
    for (const std::string& line : outcome.report) context.log.reportLine(line);
    context.log.line("");
  }
  if (summary.best.empty()) return outcome;
  const FrontMember* const suggested = front_ ? front_->suggested() : nullptr;
  if (suggested != nullptr) summary.finalRunOf = suggested->number;
  if (context.searchEnded) context.searchEnded(summary);
  logBestSet(context, summary.best, summary.bestResult);
  const std::size_t logged = outcome.report.size();  // what there is of repetitions
  if (const ResidualFitting* const fitting = bestFitting()) fitting->addCovariance(context, outcome);
  if (front_) front_->addFront(context, summary.bestResult.number, outcome);
  if (outcome.report.size() > logged) logReport(context, std::span(outcome.report).subspan(logged));
  context.log.line("");
  context.log.line(suggested == nullptr ? "Final model run with the best parameter set:"
                                        : fmt::format("Final model run with the suggested compromise, evaluation {}:",
                                                      suggested->number));
  const std::vector<ParameterSet> last{suggested == nullptr ? summary.best : suggested->set};
  context.evaluator.evaluateParameterSets(last, DispatchMode::finalRun);
  return outcome;
}

std::optional<TaskOutcome> OptimisationTask::unfinishedOutcome(const TaskContext& context,
                                                               const UnfinishedBatch& made) const {
  const std::optional<std::size_t> fitted = fittedRepetition();
  std::optional<FrontFinding> front;
  if (front_) front.emplace(*front_);
  if (front && !repeated_ && !hasSearched_) {  // what the search has not taken belongs to its front, too
    for (std::size_t i = 0; i < made.results.size(); ++i) {
      addToArchive(front->problem().archive, made.sets[i], made.results[i]);
    }
  }
  if (!repeated_ && !fitted && !(front && front->hasFront())) return std::nullopt;
  TaskOutcome outcome{std::string(kEndOfTask)};
  if (repeated_) {
    RepeatedSearch all = *repeated_;
    all.takeUnfinished(context, made, front ? &front->problem().archive : nullptr);
    all.addResults(context, referencePoint(), outcome);
    if (fitted) {
      outcome.report.push_back(
          fmt::format("The covariance is that of repetition {}, the best of those that have derivatives", *fitted + 1));
    }
  }
  if (fitted) fittings_[*fitted]->addCovariance(context, outcome);
  if (front) front->addFront(context, 0, outcome);
  return outcome;
}

std::optional<int> OptimisationTask::unfinishedEvaluations(const UnfinishedBatch& made) const {
  if (repeated_) return repeated_->evaluationCountWith(made);
  if (front_) return front_->evaluationCount() + (hasSearched_ ? 0 : static_cast<int>(made.results.size()));
  const std::optional<std::size_t> fitted = fittedRepetition();
  return fitted ? fittings_[*fitted]->problem().evaluationCount : 0;
}

TaskReport OptimisationTask::report() const {
  TaskReport report;
  report.algorithm = method->facts().name.name;
  report.populationSize = static_cast<int>(method->populationSize());
  if (usesSurrogate()) report.surrogate = surrogateModelName(surrogate);
  return report;
}

std::optional<RaisedBudget> OptimisationTask::raisedBudget(const SearchHistory& history) const {
  if (auto raised = raisedRepetitions(repetitions, stopping, history)) return raised;
  if (stopping.maxEvaluations <= history.budget) return std::nullopt;
  return method->raiseBudget(history, stopping, initialSample);
}

}  // namespace mirevo

#include "run/tasks/repeated_search.h"

#include <algorithm>
#include <cmath>
#include <deque>
#include <limits>
#include <set>
#include <utility>

#include <fmt/core.h>

#include "algorithms/searches/side_by_side.h"
#include "algorithms/searches/stopping_criteria.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr CodeName kOrders[] = {{std::nullopt, "consecutive"}, {std::nullopt, "side by side"}};

}  // namespace

void takeRepetitionOrder(RepetitionSettings& settings, const SetupValue& value) {
  const bool isFirst = std::get<std::string>(value) == kOrders[0].name;
  settings.order = isFirst ? RepetitionOrder::consecutive : RepetitionOrder::sideBySide;
}

std::span<const CodeName> repetitionOrderNames() {
  return kOrders;
}

void warnOfOrder(const RepetitionSettings& settings, const SetupSection& section) {
  if (settings.count > 1 || !section.isWritten(kRepetitionOrderKeyword)) return;
  section.warn(kRepetitionOrderKeyword, fmt::format("has no effect with {} = 1", kRepetitionsKeyword));
}

void requireRepetitions(const RepetitionSettings& settings, const SearchMethod& method,
                        const InitialSampleSettings& sample, const SetupSection& section) {
  if (settings.count == 1) return;
  const std::string doubt = method.seedDoubt(sample);
  if (doubt.empty()) return;
  section.refuse("Error: No. of repetitions of the search invalid", kRepetitionsKeyword,
                 fmt::format("expected 1, found {}: the repetitions of {} would be the same, as {}", settings.count,
                             method.facts().name.name, doubt));
}

void requireRepeatedBudget(const RepetitionSettings& settings, const StoppingCriteria& stopping,
                           const SetupSection& section) {
  constexpr std::int32_t kMost = std::numeric_limits<std::int32_t>::max();
  if (std::int64_t{settings.count} * stopping.maxEvaluations <= kMost) return;
  section.refuse(
      "Error: Maximum No. of model evaluations invalid", kBudgetKeyword,
      fmt::format("expected at most {} for {} = {}, found {}: a run can make {} evaluations", kMost / settings.count,
                  kRepetitionsKeyword, settings.count, stopping.maxEvaluations, kMost));
}

std::string repetitionsText(const RepetitionSettings& settings, const StoppingCriteria& stopping, std::int32_t seed) {
  return fmt::format("Repetitions: {} of up to {} evaluations each, {}, {}", settings.count, stopping.maxEvaluations,
                     settings.areSideBySide() ? "side by side" : "one after the other",
                     seedsText(seed, settings.count));
}

std::optional<RaisedBudget> raisedRepetitions(const RepetitionSettings& settings, const StoppingCriteria& stopping,
                                              const SearchHistory& history) {
  if (settings.count == 1) return std::nullopt;
  RaisedBudget raised;
  if (stopping.maxEvaluations > history.budget) {
    raised.refusal = fmt::format(
        "Max_No_Evaluations: {} then, {} now: it holds for each of {} repetitions, and a longer one would take the "
        "place of evaluations of the next. More repetitions can be added: {}",
        history.budget, stopping.maxEvaluations, settings.count, kRepetitionsKeyword);
    return raised;
  }
  if (settings.count <= history.repetitions) return std::nullopt;
  if (!history.searches.empty()) {
    raised.refusal = fmt::format(
        "{}: {} then, {} now: a search whose budget was raised, and which began anew then, cannot be repeated",
        kRepetitionsKeyword, history.repetitions, settings.count);
    return raised;
  }
  // In a run that has ended it is that of the final model run, where the next repetition begins; otherwise the model is
  // run once more.
  raised.keptEvaluations = history.lastRow - 1;
  raised.note = fmt::format("{} was raised from {} to {}: further ones follow", kRepetitionsKeyword,
                            history.repetitions, settings.count);
  return raised;
}

/// Passes everything on to the evaluator of a repetition, and keeps account of it.
class RepeatedSearch::Watch final : public Evaluator {
 public:
  Watch(RepeatedSearch& all, std::size_t index, Evaluator& evaluator, const TaskContext& context)
      : all_(all), index_(index), evaluator_(evaluator), context_(context) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override {
    noteHandedOut(sets.size());
    std::vector<EvaluationResult> results = evaluator_.evaluateParameterSets(sets, mode);
    for (std::size_t i = 0; i < results.size(); ++i) {
      if (!all_.settings_.areSideBySide()) all_.receive(sets[i], results[i]);
      take(sets[i], results[i]);
    }
    if (!isSettled_) sample_.assign(sets.begin(), sets.end());
    return results;
  }
  void submit(std::span<const ParameterSet> sets) override {
    noteHandedOut(sets.size());
    submitted_.insert(submitted_.end(), sets.begin(), sets.end());
    evaluator_.submit(sets);
  }
  EvaluationResult awaitFirst() override {
    EvaluationResult result = evaluator_.awaitFirst();
    if (!all_.settings_.areSideBySide()) all_.receive(submitted_.front(), result);
    take(submitted_.front(), result);
    submitted_.pop_front();
    return result;
  }
  UnfinishedBatch takeUnfinished() override { return evaluator_.takeUnfinished(); }
  /// The first repetition determines the transformation of the objective functions. Where repetitions go on side by
  /// side, the others may have had the results of their samples before it did.
  void settleAggregates(std::span<EvaluationResult> sample) override {
    isSettled_ = true;
    if (index_ == 0) {
      evaluator_.settleAggregates(sample);
    } else if (context_.aggregate) {
      for (EvaluationResult& result : sample) {
        if (result.ok()) result.aggregate = context_.aggregate(result.objectiveValues);
      }
    }
    // Without it, aggregates were not comparable.
    course().clear();
    repetition() = {.seed = repetition().seed};
    for (std::size_t i = 0; i < std::min(sample.size(), sample_.size()); ++i) take(sample_[i], sample[i]);
    repetition().startAggregate = repetition().aggregate;
    repetition().start = repetition().best;
    sample_ = {};
  }

 private:
  Repetition& repetition() { return all_.repetitions_[index_]; }
  BestCourse& course() { return all_.courses_[index_]; }

  /// Sets are numbered in the order in which they are handed out, whatever the repetition.
  void noteHandedOut(std::size_t count) {
    const int first = all_.handedOut_ + 1;
    all_.handedOut_ += static_cast<int>(count);
    const int number = static_cast<int>(index_) + 1;
    if (all_.stretches_.empty() || all_.stretches_.back().repetition != number) {
      all_.stretches_.push_back({number, first, 0});
    }
    all_.stretches_.back().last = all_.handedOut_;
  }
  void take(const ParameterSet& set, const EvaluationResult& result) {
    all_.waiting_.erase(result.number);
    course().add(result.aggregate);
    all_.note(index_, set, result);
  }

  RepeatedSearch& all_;
  std::size_t index_;
  Evaluator& evaluator_;
  const TaskContext& context_;
  bool isSettled_ = false;
  std::vector<ParameterSet> sample_;    ///< evaluated before the aggregates are settled
  std::deque<ParameterSet> submitted_;  ///< without a result
};

/// Passes everything on to the evaluator of the run, and keeps results until their searches take them.
class RepeatedSearch::Receipt final : public Evaluator {
 public:
  Receipt(RepeatedSearch& all, Evaluator& evaluator) : all_(all), evaluator_(evaluator) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode mode) override {
    return evaluator_.evaluateParameterSets(sets, mode);
  }
  void submit(std::span<const ParameterSet> sets) override {
    submitted_.insert(submitted_.end(), sets.begin(), sets.end());
    evaluator_.submit(sets);
  }
  EvaluationResult awaitFirst() override {
    EvaluationResult result = evaluator_.awaitFirst();
    all_.receive(submitted_.front(), result);
    all_.waiting_[result.number] = {std::move(submitted_.front()), result};
    submitted_.pop_front();
    return result;
  }
  UnfinishedBatch takeUnfinished() override { return evaluator_.takeUnfinished(); }
  void settleAggregates(std::span<EvaluationResult> sample) override { evaluator_.settleAggregates(sample); }

 private:
  RepeatedSearch& all_;
  Evaluator& evaluator_;
  std::deque<ParameterSet> submitted_;  ///< without a result
};

void RepeatedSearch::findFronts(ParetoArchive& ofAll) {
  fronts_.emplace(static_cast<std::size_t>(settings_.count));
  frontOfAll_ = &ofAll;
}

/// Results come in the order of their numbers, whichever repetition takes them.
void RepeatedSearch::receive(const ParameterSet& set, const EvaluationResult& result) {
  if (frontOfAll_ != nullptr) addToArchive(*frontOfAll_, set, result);
}

void RepeatedSearch::note(std::size_t index, const ParameterSet& set, const EvaluationResult& result) {
  Repetition& own = repetitions_[index];
  ++own.evaluations;
  if (!result.ok() || (own.bestEvaluation > 0 && !(result.aggregate < own.aggregate))) return;
  own.bestEvaluation = result.number;
  own.aggregate = result.aggregate;
  own.best = set;
}

void RepeatedSearch::takeUnfinished(const TaskContext& context, const UnfinishedBatch& made, ParetoArchive* ofAll) {
  frontOfAll_ = ofAll;
  for (std::size_t i = 0; i < made.results.size(); ++i) {
    if (made.results[i].number > handedOut_) continue;  // of the final model run
    receive(made.sets[i], made.results[i]);
    waiting_[made.results[i].number] = {made.sets[i], made.results[i]};
  }
  for (auto& [number, evaluated] : waiting_) {
    auto& [set, result] = evaluated;
    const auto isIts = [number = number](const RepetitionStretch& one) {
      return one.first <= number && number <= one.last;
    };
    const auto stretch = std::ranges::find_if(stretches_, isIts);
    if (stretch == stretches_.end()) continue;
    if (result.ok() && context.aggregate) result.aggregate = context.aggregate(result.objectiveValues);
    const auto index = static_cast<std::size_t>(stretch->repetition) - 1;
    note(index, set, result);
    if (fronts_) addToArchive(fronts_->problem(index).archive, set, result);
  }
  waiting_.clear();
}

SearchSummary RepeatedSearch::run(const TaskContext& context, const Search& search, const Ended& ended) {
  const auto count = static_cast<std::size_t>(settings_.count);
  repetitions_.reserve(count);
  courses_.resize(count);
  std::vector<SearchRun> searches;
  for (std::size_t i = 0; i < count; ++i) {
    searches.emplace_back([&, i](Evaluator& evaluator, const PeriodicStep& step) {
      const std::int32_t seed = repetitionSeed(seed_, static_cast<std::int32_t>(i));
      repetitions_.push_back({.seed = seed});
      Watch watch(*this, i, evaluator, context);
      return search(watch, i, seed,
                    [&](std::string_view line) { step(fmt::format("Repetition {}: {}", i + 1, line)); });
    });
  }
  const PeriodicStep report = [&context](std::string_view line) { context.log.reportLine(line); };
  const SearchEnd oneEnded = [&](std::size_t i, const SearchSummary& summary) {
    context.log.line(fmt::format("\nRepetition {} of {}, seed {}, has ended after {}", i + 1, count,
                                 repetitions_[i].seed,
                                 countText(static_cast<std::size_t>(repetitions_[i].evaluations), "evaluation")));
    end(i, summary);
    ended(i, summary, courses_[i]);
    context.log.line("");
  };
  if (settings_.areSideBySide()) {
    Receipt receipt(*this, context.evaluator);
    runSideBySide(receipt, searches, report, oneEnded);
  } else {
    for (std::size_t i = 0; i < count; ++i) oneEnded(i, searches[i](context.evaluator, report));
  }
  best_.terminationMessage = fmt::format("Optimisation terminated: All {} repetitions have ended", count);
  return best_;
}

void RepeatedSearch::end(std::size_t index, const SearchSummary& summary) {
  Repetition& own = repetitions_[index];
  own.loops = summary.loopCount;
  own.termination = summary.terminationMessage;
  own.starts = summary.starts;
  if (summary.bestResult.ok() && !summary.best.empty() && summary.failure.empty()) {
    // The search knows which of several equal evaluations it took.
    own.bestEvaluation = summary.bestResult.number;
    own.aggregate = summary.bestResult.aggregate;
    own.best = summary.best;
    if (summary.sums) {
      own.sumOfSquares = summary.sums->best;
      own.startSum = summary.sums->start;
    }
  }
  const auto valueOf = [](const SearchSummary& one) { return one.sums ? one.sums->best : one.bestResult.aggregate; };
  const bool isFirst = best_.best.empty();
  const double before = valueOf(best_);
  const double now = valueOf(summary);
  // Side by side a later one may have ended before.
  const bool isRescue = !best_.failure.empty() && summary.failure.empty();
  const bool isBetter = isRescue || (summary.failure.empty() && summary.bestResult.ok() &&
                                     (!best_.bestResult.ok() || now < before || (now == before && index < bestEnded_)));
  if (!isFirst && !isBetter) return;
  best_ = summary;
  bestEnded_ = index;
}

bool RepeatedSearch::hasEnded(std::size_t index) const {
  return index < repetitions_.size() && !repetitions_[index].termination.empty();
}

void RepeatedSearch::addResults(const TaskContext& context, std::span<const double> reference, TaskOutcome& outcome) {
  if (fronts_) fronts_->describe(*frontOfAll_, reference, context.aggregate, repetitions_);
  std::vector<std::string> objectives;
  for (const ObjectiveFunction& objective : context.objectives) objectives.push_back(objective.name);
  for (std::string& line : repetitionLines(repetitions_, context.space, objectives, settings_.count)) {
    outcome.report.push_back(std::move(line));
  }
  outcome.tables.push_back(repetitionTable(repetitions_, context.space));
  outcome.tables.push_back(repetitionRowTable(stretches_));
}

int RepeatedSearch::evaluationCountWith(const UnfinishedBatch& made) const {
  std::set<int> untaken;
  for (const auto& [number, evaluated] : waiting_) untaken.insert(number);
  for (const EvaluationResult& result : made.results) {
    if (result.number <= handedOut_) untaken.insert(result.number);
  }
  auto count = static_cast<int>(untaken.size());
  for (const Repetition& repetition : repetitions_) count += repetition.evaluations;
  return count;
}

}  // namespace mirevo

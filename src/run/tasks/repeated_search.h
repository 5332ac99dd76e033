#pragma once

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "algorithms/searches/best_course.h"
#include "algorithms/searches/repeated_fronts.h"
#include "algorithms/searches/repetitions.h"
#include "common/settings/keyword_row.h"
#include "run/tasks/task.h"

namespace mirevo {

inline constexpr std::string_view kRepetitionsKeyword = "Repetitions";
inline constexpr std::string_view kRepetitionOrderKeyword = "Repetition_Order";

/// Takes a value of kRepetitionOrderKeyword, one of repetitionOrderNames().
void takeRepetitionOrder(RepetitionSettings& settings, const SetupValue& value);
std::span<const CodeName> repetitionOrderNames();
/// Warns of an order without repetitions.
void warnOfOrder(const RepetitionSettings& settings, const SetupSection& section);
/// Refuses repetitions that would all be the same.
void requireRepetitions(const RepetitionSettings& settings, const SearchMethod& method,
                        const InitialSampleSettings& sample, const SetupSection& section);
/// Refuses a budget that, taken so often, is more evaluations than a run can number.
void requireRepeatedBudget(const RepetitionSettings& settings, const StoppingCriteria& stopping,
                           const SetupSection& section);
/// "Repetitions: 5 of up to 1000 evaluations each, one after the other, seeds 1 to 5"; for more than one.
std::string repetitionsText(const RepetitionSettings& settings, const StoppingCriteria& stopping, std::int32_t seed);

/// What becomes of a run with `history` when its budget or the number of its repetitions is raised; empty if neither
/// was, or if it had and has one repetition.
std::optional<RaisedBudget> raisedRepetitions(const RepetitionSettings& settings, const StoppingCriteria& stopping,
                                              const SearchHistory& history);

/// The repetitions of a search: each is the search that a run with its seed would make. The transformation of the
/// objective functions, where it is determined by an initial sample, is determined by that of the first one, so that
/// all aggregates can be compared.
class RepeatedSearch final {
 public:
  /// The search with this 0-based index and seed, from its start to its end.
  using Search = std::function<SearchSummary(Evaluator&, std::size_t index, std::int32_t seed, const PeriodicStep&)>;
  /// Called when a repetition has ended, with its index and the course of its best aggregate.
  using Ended = std::function<void(std::size_t index, const SearchSummary&, const BestCourse&)>;

  RepeatedSearch(const RepetitionSettings& settings, std::int32_t seed) : settings_(settings), seed_(seed) {}

  /// To be called before run() of searches that find fronts: the front of all is `ofAll`, which must outlive it.
  void findFronts(ParetoArchive& ofAll);
  /// What the repetition with this index works on then.
  ParetoProblem& front(std::size_t index) { return fronts_->problem(index); }

  /// Runs them and returns what the best of them has found, of equals the first, with the message that all have ended.
  SearchSummary run(const TaskContext& context, const Search& search, const Ended& ended);

  /// Adds lines and tables about the repetitions as far as they have come. `reference`: of the hypervolume.
  void addResults(const TaskContext& context, std::span<const double> reference, TaskOutcome& outcome);
  /// Of a run that ends early, of a copy: counts the results that no search has taken, so that the repetitions are
  /// those of all rows of the result file. `made` is what the evaluator handed over; `ofAll` the front of all from now
  /// on, of searches that find fronts.
  void takeUnfinished(const TaskContext& context, const UnfinishedBatch& made, ParetoArchive* ofAll);
  /// The index of the best repetition of those that have ended, of equals the first; 0 if none has.
  std::size_t bestEnded() const { return bestEnded_; }
  bool hasEnded(std::size_t index) const;
  /// Evaluations whose results they have after takeUnfinished().
  int evaluationCountWith(const UnfinishedBatch& made) const;

 private:
  class Watch;
  class Receipt;

  void receive(const ParameterSet& set, const EvaluationResult& result);
  void note(std::size_t index, const ParameterSet& set, const EvaluationResult& result);
  void end(std::size_t index, const SearchSummary& summary);

  RepetitionSettings settings_;
  std::int32_t seed_;
  std::vector<Repetition> repetitions_;  ///< those that have begun
  std::vector<RepetitionStretch> stretches_;
  int handedOut_ = 0;  ///< sets, of all repetitions
  /// By number: results that have come and that their search, which waits for further ones, has not taken.
  std::map<int, std::pair<ParameterSet, EvaluationResult>> waiting_;
  std::vector<BestCourse> courses_;
  SearchSummary best_;
  std::size_t bestEnded_ = 0;             ///< the index of that
  std::optional<RepeatedFronts> fronts_;  ///< of searches that find fronts
  ParetoArchive* frontOfAll_ = nullptr;   ///< likewise
};

}  // namespace mirevo

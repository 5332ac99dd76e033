#pragma once

#include "algorithms/searches/best_course.h"
#include "algorithms/searches/initial_sample.h"
#include "algorithms/searches/search_methods.h"
#include "algorithms/searches/stopping_criteria.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "run/tasks/pareto_front.h"
#include "run/tasks/repeated_search.h"
#include "run/tasks/residual_fit.h"
#include "run/tasks/task.h"

namespace mirevo {

inline constexpr std::string_view kAlgorithmTypeKeyword = "Algorithm_Type";

/// Any other number: no search is run.
enum class SurrogateUse : std::int32_t { no = 0, yes = 1 };

/// Parameter optimisation by one of the searches, with or without a surrogate model.
class OptimisationTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  bool mayHaveInitialSample() const override { return true; }
  std::vector<double> givenValues(std::size_t parameter) const override;
  std::string description() const override;
  std::vector<std::string> summaryLines(const SearchSpace& space) const override;
  int plannedEvaluations() const override { return repetitions.count * stopping.maxEvaluations; }
  int mostAtOnce() const override;
  bool hasFinalRun() const override { return true; }
  bool drawsRandomNumbers() const override { return true; }
  std::optional<OneSlotOnly> needsOneSlot() const override;
  bool judgesByAggregate() const override {
    return !method || !(method->facts().findsFront || method->facts().usesResiduals);
  }
  void requireSets(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::optional<ParameterSet> trialSet(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::vector<SetDoubt> setDoubts(const SearchSpace& space, const Feasibility& feasibility) const override;
  /// A search by residuals needs them in every result; one for a front shows those of the front.
  bool keepsSimulatedValues() const override { return method && (method->facts().usesResiduals || keepsFrontSeries_); }
  bool readsSimulatedValues() const override { return keepsFrontSeries_; }
  std::optional<KeptSteps> keptSteps() const override;
  SeriesPrecision keptPrecision() const override {
    return method && method->facts().usesResiduals ? SeriesPrecision::exact : SeriesPrecision::single;
  }
  TaskOutcome run(const TaskContext& context) override;
  std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const override;
  std::optional<int> unfinishedEvaluations(const UnfinishedBatch& made) const override;
  TaskReport report() const override;
  std::optional<RaisedBudget> raisedBudget(const SearchHistory& history) const override;
  void continueFrom(const std::vector<EarlierSearch>& searches) override { earlierSearches_ = searches; }
  std::vector<EarlierSearch> earlierSearches() const override { return earlierSearches_; }

  std::unique_ptr<SearchMethod> method;  ///< nullptr until it is read
  SurrogateUse surrogateUse = SurrogateUse::no;
  InitialSampleSettings initialSample;
  StoppingCriteria stopping;
  SurrogateSettings surrogate;
  RepetitionSettings repetitions;

 private:
  bool isSearch() const;
  std::vector<ParameterSet> startOf(const SearchSpace& space, const Feasibility& feasibility, std::int32_t seed) const;
  /// Whether a surrogate model assists the search.
  bool usesSurrogate() const { return surrogateUse == SurrogateUse::yes && method->facts().usesSurrogate; }
  void warnOfUnusedSample(const SetupSection& section) const;
  void takeGivenValues(const TaskReading& reading, const SetupSection& section);
  void readEarlierResults(const TaskReading& reading, const SetupSection& section);
  void keepAsGiven(const TaskReading& reading, std::span<const ParameterSet> modelScale, const SetupSection& section,
                   std::string_view keyword);
  void readMethod(const TaskReading& reading, const SetupSection& section);
  void readStopping(const SetupSection& section, std::size_t variableCount);
  void warnOfOneLoop(const SetupSection& section) const;
  void warnOfUnusedChange(const SetupSection& section) const;
  void readSurrogate(const TaskReading& reading, const SetupSection& section, const SetupSection& stoppingSection);
  std::vector<ParameterSet> givenSample(const SearchSpace& space) const;
  std::vector<ParameterSet> givenSets(const SearchSpace& space) const;
  SearchProblem problemOf(const SearchSpace& space, const Feasibility& feasibility, Evaluator& evaluator,
                          UniformGenerator& random) const;
  /// The search with this 0-based index of its repetitions.
  SearchSummary search(const TaskContext& context, Evaluator& evaluator, std::size_t index, std::int32_t seed,
                       const PeriodicStep& step);
  SearchSummary searchAll(const TaskContext& context);
  void logEnd(const TaskContext& context, const SearchSummary& summary, const std::vector<std::string>& course) const;
  const ResidualFitting* bestFitting() const;
  std::optional<std::size_t> fittedRepetition() const;
  void dropFittings();
  void requireResiduals(const TaskReading& reading, const SetupSection& section) const;
  std::span<const double> referencePoint() const;

  std::optional<std::string> sampleText_;         ///< of a sample file, which is read once
  std::vector<std::vector<double>> givenValues_;  ///< those of a file, one entry per model parameter
  EarlierSets earlierSets_;                       ///< of an earlier run
  std::vector<EarlierSearch> earlierSearches_;
  /// Of a search by residuals, once it runs: one for each repetition, but null for those that have ended without
  /// finding the best.
  std::vector<std::unique_ptr<ResidualFitting>> fittings_;
  std::optional<RepeatedSearch> repeated_;  ///< once it runs
  std::unique_ptr<FrontFinding> front_;     ///< of a search for a front, once it runs; of repetitions that of all
  bool keepsFrontSeries_ = false;
  bool hasSearched_ = false;  ///< what follows is the final model run
};

}  // namespace mirevo

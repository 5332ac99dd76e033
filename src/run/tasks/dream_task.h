#pragma once

#include <memory>

#include "algorithms/analyses/uncertainty.h"
#include "algorithms/bayes/dream_sampler.h"
#include "algorithms/distributions/parameter_distributions.h"
#include "run/tasks/dream_section.h"
#include "run/tasks/dream_target.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Bayesian uncertainty analysis: the posterior distribution of the parameters by Markov chains, with bands.
class DreamTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  std::string description() const override;
  std::vector<std::string> summaryLines(const SearchSpace& space) const override;
  std::vector<std::string> warnings(const SearchSpace& space) const override;
  int plannedEvaluations() const override { return settings.sampleSize; }
  int mostAtOnce() const override { return dream.sampler.chainCount; }
  bool drawsRandomNumbers() const override { return true; }
  bool keepsSimulatedValues() const override { return true; }
  bool readsSimulatedValues() const override { return true; }
  SeriesPrecision keptPrecision() const override { return SeriesPrecision::exact; }
  std::optional<KeptSteps> keptSteps() const override;
  bool usesExactMeasures() const override { return true; }
  void requireSets(const SearchSpace& space, const Feasibility& feasibility) const override;
  void requireObservations(const SearchSpace& space, std::span<const OutputMeasure> measures,
                           std::span<const ObjectiveFunction> objectives,
                           std::span<const ObservedSeries> observed) const override;
  std::optional<ParameterSet> trialSet(const SearchSpace& space, const Feasibility& feasibility) const override;
  TaskOutcome run(const TaskContext& context) override;
  /// Of the generations that are complete.
  std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const override;
  std::optional<int> unfinishedEvaluations(const UnfinishedBatch& /*made*/) const override {
    return sampler_ ? sampler_->runs() : 0;
  }
  std::optional<RaisedBudget> raisedBudget(const SearchHistory& history) const override;
  void continueFrom(const std::vector<EarlierSearch>& searches) override;
  std::vector<EarlierSearch> earlierSearches() const override { return earlierRuns_; }
  TaskReport report() const override { return {.hasBands = true, .chains = &dream.sampler}; }

  UncertaintySettings settings;  ///< what all forms of the task have in common
  DreamSection dream;

 private:
  void refusePriorWithoutDensity(const TaskReading& reading, const SetupSection& section) const;
  void refuseImpossiblePriors(const TaskReading& reading, const SetupSection& section) const;
  void checkSize(const TaskReading& reading, const SetupSection& section) const;
  std::optional<ParameterSet> priorSet(const SearchSpace& space, const Feasibility& feasibility,
                                       std::string& reason) const;
  void advance();
  std::string noLikelihood() const;
  TaskOutcome outcomeOf(const TaskContext& context) const;

  ParameterDistributions prior_;
  std::vector<EarlierSearch> earlierRuns_;  ///< with which this one goes on: the first has told how long burn-in is
  std::unique_ptr<DreamTarget> target_;     ///< of the run
  std::unique_ptr<DreamSampler> sampler_;
};

}  // namespace mirevo

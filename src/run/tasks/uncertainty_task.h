#pragma once

#include "algorithms/analyses/uncertainty.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Uncertainty analysis by sampling, with the band of every simulated series.
class UncertaintyTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  std::vector<double> givenValues(std::size_t parameter) const override;
  std::string description() const override;
  std::vector<std::string> summaryLines(const SearchSpace& space) const override;
  std::vector<std::string> warnings(const SearchSpace& space) const override;
  int plannedEvaluations() const override { return settings.sampleSize; }
  bool drawsRandomNumbers() const override { return true; }
  bool keepsSimulatedValues() const override { return true; }
  bool readsSimulatedValues() const override { return true; }
  std::optional<KeptSteps> keptSteps() const override;
  void requireSets(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::vector<SetDoubt> setDoubts(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::optional<ParameterSet> trialSet(const SearchSpace& space, const Feasibility& feasibility) const override;
  TaskOutcome run(const TaskContext& context) override;
  std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const override;
  TaskReport report() const override { return {.hasBands = true, .distributions = &settings.distributions}; }

  UncertaintySettings settings;

 private:
  TaskOutcome outcomeOf(const TaskContext& context, const UncertaintyOutcome& found) const;
  std::vector<ParameterSet> drawSample(const TaskContext& context, std::string& acceptance) const;

  std::vector<std::vector<double>> singleValues_;  ///< of discrete distributions, by parameter
};

}  // namespace mirevo

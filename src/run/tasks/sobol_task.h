#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "algorithms/analyses/sobol_design.h"
#include "algorithms/analyses/sobol_settings.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Sensitivity analysis by Sobol' indices, also of every simulated series over time.
class SobolTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  std::string description() const override;
  std::vector<std::string> summaryLines(const SearchSpace& space) const override;
  std::vector<std::string> warnings(const SearchSpace& space) const override;
  int plannedEvaluations() const override { return static_cast<int>(design_.setCount()); }
  bool drawsRandomNumbers() const override { return true; }
  bool keepsSimulatedValues() const override { return settings.seriesTimes != SobolSeriesTimes::none; }
  bool readsSimulatedValues() const override { return keepsSimulatedValues(); }
  std::optional<KeptSteps> keptSteps() const override;
  bool usesExactMeasures() const override { return true; }
  std::vector<SetDoubt> setDoubts(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::optional<ParameterSet> trialSet(const SearchSpace& space, const Feasibility& feasibility) const override;
  TaskOutcome run(const TaskContext& context) override;
  std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const override;
  TaskReport report() const override { return {.sobol = &settings, .distributions = &distributions_}; }

  SobolSettings settings;

 private:
  struct Drawn;
  Drawn draw() const;
  TaskOutcome outcomeOf(const TaskContext& context, std::span<const EvaluationResult> results,
                        std::vector<std::string>& warnings) const;

  SobolDesign design_;
  std::vector<SobolFactor> factors_;
  ParameterDistributions distributions_;
};

}  // namespace mirevo

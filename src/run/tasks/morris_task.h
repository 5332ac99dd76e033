#pragma once

#include <optional>

#include "algorithms/analyses/morris.h"
#include "algorithms/distributions/parameter_distributions.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Screening of the parameters by elementary effects, a form of the sensitivity analysis.
class MorrisTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  std::string description() const override;
  std::vector<std::string> summaryLines(const SearchSpace& space) const override;
  std::vector<std::string> warnings(const SearchSpace& space) const override;
  int plannedEvaluations() const override { return planned_; }
  bool drawsRandomNumbers() const override { return true; }
  bool usesExactMeasures() const override { return true; }
  void requireSets(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::vector<SetDoubt> setDoubts(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::optional<ParameterSet> trialSet(const SearchSpace& space, const Feasibility& feasibility) const override;
  TaskOutcome run(const TaskContext& context) override;
  std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const override;
  TaskReport report() const override {
    return {.hasMorris = true, .distributions = givesDistributions && distributions ? &*distributions : nullptr};
  }

  MorrisSettings settings;
  /// Without one, each parameter is uniform between its bounds.
  std::optional<ParameterDistributions> distributions;
  bool givesDistributions = false;  ///< the setup has one for some parameter, which is worth a chart

 private:
  ParameterDistributions distributionsIn(const SearchSpace& space) const;
  void tellOfDesign(const SetupSection& section) const;
  /// Made once, as the choice among many candidates takes long.
  const EffectPlan& planIn(const SearchSpace& space, const Feasibility& feasibility) const;
  TaskOutcome outcomeOf(const TaskContext& context, const EffectPlan& plan, const EffectResults& results) const;

  mutable std::optional<EffectPlan> plan_;
  int planned_ = 0;        ///< the sets of the setup's plan
  EffectResults results_;  ///< of the batches of the run that are complete
};

}  // namespace mirevo

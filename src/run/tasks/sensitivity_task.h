#pragma once

#include "algorithms/analyses/local_sensitivity.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Local sensitivity analysis, with the covariance of the parameters if the setup asks for it.
class SensitivityTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  std::string description() const override;
  int plannedEvaluations() const override { return planned_; }
  bool keepsSimulatedValues() const override { return settings.calculatesCovariance; }
  SeriesPrecision keptPrecision() const override { return SeriesPrecision::exact; }
  bool usesExactMeasures() const override { return true; }
  void requireSets(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::vector<SetDoubt> setDoubts(const SearchSpace& space, const Feasibility& feasibility) const override;
  TaskOutcome run(const TaskContext& context) override;
  std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const override;
  TaskReport report() const override { return {.sensitivity = &settings}; }

  SensitivitySettings settings;

 private:
  /// The analysis by the evaluations that `evaluator` makes, without the log.
  TaskOutcome outcomeOf(const TaskContext& context, Evaluator& evaluator) const;

  int planned_ = 0;  ///< the sets of the setup's plan
};

}  // namespace mirevo

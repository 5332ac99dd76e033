#pragma once

#include <optional>
#include <string>
#include <vector>

#include "algorithms/analyses/glue.h"
#include "algorithms/analyses/uncertainty.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Generalised likelihood uncertainty estimation (algorithms/analyses/glue.h): of a sample from the distributions of
/// the parameters, or of the evaluations of an earlier run. `Uncertainty_Type = 'GLUE'`.
class GlueTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  std::vector<double> givenValues(std::size_t parameter) const override;
  std::string description() const override;
  std::vector<std::string> summaryLines(const SearchSpace& space) const override;
  std::vector<std::string> warnings(const SearchSpace& space) const override;
  int plannedEvaluations() const override { return isOfEarlierRun() ? 0 : settings.sampleSize; }
  bool drawsRandomNumbers() const override { return !isOfEarlierRun(); }
  bool keepsSimulatedValues() const override { return true; }
  bool readsSimulatedValues() const override { return true; }
  std::optional<KeptSteps> keptSteps() const override;
  void requireSets(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::vector<SetDoubt> setDoubts(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::optional<ParameterSet> trialSet(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::string earlierResultFile() const override { return glue.earlierFile; }
  TaskOutcome run(const TaskContext& context) override;
  std::optional<TaskOutcome> unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const override;
  TaskReport report() const override {
    const ParameterDistributions* drawnFrom = isOfEarlierRun() ? nullptr : &settings.distributions;
    return {.hasBands = true, .isGlue = true, .distributions = drawnFrom};
  }

  UncertaintySettings settings;  ///< what all forms of the uncertainty analysis have in common
  GlueSettings glue;

 private:
  bool isOfEarlierRun() const { return !glue.earlierFile.empty(); }
  void keepSingleValues(const TaskReading& reading);
  void warnOfUnused(const SetupSection& section, const SetupSection& own) const;
  void refuseOwnResults(const TaskReading& reading, const SetupSection& section) const;
  /// The sets and how many were drawn for them; fewer only if none are redrawn.
  FeasibleSample drawSample(const Feasibility& feasibility) const;
  EarlierSample emptySample(const TaskContext& context) const;
  EarlierSample evaluateSample(const TaskContext& context) const;
  void addSensitivity(const TaskContext& context, const EarlierSample& evaluated, TaskOutcome& outcome) const;
  struct Found {
    TaskOutcome outcome;
    std::vector<std::string> warnings;  ///< which the report has, too
    bool hasWeights = false;
  };
  Found find(const TaskContext& context, const EarlierSample& evaluated) const;

  std::vector<std::vector<double>> singleValues_;  ///< by parameter
  GlueJudge judge_;
};

}  // namespace mirevo

#pragma once

#include "run/tasks/task.h"

namespace mirevo {

enum class ScenarioType : std::int32_t { singleRun = 0, multipleRuns = 1 };

/// Scenarios whose series are kept and shown one beside another, the first ones.
inline constexpr int kMostShownScenarios = 20;

/// One run of the list.
struct ScenarioRun {
  std::vector<double> values;  ///< one per model parameter, model scale
  std::string name = {};       ///< for people; may be empty
};

struct ScenarioSettings {
  ScenarioType type = ScenarioType::singleRun;
  std::vector<ScenarioRun> runs;
};

/// Scenario runs: the initial parameter set alone, or a list of sets in one batch.
class ScenarioTask final : public Task {
 public:
  const TaskFacts& facts() const override;
  std::vector<const SectionRow*> sections() const override;
  std::vector<std::string> neededSections(const SetupSection& target) const override;
  void read(const TaskReading& reading) override;
  std::vector<double> givenValues(std::size_t parameter) const override;
  std::string description() const override;
  std::vector<std::string> summaryLines(const SearchSpace& space) const override;
  int shownRuns() const override;
  /// A scenario that is listed twice is meant twice: so it shows whether the model draws random numbers.
  bool runsEverySet() const override { return true; }
  TaskReport report() const override;
  int plannedEvaluations() const override;
  std::vector<SetDoubt> setDoubts(const SearchSpace& space, const Feasibility& feasibility) const override;
  std::optional<ParameterSet> trialSet(const SearchSpace& space, const Feasibility& feasibility) const override;
  TaskOutcome run(const TaskContext& context) override;

  ScenarioSettings settings;

 private:
  std::vector<ParameterSet> sets(const SearchSpace& space, std::span<const ModelParameter> parameters) const;

  std::vector<ModelParameter> parameters_;  ///< of the setup
};

/// The parameter sets of the runs: the values of the variable parameters, transformed to the search scale. Mapping them
/// back yields the given values, which for an integer parameter are those of its grid, provided that the search space
/// knows those of logarithmic parameters. Throws FatalError naming run and parameter if a value cannot be transformed.
std::vector<ParameterSet> scenarioSets(std::span<const ScenarioRun> runs, std::span<const ModelParameter> parameters);

}  // namespace mirevo

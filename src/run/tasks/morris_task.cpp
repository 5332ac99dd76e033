#include "run/tasks/morris_task.h"

#include <utility>

#include <fmt/core.h>

#include "algorithms/analyses/sampled_distributions.h"
#include "common/fatal_error.h"
#include "parameters/parameter_model.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/sensitivity_section.h"

namespace mirevo {

const TaskFacts& MorrisTask::facts() const {
  static constexpr TaskFacts kFacts{{1, "sensitivity"},
                                    "sensitivity analysis",
                                    run_files::kSensitivity,
                                    {kSensitivitySection, kSensitivityTypeKeyword, {std::nullopt, kMorrisName}}};
  return kFacts;
}

std::vector<const SectionRow*> MorrisTask::sections() const {
  return {&morrisSection().row};
}

std::vector<std::string> MorrisTask::neededSections(const SetupSection& /*target*/) const {
  return {std::string(sensitivitySection().row.path)};
}

void MorrisTask::read(const TaskReading& reading) {
  const SetupSection section = reading.target.open(kSensitivitySection);
  section.read(sensitivitySection(), *static_cast<Task*>(this));
  const auto own = section.openIfPresent("MORRIS");
  if (own) own->read(morrisSection(), settings);
  const std::int64_t sets = std::int64_t{settings.trajectories} * static_cast<std::int64_t>(reading.variableCount + 1);
  if (const auto tooMany = tooManySets(sets)) {
    (own ? *own : section)
        .refuse("Error: Number of trajectories in Morris analysis invalid", kTrajectoriesKeyword,
                fmt::format("{}, found {} trajectories of {} sets", *tooMany, settings.trajectories,
                            reading.variableCount + 1));
  }
  if (own) tellOfDesign(*own);
  distributions = readDistributions(reading, section);
  givesDistributions = firstDistribution(section, reading.variableCount).has_value();
  ParameterModel model({reading.parameters.begin(), reading.parameters.end()},
                       {reading.constraints.begin(), reading.constraints.end()});
  plan_.reset();
  planned_ = planIn(model.searchSpace(), model.feasibility()).evaluationCount;
}

void MorrisTask::tellOfDesign(const SetupSection& section) const {
  constexpr std::int32_t kManyCandidates = 1000;
  if (settings.design == EffectDesign::trajectories) {
    if (settings.candidates < kManyCandidates) return;
    section.note(kCandidatesKeyword, fmt::format("{} designs are compared, which takes a while", settings.candidates));
    return;
  }
  for (const std::string_view keyword : {kLevelsKeyword, kCandidatesKeyword}) {
    if (section.isWritten(keyword)) section.warn(keyword, "has no effect without Design = 'trajectories'");
  }
}

ParameterDistributions MorrisTask::distributionsIn(const SearchSpace& space) const {
  return distributions ? *distributions : ParameterDistributions::uniform(space);
}

const EffectPlan& MorrisTask::planIn(const SearchSpace& space, const Feasibility& feasibility) const {
  if (!plan_) plan_ = planEffects(settings, space, distributionsIn(space), randomSeed, feasibility);
  return *plan_;
}

std::string MorrisTask::description() const {
  return fmt::format("Sensitivity analysis: Morris screening, {} trajectories, {}", settings.trajectories,
                     settings.design == EffectDesign::radial ? "radial" : "on levels");
}

std::vector<std::string> MorrisTask::summaryLines(const SearchSpace& space) const {
  return distributionLines(distributionsIn(space), space, kSensitivitySection);
}

std::vector<std::string> MorrisTask::warnings(const SearchSpace& space) const {
  const ParameterDistributions drawnFrom = distributionsIn(space);
  std::vector<std::string> texts = distributionWarnings(drawnFrom, space);
  if (drawnFrom.copula() && !drawnFrom.copula()->correlatedOnes().empty()) {
    texts.emplace_back(kCorrelatedStepsText);
  }
  if (settings.trajectories >= static_cast<std::int32_t>(kFewestEffectsForSigma)) return texts;
  texts.push_back(fmt::format("{} = {}: {}", kTrajectoriesKeyword, settings.trajectories,
                              settings.trajectories < static_cast<std::int32_t>(kFewestEffects)
                                  ? "too few for limits, and for a statement on which parameters can be fixed"
                                  : "so few that limits are wide, sigma has none, and a ranking may not hold"));
  return texts;
}

void MorrisTask::requireSets(const SearchSpace& space, const Feasibility& feasibility) const {
  if (!feasibility.isTested()) return;
  const EffectPlan& plan = planIn(space, feasibility);
  for (const EffectTrajectory& trajectory : plan.trajectories) {
    if (!pairsOf(plan, trajectory).empty()) return;
  }
  fatalError(feasibility.noSetMessage(), fmt::format("No elementary effect has two sets that can be run: {}",
                                                     plan.violation.empty() ? plan.stepViolation : plan.violation));
}

std::vector<SetDoubt> MorrisTask::setDoubts(const SearchSpace& space, const Feasibility& feasibility) const {
  const std::string text = infeasiblePointsText(planIn(space, feasibility), space.names);
  return text.empty() ? std::vector<SetDoubt>() : std::vector{SetDoubt{text}};
}

std::optional<ParameterSet> MorrisTask::trialSet(const SearchSpace& space, const Feasibility& feasibility) const {
  const EffectPlan& plan = planIn(space, feasibility);
  for (const EffectTrajectory& trajectory : plan.trajectories) {
    const std::vector<ParameterSet> sets = setsOf(plan, trajectory, distributionsIn(space));
    if (!sets.empty()) return sets.front();
  }
  return std::nullopt;
}

TaskOutcome MorrisTask::outcomeOf(const TaskContext& context, const EffectPlan& plan,
                                  const EffectResults& results) const {
  const AnalysisNames names = analysisNames(context);
  const MorrisOutcome found = screenParameters(plan, results, settings, randomSeed, context.objectives, names);
  TaskOutcome outcome{std::string(kEndOfTask)};
  outcome.report =
      formatMorris(found, plan, settings, names, fileNameOf(runFilePath(context.filePrefix, run_files::kMorris)));
  outcome.tables.push_back(morrisTable(found, settings, names));
  return outcome;
}

TaskOutcome MorrisTask::run(const TaskContext& context) {
  requireSets(context.space, context.feasibility);
  const EffectPlan& plan = planIn(context.space, context.feasibility);
  const ParameterDistributions drawnFrom = distributionsIn(context.space);
  BoundsCount outside(context.space);
  for (const EffectTrajectory& trajectory : plan.trajectories) {
    for (const ParameterSet& set : setsOf(plan, trajectory, drawnFrom)) outside.add(set);
  }
  context.log.line(outside.line());
  for (const SetDoubt& doubt : setDoubts(context.space, context.feasibility)) context.log.warning(doubt.text);
  results_.clear();
  evaluateEffects(plan, drawnFrom, context.evaluator, results_);
  context.log.line(
      fmt::format("The statistics of the effects and their limits, from {} bootstrap samples, are computed",
                  settings.bootstrapSamples));
  TaskOutcome outcome = outcomeOf(context, plan, results_);
  logReport(context, outcome.report);
  return outcome;
}

std::optional<TaskOutcome> MorrisTask::unfinishedOutcome(const TaskContext& context,
                                                         const UnfinishedBatch& made) const {
  const EffectPlan& plan = planIn(context.space, context.feasibility);
  EvaluationResult missing;
  missing.failure = {EvaluationFailure::Kind::notMade, "the run ended before", {}};
  EffectResults results = results_;
  results.resize(static_cast<std::size_t>(plan.evaluationCount), missing);
  for (const EvaluationResult& result : made.results) {
    if (result.number > plan.evaluationCount) continue;
    results[static_cast<std::size_t>(result.number - 1)] = result;
  }
  const auto isOk = [&](int number) { return results[static_cast<std::size_t>(number - 1)].ok(); };
  for (const EffectTrajectory& trajectory : plan.trajectories) {
    for (const EffectPair& pair : pairsOf(plan, trajectory)) {
      if (isOk(pair.from) && isOk(pair.to)) return outcomeOf(context, plan, results);
    }
  }
  return std::nullopt;
}

}  // namespace mirevo

#include "run/tasks/uncertainty_task.h"

#include <fmt/format.h>

#include "algorithms/analyses/sample_sensitivity.h"
#include "algorithms/analyses/sampled_distributions.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/sample_bands.h"
#include "run/tasks/simulated_room.h"

namespace mirevo {
namespace {

constexpr const char* kWhatSets = "sets of the sample";
constexpr const char* kInfeasibleRemedy =
    "With Redraw_Infeasible = 1 in UNCERTAINTY_ESTIMATION sets are drawn until all can be run";

}  // namespace

const TaskFacts& UncertaintyTask::facts() const {
  static constexpr TaskFacts kFacts{{3, "uncertainty"},
                                    "uncertainty analysis",
                                    run_files::kPlain,
                                    {kUncertaintySection, kUncertaintyTypeKeyword, kSamplingTypeNames[0]}};
  return kFacts;
}

std::vector<const SectionRow*> UncertaintyTask::sections() const {
  std::vector<const SectionRow*> rows{&uncertaintySection().row};
  for (const SectionRow* row : distributionSections(kUncertaintySection)) rows.push_back(row);
  return rows;
}

std::vector<std::string> UncertaintyTask::neededSections(const SetupSection& target) const {
  constexpr std::string_view kParameters = "MODEL_PARAMETERS";
  std::vector<std::string> paths{std::string(uncertaintySection().row.path)};
  const auto count = target.peek(kParameters, kItemCountKeyword);
  int variable = 0;
  for (int number = 1; count && number <= std::get<std::int32_t>(*count); ++number) {
    const std::string parameter = fmt::format("{}/PARAMETER_{}", kParameters, number);
    if (!target.holds(parameter)) break;
    if (target.peek(parameter, "Parameter_Type") != SetupValue(std::int32_t{0})) continue;
    paths.push_back(fmt::format("{}/PARAMETER_{}", paths.front(), ++variable));
  }
  return paths;
}

void UncertaintyTask::read(const TaskReading& reading) {
  const SetupSection section = reading.target.open("UNCERTAINTY_ESTIMATION");
  UncertaintySection filled{settings, randomSeed};
  section.read(uncertaintySection(), filled);
  if (const auto tooMany = tooManySets(settings.sampleSize, reading.variableCount)) {
    section.refuse(kSampleSizeRefusal, kSampleSizeKeyword, fmt::format("{}, found {}", *tooMany, settings.sampleSize));
  }
  section.require(validateBandEnd(settings, reading.period));
  settings.distributions = readDistributions(reading, section, MissingDistribution::isRefused);
  std::size_t variable = 0;
  for (const ModelParameter& parameter : reading.parameters) {
    std::vector<double>& values = singleValues_.emplace_back();
    if (parameter.parameterType != ParameterType::variable) continue;
    const std::span<const double> ofParameter = settings.distributions[variable++].singleValues();
    values.assign(ofParameter.begin(), ofParameter.end());
  }
}

std::vector<double> UncertaintyTask::givenValues(std::size_t parameter) const {
  return parameter < singleValues_.size() ? singleValues_[parameter] : std::vector<double>{};
}

std::optional<KeptSteps> UncertaintyTask::keptSteps() const {
  return bandSteps(settings);
}

std::string UncertaintyTask::description() const {
  return fmt::format("Uncertainty analysis: {} sampling",
                     kSamplingTypeNames[settings.samplingType == SamplingType::latinHypercube ? 1 : 0].name);
}

std::vector<std::string> UncertaintyTask::summaryLines(const SearchSpace& space) const {
  return distributionLines(settings.distributions, space, kUncertaintySection);
}

std::vector<std::string> UncertaintyTask::warnings(const SearchSpace& space) const {
  return distributionWarnings(settings.distributions, space);
}

void UncertaintyTask::requireSets(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  if (!settings.redrawsInfeasible || !feasibility.isTested() || settings.distributions.size() == 0) return;
  feasibleUncertaintySample(settings, randomSeed, feasibility);
}

std::vector<SetDoubt> UncertaintyTask::setDoubts(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  if (settings.redrawsInfeasible || !feasibility.isTested() || settings.distributions.size() == 0) return {};
  return infeasibleSets(feasibility, uncertaintySample(settings, randomSeed, {}), kWhatSets, settings.sampleSize,
                        kInfeasibleRemedy)
      .doubts();
}

std::optional<ParameterSet> UncertaintyTask::trialSet(const SearchSpace& /*space*/,
                                                      const Feasibility& feasibility) const {
  if (settings.distributions.size() == 0) return std::nullopt;
  return firstFeasible(feasibility, settings.redrawsInfeasible
                                        ? feasibleUncertaintySample(settings, randomSeed, feasibility).sets
                                        : uncertaintySample(settings, randomSeed, {}));
}

/// `acceptance`: a line on the sets drawn, if any can be drawn again.
std::vector<ParameterSet> UncertaintyTask::drawSample(const TaskContext& context, std::string& acceptance) const {
  if (settings.distributions.size() == 0) return {};
  const auto messages = [&](std::string_view text) { context.log.line(text); };
  if (!settings.redrawsInfeasible) {
    std::vector<ParameterSet> sample = uncertaintySample(settings, randomSeed, messages);
    warnOfInfeasibleSets(context, sample, kWhatSets, settings.sampleSize, kInfeasibleRemedy);
    return sample;
  }
  FeasibleSample sample = feasibleUncertaintySample(settings, randomSeed, context.feasibility, messages);
  const double rate = 100.0 * static_cast<double>(sample.sets.size()) / static_cast<double>(sample.drawnCount);
  acceptance = fmt::format("Redraw_Infeasible: {} sets that can be run out of {} drawn, an acceptance rate of {} %",
                           sample.sets.size(), sample.drawnCount,
                           rate < 1.0 ? fmt::format("{:.2g}", rate) : fmt::format("{:.1f}", rate));
  context.log.line(acceptance);
  if (rate < 1.0) {
    context.log.warning(
        "Less than 1 % of the sets drawn can be run: their distributions may have little in common with the ones "
        "requested. Are means, standard deviations, constraints and equations right?");
  }
  return std::move(sample.sets);
}

TaskOutcome UncertaintyTask::outcomeOf(const TaskContext& context, const UncertaintyOutcome& found) const {
  TaskOutcome outcome{std::string(kEndOfTask)};
  const UncertaintySummary summary = summariseUncertainty(found, context.space, settings.matrixLimit);
  const AnalysisNames names = analysisNames(context);
  outcome.report =
      formatUncertainty(summary, names, fileNameOf(runFilePath(context.filePrefix, run_files::kSampleCorrelation)));
  outcome.report.insert(outcome.report.begin() + 1, setsOutsideBounds(found.sample, context.space));
  outcome.tables = uncertaintyTables(summary, names);
  const bool areCorrelated = settings.distributions.copula().has_value();
  const SampleSensitivity sensitivity = sampleSensitivity(found, context.space, names, randomSeed);
  outcome.tables.push_back(sampleSensitivityTable(sensitivity, names, areCorrelated));
  const std::vector<std::string> dependences = formatSampleSensitivity(
      sensitivity, names, fileNameOf(runFilePath(context.filePrefix, run_files::kSampleSensitivities)), areCorrelated);
  outcome.report.insert(outcome.report.end(), dependences.begin(), dependences.end());
  std::vector<int> numbers;
  for (const EvaluationResult& result : found.results) {
    if (result.ok()) numbers.push_back(result.number);
  }
  const std::vector<std::string> bands =
      reportBands(context, settings, numbers, {}, context.simulatedColumns, outcome.files);
  outcome.report.emplace_back();
  outcome.report.insert(outcome.report.end(), bands.begin(), bands.end());
  return outcome;
}

TaskOutcome UncertaintyTask::run(const TaskContext& context) {
  std::string acceptance;
  std::vector<ParameterSet> sample = drawSample(context, acceptance);
  context.log.line(setsOutsideBounds(sample, context.space));
  logBandTimes(context, settings);
  logRoomOfSimulatedValues(context, run_files::kPlain.simulatedValues, static_cast<std::size_t>(settings.sampleSize));
  const UncertaintyOutcome found = uncertaintyAnalysis(std::move(sample), context.evaluator);
  TaskOutcome outcome = outcomeOf(context, found);
  if (!acceptance.empty()) outcome.report.insert(outcome.report.begin() + 1, acceptance);
  logReport(context, outcome.report);
  return outcome;
}

std::optional<TaskOutcome> UncertaintyTask::unfinishedOutcome(const TaskContext& context,
                                                              const UnfinishedBatch& made) const {
  return outcomeOf(context, {made.sets, made.results});
}

}  // namespace mirevo

#include "run/tasks/glue_task.h"

#include <algorithm>
#include <bit>
#include <filesystem>
#include <system_error>
#include <utility>

#include <fmt/format.h>

#include "algorithms/analyses/sample_sensitivity.h"
#include "algorithms/analyses/sampled_distributions.h"
#include "algorithms/numbers/latin_hypercube.h"
#include "algorithms/numbers/sobol.h"
#include "algorithms/numbers/uniform_generator.h"
#include "common/text.h"
#include "run/access/file_validation.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/sample_bands.h"
#include "run/tasks/simulated_room.h"

namespace mirevo {
namespace {

constexpr CodeName kGlueName{std::nullopt, "GLUE"};
constexpr const char* kWhatSets = "sets of the sample";
constexpr const char* kInfeasibleRemedy =
    "With Redraw_Infeasible = 1 in UNCERTAINTY_ESTIMATION sets are drawn until all can be run";

std::vector<double> randomPoint(std::size_t dimension, UniformGenerator& random) {
  std::vector<double> point(dimension);
  for (double& coordinate : point) coordinate = random.next();
  return point;
}

UnitPoints pointsOf(GlueSampling sampling, std::size_t count, std::size_t dimension, UniformGenerator& random) {
  if (sampling == GlueSampling::latinHypercube) return latinHypercube(count, dimension, random);
  UnitPoints points;
  if (sampling == GlueSampling::sobol) {
    points = scrambledSobol(count, dimension, random);
    // A coordinate may be 0, at which a distribution need not have a value.
    constexpr double kLeast = 0x1p-33;
    for (std::vector<double>& point : points) {
      for (double& coordinate : point) coordinate = std::max(coordinate, kLeast);
    }
    return points;
  }
  for (std::size_t i = 0; i < count; ++i) points.push_back(randomPoint(dimension, random));
  return points;
}

/// The log has warnings as such; the result file has them, too.
std::string samplingName(GlueSampling sampling) {
  return std::string(kGlueSamplingNames[static_cast<std::size_t>(sampling)].name);
}

}  // namespace

const TaskFacts& GlueTask::facts() const {
  static constexpr TaskFacts kFacts{{3, "uncertainty"},
                                    "uncertainty analysis",
                                    run_files::kPlain,
                                    {kUncertaintySection, kUncertaintyTypeKeyword, kGlueName}};
  return kFacts;
}

std::vector<const SectionRow*> GlueTask::sections() const {
  return {&glueSection().row};
}

std::vector<std::string> GlueTask::neededSections(const SetupSection& /*target*/) const {
  return {std::string(uncertaintySection().row.path), std::string(glueSection().row.path)};
}

void GlueTask::read(const TaskReading& reading) {
  const SetupSection section = reading.target.open(kUncertaintySection);
  UncertaintySection filled{settings, randomSeed};
  section.read(uncertaintySection(), filled);
  section.require(validateBandEnd(settings, reading.period));
  const SetupSection own = section.open(kGlueSectionName);
  own.read(glueSection(), glue);
  if (glue.sampling == GlueSampling::sobol && reading.variableCount > kMaxSobolDimension) {
    own.refuse("Error: Sampling in uncertainty estimation invalid", kSamplingKeyword,
               fmt::format("'Sobol' is for up to {} variable parameters, found {}", kMaxSobolDimension,
                           reading.variableCount));
  }
  SettingRefusal refusal;
  const auto judge = glueJudge(glue, reading.measures, reading.objectives, refusal);
  if (!judge) own.refuse(refusal);
  judge_ = *judge;
  settings.distributions = readDistributions(reading, section);
  keepSingleValues(reading);
  warnOfUnused(section, own);
  if (isOfEarlierRun()) {
    validateFileOpens(glue.earlierFile, kEarlierRunKeyword, own);
    refuseOwnResults(reading, own);
    return;
  }
  if (const auto tooMany = tooManySets(settings.sampleSize, reading.variableCount)) {
    section.refuse(kSampleSizeRefusal, kSampleSizeKeyword, fmt::format("{}, found {}", *tooMany, settings.sampleSize));
  }
  const auto size = static_cast<unsigned>(settings.sampleSize);
  if (glue.sampling == GlueSampling::sobol && !std::has_single_bit(size)) {
    section.warn(kSampleSizeKeyword,
                 fmt::format("Sobol points fill the space evenly where their number is a power of two: {} or {}",
                             std::bit_floor(size), std::uint64_t{std::bit_floor(size)} * 2));
  }
}

void GlueTask::warnOfUnused(const SetupSection& section, const SetupSection& own) const {
  if (glue.likelihood == LikelihoodShape::equal && own.isWritten(kShapeFactorKeyword)) {
    own.warn(kShapeFactorKeyword, "has no effect with Likelihood = 'equal'");
  }
  if (!isOfEarlierRun()) return;
  constexpr const char* kReason = "has no effect with Earlier_Result_File, as no set is drawn";
  if (section.isWritten(kRedrawKeyword)) section.warn(kRedrawKeyword, kReason);
  if (own.isWritten(kSamplingKeyword)) own.warn(kSamplingKeyword, kReason);
  if (const auto name = firstDistribution(section, settings.distributions.size())) section.warn(*name, kReason);
}

/// Values that distributions have exactly, such as those of a file.
void GlueTask::keepSingleValues(const TaskReading& reading) {
  std::size_t variable = 0;
  for (const ModelParameter& parameter : reading.parameters) {
    std::vector<double>& values = singleValues_.emplace_back();
    if (parameter.parameterType != ParameterType::variable) continue;
    const std::span<const double> ofParameter = settings.distributions[variable++].singleValues();
    values.assign(ofParameter.begin(), ofParameter.end());
  }
}

std::vector<double> GlueTask::givenValues(std::size_t parameter) const {
  return parameter < singleValues_.size() ? singleValues_[parameter] : std::vector<double>{};
}

/// They are taken over by a restart; a fresh start would put them aside before they are read.
void GlueTask::refuseOwnResults(const TaskReading& reading, const SetupSection& section) const {
  std::error_code none;
  if (!std::filesystem::equivalent(glue.earlierFile, runFilePath(reading.filePrefix, facts().resultFiles.results),
                                   none)) {
    return;
  }
  section.refuse("Error: Earlier result file invalid", kEarlierRunKeyword,
                 "expected the results of another setup, found those of this one: Restart = 1 takes them over, and "
                 "another threshold or likelihood then needs no model run");
}

std::optional<KeptSteps> GlueTask::keptSteps() const {
  return bandSteps(settings);
}

std::string GlueTask::description() const {
  return isOfEarlierRun() ? fmt::format("Uncertainty analysis: GLUE of the evaluations in {}", glue.earlierFile)
                          : fmt::format("Uncertainty analysis: GLUE, {} sampling", samplingName(glue.sampling));
}

std::vector<std::string> GlueTask::summaryLines(const SearchSpace& space) const {
  std::vector<std::string> lines;
  if (!isOfEarlierRun()) lines = distributionLines(settings.distributions, space, kUncertaintySection);
  lines.insert(lines.end(), {"GLUE, " + behaviouralText(judge_, glue), "GLUE, " + likelihoodText(glue)});
  return lines;
}

std::vector<std::string> GlueTask::warnings(const SearchSpace& space) const {
  return isOfEarlierRun() ? std::vector<std::string>() : distributionWarnings(settings.distributions, space);
}

FeasibleSample GlueTask::drawSample(const Feasibility& feasibility) const {
  UniformGenerator random(randomSeed);
  const std::size_t dimension = settings.distributions.size();
  std::vector<ParameterSet> sets;
  for (const std::vector<double>& point :
       pointsOf(glue.sampling, static_cast<std::size_t>(settings.sampleSize), dimension, random)) {
    sets.push_back(settings.distributions.setAt(point));
  }
  if (!settings.redrawsInfeasible || !feasibility.isTested()) {
    const auto count = static_cast<std::int64_t>(sets.size());
    return {std::move(sets), count};
  }
  return redrawInfeasible(std::move(sets), feasibility,
                          [&] { return settings.distributions.setAt(randomPoint(dimension, random)); });
}

void GlueTask::requireSets(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  if (!isOfEarlierRun() && settings.redrawsInfeasible && feasibility.isTested()) drawSample(feasibility);
}

EarlierSample GlueTask::emptySample(const TaskContext& context) const {
  return {.simulatedColumns = context.simulatedColumns, .areCorrelated = settings.distributions.copula().has_value()};
}

std::vector<SetDoubt> GlueTask::setDoubts(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  if (isOfEarlierRun() || settings.redrawsInfeasible || !feasibility.isTested()) return {};
  return infeasibleSets(feasibility, drawSample(feasibility).sets, kWhatSets, settings.sampleSize, kInfeasibleRemedy)
      .doubts();
}

std::optional<ParameterSet> GlueTask::trialSet(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  if (isOfEarlierRun()) return std::nullopt;
  return firstFeasible(feasibility, drawSample(feasibility).sets);
}

EarlierSample GlueTask::evaluateSample(const TaskContext& context) const {
  const FeasibleSample drawn = drawSample(context.feasibility);
  if (drawn.drawnCount > std::ssize(drawn.sets)) {
    context.log.line(
        fmt::format("Redraw_Infeasible: {} sets that can be run out of {} drawn", drawn.sets.size(), drawn.drawnCount));
  } else if (!settings.redrawsInfeasible) {
    warnOfInfeasibleSets(context, drawn.sets, kWhatSets, settings.sampleSize, kInfeasibleRemedy);
  }
  context.log.line(setsOutsideBounds(drawn.sets, context.space));
  logBandTimes(context, settings);
  logRoomOfSimulatedValues(context, run_files::kPlain.simulatedValues, static_cast<std::size_t>(settings.sampleSize));
  const std::vector<EvaluationResult> results = context.evaluator.evaluateParameterSets(drawn.sets, DispatchMode::task);
  EarlierSample evaluated = emptySample(context);
  for (std::size_t i = 0; i < results.size(); ++i) {
    evaluated.sample.add(ToModelScale(context.space, drawn.sets[i]), results[i]);
  }
  return evaluated;
}

/// What all sets say of the outputs, whether they are behavioural or not.
void GlueTask::addSensitivity(const TaskContext& context, const EarlierSample& evaluated, TaskOutcome& outcome) const {
  const AnalysisNames names = analysisNames(context);
  const SampleSensitivity sensitivity = sampleSensitivity(evaluated.sample, names, randomSeed);
  outcome.tables.push_back(sampleSensitivityTable(sensitivity, names, evaluated.areCorrelated));
  const std::vector<std::string> lines = formatSampleSensitivity(
      sensitivity, names, fileNameOf(runFilePath(context.filePrefix, run_files::kSampleSensitivities)),
      evaluated.areCorrelated);
  outcome.report.insert(outcome.report.end(), lines.begin(), lines.end());
}

GlueTask::Found GlueTask::find(const TaskContext& context, const EarlierSample& evaluated) const {
  const EvaluatedSample& sample = evaluated.sample;
  const GlueWeights weights = glueWeights(sample, judge_, glue);
  const GlueSummary summary = summariseGlue(sample, weights, settings.matrixLimit);
  const AnalysisNames names = analysisNames(context);
  Found found{{std::string(kEndOfTask)}, glueWarnings(sample, weights, judge_, glue), weights.hasWeights()};
  TaskOutcome& outcome = found.outcome;
  outcome.report = formatGlue(sample, weights, summary, judge_, glue, names,
                              fileNameOf(runFilePath(context.filePrefix, run_files::kSampleCorrelation)),
                              evaluated.isOfDistributions);
  outcome.tables = glueTables(sample, weights, summary, judge_, glue, names);
  if (evaluated.isOfDistributions) addSensitivity(context, evaluated, outcome);
  if (!evaluated.simulatedColumns) return found;
  std::vector<int> numbers;
  std::vector<double> ofNumbers;
  for (std::size_t k = 0; k < weights.behavioural.size(); ++k) {
    if (!(weights.weights[k] > 0.0)) continue;
    numbers.push_back(sample.numbers[weights.behavioural[k]]);
    ofNumbers.push_back(weights.weights[k]);
  }
  // Without a behavioural set they are empty, so that those of another threshold are not taken for them.
  const std::vector<std::string> bands =
      reportBands(context, settings, numbers, ofNumbers, evaluated.simulatedColumns, outcome.files);
  if (!found.hasWeights) return found;
  outcome.report.emplace_back();
  outcome.report.insert(outcome.report.end(), bands.begin(), bands.end());
  return found;
}

TaskOutcome GlueTask::run(const TaskContext& context) {
  const EarlierSample evaluated = isOfEarlierRun() ? context.earlierSample(glue.earlierFile) : evaluateSample(context);
  for (const std::string& text : evaluated.notes) context.log.line(text);
  for (const std::string& text : evaluated.warnings) context.log.warning(text);
  Found found = find(context, evaluated);
  logReport(context, found.outcome.report);
  std::vector<std::string> notes = evaluated.warnings;
  notes.insert(notes.end(), found.warnings.begin(), found.warnings.end());
  addNotes(notes, found.outcome.report);
  for (const std::string& text : found.warnings) {
    if (!found.hasWeights && context.warnUser) {
      context.warnUser(text);
    } else {
      context.log.warning(text);
    }
  }
  return std::move(found.outcome);
}

std::optional<TaskOutcome> GlueTask::unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const {
  if (isOfEarlierRun()) return std::nullopt;
  EarlierSample evaluated = emptySample(context);
  for (std::size_t i = 0; i < made.results.size(); ++i) {
    evaluated.sample.add(ToModelScale(context.space, made.sets[i]), made.results[i]);
  }
  Found found = find(context, evaluated);
  addNotes(found.warnings, found.outcome.report);
  return std::move(found.outcome);
}

}  // namespace mirevo

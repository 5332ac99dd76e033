#include "run/tasks/sobol_task.h"

#include <algorithm>
#include <bit>
#include <limits>
#include <utility>

#include <fmt/format.h>

#include "algorithms/analyses/compared_observations.h"
#include "algorithms/analyses/sampled_distributions.h"
#include "algorithms/analyses/sobol_indices.h"
#include "algorithms/analyses/sobol_report.h"
#include "algorithms/analyses/sobol_series.h"
#include "algorithms/numbers/sobol.h"
#include "common/text.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/sensitivity_section.h"
#include "run/tasks/simulated_room.h"

namespace mirevo {
namespace {

constexpr const char* kWhatSets = "sets of the design";
constexpr const char* kInfeasibleRemedy =
    "Narrower bounds that leave out most of what the constraints exclude make more of them run; or a parameter for the "
    "difference or the ratio of two, from which an equation makes the other (Parameter_Type = 2)";
constexpr const char* kSobolSizeRefusal = "Error: Sample size in Sobol sensitivity analysis invalid";

/// Two correlated parameters of different factors.
std::optional<std::pair<std::size_t, std::size_t>> dependence(const ParameterDistributions& distributions,
                                                              std::span<const SobolFactor> factors) {
  if (!distributions.copula()) return std::nullopt;
  std::vector<std::size_t> factorOf(distributions.size(), 0);
  for (std::size_t f = 0; f < factors.size(); ++f) {
    for (const std::size_t j : factors[f].parameters) factorOf[j] = f;
  }
  for (std::size_t i = 0; i < factorOf.size(); ++i) {
    for (std::size_t j = 0; j < i; ++j) {
      if (distributions.copula()->correlations()[i][j] != 0.0 && factorOf[i] != factorOf[j]) return std::pair{j, i};
    }
  }
  return std::nullopt;
}

/// The results by their sets; null for a set that was not run or failed.
std::vector<const EvaluationResult*> bySet(std::span<const EvaluationResult> results, std::size_t setCount) {
  std::vector<const EvaluationResult*> ofSets(setCount, nullptr);
  for (const EvaluationResult& result : results) {
    const auto set = static_cast<std::size_t>(result.number) - 1;
    if (result.number >= 1 && set < setCount && result.ok()) ofSets[set] = &result;
  }
  return ofSets;
}

std::span<const double> measuresOf(const EvaluationResult& result) {
  return result.exactMeasures.empty() ? result.measureValues : result.exactMeasures;
}

/// `valueOf(result)` of every set, NaN without a result.
template <class ValueOf>
std::vector<double> valuesOf(std::span<const EvaluationResult* const> ofSets, ValueOf valueOf) {
  std::vector<double> values;
  values.reserve(ofSets.size());
  for (const EvaluationResult* result : ofSets) {
    values.push_back(result == nullptr ? std::numeric_limits<double>::quiet_NaN() : valueOf(*result));
  }
  return values;
}

std::vector<SobolOutput> outputsOf(const TaskContext& context, const SobolDesign& design,
                                   std::span<const EvaluationResult* const> ofSets,
                                   const ReplicateBootstrap& bootstrap) {
  std::vector<SobolOutput> outputs;
  for (std::size_t i = 0; i < context.measures.size(); ++i) {
    const std::vector<double> values =
        valuesOf(ofSets, [i](const EvaluationResult& result) { return measuresOf(result)[i]; });
    outputs.push_back(sobolOutput(design, values, bootstrap, "measure", context.measures[i].name));
  }
  for (std::size_t i = 0; i < context.objectives.size(); ++i) {
    const std::vector<double> values = valuesOf(ofSets, [&](const EvaluationResult& result) {
      return result.exactMeasures.empty()
                 ? result.objectiveValues[i]
                 : objectiveFunctionValues(context.objectives.subspan(i, 1), result.exactMeasures).front();
    });
    outputs.push_back(sobolOutput(design, values, bootstrap, "objective", context.objectives[i].name));
  }
  return outputs;
}

/// "K at 63 %, FC at 37 % of 365 times"
std::string leadersText(const SobolSeries& series, std::span<const SobolFactor> factors) {
  std::vector<std::size_t> order;
  for (std::size_t j = 0; j < factors.size(); ++j) {
    if (series.largestCounts[j] > 0) order.push_back(j);
  }
  std::ranges::stable_sort(order, std::ranges::greater{}, [&](std::size_t j) { return series.largestCounts[j]; });
  constexpr std::size_t kMost = 5;
  std::string text;
  for (std::size_t i = 0; i < std::min(order.size(), kMost); ++i) {
    text += fmt::format(
        "{}{} at {:.0f} %", i == 0 ? "" : ", ", factors[order[i]].name,
        100.0 * static_cast<double>(series.largestCounts[order[i]]) / static_cast<double>(series.timeCount));
  }
  return text + fmt::format(" of {}", countText(series.timeCount, "time"));
}

/// Whose total index is the largest, or why that is not known.
std::string seriesText(const std::string& name, const SobolSeries& series, std::span<const SobolFactor> factors) {
  if (series.timeCount > 0) {
    return fmt::format("   Series of {}, largest total index: {}", name, leadersText(series, factors));
  }
  return fmt::format("   Series of {}: {}", name,
                     series.constantCount > 0 ? "no parameter has an influence"
                                              : "which total index is the largest is not known, as none has limits");
}

}  // namespace

/// What is drawn from the run's random numbers.
struct SobolTask::Drawn {
  UniformGenerator random;
  ReplicateBootstrap bootstrap;
};

SobolTask::Drawn SobolTask::draw() const {
  UniformGenerator ofBootstrap(randomSeed);
  const ReplicateBootstrap bootstrap(static_cast<std::size_t>(settings.bootstrapSamples), ofBootstrap);
  // The numbers of the sets come behind those of the default number of bootstrap samples, whatever their number is, so
  // that a restart with more of them has the same sets.
  UniformGenerator random(randomSeed);
  [[maybe_unused]] const ReplicateBootstrap before(static_cast<std::size_t>(SobolSettings{}.bootstrapSamples), random);
  return {random, bootstrap};
}

const TaskFacts& SobolTask::facts() const {
  static constexpr TaskFacts kFacts{{1, "sensitivity"},
                                    "sensitivity analysis",
                                    run_files::kSensitivity,
                                    {kSensitivitySection, kSensitivityTypeKeyword, {std::nullopt, kSobolName}}};
  return kFacts;
}

std::vector<const SectionRow*> SobolTask::sections() const {
  return {&sobolSection().row};
}

std::vector<std::string> SobolTask::neededSections(const SetupSection& /*target*/) const {
  return {std::string(sensitivitySection().row.path), std::string(sobolSection().row.path)};
}

void SobolTask::read(const TaskReading& reading) {
  const SetupSection section = reading.target.open(kSensitivitySection);
  section.read(sensitivitySection(), *static_cast<Task*>(this));
  const SetupSection own = section.open("SOBOL");
  own.read(sobolSection(), settings);
  distributions_ = readDistributions(reading, section);
  if (2 * reading.variableCount > kMaxSobolDimension) {
    own.refuse("Error: Too many parameters for a Sobol sensitivity analysis", kSobolSampleSizeKeyword,
               fmt::format("expected at most {} variable parameters, found {}: 'Morris' finds those that matter among "
                           "more",
                           kMaxSobolDimension / 2, reading.variableCount));
  }
  const SearchSpace space = BuildSearchSpace(reading.parameters);
  SobolGroupProblem problem;
  factors_ = sobolFactors(space.names, settings.groups, problem);
  if (!problem.text.empty()) {
    own.refuse("Error: Invalid group in Sobol sensitivity analysis", kSobolGroupKeyword,
               static_cast<int>(problem.group) + 1, problem.text);
  }
  if (const auto pair = dependence(distributions_, factors_)) {
    own.refuse(
        "Error: Sobol sensitivity analysis of correlated parameters", kSobolGroupKeyword,
        fmt::format("parameters '{}' and '{}' are correlated, and the variance is not the sum of shares of each: "
                    "leave the correlation out, or put parameters that are correlated into one group",
                    trimTrailing(space.names[pair->first]), trimTrailing(space.names[pair->second])));
  }
  design_ = {static_cast<std::size_t>(settings.sampleSize), factors_.size(), settings.hasSecondOrder};
  const auto sets = static_cast<std::int64_t>(design_.setCount());
  if (const auto tooMany = tooManySets(sets, reading.variableCount)) {
    own.refuse(kSobolSizeRefusal, kSobolSampleSizeKeyword,
               fmt::format("{}, found {} blocks of {} sets", *tooMany, settings.sampleSize, design_.setsPerRow()));
  }
}

std::optional<KeptSteps> SobolTask::keptSteps() const {
  if (settings.seriesTimes != SobolSeriesTimes::steps) return std::nullopt;
  return KeptSteps{};
}

std::string SobolTask::description() const {
  return fmt::format("Sensitivity analysis: Sobol' indices, first-order and total{}",
                     settings.hasSecondOrder ? ", and second order" : "");
}

std::vector<std::string> SobolTask::summaryLines(const SearchSpace& space) const {
  std::vector<std::string> lines{fmt::format("Design: {} blocks of {} model runs for {}, {} in all", design_.rows,
                                             design_.setsPerRow(), factorCountText(factors_), design_.setCount())};
  for (std::string& line : distributionLines(distributions_, space, kSensitivitySection)) {
    lines.push_back(std::move(line));
  }
  return lines;
}

std::vector<std::string> SobolTask::warnings(const SearchSpace& space) const {
  std::vector<std::string> texts = distributionWarnings(distributions_, space);
  if (std::string single = singleFactorText(factors_); !single.empty()) texts.push_back(std::move(single));
  const std::size_t rows = design_.rows;
  if (std::has_single_bit(rows)) return texts;
  texts.push_back(fmt::format("{} = {} is no power of two: the points of the design are less even than those of {}",
                              kSobolSampleSizeKeyword, rows, std::bit_floor(rows)));
  return texts;
}

std::vector<SetDoubt> SobolTask::setDoubts(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  if (!feasibility.isTested()) return {};
  UniformGenerator random = draw().random;
  const std::vector<ParameterSet> sets = sobolSets(design_, factors_, distributions_, random);
  return infeasibleSets(feasibility, sets, kWhatSets, static_cast<int>(sets.size()), kInfeasibleRemedy).doubts();
}

std::optional<ParameterSet> SobolTask::trialSet(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  UniformGenerator random = draw().random;
  return firstFeasible(feasibility, sobolSets(design_, factors_, distributions_, random));
}

TaskOutcome SobolTask::outcomeOf(const TaskContext& context, std::span<const EvaluationResult> results,
                                 std::vector<std::string>& warnings) const {
  TaskOutcome outcome{std::string(kEndOfTask)};
  SobolFindings findings{.design = design_,
                         .factors = factors_,
                         .parameters = context.space.names,
                         .outputs = {},
                         .runCount = results.size(),
                         .failedCount = 0,
                         .negligibleIndex = settings.negligibleIndex};
  std::size_t last = 0;
  for (const EvaluationResult& result : results) {
    last = std::max(last, static_cast<std::size_t>(result.number));
    if (!result.ok()) ++findings.failedCount;
  }
  // Of an interrupted run the blocks that it had begun.
  findings.design.rows = std::min(design_.rows, (last + design_.setsPerRow() - 1) / design_.setsPerRow());
  const ReplicateBootstrap bootstrap = draw().bootstrap;
  const std::vector<const EvaluationResult*> ofSets = bySet(results, findings.design.setCount());
  findings.outputs = outputsOf(context, findings.design, ofSets, bootstrap);
  outcome.report = formatSobol(findings, fileNameOf(runFilePath(context.filePrefix, run_files::kSobol)));
  outcome.tables = sobolTables(findings);
  warnings = sobolWarnings(findings);
  for (std::string& text : mixedObservations(results, analysisNames(context).measures)) {
    warnings.push_back(std::move(text));
  }

  std::vector<int> numbers;
  std::vector<std::size_t> sets;
  for (std::size_t set = 0; set < ofSets.size(); ++set) {
    if (ofSets[set] == nullptr) continue;
    numbers.push_back(static_cast<int>(set) + 1);
    sets.push_back(set);
  }
  std::size_t first = 0;
  std::vector<std::size_t> taken;  // measures: several may compare the same series
  for (const ObservedSeries& observed : context.observedSeries) {
    if (!keepsSimulatedValues()) break;
    const std::size_t begin = std::exchange(first, first + observed.days.size());
    const OutputMeasure& measure = context.measures[observed.measure];
    const bool isRepeated =
        std::ranges::any_of(taken, [&](std::size_t other) { return isSamePair(measure, context.measures[other]); });
    if (isRepeated) continue;
    taken.push_back(observed.measure);
    const std::string& name = measure.name;
    const SobolSeries series = sobolSeries(
        name, observed, findings.design, factors_, sets,
        [&](std::size_t index, std::size_t count) { return context.simulatedColumns(numbers, begin + index, count); },
        bootstrap);
    outcome.files.push_back(
        {runFilePath(context.filePrefix, run_files::kSobolSeries, static_cast<int>(observed.measure) + 1),
         series.text});
    outcome.report.push_back(seriesText(name, series, factors_));
    outcome.report.push_back("   " + outcome.files.back().path);
  }
  return outcome;
}

TaskOutcome SobolTask::run(const TaskContext& context) {
  std::vector<EvaluationResult> results;
  {
    UniformGenerator random = draw().random;
    const std::vector<ParameterSet> sets = sobolSets(design_, factors_, distributions_, random);
    warnOfInfeasibleSets(context, sets, kWhatSets, static_cast<int>(sets.size()), kInfeasibleRemedy);
    context.log.line(setsOutsideBounds(sets, context.space));
    if (keepsSimulatedValues()) logRoomOfSimulatedValues(context, facts().resultFiles.simulatedValues, sets.size());
    results = context.evaluator.evaluateParameterSets(sets, DispatchMode::task);
  }
  context.log.line(fmt::format(
      "The indices of {} are computed{}", countText(context.measures.size() + context.objectives.size(), "output"),
      keepsSimulatedValues() && !context.observedSeries.empty() ? ", and those of the simulated series over time"
                                                                : ""));
  std::vector<std::string> warnings;
  TaskOutcome outcome = outcomeOf(context, results, warnings);
  logReport(context, outcome.report);
  addNotes(warnings, outcome.report);
  for (const std::string& warning : warnings) context.log.warning(warning);
  return outcome;
}

std::optional<TaskOutcome> SobolTask::unfinishedOutcome(const TaskContext& context, const UnfinishedBatch& made) const {
  std::vector<std::string> warnings;
  TaskOutcome outcome = outcomeOf(context, made.results, warnings);
  addNotes(warnings, outcome.report);
  return outcome;
}

}  // namespace mirevo

#include "algorithms/analyses/uncertainty.h"

#include <algorithm>
#include <cstdint>
#include <numeric>
#include <utility>

#include <fmt/core.h>

#include "algorithms/numbers/uniform_generator.h"
#include "common/fatal_error.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {

namespace {

constexpr std::int64_t kMostRedraws = 1'000'000;  // for the whole sample, and as many again for each thousand sets

/// Replaces deviate i by a random value in the stratum (pi_i - 1, pi_i) / N, where pi_i is its rank among the deviates,
/// from 1; ties by index.
void stratify(std::vector<double>& deviates, UniformGenerator& random) {
  std::vector<std::size_t> order(deviates.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::stable_sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) { return deviates[a] < deviates[b]; });
  std::vector<std::size_t> rank(deviates.size());
  for (std::size_t k = 0; k < order.size(); ++k) rank[order[k]] = k + 1;
  const auto n = static_cast<double>(deviates.size());
  for (std::size_t i = 0; i < deviates.size(); ++i) deviates[i] = (static_cast<double>(rank[i]) - random.next()) / n;
}

/// One summary per column; `valuesOf(i)` returns the values of evaluation i.
template <typename ValuesOf>
std::vector<SampleSummary> summariseColumns(std::size_t count, const ValuesOf& valuesOf) {
  std::vector<std::vector<double>> columns;
  for (std::size_t i = 0; i < count; ++i) {
    const std::vector<double>& values = valuesOf(i);
    if (columns.size() < values.size()) columns.resize(values.size());
    for (std::size_t j = 0; j < values.size(); ++j) columns[j].push_back(values[j]);
  }
  std::vector<SampleSummary> summaries;
  summaries.reserve(columns.size());
  for (const std::vector<double>& column : columns) summaries.push_back(summariseSample(column));
  return summaries;
}

void appendSummaries(std::vector<std::string>& lines, const std::string& title, std::span<const std::string> names,
                     std::span<const SampleSummary> summaries) {
  std::vector<std::string> headings{"Mean", "Std. deviation"};
  for (const double p : kSummaryProbabilities) headings.push_back(fmt::format("{:g} %", 100.0 * p));
  std::vector<std::vector<double>> rows;
  for (const SampleSummary& summary : summaries) {
    rows.push_back({summary.mean, summary.standardDeviation});
    rows.back().insert(rows.back().end(), summary.quantiles.begin(), summary.quantiles.end());
  }
  lines.emplace_back();
  for (std::string& line : formatTable(title, headings, names, rows)) lines.push_back(std::move(line));
}

}  // namespace

const SettingSection<UncertaintySection>& uncertaintySection() {
  static const SettingSection<UncertaintySection> section{
      {std::string_view(kUncertaintySection),
       "when `Option` is 3",
       "Uncertainty analysis by sampling.",
       {choice<UncertaintySection>(
            [](UncertaintySection& s, const SetupValue& value) {
              const auto* number = std::get_if<std::int32_t>(&value);  // a name selects another form of the task
              if (number != nullptr) s.settings.samplingType = static_cast<SamplingType>(*number);
            },
            {.name = kUncertaintyTypeKeyword,
             .range = between(0, 1),
             .codes = kSamplingTypeNames,
             .refusal = "Error: Invalid uncertainty estimation type selection",
             .meaning = "How the parameter sets are drawn."}),
        setting<UncertaintySection>([](auto& s) -> auto& { return s.settings.sampleSize; },
                                    {.name = kSampleSizeKeyword,
                                     .range = from(2),
                                     .refusal = kSampleSizeRefusal,
                                     .unit = "model runs",
                                     .meaning = "Parameter sets that are drawn."}),
        setting<UncertaintySection>(
            [](auto& s) -> auto& { return s.randomSeed; },
            {.name = "Random_Seed", .defaultValue = "1", .meaning = "Seed of the run; its sign does not matter."}),
        setting<UncertaintySection>(
            [](auto& s) -> auto& { return s.settings.redrawsInfeasible; },
            {.name = kRedrawKeyword,
             .defaultValue = "0",
             .meaning =
                 "1: sets that violate a constraint, or for which an equation has no finite value, are drawn again "
                 "until all sets can be run. 0: they are not run and count as failed. No effect on DREAM, which "
                 "rejects them without a model run in any case."}),
        choice<UncertaintySection>(
            [](UncertaintySection& s, const SetupValue& value) {
              const bool isSteps = equalIgnoringCase(std::get<std::string>(value), kBandTimesNames[1].name);
              s.settings.bandTimes = isSteps ? BandTimes::steps : BandTimes::observations;
            },
            {.name = kBandTimesKeyword,
             .defaultValue = "'observations'",
             .codes = kBandTimesNames,
             .meaning = "At which times the bands are made: those of the observations, or also every simulated step."}),
        setting<UncertaintySection>(
            [](UncertaintySection& s) -> DateRecord& { return s.settings.bandEnd.emplace(); },
            {.name = kBandEndKeyword,
             .defaultValue = kNoDefault,
             .meaning = "With `Band_Times = 'steps'`, the end of the steps, inclusive, if it is later than `End_Date` "
                        "of the evaluation period."}),
        setting<UncertaintySection>(
            [](auto& s) -> auto& { return s.settings.matrixLimit; },
            {.name = "Correlation_Matrix_Limit",
             .defaultValue = "1000",
             .unit = "parameters",
             .meaning = "Number of variable parameters up to which `<setup>_SampleCorrelation.dat` has the matrix of "
                        "all correlations. Of more parameters it has the 10,000 largest alone; 0 or less: always."})}}};
  return section;
}

namespace {

std::vector<ParameterSet> drawSample(const UncertaintySettings& settings, UniformGenerator& random,
                                     const MessageSink& messages) {
  const auto n = static_cast<std::size_t>(std::max(settings.sampleSize, 0));
  std::vector<ParameterSet> sample(n, ParameterSet(settings.distributions.size()));  // of points of the unit cube
  std::vector<double> deviates(n);
  for (std::size_t j = 0; j < settings.distributions.size(); ++j) {
    for (double& deviate : deviates) deviate = random.next();
    if (settings.samplingType == SamplingType::latinHypercube) stratify(deviates, random);
    for (std::size_t i = 0; i < n; ++i) {
      int fault = 0;
      if (!(deviates[i] < 1.0)) normalQuantile(deviates[i], fault, messages);
      sample[i][j] = deviates[i];
    }
  }
  for (ParameterSet& set : sample) set = settings.distributions.setAt(set);
  return sample;
}

/// Ends an analysis that has drawn as often as it may; `complete` sets at the beginning of the sample can be run.
[[noreturn]] void failRedrawing(const Feasibility& feasibility, std::size_t complete, const FeasibleSample& sample,
                                std::string_view violation) {
  const double rate = 100.0 * static_cast<double>(complete) / static_cast<double>(sample.drawnCount);
  fatalError(
      complete == 0 ? feasibility.noSetMessage() : "Error: Too few parameter sets found that can be run",
      fmt::format("{} of the {} sets wanted, of {} drawn, an acceptance rate of {:.2g} %; the last one: {}\nMake "
                  "means, standard deviations and constraints (or equations) agree, so that more of the sets "
                  "drawn can be run{}",
                  complete, sample.sets.size(), sample.drawnCount, rate, violation,
                  complete == 0 ? "" : ", or take a smaller Sample_Size"));
}

}  // namespace

std::vector<ParameterSet> uncertaintySample(const UncertaintySettings& settings, std::int32_t seed,
                                            const MessageSink& messages) {
  UniformGenerator random(seed);
  return drawSample(settings, random, messages);
}

FeasibleSample redrawInfeasible(std::vector<ParameterSet> sets, const Feasibility& feasibility,
                                const std::function<ParameterSet()>& drawOne) {
  FeasibleSample sample{std::move(sets)};
  sample.drawnCount = static_cast<std::int64_t>(sample.sets.size());
  const std::int64_t most = kMostRedraws + kMostRedraws / 1000 * sample.drawnCount;
  std::int64_t redraws = 0;
  std::size_t feasible = 0;
  for (ParameterSet& set : sample.sets) {
    while (const auto violation = feasibility.violation(set)) {
      if (redraws++ == most) {
        failRedrawing(feasibility, feasible, sample, *violation);
      }
      set = drawOne();
      ++sample.drawnCount;
    }
    ++feasible;
  }
  return sample;
}

FeasibleSample feasibleUncertaintySample(const UncertaintySettings& settings, std::int32_t seed,
                                         const Feasibility& feasibility, const MessageSink& messages) {
  UniformGenerator random(seed);
  UncertaintySettings single = settings;
  single.samplingType = SamplingType::simpleRandom;
  single.sampleSize = 1;
  return redrawInfeasible(drawSample(settings, random, messages), feasibility,
                          [&] { return std::move(drawSample(single, random, messages).front()); });
}

UncertaintyOutcome uncertaintyAnalysis(std::vector<ParameterSet> sample, Evaluator& evaluator) {
  UncertaintyOutcome outcome{std::move(sample), {}};
  outcome.results = evaluator.evaluateParameterSets(outcome.sample, DispatchMode::task);
  return outcome;
}

UncertaintySummary summariseUncertainty(const UncertaintyOutcome& outcome, const SearchSpace& space,
                                        std::int32_t matrixLimit) {
  std::vector<std::vector<double>> modelValues;
  for (const ParameterSet& set : outcome.sample) modelValues.push_back(ToModelScale(space, set));
  std::vector<const EvaluationResult*> successful;
  for (const EvaluationResult& result : outcome.results) {
    if (result.ok()) successful.push_back(&result);
  }
  UncertaintySummary summary;
  summary.evaluationCount = outcome.results.size();
  summary.failedCount = outcome.results.size() - successful.size();
  summary.parameters = summariseColumns(
      modelValues.size(), [&](std::size_t i) -> auto& { return modelValues[i]; });
  for (std::size_t j = 0; j < summary.parameters.size(); ++j) {
    if (space.transformation[j] != TransformationType::integer) continue;
    std::vector<double> steps(modelValues.size());
    for (std::size_t i = 0; i < steps.size(); ++i) steps[i] = modelValues[i][j];
    summary.parameters[j] = summariseSample(steps, QuantileKind::ofValues);
  }
  if (space.size() <= static_cast<std::size_t>(std::max(matrixLimit, 0))) {
    summary.correlations = correlationMatrix(modelValues);
  } else {
    summary.largestCorrelations = largestCorrelations(SampleCorrelations(modelValues), kMostLargeCorrelations);
  }
  summary.measures = summariseColumns(
      successful.size(), [&](std::size_t i) -> auto& { return successful[i]->measureValues; });
  summary.objectives = summariseColumns(
      successful.size(), [&](std::size_t i) -> auto& { return successful[i]->objectiveValues; });
  summary.validation = summariseColumns(
      successful.size(), [&](std::size_t i) -> auto& { return successful[i]->validationValues; });
  return summary;
}

namespace {

DataTable correlationTable(const UncertaintySummary& summary, const AnalysisNames& names) {
  const std::string title = "Correlation of the parameters of all sets evaluated, model scale";
  if (summary.largestCorrelations.empty()) {
    return matrixTable(run_files::kSampleCorrelation, title, names.parameters, summary.correlations);
  }
  return pairTable(run_files::kSampleCorrelation, title, names.parameters, summary.largestCorrelations);
}

}  // namespace

std::vector<DataTable> uncertaintyTables(const UncertaintySummary& summary, const AnalysisNames& names) {
  DataTable table;
  table.file = run_files::kQuantiles;
  table.headLines = {
      "Parameters on the model scale, of all sets evaluated; measures and objective functions of those whose "
      "model run succeeded"};
  table.columns = {"Kind", "Name", "Count", "Mean", "StandardDeviation"};
  for (const double p : kSummaryProbabilities) table.columns.push_back(fmt::format("{:g} %", 100.0 * p));
  const auto add = [&table](const std::string& kind, std::span<const std::string> ofKind,
                            std::span<const SampleSummary> summaries) {
    for (std::size_t i = 0; i < summaries.size(); ++i) {
      const SampleSummary& one = summaries[i];
      std::vector<DataTable::Cell>& row = table.rows.emplace_back();
      row = {kind, ofKind[i], static_cast<std::int64_t>(one.count), one.mean, one.standardDeviation};
      row.insert(row.end(), one.quantiles.begin(), one.quantiles.end());
    }
  };
  add("parameter", names.parameters, summary.parameters);
  add("measure", names.measures, summary.measures);
  add("objective", names.objectives, summary.objectives);
  add("validation", names.validation, summary.validation);
  return {std::move(table), correlationTable(summary, names)};
}

std::vector<std::string> formatUncertainty(const UncertaintySummary& summary, const AnalysisNames& names,
                                           std::string_view correlationFile) {
  std::vector<std::string> lines;
  lines.push_back(fmt::format("Uncertainty analysis: {} evaluations, {} failed and left out of the statistics",
                              summary.evaluationCount, summary.failedCount));
  appendSummaries(lines, "Parameter (model scale)", names.parameters, summary.parameters);
  appendSummaries(lines, "Output measure", names.measures, summary.measures);
  appendSummaries(lines, "Objective function", names.objectives, summary.objectives);
  if (!names.validation.empty()) appendSummaries(lines, "Validation", names.validation, summary.validation);
  lines.emplace_back();
  const std::string title = "Sample correlation";
  const std::span<const PairCorrelation> largest = summary.largestCorrelations;
  for (std::string& line : largest.empty()
                               ? formatCorrelation(title, names.parameters, summary.correlations, correlationFile)
                               : formatLargest(title, names.parameters, largest, correlationFile)) {
    lines.push_back(std::move(line));
  }
  return lines;
}

}  // namespace mirevo

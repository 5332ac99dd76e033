#include "run/tasks/uncertainty_task.h"

#include <algorithm>
#include <cmath>
#include <cstdint>

#include <fmt/format.h>

#include "algorithms/analyses/sampled_distributions.h"
#include "algorithms/analyses/series_band.h"
#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "measures/dates.h"
#include "run/tasks/analysis_names.h"
#include "run/tasks/distribution_reading.h"
#include "run/tasks/infeasible_sets.h"
#include "run/tasks/simulated_room.h"

namespace mirevo {
namespace {

std::size_t countWithoutObservation(const ObservedSeries& series) {
  return static_cast<std::size_t>(
      std::count_if(series.values.begin(), series.values.end(), [](double value) { return std::isnan(value); }));
}

/// "Band of flow at 365 times from 2001-01-01 00:00 to 2001-12-31 00:00, 10 of them without an observation"
std::string bandTimesText(const std::string& name, const ObservedSeries& series) {
  const std::int64_t origin = secondNumber(series.start);
  const auto dateOf = [&](double days) { return formatDate(dateOfSecond(secondAfter(origin, days))); };
  return fmt::format("Band of {} at {} times from {} to {}, {} of them without an observation", name,
                     series.days.size(), dateOf(series.days.front()), dateOf(series.days.back()),
                     countWithoutObservation(series));
}

std::optional<SettingRefusal> validateBandEnd(const UncertaintySettings& settings, const EvaluationPeriod& period) {
  if (!settings.bandEnd) return std::nullopt;
  try {
    date_check(*settings.bandEnd, kDateFieldCount);
  } catch (const FatalError& error) {
    return SettingRefusal{error.message(), kBandEndKeyword, "no day and time of the calendar"};
  }
  constexpr const char* kRefusal = "Error: End date of the bands invalid";
  if (settings.bandTimes != BandTimes::steps) {
    return SettingRefusal{kRefusal, kBandEndKeyword,
                          fmt::format("expected {} = 'steps' beside it: behind the evaluation period there are no "
                                      "observations that count",
                                      kBandTimesKeyword)};
  }
  if (daysSince(period.end, *settings.bandEnd) >= 0.0) return std::nullopt;
  return SettingRefusal{kRefusal, kBandEndKeyword,
                        fmt::format("expected the end of the evaluation period, {}, or later, found {}",
                                    formatDate(period.end), formatDate(*settings.bandEnd))};
}

/// Adds the band of each series to `files` and returns one line on each for the report.
std::vector<std::string> reportBands(const TaskContext& context, bool hasSteps,
                                     std::span<const EvaluationResult> results, std::vector<TaskFile>& files) {
  std::vector<int> numbers;
  for (const EvaluationResult& result : results) {
    if (result.ok()) numbers.push_back(result.number);
  }
  std::vector<std::string> lines;
  std::size_t first = 0;
  for (const ObservedSeries& observed : context.observedSeries) {
    const SeriesBand band = seriesBand(observed.values, numbers.size(), [&](std::size_t index, std::size_t count) {
      return context.simulatedColumns(numbers, first + index, count);
    });
    first += observed.values.size();
    const std::string& name = context.measures[observed.measure].name;
    files.push_back({runFilePath(context.filePrefix, run_files::kBand, static_cast<int>(observed.measure) + 1),
                     seriesBandText(name, observed, band, hasSteps)});
    lines.push_back(band.observationCount == 0
                        ? fmt::format("Band of {}: no observation has a simulated value", name)
                        : fmt::format("Band of {}: {:.1f} % of {} observations lie between the 5 and the 95 % quantile",
                                      name, 100.0 * band.shareInside, band.observationCount));
    if (hasSteps) {
      lines.push_back(fmt::format("   at {} times, {} of them without an observation; quantiles of {} runs{}",
                                  observed.days.size(), countWithoutObservation(observed), band.mostRuns,
                                  band.fewerRunsCount > 0 ? " at most" : ""));
    }
    lines.push_back("   " + files.back().path);
    if (const std::string fewer = fewerRunsText(band); !fewer.empty()) {
      lines.push_back("   " + fewer);
      context.log.warning(fmt::format("Band of {}: {}", name, fewer));
    }
  }
  return lines;
}

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
  if (settings.bandTimes != BandTimes::steps) return std::nullopt;
  return KeptSteps{settings.bandEnd};
}

std::string UncertaintyTask::description() const {
  return fmt::format("Uncertainty analysis: {} sampling",
                     kSamplingTypeNames[settings.samplingType == SamplingType::latinHypercube ? 1 : 0].name);
}

std::vector<std::string> UncertaintyTask::summaryLines(const SearchSpace& space) const {
  return distributionLines(settings.distributions, space);
}

std::vector<std::string> UncertaintyTask::warnings(const SearchSpace& space) const {
  return distributionWarnings(settings.distributions, space);
}

void UncertaintyTask::requireSets(const SearchSpace& /*space*/, const Feasibility& feasibility) const {
  if (!settings.redrawsInfeasible || !feasibility.isTested() || settings.distributions.size() == 0) return;
  feasibleUncertaintySample(settings, randomSeed, feasibility);
}

/// `acceptance`: a line on the sets drawn, if any can be drawn again.
std::vector<ParameterSet> UncertaintyTask::drawSample(const TaskContext& context, std::string& acceptance) const {
  if (settings.distributions.size() == 0) return {};
  const auto messages = [&](std::string_view text) { context.log.line(text); };
  if (!settings.redrawsInfeasible) {
    std::vector<ParameterSet> sample = uncertaintySample(settings, randomSeed, messages);
    warnOfInfeasibleSets(context, sample, "sets of the sample", settings.sampleSize,
                         "With Redraw_Infeasible = 1 in UNCERTAINTY_ESTIMATION sets are drawn until all can be run");
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
  const std::vector<std::string> bands = reportBands(context, keptSteps().has_value(), found.results, outcome.files);
  outcome.report.emplace_back();
  outcome.report.insert(outcome.report.end(), bands.begin(), bands.end());
  return outcome;
}

/// Before the first model run, so that an end of the steps that is not meant is seen in time.
void UncertaintyTask::logBandTimes(const TaskContext& context) const {
  if (!keptSteps()) return;
  for (const ObservedSeries& series : context.observedSeries) {
    const OutputMeasure& measure = context.measures[series.measure];
    const std::string& name = measure.name;
    if (!measure.timeMatch.isUsual()) {
      context.log.line(
          fmt::format("Band of {}: at the observations alone, because of its Time_Match or Time_Offset", name));
      continue;
    }
    context.log.line(bandTimesText(name, series));
    const std::size_t count = series.days.size();
    if (!settings.bandEnd || count < 2) continue;
    const double last = series.days.back();
    if (daysSince(series.start, *settings.bandEnd) - last < last - series.days[count - 2]) continue;
    context.log.warning(fmt::format(
        "Band of {}: {} in the model's folder has no step at {} = {} or shortly before it, and the band ends earlier",
        name, trimTrailing(measure.simulation.fileName), kBandEndKeyword, formatDate(*settings.bandEnd)));
  }
}

TaskOutcome UncertaintyTask::run(const TaskContext& context) {
  std::string acceptance;
  std::vector<ParameterSet> sample = drawSample(context, acceptance);
  context.log.line(setsOutsideBounds(sample, context.space));
  logBandTimes(context);
  logRoomOfSimulatedValues(context, run_files::kPlain.simulatedValues, sample.size());
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

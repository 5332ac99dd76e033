#include "run/run_series.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <filesystem>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/clock.h"
#include "common/files.h"
#include "common/text.h"
#include "common/version.h"
#include "measures/dates.h"
#include "measures/period_series.h"
#include "run/results/shared_files.h"

namespace mirevo {
namespace {

/// An end without a time of day is the beginning of its day.
void warnOfLastDay(const RunConfig& config, OutputReader& output, RunLog& log) {
  for (const std::size_t i : output.shownMeasures()) {
    const auto leftOut = output.observationLeftOut(i);
    if (!leftOut) continue;
    log.warning(fmt::format(
        "End_Date = {} is the beginning of its day: the later observations of that day are left out (output "
        "measure {}, {} ...). With a time of day, such as 23:59, they count",
        formatDate(countedPeriod(config.measures[i], config.period).end), quotedForMessage(config.measures[i].name),
        formatDate(dateOfSecond(*leftOut))));
  }
}

/// Empty for a task that keeps no simulated values.
std::vector<KeptSeries> keptSeries(const RunConfig& config, const OutputReader& output) {
  const bool isExact = config.task && config.task->keptPrecision() == SeriesPrecision::exact;  // units follow
  const std::vector<std::size_t>& shown = output.shownMeasures();
  std::vector<KeptSeries> kept;
  std::size_t first = 0;
  for (const ObservedSeries& observed : output.observedSeries()) {
    if (std::find(shown.begin(), shown.end(), observed.measure) != shown.end()) {
      KeptSeries& series = kept.emplace_back();
      series.first = first;
      const std::int64_t origin = secondNumber(observed.start);
      for (const double days : observed.days) series.seconds.push_back(secondAfter(origin, days));
    }
    first += observed.values.size() * (isExact ? 2 : 1);
  }
  return kept;
}

}  // namespace

std::unique_ptr<ScenarioSeriesFile> openScenarioSeries(const RunConfig& config, OutputReader& output,
                                                       const std::string& path, bool goesOn, RunLog& log) {
  if (!config.task || config.task->shownRuns() == 0 || output.shownMeasures().empty()) return nullptr;
  if (!goesOn) keepEarlierResults(std::array{path}, config.setupFile, log);
  if (!config.writesReport) return nullptr;
  ScenarioSeriesFile::Settings settings;
  settings.path = path;
  settings.headLines = {columnName(config.title), fmt::format("Mirevo {}", programVersion()),
                        "Setup file: " + config.setupFile};
  settings.measures = seriesNames(config.measures, output.shownMeasures());
  const EvaluationPeriod period = hullOf(config.period, config.validationPeriods);
  settings.periodFirst = secondNumber(period.start);
  settings.periodLast = secondNumber(period.end);
  settings.mostRuns = config.task->shownRuns();
  auto file =
      std::make_unique<ScenarioSeriesFile>(std::move(settings), [&log](std::string_view text) { log.warning(text); });
  file->begin(goesOn);
  return file;
}

std::unique_ptr<SeriesRecorder> openSeries(const RunConfig& config, const SearchSpace& space, OutputReader& output,
                                           const std::string& path, bool goesOn, RunLog& log) {
  if (!goesOn) keepEarlierResults(std::array{path}, config.setupFile, log);
  if (!config.writesReport || output.shownMeasures().empty()) return nullptr;
  RecordedSeries run;
  run.headLines = {
      columnName(config.title), fmt::format("Mirevo {}", programVersion()), "Setup file: " + config.setupFile,
      fmt::format("Evaluation period: {} to {}", formatDate(config.period.start), formatDate(config.period.end))};
  for (const ValidationPeriod& period : config.validationPeriods) {
    run.headLines.push_back(fmt::format("Validation period {}: {} to {}", columnName(period.name),
                                        formatDate(period.start), formatDate(period.end)));
  }
  const std::string task = config.task ? std::string(config.task->facts().name.name) : std::string();
  run.task = task;
  run.measures = seriesNames(config.measures, output.shownMeasures());
  run.observations = output.readShownObservations();
  const EvaluationPeriod shown = hullOf(config.period, config.validationPeriods);
  run.periodFirst = secondNumber(shown.start);
  run.periodLast = secondNumber(shown.end);
  run.largestGap = config.period.largestGapDays();
  warnOfLastDay(config, output, log);
  run.initialValues = ToModelScale(space, space.initial);
  run.kept = keptSeries(config, output);
  const auto steps = config.task ? config.task->keptSteps() : std::nullopt;
  // Measures with times of their own keep to the observations.
  const bool keepsSteps = steps && std::ranges::all_of(output.shownMeasures(), [&config](std::size_t measure) {
                            return config.measures[measure].timeMatch.isUsual();
                          });
  run.keepsSteps = keepsSteps;
  run.evaluationFirst = secondNumber(config.period.start);
  run.evaluationLast = secondNumber(config.period.end);
  run.keepsAllPeriods =
      config.validationPeriods.empty() || (keepsSteps && run.evaluationFirst <= run.periodFirst &&
                                           secondNumber(steps->end.value_or(config.period.end)) >= run.periodLast);
  auto series = std::make_unique<SeriesRecorder>(path, std::move(run), runTimeClock,
                                                 [&log](std::string_view text) { log.warning(text); });
  if (goesOn) {
    std::string reason;
    const auto earlier = readTextFile(path, reason);
    std::error_code ignored;
    if (!earlier && std::filesystem::exists(path, ignored)) {
      log.warning(fmt::format("The series of the earlier run are not taken up: {}: {}", path, reason));
    }
    const SeriesTable table = earlier ? readSeriesTable(*earlier) : SeriesTable{};
    if (table.isOf(task)) {
      if (const std::string remains = table.remains(); !remains.empty()) {
        log.warning(
            fmt::format("{} is cut off or damaged: {}; the series of the earlier run have no values at other times",
                        path, remains));
      }
      series->resume(table);
    } else {
      keepEarlierFile(path, log);  // of a run of another task in between
    }
  }
  return series;
}

}  // namespace mirevo

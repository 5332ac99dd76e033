#include "run/tasks/sample_bands.h"

#include <algorithm>
#include <cmath>
#include <cstdint>

#include <fmt/format.h>

#include "algorithms/analyses/series_band.h"
#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/text.h"
#include "measures/dates.h"

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

std::string coverageText(const std::string& name, const BandCoverage& coverage) {
  if (coverage.observationCount == 0) return fmt::format("Band of {}: no observation has a simulated value", name);
  return fmt::format("Band of {}: {:.1f} % of {} observations lie between the 5 and the 95 % quantile", name,
                     100.0 * coverage.shareInside, coverage.observationCount);
}

}  // namespace

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

std::optional<KeptSteps> bandSteps(const UncertaintySettings& settings) {
  if (settings.bandTimes != BandTimes::steps) return std::nullopt;
  return KeptSteps{settings.bandEnd};
}

void logBandTimes(const TaskContext& context, const UncertaintySettings& settings) {
  if (!bandSteps(settings)) return;
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

std::vector<std::string> reportBands(const TaskContext& context, const UncertaintySettings& settings,
                                     std::span<const int> numbers, std::span<const double> weights,
                                     const SimulatedColumns& columns, std::vector<TaskFile>& files) {
  const bool hasSteps = bandSteps(settings).has_value();
  std::vector<std::string> lines;
  std::size_t first = 0;
  for (const ObservedSeries& observed : context.observedSeries) {
    const auto read = [&](std::size_t index, std::size_t count) { return columns(numbers, first + index, count); };
    const SeriesBand band = seriesBand(observed.values, numbers.size(), read, weights);
    first += observed.values.size();
    const std::string& name = context.measures[observed.measure].name;
    files.push_back({runFilePath(context.filePrefix, run_files::kBand, static_cast<int>(observed.measure) + 1),
                     seriesBandText(name, observed, band, hasSteps)});
    lines.push_back(coverageText(name, band.coverage));
    if (const std::string width = bandWidthText(band.coverage); !width.empty()) lines.push_back("   " + width);
    for (const ValidationObservations& validation : context.validationObservations) {
      if (validation.observed.measure != observed.measure) continue;
      const BandCoverage unused = coverageOf(band, observed, validation.observed);
      if (unused.observationCount == 0) continue;
      const std::string period = context.validationPeriods[validation.period].name;
      lines.push_back(coverageText(fmt::format("{} in {} (validation)", name, period), unused));
      lines.push_back("   " + bandWidthText(unused));
    }
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

}  // namespace mirevo

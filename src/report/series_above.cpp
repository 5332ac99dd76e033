#include "report/series_above.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/fatal_error.h"

namespace mirevo {
namespace {

/// A missing value only where a span has no other.
PeriodSeries largestOfSpans(const PeriodSeries& series) {
  PeriodSeries thinned;
  const std::size_t count = series.values.size();
  for (std::size_t span = 0; span < kMostTimesAbove; ++span) {
    const std::size_t begin = count * span / kMostTimesAbove;
    const std::size_t end = count * (span + 1) / kMostTimesAbove;
    std::size_t largest = begin;
    for (std::size_t i = begin; i < end; ++i) {
      if (std::isnan(series.values[largest]) || series.values[i] > series.values[largest]) largest = i;
    }
    thinned.seconds.push_back(series.seconds[largest]);
    thinned.values.push_back(series.values[largest]);
  }
  return thinned;
}

}  // namespace

std::optional<SeriesAbove> seriesAbove(std::span<const OutputMeasure> measures, std::size_t measure,
                                       std::span<const std::int64_t> seconds, std::string& fault) {
  const auto with = std::find_if(measures.begin(), measures.end(), [&](const OutputMeasure& other) {
    return !other.shownAbove.fileName.empty() && isSamePair(other, measures[measure]);
  });
  if (with == measures.end() || seconds.empty()) return std::nullopt;
  try {
    NamedSeries read = readShownAbove(with->shownAbove, {dateOfSecond(seconds.front()), dateOfSecond(seconds.back())});
    SeriesAbove above{std::move(read.name), {}};
    for (std::size_t i = 0; i < read.series.seconds.size(); ++i) {
      if (read.series.seconds[i] < seconds.front() || read.series.seconds[i] > seconds.back()) continue;
      above.series.seconds.push_back(read.series.seconds[i]);
      above.series.values.push_back(read.series.values[i]);
    }
    above.isThinned = above.series.values.size() > kMostTimesAbove;
    if (above.isThinned) above.series = largestOfSpans(above.series);
    if (!above.series.values.empty()) return above;
    fault = fmt::format("No series is shown above the hydrograph of {}: {} has no times in its period", with->name,
                        with->shownAbove.fileName);
  } catch (const FatalError& error) {
    fault = fmt::format("No series is shown above the hydrograph of {}: {}: {}", with->name, error.message(),
                        error.detail());
  }
  return std::nullopt;
}

}  // namespace mirevo

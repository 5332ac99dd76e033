#include "report/thinning.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <optional>

namespace mirevo {
namespace {

constexpr std::size_t kDurationPoints = 1000;
constexpr std::size_t kMostDrawnTimesOfAll = 600'000;
constexpr std::size_t kFewestDrawnTimes = 6'000;
constexpr std::size_t kPlacesOfExtremes = 2;
constexpr std::size_t kPlacesOfGap = 3;
/// Of the times that are drawn a fifth is for the gaps.
constexpr std::size_t kShareOfGaps = 5;

using Columns = std::span<const std::vector<float>* const>;

std::vector<std::int64_t> timesOfValues(const TimedValues& column) {
  std::vector<std::int64_t> times;
  for (std::size_t i = 0; i < column.seconds.size(); ++i) {
    if (std::isfinite(column.values[i])) times.push_back(column.seconds[i]);
  }
  return times;
}

/// The longest step that is no gap; empty if there are too few to tell.
std::optional<std::int64_t> longestUsualStep(std::span<const std::int64_t> times) {
  constexpr std::size_t kFewest = 3;
  if (times.size() < kFewest) return std::nullopt;
  std::vector<std::int64_t> steps;
  for (std::size_t i = 1; i < times.size(); ++i) steps.push_back(times[i] - times[i - 1]);
  const auto usual = steps.begin() + static_cast<std::ptrdiff_t>((steps.size() - 1) * 9 / 10);
  std::nth_element(steps.begin(), usual, steps.end());
  return *usual + *usual / 2;
}

/// Adds the places of the smallest and the largest finite value among those from `begin` to `end`.
void addExtremes(const std::vector<float>& values, std::size_t begin, std::size_t end,
                 std::vector<std::size_t>& places) {
  std::size_t smallest = end;
  std::size_t largest = end;
  for (std::size_t i = begin; i < end; ++i) {
    if (!std::isfinite(values[i])) continue;
    if (smallest == end || values[i] < values[smallest]) smallest = i;
    if (largest == end || values[i] > values[largest]) largest = i;
  }
  if (smallest == end) return;
  places.push_back(smallest);
  places.push_back(largest);
}

/// Of the gaps of a column that begin in one of `spans` equally long spans, the longest: its ends, and a time without a
/// value in it if there is one.
void addGaps(std::span<const std::int64_t> seconds, const std::vector<float>& values, std::size_t spans,
             std::vector<std::size_t>& places) {
  const auto usual = longestUsualStep(timesOfValues({seconds, values}));
  if (!usual) return;
  struct Gap {
    std::size_t begin = 0;
    std::size_t end = 0;
    std::int64_t length = 0;
  };
  Gap longest;
  std::size_t spanOfLongest = 0;
  const auto add = [&] {
    if (longest.length == 0) return;
    places.insert(places.end(), {longest.begin, longest.begin + 1, longest.end});
    longest = Gap{};
  };
  std::size_t last = values.size();  // place of the last value
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (!std::isfinite(values[i])) continue;
    const std::int64_t length = last == values.size() ? 0 : seconds[i] - seconds[last];
    if (length > *usual) {
      const std::size_t span = last * spans / values.size();
      if (span != spanOfLongest) add();
      spanOfLongest = span;
      if (length > longest.length) longest = {last, i, length};
    }
    last = i;
  }
  add();
}

/// At most `most`, ascending; all of them if there are few.
std::vector<std::size_t> drawnPlaces(std::span<const std::int64_t> seconds, Columns columns, std::size_t most) {
  const std::size_t count = seconds.size();
  std::vector<std::size_t> places;
  // Columns with few values are drawn whole and take half of the places at most.
  std::vector<const std::vector<float>*> thinnedColumns;
  const std::size_t few = most / (2 * columns.size());
  for (const std::vector<float>* const column : columns) {
    const auto isValue = [](float value) { return std::isfinite(value); };
    if (static_cast<std::size_t>(std::count_if(column->begin(), column->end(), isValue)) > few) {
      thinnedColumns.push_back(column);
      continue;
    }
    for (std::size_t i = 0; i < count; ++i) {
      if (isValue((*column)[i])) places.push_back(i);
    }
  }
  const std::size_t left = most - places.size();
  const std::size_t forGaps = left / kShareOfGaps;
  const std::size_t columnCount = std::max<std::size_t>(thinnedColumns.size(), 1);
  const std::size_t spans = (left - forGaps) / (kPlacesOfExtremes * columnCount);
  for (std::size_t span = 0; span < spans; ++span) {
    const std::size_t begin = count * span / spans;
    const std::size_t end = count * (span + 1) / spans;
    const std::size_t before = places.size();
    for (const std::vector<float>* const column : thinnedColumns) addExtremes(*column, begin, end, places);
    if (places.size() == before && begin < end) places.push_back(begin);  // a gap stays one
  }
  for (const std::vector<float>* const column : thinnedColumns) {
    addGaps(seconds, *column, forGaps / (kPlacesOfGap * columnCount), places);
  }
  std::sort(places.begin(), places.end());
  places.erase(std::unique(places.begin(), places.end()), places.end());
  return places;
}

template <class Values>
Values at(const std::vector<std::size_t>& places, const Values& values) {
  Values taken;
  if (values.empty()) return taken;
  for (const std::size_t i : places) taken.push_back(values[i]);
  return taken;
}

}  // namespace

std::size_t mostDrawnTimes(std::size_t count) {
  return std::clamp(kMostDrawnTimesOfAll / std::max<std::size_t>(count, 1), kFewestDrawnTimes, kMostDrawnTimes);
}

std::vector<std::size_t> gapsOf(const TimedValues& drawn, const TimedValues& whole) {
  const std::vector<std::int64_t> times = timesOfValues(whole);
  const auto usual = longestUsualStep(times);
  std::vector<std::size_t> gaps;
  std::size_t next = 0;
  for (std::size_t i = 0; i < drawn.seconds.size(); ++i) {
    if (!std::isfinite(drawn.values[i])) continue;
    bool isGap = !usual;
    for (; next < times.size() && times[next] <= drawn.seconds[i]; ++next) {
      isGap = isGap || (next > 0 && times[next] - times[next - 1] > *usual);
    }
    if (isGap) gaps.push_back(i);
  }
  return gaps;
}

ShownSeries thinned(const ShownSeries& series, std::size_t most) {
  const std::vector<float>* const columns[] = {&series.observed, &series.initial, &series.best};
  const std::vector<std::size_t> places = drawnPlaces(series.seconds, columns, most);
  ShownSeries drawn;
  drawn.measure = series.measure;
  drawn.seconds = at(places, series.seconds);
  drawn.observed = at(places, series.observed);
  drawn.initial = at(places, series.initial);
  drawn.best = at(places, series.best);
  return drawn;
}

ReportedBand thinned(const ReportedBand& band, std::size_t most) {
  const std::vector<float>* const columns[] = {&band.observed, &band.lower, &band.median, &band.upper};
  const std::vector<std::size_t> places = drawnPlaces(band.seconds, columns, most);
  ReportedBand drawn = band;
  drawn.seconds = at(places, band.seconds);
  drawn.observed = at(places, band.observed);
  drawn.lower = at(places, band.lower);
  drawn.median = at(places, band.median);
  drawn.upper = at(places, band.upper);
  drawn.runs = at(places, band.runs);
  return drawn;
}

std::vector<double> exceedancePercentages() {
  std::vector<double> percentages;
  for (std::size_t i = 0; i < kDurationPoints; ++i) {
    percentages.push_back(100.0 * (static_cast<double>(i) + 0.5) / kDurationPoints);
  }
  return percentages;
}

std::vector<double> flowDuration(std::span<const float> values) {
  std::vector<float> sorted;
  std::copy_if(values.begin(), values.end(), std::back_inserter(sorted), [](float v) { return std::isfinite(v); });
  std::sort(sorted.begin(), sorted.end(), std::greater<>());
  std::vector<double> curve;
  if (sorted.empty()) return curve;
  for (const double percentage : exceedancePercentages()) {
    curve.push_back(sorted[static_cast<std::size_t>(percentage / 100.0 * static_cast<double>(sorted.size()))]);
  }
  return curve;
}

}  // namespace mirevo

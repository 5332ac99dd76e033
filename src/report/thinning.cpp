#include "report/thinning.h"

#include <algorithm>
#include <cmath>
#include <functional>

namespace mirevo {
namespace {

constexpr std::size_t kColumns = 3;
constexpr std::size_t kDurationPoints = 1000;
constexpr std::size_t kMostDrawnTimesOfAll = 600'000;
constexpr std::size_t kFewestDrawnTimes = 6'000;

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

}  // namespace

std::size_t mostDrawnTimes(std::size_t count) {
  return std::clamp(kMostDrawnTimesOfAll / std::max<std::size_t>(count, 1), kFewestDrawnTimes, kMostDrawnTimes);
}

ShownSeries thinned(const ShownSeries& series, std::size_t most) {
  const std::size_t spans = most / (2 * kColumns);
  const std::size_t count = series.seconds.size();
  ShownSeries drawn;
  drawn.measure = series.measure;
  std::vector<std::size_t> places;
  for (std::size_t span = 0; span < spans; ++span) {
    const std::size_t begin = count * span / spans;
    const std::size_t end = count * (span + 1) / spans;
    places.clear();
    for (const auto* column : {&series.observed, &series.initial, &series.best}) {
      addExtremes(*column, begin, end, places);
    }
    if (places.empty() && begin < end) places.push_back(begin);  // a gap stays one
    std::sort(places.begin(), places.end());
    places.erase(std::unique(places.begin(), places.end()), places.end());
    for (const std::size_t i : places) {
      drawn.seconds.push_back(series.seconds[i]);
      drawn.observed.push_back(series.observed[i]);
      drawn.initial.push_back(series.initial[i]);
      drawn.best.push_back(series.best[i]);
    }
  }
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

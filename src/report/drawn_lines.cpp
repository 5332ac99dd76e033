#include "report/drawn_lines.h"

#include <algorithm>
#include <cmath>
#include <cstddef>

#include "common/calendar.h"

namespace mirevo {
namespace {

constexpr double kSame = 1.5;  ///< steps that differ by less than this factor are alike: months are
constexpr double kFar = 10.0;  ///< among uneven steps, what is far longer than nearly all of them
constexpr std::size_t kFewestSteps = 3;

/// How far apart successive values usually are, in seconds.
struct UsualStep {
  double median = 0.0;
  double largest = 0.0;  ///< the longest step over which a line is drawn
  bool isEven = false;
};

UsualStep usualStep(std::vector<double> steps) {
  if (steps.empty()) return {};
  const auto quantile = [&steps](double share, double (*round)(double)) {
    const auto nth =
        steps.begin() + static_cast<std::ptrdiff_t>(round(share * (static_cast<double>(steps.size()) - 1.0)));
    std::nth_element(steps.begin(), nth, steps.end());
    return *nth;
  };
  const double median = quantile(0.5, std::floor);
  const bool isEven = quantile(0.75, std::ceil) <= kSame * median;
  return {median, isEven ? kSame * median : kFar * quantile(0.9, std::ceil), isEven && steps.size() >= kFewestSteps};
}

/// Places of the values that are there.
std::vector<std::size_t> placesOf(std::span<const float> values) {
  std::vector<std::size_t> places;
  for (std::size_t i = 0; i < values.size(); ++i) {
    if (std::isfinite(values[i])) places.push_back(i);
  }
  return places;
}

double stepBetween(std::span<const std::int64_t> seconds, std::size_t from, std::size_t to) {
  return static_cast<double>(seconds[to] - seconds[from]);
}

/// From the rows without an observation, as simulated values at the times of observations may be interpolated; from all
/// where there are too few.
UsualStep stepOfSimulated(std::span<const std::int64_t> seconds, std::span<const float> values,
                          std::span<const float> observed) {
  std::vector<double> own;
  std::vector<double> all;
  for (std::size_t i = 1; i < values.size(); ++i) {
    if (!std::isfinite(values[i - 1]) || !std::isfinite(values[i])) continue;
    all.push_back(stepBetween(seconds, i - 1, i));
    if (!std::isfinite(observed[i - 1]) && !std::isfinite(observed[i])) own.push_back(all.back());
  }
  return usualStep(std::move(own.size() < kFewestSteps ? all : own));
}

DrawnLine simulatedLine(std::span<const std::int64_t> seconds, std::span<const float> values, const UsualStep& usual) {
  DrawnLine line;
  for (std::size_t i = 1; i < values.size(); ++i) {
    if (!std::isfinite(values[i - 1])) continue;
    if (std::isfinite(values[i]) && stepBetween(seconds, i - 1, i) <= usual.largest) continue;
    line.breaks.push_back(seconds[i - 1]);
  }
  return line;
}

DrawnLine observedLine(std::span<const std::int64_t> seconds, std::span<const float> values, double simulatedStep) {
  const std::vector<std::size_t> places = placesOf(values);
  std::vector<double> steps;
  for (std::size_t k = 1; k < places.size(); ++k) steps.push_back(stepBetween(seconds, places[k - 1], places[k]));
  const UsualStep usual = usualStep(steps);
  const bool isSparse = usual.median > kSame * static_cast<double>(kSecondsOfDay) && simulatedStep > 0.0 &&
                        usual.median >= 2.0 * simulatedStep;
  DrawnLine line;
  line.isPoints = !usual.isEven || isSparse;
  for (std::size_t k = 1; k < places.size(); ++k) {
    if (steps[k - 1] > usual.largest) line.breaks.push_back(seconds[places[k - 1]]);
  }
  return line;
}

}  // namespace

DrawnLine drawnSimulated(std::span<const std::int64_t> seconds, std::span<const float> values,
                         std::span<const float> observed) {
  return simulatedLine(seconds, values, stepOfSimulated(seconds, values, observed));
}

DrawnLines drawnLines(const ShownSeries& series) {
  const UsualStep initial = stepOfSimulated(series.seconds, series.initial, series.observed);
  const UsualStep best = stepOfSimulated(series.seconds, series.best, series.observed);
  return {observedLine(series.seconds, series.observed, std::max(initial.median, best.median)),
          simulatedLine(series.seconds, series.initial, initial), simulatedLine(series.seconds, series.best, best)};
}

}  // namespace mirevo

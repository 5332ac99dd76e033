#include "report/residual_views.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <map>
#include <numeric>
#include <set>
#include <utility>

#include "algorithms/numbers/special_functions.h"
#include "common/calendar.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr std::size_t kMostLags = 60;
constexpr std::size_t kNormalSpans = 200;
constexpr std::size_t kFlowCells = 100;  ///< in each direction

void addMonths(const ShownPairs& pairs, const std::vector<double>& residuals, ResidualViews& views) {
  std::map<std::int64_t, std::pair<double, std::size_t>> sums;  // by the beginning of the month
  std::array<std::vector<double>, 12> samples;
  for (std::size_t i = 0; i < residuals.size(); ++i) {
    const DateRecord date = dateOfSecond(pairs.seconds[i]);
    const auto month = static_cast<int>(date[date_field::kMonth]);
    auto& [sum, count] = sums[dayNumber(date[date_field::kYear], month, 1) * kSecondsOfDay];
    sum += residuals[i];
    ++count;
    samples[static_cast<std::size_t>(month - 1)].push_back(residuals[i]);
  }
  for (const auto& [second, sum] : sums) {
    views.months.push_back(second);
    views.monthMeans.push_back(sum.first / static_cast<double>(sum.second));
  }
  for (std::size_t month = 0; month < samples.size(); ++month) views.byMonth[month] = summariseSample(samples[month]);
}

/// Cells are columns of equally many pairs, in the order of the simulated values, and rows of equal height.
void addFlows(const ShownPairs& pairs, const std::vector<double>& residuals, ResidualViews& views) {
  std::vector<std::size_t> order(residuals.size());
  std::iota(order.begin(), order.end(), 0);
  std::sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) {
    return std::pair(pairs.simulated[a], a) < std::pair(pairs.simulated[b], b);
  });
  const auto [least, largest] = std::minmax_element(residuals.begin(), residuals.end());
  const double height = *largest - *least;
  std::set<std::pair<std::size_t, std::size_t>> taken;
  for (std::size_t rank = 0; rank < order.size(); ++rank) {
    const std::size_t i = order[rank];
    const double share = height > 0.0 ? (residuals[i] - *least) / height : 0.0;
    if (!taken.emplace(rank * kFlowCells / order.size(), static_cast<std::size_t>(share * kFlowCells)).second) continue;
    views.flows.push_back(pairs.simulated[i]);
    views.ofFlows.push_back(static_cast<float>(residuals[i]));
  }
}

void addAutocorrelation(const ShownPairs& pairs, const std::vector<double>& residuals, ResidualViews& views) {
  const std::size_t count = residuals.size();
  const std::int64_t step = usualStep(pairs);
  double squares = 0.0;
  for (const double residual : residuals) squares += (residual - views.all.mean) * (residual - views.all.mean);
  for (std::size_t lag = 1; lag <= std::min(kMostLags, count / 4); ++lag) {
    const std::int64_t distance = step * static_cast<std::int64_t>(lag);
    double sum = 0.0;
    std::size_t products = 0;
    for (std::size_t i = 0, later = 0; i < count; ++i) {
      while (later < count && pairs.seconds[later] < pairs.seconds[i] + distance) ++later;
      if (later == count) break;
      if (pairs.seconds[later] != pairs.seconds[i] + distance) continue;
      sum += (residuals[i] - views.all.mean) * (residuals[later] - views.all.mean);
      ++products;
    }
    const bool isDefined = 2 * products >= count && squares > 0.0;
    views.autocorrelation.push_back(isDefined ? sum / squares : kNaN);
  }
  views.autocorrelationLimit = 1.96 / std::sqrt(static_cast<double>(count));
}

/// The ranks are about evenly spaced on the scale of the quantiles, so that the tails are kept.
void addNormalPlot(std::vector<double> residuals, ResidualViews& views) {
  if (!(views.all.standardDeviation > 0.0)) return;
  std::sort(residuals.begin(), residuals.end());
  const auto count = static_cast<double>(residuals.size());
  const auto quantileOf = [count](double rank) {
    int fault = 0;
    return normalQuantile((rank - 0.375) / (count + 0.25), fault);
  };
  const double end = quantileOf(count);
  double earlier = 0.0;
  for (std::size_t i = 0; i <= kNormalSpans; ++i) {
    const double quantile = end * (2.0 * static_cast<double>(i) / kNormalSpans - 1.0);
    const double probability = 0.5 * std::erfc(-quantile / std::sqrt(2.0));
    const double rank = std::clamp(std::round(probability * (count + 0.25) + 0.375), 1.0, count);
    if (rank == std::exchange(earlier, rank)) continue;
    views.normalQuantiles.push_back(quantileOf(rank));
    views.standardisedResiduals.push_back((residuals[static_cast<std::size_t>(rank) - 1] - views.all.mean) /
                                          views.all.standardDeviation);
  }
}

}  // namespace

ResidualViews residualViews(const ShownPairs& pairs) {
  ResidualViews views;
  std::vector<double> residuals;
  for (std::size_t i = 0; i < pairs.seconds.size(); ++i) {
    residuals.push_back(static_cast<double>(pairs.simulated[i]) - static_cast<double>(pairs.observed[i]));
  }
  views.all = summariseSample(residuals);
  if (residuals.empty()) return views;
  addMonths(pairs, residuals, views);
  addFlows(pairs, residuals, views);
  addAutocorrelation(pairs, residuals, views);
  addNormalPlot(std::move(residuals), views);
  return views;
}

}  // namespace mirevo

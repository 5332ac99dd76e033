#include "report/extreme_views.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <map>
#include <numeric>
#include <set>

#include "common/calendar.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr std::size_t kDaysOfMean = 7;
constexpr std::size_t kMostTailPoints = 200;
constexpr double kTailBegin = 0.7;
constexpr std::size_t kPeakCount = 10;
constexpr std::int64_t kPeakDistance = 7 * kSecondsOfDay;
constexpr std::int64_t kPeakWindow = 3 * kSecondsOfDay;

struct Day {
  std::int64_t number = 0;
  double observed = 0.0;  ///< mean of its pairs
  double simulated = 0.0;
};

/// The days of one year that have all their pairs.
struct Year {
  std::vector<Day> days;
  double highObserved = -std::numeric_limits<double>::infinity();
  double highSimulated = highObserved;
};

std::map<int, Year> yearsOf(const ShownPairs& pairs, int firstMonth) {
  const auto pairsOfDay = static_cast<std::size_t>(kSecondsOfDay / usualStep(pairs));
  std::map<int, Year> years;
  for (std::size_t begin = 0, end = 0; begin < pairs.seconds.size(); begin = end) {
    Day day{pairs.seconds[begin] / kSecondsOfDay};
    Year& year = years[yearOf(pairs.seconds[begin], firstMonth)];
    for (; end < pairs.seconds.size() && pairs.seconds[end] / kSecondsOfDay == day.number; ++end) {
      day.observed += pairs.observed[end];
      day.simulated += pairs.simulated[end];
      year.highObserved = std::max<double>(year.highObserved, pairs.observed[end]);
      year.highSimulated = std::max<double>(year.highSimulated, pairs.simulated[end]);
    }
    const auto count = end - begin;
    if (count < pairsOfDay) continue;
    day.observed /= static_cast<double>(count);
    day.simulated /= static_cast<double>(count);
    year.days.push_back(day);
  }
  return years;
}

/// NaN if no 7 of the days are in a row.
double lowestMean(const std::vector<Day>& days, double Day::*value) {
  double lowest = kNaN;
  for (std::size_t last = kDaysOfMean - 1; last < days.size(); ++last) {
    const std::size_t first = last + 1 - kDaysOfMean;
    if (days[last].number - days[first].number != static_cast<std::int64_t>(kDaysOfMean - 1)) continue;
    double sum = 0.0;
    for (std::size_t i = first; i <= last; ++i) sum += days[i].*value;
    lowest = std::fmin(lowest, sum / static_cast<double>(kDaysOfMean));
  }
  return lowest;
}

}  // namespace

bool isAtLeastDaily(const ShownPairs& pairs) {
  const std::int64_t step = usualStep(pairs);
  return step > 0 && step <= kSecondsOfDay;
}

AnnualExtremes annualExtremes(const ShownPairs& pairs, int firstMonth) {
  AnnualExtremes extremes;
  if (!isAtLeastDaily(pairs)) return extremes;
  for (const auto& [number, year] : yearsOf(pairs, firstMonth)) {
    const auto length = static_cast<double>(dayNumber(number + 1, firstMonth, 1) - dayNumber(number, firstMonth, 1));
    if (static_cast<double>(year.days.size()) < kLeastShareOfDays * length) continue;
    extremes.years.push_back(yearName(number, firstMonth));
    extremes.lowObserved.push_back(lowestMean(year.days, &Day::observed));
    extremes.lowSimulated.push_back(lowestMean(year.days, &Day::simulated));
    extremes.highObserved.push_back(year.highObserved);
    extremes.highSimulated.push_back(year.highSimulated);
  }
  return extremes;
}

std::vector<double> returnPeriods(std::size_t count) {
  std::vector<double> periods;
  for (std::size_t rank = 1; rank <= count; ++rank) {
    periods.push_back(static_cast<double>(count + 1) / static_cast<double>(rank));
  }
  return periods;
}

DurationTail durationTail(const ShownPairs& pairs) {
  const std::size_t count = pairs.seconds.size();
  std::vector<float> observed = pairs.observed;
  std::vector<float> simulated = pairs.simulated;
  std::sort(observed.begin(), observed.end(), std::greater<>());
  std::sort(simulated.begin(), simulated.end(), std::greater<>());
  const auto first = static_cast<std::size_t>(std::ceil(kTailBegin * static_cast<double>(count + 1)));
  DurationTail tail;
  if (first > count) return tail;
  const std::size_t points = std::min(count - first + 1, kMostTailPoints);
  for (std::size_t i = 0; i < points; ++i) {
    const std::size_t rank = points == 1 ? first : first + i * (count - first) / (points - 1);
    tail.exceedance.push_back(100.0 * static_cast<double>(rank) / static_cast<double>(count + 1));
    tail.observed.push_back(observed[rank - 1]);
    tail.simulated.push_back(simulated[rank - 1]);
  }
  return tail;
}

std::vector<ShownPeak> largestPeaks(const ShownPairs& pairs) {
  const std::vector<std::int64_t>& seconds = pairs.seconds;
  const std::int64_t step = usualStep(pairs);
  std::vector<std::size_t> falling(seconds.size());
  std::iota(falling.begin(), falling.end(), 0);
  std::stable_sort(falling.begin(), falling.end(),
                   [&](std::size_t a, std::size_t b) { return pairs.observed[a] > pairs.observed[b]; });
  const auto isUsual = [&](std::size_t later) { return 2 * (seconds[later] - seconds[later - 1]) <= 3 * step; };
  std::vector<ShownPeak> peaks;
  std::set<std::int64_t> higher;  // times of larger values, and of equal ones before
  for (const std::size_t at : falling) {
    if (peaks.size() == kPeakCount) break;
    const std::int64_t second = seconds[at];
    const float value = pairs.observed[at];
    const auto near = higher.lower_bound(second - kPeakDistance);
    const bool isExceeded = near != higher.end() && *near <= second + kPeakDistance;
    higher.insert(second);
    if (isExceeded || at == 0 || !isUsual(at)) continue;
    std::size_t next = at + 1;  // the first lower one, behind equal ones
    while (next < seconds.size() && isUsual(next) && pairs.observed[next] == value) ++next;
    if (next == seconds.size() || !isUsual(next)) continue;
    ShownPeak peak{second, value, kNaN, kNaN, kNaN};
    const auto begin = std::lower_bound(seconds.begin(), seconds.end(), second - kPeakWindow);
    for (auto time = begin; time != seconds.end() && *time <= second + kPeakWindow; ++time) {
      const float candidate = pairs.simulated[static_cast<std::size_t>(time - seconds.begin())];
      if (candidate <= peak.simulated) continue;
      peak.simulated = candidate;
      peak.hoursLater = static_cast<double>(*time - second) / 3600.0;
    }
    if (value != 0.0F) peak.percent = 100.0 * (peak.simulated - value) / value;
    peaks.push_back(peak);
  }
  return peaks;
}

}  // namespace mirevo

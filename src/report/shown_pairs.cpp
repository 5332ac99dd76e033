#include "report/shown_pairs.h"

#include <algorithm>
#include <cmath>

#include <fmt/core.h>

#include "common/calendar.h"

namespace mirevo {

const std::vector<float>& judgedValues(const ShownSeries& series) {
  const bool hasBest = std::any_of(series.best.begin(), series.best.end(), [](float v) { return std::isfinite(v); });
  return hasBest ? series.best : series.initial;
}

ShownPairs shownPairs(const ShownSeries& series) {
  const std::vector<float>& simulated = judgedValues(series);
  ShownPairs pairs;
  for (std::size_t i = 0; i < std::min(simulated.size(), series.observed.size()); ++i) {
    if (!std::isfinite(series.observed[i]) || !std::isfinite(simulated[i])) continue;
    pairs.seconds.push_back(series.seconds[i]);
    pairs.observed.push_back(series.observed[i]);
    pairs.simulated.push_back(simulated[i]);
  }
  return pairs;
}

std::int64_t usualStep(const ShownPairs& pairs) {
  if (pairs.seconds.size() < 2) return 0;
  std::vector<std::int64_t> steps;
  for (std::size_t i = 1; i < pairs.seconds.size(); ++i) steps.push_back(pairs.seconds[i] - pairs.seconds[i - 1]);
  const auto middle = steps.begin() + static_cast<std::ptrdiff_t>(steps.size() / 2);
  std::nth_element(steps.begin(), middle, steps.end());
  return *middle;
}

int yearOf(std::int64_t second, int firstMonth) {
  const DateRecord date = dateOfSecond(second);
  const auto year = static_cast<int>(date[date_field::kYear]);
  return date[date_field::kMonth] >= firstMonth ? year : year - 1;
}

std::string yearName(int year, int firstMonth) {
  return firstMonth == 1 ? fmt::format("{}", year) : fmt::format("{}/{:02}", year, (year + 1) % 100);
}

}  // namespace mirevo

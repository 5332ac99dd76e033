#include "report/regime_views.h"

#include <limits>
#include <map>
#include <numeric>
#include <utility>

#include "common/calendar.h"

namespace mirevo {
namespace {

struct Group {
  std::vector<float> observed;
  std::vector<float> simulated;
};

double mean(const std::vector<float>& values) {
  return std::accumulate(values.begin(), values.end(), 0.0) / static_cast<double>(values.size());
}

RegimeFit fitOf(std::string name, const Group& group) {
  RegimeFit fit{std::move(name), fitFigures(group.simulated, group.observed), mean(group.observed),
                mean(group.simulated)};
  if (fit.figures.count < kLeastPairsOfEfficiency) {
    fit.figures.nse = fit.figures.kge = std::numeric_limits<double>::quiet_NaN();
  }
  return fit;
}

/// The pairs by what `keyOf` says of their times.
template <class KeyOf>
std::map<int, Group> groupsOf(const ShownPairs& pairs, KeyOf keyOf) {
  std::map<int, Group> groups;
  for (std::size_t i = 0; i < pairs.seconds.size(); ++i) {
    Group& group = groups[keyOf(pairs.seconds[i])];
    group.observed.push_back(pairs.observed[i]);
    group.simulated.push_back(pairs.simulated[i]);
  }
  return groups;
}

}  // namespace

std::vector<RegimeFit> seasonFits(const ShownPairs& pairs) {
  static constexpr const char* kNames[] = {"DJF", "MAM", "JJA", "SON"};
  const auto seasonOf = [](std::int64_t second) {
    return static_cast<int>(dateOfSecond(second)[date_field::kMonth] % 12 / 3);
  };
  std::vector<RegimeFit> fits;
  for (const auto& [season, group] : groupsOf(pairs, seasonOf)) fits.push_back(fitOf(kNames[season], group));
  return fits;
}

std::vector<RegimeFit> yearFits(const ShownPairs& pairs, int firstMonth) {
  const auto year = [firstMonth](std::int64_t second) { return yearOf(second, firstMonth); };
  std::vector<RegimeFit> fits;
  for (const auto& [number, group] : groupsOf(pairs, year)) fits.push_back(fitOf(yearName(number, firstMonth), group));
  return fits;
}

}  // namespace mirevo

#include "measures/statistics.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>

#include "common/text.h"
#include "measures/measure_statistics.h"

namespace mirevo {
namespace {

/// One of the statistics that MeasureStatistics holds.
template <double MeasureStatistics::*Figure>
double figure(const MeasureStatistics& statistics) {
  return statistics.*Figure;
}

double asItIs(double value) {
  return value;
}

constexpr auto kTable = std::to_array<Statistic>({
    {.key = {0, "mean"},
     .description = "mean",
     .value = figure<&MeasureStatistics::mean>,
     .best = Best::zero,
     .inObjective = asItIs},
    {.key = {1, "root mean square"},
     .description = "root mean square",
     .value = figure<&MeasureStatistics::rootMeanSquare>,
     .best = Best::smallest,
     .inObjective = asItIs},
    {.key = {2, "standard deviation"},
     .description = "standard deviation",
     .value = figure<&MeasureStatistics::standardDeviation>,
     .best = Best::smallest,
     .inObjective = asItIs},
    {.key = {3, "peak difference"},
     .description = "difference of the largest values",
     .value = figure<&MeasureStatistics::peakDifference>,
     .best = Best::zero,
     .inObjective = asItIs,
     .needsPeaks = true},
    {.key = {4, "low difference"},
     .description = "difference of the smallest values",
     .value = figure<&MeasureStatistics::lowDifference>,
     .best = Best::zero,
     .inObjective = asItIs,
     .needsPeaks = true},
});

constexpr auto kNames = [] {
  std::array<CodeName, kTable.size()> names;
  std::transform(kTable.begin(), kTable.end(), names.begin(), [](const Statistic& row) { return row.key; });
  return names;
}();

/// StatisticType is an index into the table, and its enumerators are the codes.
constexpr bool codesArePlaces() {
  for (std::size_t i = 0; i < kTable.size(); ++i) {
    if (kTable[i].key.code && *kTable[i].key.code != static_cast<std::int32_t>(i)) return false;
  }
  return true;
}
static_assert(codesArePlaces());

}  // namespace

std::span<const Statistic> statisticTable() {
  return kTable;
}

std::span<const CodeName> statisticNames() {
  return kNames;
}

const Statistic& statisticOf(StatisticType type) {
  return kTable.at(static_cast<std::size_t>(type));
}

std::optional<StatisticType> findStatistic(std::string_view name) {
  for (std::size_t i = 0; i < kTable.size(); ++i) {
    if (equalIgnoringCase(kTable[i].key.name, name)) return static_cast<StatisticType>(i);
  }
  return std::nullopt;
}

}  // namespace mirevo

#include "measures/statistics.h"

#include <gtest/gtest.h>

#include "measures/measure_statistics.h"
#include "platform/series/memory_time_series.h"

namespace mirevo {
namespace {

MeasureStatistics compare(std::vector<float> simulated, std::vector<float> observed) {
  const std::vector<double> days{0, 1, 2, 3};
  const DateRecord start{2001, 1, 1};
  MemoryTimeSeries simulation(start, days, {std::move(simulated)});
  MemoryTimeSeries observation(start, days, {std::move(observed)});
  return computeMeasureStatistics({}, {start, {2001, 1, 4}}, simulation, observation, 1.0F, 1.0F, true);
}

TEST(Statistics, APerfectFitIsBestAndZeroInAnObjective) {
  const MeasureStatistics perfect = compare({2, 1, 4, 3}, {2, 1, 4, 3});
  const MeasureStatistics worse = compare({3, 4, 9, 5}, {2, 1, 4, 3});
  for (const Statistic& statistic : statisticTable()) {
    SCOPED_TRACE(statistic.key.name);
    const double best = statistic.value(perfect);
    const double other = statistic.value(worse);
    EXPECT_TRUE(statistic.best == Best::zero       ? best == 0.0
                : statistic.best == Best::smallest ? best < other
                                                   : best > other);
    EXPECT_EQ(statistic.inObjective(best), 0.0);
    EXPECT_GT(statistic.inObjective(other), 0.0);
  }
}

TEST(Statistics, AreFoundByNameInAnyLetterCase) {
  EXPECT_EQ(findStatistic("Root MEAN square"), StatisticType::rootMeanSquare);
  EXPECT_EQ(findStatistic("root mean"), std::nullopt);
  for (std::size_t i = 0; i < statisticNames().size(); ++i) {
    EXPECT_EQ(findStatistic(statisticNames()[i].name), static_cast<StatisticType>(i)) << "a name twice";
  }
}

}  // namespace
}  // namespace mirevo

#include "platform/series/time_series_object.h"

#include <cmath>
#include <limits>
#include <tuple>

#include <gtest/gtest.h>

#include "platform/series/memory_time_series.h"

namespace mirevo {
namespace {

constexpr float kGap = -99.0F;

MemoryTimeSeries sampleSeries() {
  return MemoryTimeSeries({2001, 1, 1}, {0.0, 1.0, 2.0, 3.0, 5.0, 6.0, 7.0},
                          {{1.0F, 3.0F, kGap, 4.0F, 8.0F, NAN, 0.5F}}, kGap);
}

TEST(TimeSeriesObject, ValueAtATimeIsThatOfTheStepOrLinearBetween) {
  constexpr double kQuarterMillisecond = 0.25e-3 / 86400.0;
  const std::tuple<double, std::optional<float>> cases[] = {
      {-0.001, std::nullopt},        // before the axis
      {-kQuarterMillisecond, 1.0F},  // the same time
      {0.0, 1.0F},
      {0.25, 1.5F},
      {1.0 - kQuarterMillisecond, 3.0F},
      {1.0 + kQuarterMillisecond, 3.0F},  // the step itself, though the next one is missing
      {1.5, std::nullopt},                // beside a missing neighbour
      {2.0, std::nullopt},
      {2.5, std::nullopt},
      {3.0, 4.0F},
      {3.5, 5.0F},
      {5.5, std::nullopt},
      {6.0, std::nullopt},
      {7.0, 0.5F},
      {7.0 + kQuarterMillisecond, 0.5F},
      {7.001, std::nullopt},
      {std::numeric_limits<double>::quiet_NaN(), std::nullopt},
  };
  const MemoryTimeSeries series = sampleSeries();
  for (const auto& [days, expected] : cases) {
    EXPECT_EQ(valueAt(series, 1, days), expected) << days;
    // Whatever step the search begins at, it ends at the same one.
    for (std::size_t start = 0; start < 9; ++start) {
      std::size_t hint = start;
      EXPECT_EQ(valueAt(series, 1, days, hint), expected) << days << " from " << start;
    }
  }
}

TEST(TimeSeriesObject, InterpolatesIn64BitsAndRoundsOnce) {
  const float below = 16777216.0F;  // 2^24: the next float is two further
  const MemoryTimeSeries series({2001, 1, 1}, {0.0, 4.0}, {{below, below + 4.0F}});
  EXPECT_EQ(valueAt(series, 1, 1.5), below + 2.0F);  // 1.5 above rounds to 2
  EXPECT_EQ(valueAt(series, 1, 0.75), below);        // 0.75 above rounds to 0
  const float huge = std::numeric_limits<float>::max();
  const MemoryTimeSeries wide({2001, 1, 1}, {0.0, 2.0}, {{-huge, huge}});
  EXPECT_EQ(valueAt(wide, 1, 1.0), 0.0F);
}

TEST(TimeSeriesObject, ExtremesSkipMissingValuesAndIncludeBothEnds) {
  const MemoryTimeSeries series = sampleSeries();
  const std::tuple<double, double, std::optional<float>, std::optional<float>> cases[] = {
      {0.0, 7.0, 0.5F, 8.0F},
      {1.0, 3.0, 3.0F, 4.0F},
      {1.5, 2.5, std::nullopt, std::nullopt},
      {5.0, 6.0, 8.0F, 8.0F},
      {7.0, 9.0, 0.5F, 0.5F},
      {8.0, 9.0, std::nullopt, std::nullopt},
      {-5.0, 0.0, 1.0F, 1.0F},
      {3.0, 1.0, std::nullopt, std::nullopt}};
  for (const auto& [start, end, smallest, largest] : cases) {
    EXPECT_EQ(extractMinValue(series, 1, start, end), smallest) << start;
    EXPECT_EQ(extractMaxValue(series, 1, start, end), largest) << start;
  }
}

TEST(TimeSeriesObject, TheEndingOfTheNameChoosesTheReader) {
  std::string reason;
  for (const char* name : {"a.csv", "b/c.TXT", "d.tsv  "}) EXPECT_NE(createTimeSeriesObject(name, reason), nullptr);
  EXPECT_EQ(createTimeSeriesObject("x/sim.xls", reason), nullptr);
  EXPECT_EQ(reason, "expected a time-series file name ending in .csv, .txt, .tsv or .nc, found \".xls\"");
  EXPECT_EQ(createTimeSeriesObject("x.csv/sim", reason), nullptr);
  EXPECT_EQ(reason, "expected a time-series file name ending in .csv, .txt, .tsv or .nc, found no ending");
}

}  // namespace
}  // namespace mirevo

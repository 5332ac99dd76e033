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
  // Nothing lies before and behind the axis or beside a missing step; a quarter of a millisecond off is the same time.
  const std::pair<std::optional<float>, std::vector<double>> cases[] = {
      {std::nullopt, {-0.001, 1.5, 2.0, 2.5, 5.5, 6.0, 7.001, NAN}},
      {1.0F, {-kQuarterMillisecond, 0.0}},
      {1.5F, {0.25}},
      {3.0F, {1.0 - kQuarterMillisecond, 1.0 + kQuarterMillisecond}},
      {4.0F, {3.0}},
      {5.0F, {3.5}},
      {0.5F, {7.0, 7.0 + kQuarterMillisecond}}};
  const MemoryTimeSeries series = sampleSeries();
  for (const auto& [expected, times] : cases) {
    for (const double days : times) {
      EXPECT_EQ(valueAt(series, 1, days), expected) << days;
      // Whatever step the search begins at, it ends at the same one.
      for (std::size_t start = 0; start < 9; ++start) {
        std::size_t hint = start;
        EXPECT_EQ(valueAt(series, 1, days, hint), expected) << days << " from " << start;
      }
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
  EXPECT_EQ(reason,
            "expected a time-series file name ending in .csv, .txt, .tsv, .nc, .rdb, .xml, .day, .mon, .out, .hds, "
            ".ddn, .ucn, .cbc or .bud, found \".xls\"");
  EXPECT_EQ(createTimeSeriesObject("x.csv/sim", reason), nullptr);
  EXPECT_EQ(reason,
            "expected a time-series file name ending in .csv, .txt, .tsv, .nc, .rdb, .xml, .day, .mon, .out, .hds, "
            ".ddn, .ucn, .cbc or .bud, found no ending");
}

}  // namespace
}  // namespace mirevo

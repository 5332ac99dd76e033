#include "run/results/series_table.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"

namespace mirevo {
namespace {

using ::testing::Eq;

SeriesTable sample() {
  SeriesTable table;
  table.headLines = {"Initial: evaluation of the basin", "Mirevo"};
  table.initial = ShownEvaluation{2, 0.1};
  table.best = ShownEvaluation{1234, -1.0 / 3.0};
  const std::int64_t noon = secondNumber({2000, 2, 29, 12, 0, 1});
  table.series = {{"flow, m3/s", {noon, noon + 86400}, {0.1F, NAN}, {-1e-30F, 3e38F}, {NAN, 16777217.0F}},
                  {"level", {noon}, {1.0F}, {2.0F}, {3.0F}}};
  return table;
}

TEST(SeriesTable, ReadsBackWhatItHasWritten) {
  const SeriesTable table = sample();
  const std::string text = seriesTableText(table);
  EXPECT_THAT(text, HasSubstr("\nMeasure\tTime\tObserved\tInitial\tBest\n"
                              "flow, m3/s\t2000-02-29T12:00:01\t0.1\t-1e-30\tNaN\n"));
  const SeriesTable read = readSeriesTable(text);
  EXPECT_EQ(read.initial, table.initial);
  EXPECT_EQ(read.best, table.best);
  EXPECT_FALSE(read.isOfInitialParameters);
  ASSERT_EQ(read.series.size(), 2U);
  EXPECT_EQ(read.series[0].measure, "flow, m3/s");
  EXPECT_EQ(read.series[0].seconds, table.series[0].seconds);
  EXPECT_THAT(read.series[0].observed, ElementsAre(0.1F, NanSensitiveFloatEq(NAN)));
  EXPECT_THAT(read.series[0].initial, ElementsAre(-1e-30F, 3e38F));
  EXPECT_THAT(read.series[0].best, ElementsAre(NanSensitiveFloatEq(NAN), Eq(16777217.0F)));
  EXPECT_THAT(read.series[1].best, ElementsAre(3.0F));
}

TEST(SeriesTable, TakesAnyTextAndKeepsWholeRowsOnly) {
  const std::string text = seriesTableText(sample());
  for (std::size_t size = 0; size < text.size(); ++size) {
    const SeriesTable read = readSeriesTable(std::string_view(text).substr(0, size));
    std::size_t rows = 0;
    for (const ShownSeries& series : read.series) rows += series.seconds.size();
    EXPECT_LT(rows, 3U) << size;
  }
  const std::string header = "Measure\tTime\tObserved\tInitial\tBest\n";
  for (const char* row :
       {"", "a\t2001-01-01T00:00:00\t1\t2", "a\t2001-01-01T00:00:00\t1\t2\t3\t4", "a\t2001-01-01\t1\t2\t3",
        "a\t2001-02-29T00:00:00\t1\t2\t3", "a\t2001-01-01T00:00:60\t1\t2\t3", "a\t2001-01-01T00:00:00\t1\t2\t3x",
        "a\t2001-01-01T00:00:00\t\t2\t3"}) {
    EXPECT_THAT(readSeriesTable(header + row + "\n").series, IsEmpty()) << row;
  }
}

}  // namespace
}  // namespace mirevo

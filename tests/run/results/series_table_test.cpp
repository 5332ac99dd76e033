#include "run/results/series_table.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "run/results/scenario_series.h"
#include "temporary_folder.h"

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

TEST(ScenarioSeriesFile, KeepsWholeScenariosOfThePeriodAndGoesOnFromThem) {
  const TemporaryFolder folder;
  const std::string path = folder.write("s.dat", "");
  std::vector<std::string> warnings;
  const auto open = [&] {
    return ScenarioSeriesFile({path, {"title", "Mirevo"}, {"flow"}, 3600, 7200, 2},
                              [&](std::string_view text) { warnings.emplace_back(text); });
  };
  const PeriodSeries hourly{{0, 3600, 7200, 10800}, {0.0F, 1.5F, std::nanf(""), 3.0F}};
  ScenarioSeriesFile first = open();
  first.begin(false);
  first.add(2, {hourly});
  first.add(3, {hourly});                                                             // more than are kept
  folder.write("s.dat", folder.read("s.dat") + "1\tflow\t0001-01-01T01:00:00\t9\n");  // cut off
  ScenarioSeriesFile second = open();
  second.begin(true);
  second.add(2, {hourly});
  second.add(1, {hourly});
  const std::vector<ScenarioSeries> read = readScenarioSeries(folder.read("s.dat"));
  ASSERT_EQ(read.size(), 2U) << folder.read("s.dat");
  EXPECT_EQ(read[0].number, 2);
  EXPECT_EQ(read[1].number, 1);
  EXPECT_EQ(read[1].series.seconds, (std::vector<std::int64_t>{3600, 7200}));
  EXPECT_EQ(read[1].series.values.front(), 1.5F);
  EXPECT_TRUE(warnings.empty());
}

}  // namespace
}  // namespace mirevo

#include "platform/series/rdb_time_series.h"

#include <string>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/format_samples.h"
#include "platform/series/quality_codes.h"
#include "platform/series/shown_values.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

const std::string kHead =
    "# retrieved\n#\n#    DD parameter statistic   Description\n"
    "#    01   00060     00003     Discharge, cubic feet per second (Mean)\n#\n"
    "agency_cd\tsite_no\tdatetime\t01_00060_00003\t01_00060_00003_cd\n5s\t15s\t20d\t14n\t10s\n";

TEST(RdbTimeSeries, ReadsValuesAndTheirQualifiers) {
  RdbTimeSeries series;
  ASSERT_TRUE(series.parse("q.rdb", kHead + "USGS\t1\t2012-09-30\t191\tA\nUSGS\t1\t2012-10-01\tIce\tP Ice\r\n"
                                            "USGS\t1\t2012-10-02\t-999999\t\nUSGS\t1\t2012-10-03\t0.25\tP:e"))
      << series.lastError();
  EXPECT_EQ(series.itemCount(), 2);
  EXPECT_EQ(series.itemName(1) + " " + series.itemUnit(1), "01_00060_00003 cubic feet per second");
  EXPECT_EQ(series.itemName(2) + series.itemUnit(2), "01_00060_00003_cd");
  EXPECT_EQ(formatDate(series.startTime().value()), "2012-09-30 00:00");
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, 1.0, 2.0, 3.0));
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(191.0F, -999999.0F, -999999.0F, 0.25F));
  EXPECT_THAT(valuesOf(series, 2), ElementsAre(1.0F, 42.0F, -999999.0F, 12.0F));
  EXPECT_FALSE(series.endsLine());
}

TEST(RdbTimeSeries, PutsTimesOfAChangingZoneOnStandardTimeAndSaysSo) {
  const std::string head = "a\tsite_no\tdatetime\ttz_cd\t1_00065\n5s\t15s\t20d\t6s\t14n\n";
  RdbTimeSeries series;
  ASSERT_TRUE(series.parse("h.rdb", head + "U\t1\t2012-11-04 01:30\tEDT\t1\nU\t1\t2012-11-04 01:00\tEST\t2\n"
                                           "U\t1\t2012-11-04 01:30\tEST\t3\n"))
      << series.lastError();
  EXPECT_EQ(formatDate(series.startTime().value()), "2012-11-04 00:30");
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, DoubleEq(1.0 / 48), DoubleEq(1.0 / 24)));
  EXPECT_THAT(series.doubts(), ElementsAre("h.rdb: its times change between UTC-05:00 and UTC-04:00, and are all read "
                                           "in UTC-05:00"));
  // One zone alone is left as it is, known or not.
  for (const std::string zone : {"EDT", "XYZ", ""}) {
    ASSERT_TRUE(series.parse("h.rdb", head + "U\t1\t2012-11-04 01:30\t" + zone + "\t1\n")) << series.lastError();
    EXPECT_EQ(formatDate(series.startTime().value()), "2012-11-04 01:30");
    EXPECT_TRUE(series.doubts().empty());
  }
}

TEST(RdbTimeSeries, SitesAndTablesHaveItemsOfTheirOwnOnACommonAxis) {
  RdbTimeSeries series;
  const std::string second =
      "# next\nagency_cd\tsite_no\tpeak_dt\tpeak_tm\tpeak_va\tpeak_cd\n5s\t15s\t10d\t6s\t8s\t27s\n";
  ASSERT_TRUE(series.parse("q.rdb", kHead + "U\t1\t2012-01-01\t5\tA\nU\t1\t2012-01-03\t6\tA\n" + second +
                                        "U\t22\t2012-01-02\t12:00\t7\t\nU\t22\t2012-01-03\t\t8\t<\n"))
      << series.lastError();
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, 1.5, 2.0));
  EXPECT_EQ(series.itemName(3), "22 peak_va");
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(5.0F, -999999.0F, 6.0F));
  EXPECT_THAT(valuesOf(series, 3), ElementsAre(-999999.0F, 7.0F, 8.0F));
  EXPECT_THAT(valuesOf(series, 4), ElementsAre(-999999.0F, -999999.0F, 20.0F));
}

TEST(RdbTimeSeries, RefusesWithThePlaceAndWhatWasExpected) {
  const std::string row = "USGS\t1\t2012-09-30\t191\tA\n";
  const std::tuple<std::string, std::string> cases[] = {
      {"", "1: expected a row of column names, found the end of the file"},
      {"# c\nno tabs\n", "2: expected column names separated by tabs, found \"no tabs\""},
      {"# c\na\tb\n", "2: expected the row of formats, as 5s, 15s, 20d, found the end of the file"},
      {"a\t\n5d\t5n\n", "1: expected a name for each column, found \"a\t\""},
      {"a\tb\n1\t2\n", "2: expected the row of formats, as 5s, 15s, 20d, found \"1\t2\""},
      {"a\tb\n5s\t5s\t5s\n", "2: expected 2 columns as in the row of names, found 3"},
      {"a\tb\n5s\t5n\n", "2: expected a column of format d, the time, found \"5s\t5n\""},
      {"a\tb\n5s\t5d\n", "2: expected a column of values, of format n, found \"5s\t5d\""},
      {kHead + "USGS\t1\t2012-09", "8: expected 5 columns as in the row of names, found 3"},
      {kHead + "USGS\t1\t1936-03-00\t5\tA\n", "8: expected a valid time like 2001-01-31 12:30, found \"1936-03-00\""},
      {kHead + row + row, "9: expected a time later than that of the row before, found \"2012-09-30\""},
      {kHead + "USGS\t1\t2012-09-30\tabc\tA\n", "8: expected a number in the column 01_00060_00003, found \"abc\""},
  };
  for (const auto& [content, error] : cases) {
    RdbTimeSeries series;
    EXPECT_FALSE(series.parse("s.rdb", content)) << content;
    EXPECT_EQ(series.lastError(), "s.rdb:" + error);
    EXPECT_EQ(series.timeStepCount() + series.itemCount(), 0);
  }
}

TEST(RdbTimeSeries, IsToldFromATableByItsRowOfFormats) {
  const TemporaryFolder folder;
  std::string reason;
  const std::tuple<std::string, std::string, int> cases[] = {
      {"usgs.txt", kHead + "USGS\t1\t2012-09-30\t191\tA\n", 2},
      {"mark.txt", "\xEF\xBB\xBF" + kHead, 2},
      {"noted.rdb", "\xEF\xBB\xBF" + kHead.substr(kHead.find("agency")), 2},
      {"table.txt", "time\tQ\tH\tT\n2012-09-30\t1\t2\t3\n", 3}};
  for (const auto& [name, content, items] : cases) {
    const auto series = createTimeSeriesObject(folder.write(name, content), reason);
    ASSERT_TRUE(series->open(folder / name)) << series->lastError();
    EXPECT_EQ(series->itemCount(), items);
  }
  EXPECT_FALSE(createTimeSeriesObject(folder / "none.txt", reason)->open(folder / "none.txt"));
}

TEST(RdbTimeSeries, ReadsADownloadedFile) {
  MIREVO_REQUIRE_SAMPLE(path, "RDB1Example.txt");
  std::string reason;
  const auto series = createTimeSeriesObject(path, reason);
  ASSERT_TRUE(series->open(path)) << series->lastError();
  EXPECT_EQ(series->itemUnit(1), "cubic feet per second");
  EXPECT_EQ(series->timeStepCount(), 31);
  EXPECT_EQ(valuesOf(*series, 1)[17], 1470.0F);
  EXPECT_EQ(valuesOf(*series, 2)[30], 2.0F);
}

TEST(QualityCode, AddsUpWhatTheQualifiersSay) {
  const std::tuple<const char*, double> cases[] = {{"A", 1},      {"P", 2},        {"A e", 11}, {"P:E", 12},
                                                   {"A [90]", 1}, {"A R", 1},      {"A P", 2},  {"P,<", 22},
                                                   {"Ice", 40},   {"P Ice e", 52}, {"[4]", 0}};
  for (const auto& [text, code] : cases) EXPECT_EQ(qualityCode(text), code) << text;
  EXPECT_THAT(qualityCode(" "), ::testing::IsNan());
}

}  // namespace
}  // namespace mirevo

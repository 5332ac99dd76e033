#include "platform/series/grdc_time_series.h"

#include <string>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/shown_values.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

std::string head(int lines, const std::string& columns) {
  return "# Title:                 GRDC STATION DATA FILE\r\n# Unit of measure:                  m\xB3/s\r\n#\r\n# "
         "Data lines: " +
         std::to_string(lines) + "\r\n# DATA\r\nYYYY-MM-DD;hh:mm;" + columns + "\r\n";
}

TEST(GrdcTimeSeries, ReadsDaysAndMonths) {
  const TemporaryFolder folder;
  std::string reason;
  const std::string days =
      folder.write("6335020_Q_Day.Cmd.txt", head(3, " Value") +
                                                "2000-02-28;--:--;    123.000\r\n"
                                                "2000-02-29;--:--;   -999.000\r\n2000-03-02;12:00; .5\r\n");
  auto series = createTimeSeriesObject(days, reason);
  ASSERT_TRUE(series->open(days)) << series->lastError();
  EXPECT_EQ(series->itemName(1) + ", " + series->itemUnit(1), "Value, m\xC2\xB3/s");
  EXPECT_THAT(timesOf(*series), ElementsAre(0.0, 1.0, 3.5));
  EXPECT_THAT(valuesOf(*series, 1), ElementsAre(123.0F, -999999.0F, 0.5F));

  const std::string marked =
      folder.write("marked_Q_Day.Cmd.txt", "\xEF\xBB\xBF" + folder.read("6335020_Q_Day.Cmd.txt"));
  series = createTimeSeriesObject(marked, reason);
  ASSERT_TRUE(series->open(marked)) << series->lastError();
  EXPECT_THAT(valuesOf(*series, 1), ElementsAre(123.0F, -999999.0F, 0.5F));

  const std::string months = folder.write("6335020.mon", head(2, " Original; Calculated; Flag") +
                                                             "1951-01-00;--:--;  2.030;   -999.000;   0\r\n"
                                                             "1951-02-01;--:--;  1.680;      1.700; 100\r\n");
  series = createTimeSeriesObject(months, reason);
  ASSERT_TRUE(series->open(months)) << series->lastError();
  EXPECT_EQ(series->itemCount(), 3);
  EXPECT_EQ(formatDate(series->startTime().value()), "1951-01-01 00:00");
  EXPECT_THAT(timesOf(*series), ElementsAre(0.0, 31.0));
  EXPECT_THAT(valuesOf(*series, 2), ElementsAre(-999999.0F, 1.7F));
  EXPECT_EQ(series->itemName(3) + series->itemUnit(3), "Flag");
  EXPECT_THAT(valuesOf(*series, 3), ElementsAre(0.0F, 100.0F));
}

TEST(GrdcTimeSeries, RefusesWithThePlaceAndWhatWasExpected) {
  const std::string row = "2000-02-28;--:--; 1\n";
  const std::tuple<std::string, std::string> cases[] = {
      {"", "1: expected the row \"YYYY-MM-DD;hh:mm; ...\", found the end of the file"},
      {"time,Q\n", "1: expected the row \"YYYY-MM-DD;hh:mm; ...\" of a GRDC station file, found \"time,Q\""},
      {head(2, " Value") + row, "7: expected 2 rows as its comment \"Data lines\" says, found 1: the file is cut off"},
      {head(1, " Value") + "2000-02", "7: expected 3 columns as in the row of names, found 1"},
      {head(1, " Value") + "2000-02-30;--:--; 1\n",
       "7: expected a valid time like 2001-01-31;12:30, found \"2000-02-30;--:--; 1\""},
      {head(2, " Value") + row + row, "8: expected a time later than that of the row before, found \"2000-02-28\""},
      {head(1, " Value") + "2000-02-28;--:--; x\n", "7: expected a number in the column Value, found \"x\""},
  };
  for (const auto& [content, error] : cases) {
    GrdcTimeSeries series;
    EXPECT_FALSE(series.parse("s.txt", content)) << content;
    EXPECT_EQ(series.lastError(), "s.txt:" + error);
    EXPECT_EQ(series.timeStepCount() + series.itemCount(), 0);
  }
}

}  // namespace
}  // namespace mirevo

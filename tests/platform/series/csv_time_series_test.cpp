#include "platform/series/csv_time_series.h"

#include <cmath>
#include <fstream>
#include <limits>
#include <string>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/shown_values.h"

namespace mirevo {
namespace {

TEST(CsvTimeSeries, ReadsEveryFormOfFile) {
  // Each is the same series: 1.5 at 2000-02-28 00:00, missing at 12:00, -200 at 24:00 (the 29th), 0.25 on the 1st.
  const std::tuple<const char*, std::string> cases[] = {
      {"comma", "time,Q\n2000-02-28,1.5\n2000-02-28 12:00,\n2000-02-28 24:00,-2e2\n2000-03-01 00:00:00,.25\n"},
      {"semicolon, CRLF, no last line end",
       "time;Q\r\n2000-02-28;1.5\r\n2000-02-28T12:00;-nan\r\n2000-02-29;-200\r\n2000-03-01;0.25"},
      {"tab, missing mark, comments, byte-order mark",
       "\xEF\xBB\xBF# gauge 4\n\n#missing=-9.99\n# missing values are marked\n"
       "time\tQ\n2000-02-28\t1.5\n2000-02-28 12:00\t-9.990\n2000-02-29\t-200\n2000-03-01\t0.25\n\n \n"},
      {"quotes, blanks, minute 60",
       "\"time\",\"Q, m3/s\"\n\"2000-02-28\",\"1.5\"\n 2000-02-28 11:60 , NA \n"
       "2000-02-29 , -2.0D+02\n\"2000-02-29T23:60:00\",+0.25\n"},
      {"semicolon with commas in a name, NaN in capitals",
       "time;Q, m3/s, gauge\n2000-02-28;1.5\n2000-02-28 12:00;nAN\n2000-02-29;-200\n2000-03-01;0.25\n"},
  };
  for (const auto& [name, content] : cases) {
    SCOPED_TRACE(name);
    CsvTimeSeries series;
    ASSERT_TRUE(series.parse("q.csv", content)) << series.lastError();
    EXPECT_EQ(series.itemCount(), 1);
    EXPECT_EQ(formatDate(series.startTime().value()), "2000-02-28 00:00");
    EXPECT_THAT(timesOf(series), ElementsAre(0.0, 0.5, 1.0, 2.0));
    EXPECT_THAT(valuesOf(series, 1), ElementsAre(1.5F, -999999.0F, -200.0F, 0.25F));
  }
}

TEST(CsvTimeSeries, RefusesWithThePlaceAndWhatWasExpected) {
  // error: behind "s.csv:"
  const std::string head = "# c\ntime,Q,H\n2001-01-31 00:00,1,2\n";
  const std::string noHeader =
      ":1: expected a header row (the time column's name, then one name an item), found the end of the file";
  const std::string noTime = "4:1: expected a valid time like 2001-01-31 12:30, found ";
  const std::string twice = "4:1: expected a time later than 2001-01-31 00:00, found 2001-01-31 00:00";
  const std::tuple<std::string, std::string> cases[] = {
      {"", "1" + noHeader},
      {"# only\n", "2" + noHeader},
      {std::string("t\0i\0,\0", 6),
       " the file is UTF-16 text; save it as UTF-8, for example with iconv -f UTF-16 -t UTF-8"},
      {head + std::string("2001-02-01\0,1,2\n", 16),
       noTime + "\"2001-02-01?\"; line 4 holds a zero byte (NUL), which no text has: save the file as UTF-8 text, for "
                "example with tr -d '\\000', if nothing else is wrong with it"},
      {"time Q\n",
       "1:1: expected a header row with its columns separated by comma, semicolon or tab, found \"time Q\""},
      {"2001-01-31,1\n", "1:1: expected a header row before the first time step, found \"2001-01-31,1\""},
      {"# missing = \ntime,Q\n", "1:12: expected a number after \"# missing =\", found \"\""},
      {"# missing = none\ntime,Q\n", "1:13: expected a number after \"# missing =\", found \"none\""},
      {head + "2001-01-31 00:00,1,2\n", twice},
      {head + "2001-01-31,25,2\n", twice},
      {"time,Q\n\n2001-01-31,0\n2001-01-31,1\n", twice},
      {head + "2001-01-31,24,2\n",
       twice + "; if 24 is the hour: the date and the time of day must be in one column, such as 2001-01-31 12:30"},
      {"d,h,Q\n2001-01-31,0:00,1\n2001-01-31,1:00,2\n",
       "3:1: expected a time later than 2001-01-31 00:00, found 2001-01-31 00:00; the date and the time of day must be "
       "in one column, such as 2001-01-31 12:30"},
      {head + "2001-01-30 23:59:59,1,2\n",
       "4:1: expected a time later than 2001-01-31 00:00, found 2001-01-30 23:59:59"},
      {head + "2001-02-29,1,2\n", noTime + "\"2001-02-29\""},
      {head + "31.01.2001,1,2\n", noTime + "\"31.01.2001\""},
      {head + "2001-02-01 24:01,1,2\n", noTime + "\"2001-02-01 24:01\""},
      {head + "2001-02-01 12:30:60,1,2\n", noTime + "\"2001-02-01 12:30:60\""},
      {head + ",1,2\n", noTime + "\"\""},
      {head + "2001-02-01,1\n", "4:1: expected 3 columns as in the header row, found 2"},
      {head + "2001-02-01\n", "4:1: expected 3 columns as in the header row, found 1"},
      {head + "2001-02-01,1,2,\r\n", "4:1: expected 3 columns as in the header row, found 4"},
      {head + "2001-02-01,\"1,2\n", "4:1: expected 3 columns as in the header row, found 2"},
  };
  for (const auto& [content, error] : cases) {
    CsvTimeSeries series;
    EXPECT_FALSE(series.parse("s.csv", content)) << content;
    EXPECT_EQ(series.lastError(), "s.csv:" + error);
    EXPECT_EQ(series.timeStepCount(), 0);
  }
}

TEST(CsvTimeSeries, ReadsAColumnOnlyWhenItIsAskedFor) {
  CsvTimeSeries series;
  ASSERT_TRUE(series.parse("s.csv",
                           "time,Q,\"flag, quality\",H,big\n2001-01-01,1,A:e,3,3.4028235e38\n"
                           "2001-01-02,2,\"x,y\",4,-3.5e38\n"));
  ASSERT_EQ(series.itemCount(), 4);
  EXPECT_EQ(series.itemName(2), "flag, quality");
  EXPECT_EQ(splitUnit(" Q at A (1) [m3/s] "), std::pair(std::string("Q at A (1)"), std::string("m3/s")));
  EXPECT_EQ(splitUnit("[1]"), std::pair(std::string("[1]"), std::string()));
  EXPECT_FALSE(series.getData(2));
  EXPECT_EQ(series.lastError(),
            "s.csv:2:14: expected a number of at most 3.4028235e38 in size, an empty cell, NaN or NA, found \"A:e\"");
  EXPECT_TRUE(series.values(2).empty());
  EXPECT_FALSE(series.getData(4));
  EXPECT_EQ(series.lastError(),
            "s.csv:3:22: expected a number of at most 3.4028235e38 in size, an empty cell, NaN or NA, found "
            "\"-3.5e38\"");
  // Backwards over the quoted cell, forwards again, and a second time.
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(1.0F, 2.0F));
  EXPECT_THAT(valuesOf(series, 3), ElementsAre(3.0F, 4.0F));
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(1.0F, 2.0F));
  EXPECT_FALSE(series.getData(5));
  EXPECT_FALSE(series.getData(0));
}

TEST(CsvTimeSeries, TheDigitsOfAnItemTellItsUnit) {
  CsvTimeSeries series;
  ASSERT_TRUE(series.parse("s.csv",
                           "time,fixed,significant,single,zero\n2001-01-01,1.20,1234.56,1.10000002384185791,0\n"
                           "2001-01-02,,0.00123456,2,0\n2001-01-03,3.25,3,2.20000004768371582,0\n"));
  EXPECT_THAT(series.units(1), ElementsAre(0.01, testing::IsNan(), 0.01));
  EXPECT_THAT(series.units(2), ElementsAre(DoubleEq(0.01), DoubleEq(1e-8), DoubleEq(1e-5)));
  EXPECT_NEAR(series.units(3)[2], 2.2 * std::numeric_limits<float>::epsilon(), 1e-12);
  EXPECT_THAT(series.units(4), testing::Each(1.0));
}

TEST(CsvTimeSeries, CellsThatAreNoNumbersAreRefused) {
  for (const char* cell : {"inf", "-Infinity", "1,5", "1.5x", "0x1p3", "--1", "****", "nan(1)", "1 2", "1e400", "na"}) {
    CsvTimeSeries series;
    ASSERT_TRUE(series.parse("s.csv", "time;Q\n2001-01-01;" + std::string(cell) + "\n")) << series.lastError();
    EXPECT_FALSE(series.getData(1)) << cell;
  }
  CsvTimeSeries commas;
  ASSERT_TRUE(commas.parse("s.csv", "time;Q\n2001-01-01;12,5\n"));
  EXPECT_FALSE(commas.getData(1));
  EXPECT_THAT(commas.lastError(), EndsWith("found \"12,5\"; numbers have a decimal point"));
  CsvTimeSeries hours;
  ASSERT_TRUE(hours.parse("s.csv", "d,h,Q\n2001-01-01,12:30,1\n"));
  EXPECT_FALSE(hours.getData(1));
  EXPECT_THAT(hours.lastError(),
              EndsWith("found \"12:30\"; the date and the time of day must be in one column, such as "
                       "2001-01-31 12:30"));
  // Too small for a float is no error: a tiny discharge is a zero.
  for (const char* cell : {"1e-60", "-1e-400"}) {
    CsvTimeSeries series;
    ASSERT_TRUE(series.parse("s.csv", "time,Q\n2001-01-01," + std::string(cell) + "\n"));
    EXPECT_THAT(valuesOf(series, 1), ElementsAre(0.0F)) << cell;
  }
}

TEST(CsvTimeSeries, AFirstItemThatIsCalledLikeATimeOfDayIsDoubted) {
  CsvTimeSeries series;
  for (const char* heading : {"hour", " HOUR ", "Time (UTC)", "\"HH:MM\"", "time_of_day"}) {
    ASSERT_TRUE(series.parse("s.csv", fmt::format("date,{},Q\n2001-01-01,12,1\n2001-01-02,12,1\n", heading)));
    EXPECT_THAT(series.doubts(), ElementsAre(HasSubstr(" and is read as item No. 1, not as a part of the time; ")));
  }
  // Whatever its heading, if it holds one.
  ASSERT_TRUE(series.parse("s.csv", "Datum;Uhr;Q\n2001-01-01;09:30;1\n2001-01-02;09:30;1\n"));
  EXPECT_THAT(series.doubts(), ElementsAre(HasSubstr("column 2 is called \"Uhr\" and is read as item No. 1, not as")));
  for (const char* content :
       {"date,Q,peak\n2001-01-01,1,9:30\n", "date,hourly,Q\n2001-01-01,12,1\n", "date,hour\n2001-01-01,12\n",
        "date,Q,hour\n2001-01-01,1,12\n", "date,hour,Q\n2001-01-01 06:00,12,1\n",
        "date,hour,Q\n2001-01-01,12,1\n2001-01-01 06:00,12,1\n"}) {
    ASSERT_TRUE(series.parse("s.csv", content));
    EXPECT_THAT(series.doubts(), IsEmpty()) << content;
  }
}

TEST(CsvTimeSeries, CommentsThatSeemToMarkMissingValuesAreDoubted) {
  // warning: none where it is empty
  const std::pair<const char*, const char*> cases[] = {
      {"# missing: -999",
       "s.csv:2: this comment marks no missing values; if -999 is one, the line must be \"# missing"},
      {"# Missing value = -999", "must be \"# missing = -999\""},
      {"# missing -99.99", "must be \"# missing = -99.99\""},
      {"# NODATA = -99.99", "must be \"# missing = -99.99\""},
      {"# No-data value: -1e30 (gauge)", "must be \"# missing = -1e30\""},
      {"# mising = -9", "must be \"# missing = -9\""},
      {"# units: m3/s; missing = -999", "must be \"# missing = -999\""},
      {"# missing = -99\n# missing = -9.5", "s.csv:3: -9.5 marks missing values, and no longer -99, as line 2 says"},
      {"# missing = -99\n# missing = -99.0", ""},
      {"# missing values are written as -99\n# missing = -99", ""},
      {"# 12 days are missing in 2003", ""},
      {"# missing days in 2003 were filled", ""},
      {"# missing = nan\n# missing values: none", ""},
  };
  for (const auto& [comment, warning] : cases) {
    CsvTimeSeries series;
    ASSERT_TRUE(series.parse("s.csv", fmt::format("# Q\n{}\ntime,Q\n2001-01-01,12\n", comment)));
    const std::size_t count = *warning == '\0' ? 0 : 1;
    EXPECT_THAT(series.doubts(), AllOf(testing::SizeIs(count), testing::Each(HasSubstr(warning)))) << comment;
  }
  CsvTimeSeries series;
  std::string comments;
  for (int line = 1; line <= 30; ++line) comments += "# missing: -9\n";
  ASSERT_TRUE(series.parse("s.csv", comments + "time,Q\n"));
  ASSERT_EQ(series.doubts().size(), 11U);
  EXPECT_EQ(series.doubts().back(), "s.csv: 20 more comments like these");
}

TEST(CsvTimeSeries, AHeaderAloneIsAFileWithoutSteps) {
  CsvTimeSeries series;
  ASSERT_TRUE(series.parse("s.csv", "time,Q"));
  EXPECT_EQ(series.timeStepCount(), 0);
  EXPECT_FALSE(series.startTime().has_value());
  EXPECT_TRUE(series.getData(1));
}

TEST(CsvTimeSeries, OpenSaysWhyAFileCannotBeRead) {
  CsvTimeSeries series;
  EXPECT_FALSE(series.open("no_such_folder/q.csv"));
  EXPECT_EQ(series.lastError(), "no_such_folder/q.csv: No such file or directory");
  // The same object reads another file after a failure, with nothing left of the one before.
  const std::string path = ::testing::TempDir() + "/reopened.csv";
  std::ofstream(path) << "time,Q\n2001-01-01,7\n";
  ASSERT_TRUE(series.open(path)) << series.lastError();
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(7.0F));
  std::ofstream(path) << "time,Q\n2001-01-01,8\n2001-01-02,9\n";
  ASSERT_TRUE(series.open(path)) << series.lastError();
  EXPECT_THAT(valuesOf(series, 1), ElementsAre(8.0F, 9.0F));
}

}  // namespace
}  // namespace mirevo

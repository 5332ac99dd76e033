#include "platform/series/text_table.h"

#include <string>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/csv_time_series.h"
#include "platform/series/shown_values.h"
#include "platform/series/text_time.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

TextForm given(TextForm form) {
  form.isGiven = true;
  return form;
}

TEST(TextTable, ReadsEveryFormOfFile) {
  // Each is the same series: flow 1.5 at 2000-02-28 00:00, missing on the 29th, 0.25 on 2000-03-01; level 1, 2, 3.
  const DateRecord origin{2000, 2, 28};
  const std::tuple<const char*, TextForm, std::string> cases[] = {
      {"two header rows, the second with units",
       {.headerRows = 2},
       "time,flow,level\n,[m3/s],[m]\n2000-02-28,1.5,1\n2000-02-29,,2\n2000-03-01,0.25,3\n"},
      {"gauge: year month day flow, comments, a marker",
       {.headerRows = 0,
        .commentSign = "!",
        .columnSeparator = "blank",
        .timeColumn = "1,2,3",
        .timeFormat = "YYYY MM DD",
        .missingValues = {-77, -99.9}},
       "! a gauge\n2000  2 28   1.5  1\n! a break\n\n2000 02 29 -99.9\t2\n 2000  3  1   .25  3 \n"},
      {"German: day first, decimal comma, hours in a column of their own",
       {.columnSeparator = ";", .decimalSign = ",", .timeColumn = "datum , Uhrzeit", .timeFormat = "DD.MM.YYYY hh:mm"},
       "Datum;flow;Uhrzeit;level\n28.02.2000;1,5;00:00;1\n28.2.2000;NA;24:00;2,0\n01.03.2000;2,5E-1;0:00;\"3\"\n"},
      {"separator found beside the decimal comma",
       {.decimalSign = ","},
       "# missing = -9\ntime, local;flow;level\n2000-02-28;1,5;1\n2000-02-29;-9;2\n2000-03-01;,25;3"},
      {"fixed width, names over two rows, a ruler, times with blanks in them",
       {.skipRows = 2, .headerRows = 3, .columnWidths = {11, 6, 6}, .timeFormat = "DD.MM.YYYY"},
       "MODEL VERSION 3\n\n   Date      flow level\n   d.m.y   \xC2\xB5m3/s     m\n---------- ----- -----\n"
       "28. 2.2000   1.5    1.\n29. 2.2000           2\n 1. 3.2000   .25     3\n"},
      {"date without separators, two columns in usual form",
       {.timeColumn = "2, 1"},
       "hour,date,flow,level\n00:00,2000-02-28,1.5,1\n00:00,2000-02-29,,2\n00:00,2000-03-01,0.25,3\n"},
      {"numbers without separators",
       {.timeFormat = "YYYYMMDDhhmm"},
       "time,flow,level\n200002280000,1.5,1\n200002282400,,2\n200003010000,0.25,3\n"},
      {"day of the year", {.timeFormat = "YYYY/DDD"}, "time,flow,level\n2000/59,1.5,1\n2000/060,,2\n2000/61,0.25,3\n"},
      {"name of the month and an empty fraction of a second",
       {.timeFormat = "DD-MMM-YYYYThh:mm:ss"},
       "time,flow,level\n28-Feb-2000T00:00:00.000,1.5,1\n29-FEB-2000T00:00:00,,2\n1-mar-2000T0:00:00,0.25,3\n"},
      {"hours since a date",
       {.decimalSign = ",", .timeColumn = "t", .timeUnit = TimeUnit::hours, .timeOrigin = DateRecord{2000, 2, 27}},
       "flow;level;t\n1,5;1;24\n;2;48,00\n0,25;3;7,2E1\n"},
      {"step numbers",
       {.timeUnit = TimeUnit::minutes, .timeOrigin = DateRecord{2000, 2, 27}, .timeStep = 720},
       "step,flow,level\n2,1.5,1\n4,,2\n6,0.25,3\n"},
      {"no time at all",
       {.columnSeparator = "tab", .timeColumn = "none", .timeUnit = TimeUnit::days, .timeOrigin = origin},
       "flow\tlevel\n1.5\t1\n\t2\n0.25\t3\n"},
      {"the table with a title",
       {.columnSeparator = "blank", .table = "Reach 1"},
       "Reach 10\ntime flow\n2000-01-01 9\n\nReach 1, outflow\n\n time flow level\n\n2000-02-28 1.5 1\n"
       "2000-02-29 NaN 2\n2000-03-01 0.25 3\n\nsum 9\n"},
      {"the third table",
       {.skipRows = 1, .table = "3"},
       "# c\n\ntitle\n\n\nt;x\n2000-01-01;1\n  \n# c\nlast\ntime;flow;level\n2000-02-28;1.5;1\n2000-02-29;;2\n"
       "2000-03-01;0.25;3\n\nnot;of\n"},
  };
  for (const auto& [name, form, content] : cases) {
    SCOPED_TRACE(name);
    ASSERT_FALSE(findFault(form)) << findFault(form)->explanation;
    TextTable series(given(form));
    ASSERT_TRUE(series.parse("q.txt", content)) << series.lastError() << series.firstLines();
    EXPECT_EQ(series.itemCount(), 2);
    EXPECT_EQ(formatDate(series.startTime().value()), "2000-02-28 00:00");
    EXPECT_THAT(timesOf(series), ElementsAre(0.0, 1.0, 2.0));
    EXPECT_THAT(valuesOf(series, 2), ElementsAre(1.0F, 2.0F, 3.0F)) << series.lastError();
    EXPECT_THAT(valuesOf(series, 1), ElementsAre(1.5F, -999999.0F, 0.25F)) << series.lastError();
  }
}

TEST(TextTable, NamesOfSeveralHeaderRowsAreJoinedAndRulersLeftOut) {
  TextTable series(given({.headerRows = 3, .columnSeparator = ";"}));
  ASSERT_TRUE(series.parse("q.txt", "time;Q;\n===;===;===\n;[m3/s];H\n2000-01-01;1;2\n"));
  EXPECT_EQ(series.itemName(1), "Q [m3/s]");
  EXPECT_EQ(series.itemUnit(1), "m3/s");
  EXPECT_EQ(series.itemName(2), "H");
  TextTable unnamed(given({.headerRows = 0, .timeColumn = "2"}));
  ASSERT_TRUE(unnamed.parse("q.txt", "1,2000-01-01,2\n"));
  EXPECT_EQ(unnamed.itemName(2), "column 3");
  // Of a single header row every name counts.
  TextTable single(given({.columnSeparator = ";"}));
  ASSERT_TRUE(single.parse("q.txt", "time;-;=\n2000-01-01;1;2\n"));
  EXPECT_EQ(single.itemName(1), "-");
  EXPECT_EQ(single.itemName(2), "=");
}

TEST(TextTable, RefusesWithThePlaceAndWhatWasExpected) {
  const TextForm gauge{.headerRows = 0, .columnSeparator = "blank", .timeColumn = "1,2,3", .timeFormat = "YYYY MM DD"};
  const std::tuple<TextForm, std::string, std::string> cases[] = {
      {{.headerRows = 2},
       "a,b\n",
       "1: expected 2 header rows with the names of the columns, found the end of the file"},
      {{.headerRows = 0}, "", "1: expected a row with a time, found the end of the file"},
      {{.skipRows = 5}, "a,b\n", "1: expected 1 header row with the names of the columns, found the end of the file"},
      {{.headerRows = 2},
       "a b\n",
       "1: expected a header row with columns separated by tab, semicolon or comma, unless Column_Separator or "
       "Column_Widths tells otherwise, found \"a b\""},
      {{.headerRows = 2, .columnSeparator = "blank"},
       "t Q H\n m3/s m\n",
       "2: expected 3 names as in the header row above (Column_Widths reads rows of names with gaps and names with "
       "blanks; Skip_Rows leaves rows out), found 2"},
      {gauge, "2000 13 1 2\n", "1: expected a valid time in the form YYYY MM DD, found \"2000 13 1\""},
      {gauge, "2000 12 1 2\n2000 12 2\n", "2: expected 4 columns as in the first row, found 3"},
      {gauge, "2000 12 1 2\n2000 12 1 3\n", "2: expected a time later than 2000-12-01 00:00, found 2000-12-01 00:00"},
      {{.timeFormat = "DD.MM.YYYY"},
       "t,Q\n13.01.2000,1\n01.13.2000,1\n",
       "3: expected a valid time in the form DD.MM.YYYY, found \"01.13.2000\""},
      {{.timeColumn = "tme"},
       "time,Q\n",
       "1: expected a column called \"tme\", a Time_Column, found none; did you mean \"time\"?"},
      {{.timeColumn = "Q"},
       "t,q,Q,Q\n",
       "1: expected one column called \"Q\", a Time_Column, found columns 3 and 4; a number tells which"},
      {{.timeColumn = "3"}, "t,q\n", "1: expected column 3, a Time_Column, found 2 columns"},
      {{.timeColumn = "1,T"}, "t,q\n", "1: expected each Time_Column once, found column 1 twice"},
      {{.timeUnit = TimeUnit::days, .timeOrigin = DateRecord{2000, 1, 1}},
       "t,q\n1.5x,1\n",
       "2: expected a number of days since the Time_Origin, found \"1.5x\""},
      {{.timeUnit = TimeUnit::days, .timeOrigin = DateRecord{2000, 1, 1}},
       "t,q\n-1e9,1\n",
       "2: expected a number of days since the Time_Origin, found \"-1e9\""},
      {{.columnWidths = {10, 3}},
       "time      Q\n2000-01-01 12 4\n",
       "2: expected nothing behind the last of Column_Widths, found \"4\""},
      {{.table = "2"},
       "t,q\n2000-01-01,1\n",
       "2: expected table 2 of those with blank lines between them, found 1 table"},
      {{.table = "Flow"},
       "Flows\nt,q\n",
       "2: expected a line that begins with \"Flow\", the title of the table, found none"},
      {{.table = "Flow"},
       "Flow\nt,q\n2000-01-01,1\n\nFlow\n",
       "5: expected one line that begins with \"Flow\", the title of the table, found a second one, after line 1"},
      {TextForm(), "2000-01-01,1\n2000-01-02,2\n",
       "1: expected a header row (Header_Rows tells how many there are, 0 if columns have no names, and Skip_Rows how "
       "many lines are before them), found the time \"2000-01-01\""},
      {{.headerRows = 2, .timeColumn = "2,1", .timeFormat = "DD.MM.YYYY hh:mm"},
       "h;d;Q\n0:30;31.12.2000;1\n",
       "2: expected a header row (Header_Rows tells how many there are, 0 if columns have no names, and Skip_Rows how "
       "many lines are before them), found the time \"31.12.2000 0:30\""},
      {{.timeColumn = "2", .timeUnit = TimeUnit::hours, .timeOrigin = DateRecord{2000, 1, 1}},
       "1,2\n",
       "1: expected a header row (Header_Rows tells how many there are, 0 if columns have no names, and Skip_Rows how "
       "many lines are before them), found the time \"2\""},
      {{.columnWidths = {10, 3}},
       "time      Q\n2000-01-01\t1\n",
       "2: expected blanks between columns of fixed width (Column_Separator = 'blank' in place of Column_Widths takes "
       "tabs, too), found a tab behind \"2000-01-01\""},
      {{.headerRows = 1, .timeColumn = "none", .timeUnit = TimeUnit::days, .timeOrigin = DateRecord{2000, 1, 1}},
       "q,h\n\n1,2\n \n\n3,4\n",
       "4: expected no blank line between rows that are counted, as Time_Column = 'none' says, found one before the "
       "row "
       "in line 6"},
      {{.commentSign = "!"}, "! missing = x\nt,q\n", "1: expected a number after \"missing =\", found \"x\""},
      {{.commentSign = "!"},
       "# 1\n2000-01-01,1\n",
       "1: expected a header row with columns separated by tab, semicolon or comma, unless Column_Separator or "
       "Column_Widths tells otherwise, found \"# 1\""},
  };
  for (const auto& [form, content, error] : cases) {
    SCOPED_TRACE(content);
    ASSERT_FALSE(findFault(form)) << findFault(form)->explanation;
    TextTable series(given(form));
    EXPECT_FALSE(series.parse("s.txt", content));
    EXPECT_EQ(series.lastError(), "s.txt:" + error);
    EXPECT_EQ(series.timeStepCount(), 0);
  }
  TextTable series(given({.decimalSign = ","}));
  ASSERT_TRUE(series.parse("s.txt", "t;q;h\n2000-01-01;1.000,5;1\n"));
  EXPECT_FALSE(series.getData(1));
  EXPECT_EQ(
      series.lastError(),
      "s.txt:2: expected a number of at most 3.4028235e38 in size, an empty cell, NaN or NA, found \"1.000,5\" in "
      "column 2");
  EXPECT_TRUE(series.getData(2));
}

TEST(TextTable, DoubtsWhatSeemsToBeMeantInAnotherWay) {
  const DateRecord origin{2000, 1, 1};
  const TextForm usual;
  const TextForm widths{.headerRows = 0, .columnWidths = {11, 5, 5}};
  const TextForm counted{.timeColumn = "none", .timeUnit = TimeUnit::days, .timeOrigin = origin};
  const std::string cut = "it cuts a number, unless these are two without a blank between them";
  const std::tuple<TextForm, std::string, std::vector<std::string>> cases[] = {
      // Numbers that columns cut, and those that only touch.
      {widths,
       "2000-01-01   1.5  2.5\n2000-01-02 1234512345\n2000-01-03 1234.5   1\n",
       {":2: Column_Widths ends column 2 before character 17, between \"12345\" and \"12345\": " + cut +
        "; so in 1 more row"}},
      {widths, "2000-01-01  2E-1-1E+2\n", {}},
      {widths,
       "2000-01-01  2.5E-12.5\n",
       {":1: Column_Widths ends column 2 before character 17, between \"2.5E\" and \"-12.5\": " + cut}},
      {widths, "2000-01-01 1.234-5678\n2000-01-02 \xC3\xBC   1    2\n", {}},
      {{.headerRows = 0, .decimalSign = ",", .columnWidths = {11, 5, 5}}, "2000-01-01  -1,5\n", {}},
      {{.headerRows = 0, .decimalSign = ",", .columnWidths = {11, 5, 5}},
       "2000-01-01    -11,5\n2000-01-02     1,5\n",
       {":1: Column_Widths ends column 2 before character 17, between \"-1\" and \"1,5\": " + cut +
        "; so in 1 more row"}},
      {{.headerRows = 0, .columnWidths = {4, 2, 2, 5}, .timeColumn = "1,2,3", .timeFormat = "YYYY MM DD"},
       "20000101    1\n",
       {}},
      {{.headerRows = 0, .columnWidths = {4, 2, 2, 5}, .timeColumn = "1,2,3", .timeFormat = "YYYY MM DD"},
       "2000010112345\n",
       {":1: Column_Widths ends column 3 before character 9, between \"01\" and \"12345\": " + cut}},
      // The time of day in a column that is none of the time.
      {usual,
       "date,time,Q\n2000-01-01,12:00,1\n",
       {": column 2 is called \"time\" and is read as item No. 1, not as a part of the time; Time_Column = '1, 2' "
        "takes "
        "it as one"}},
      {{.timeColumn = "date", .timeFormat = "DD.MM.YYYY"},
       "Q,hh:mm,date\n1,12:00,01.01.2000\n",
       {": column 2 is called \"hh:mm\" and is read as item No. 2, not as a part of the time; Time_Column = 'date, 2', "
        "with hh in Time_Format, takes it as one"}},
      {usual,
       "date,Uhr,Q\n2000-01-01,9:30,1\n",
       {": column 2 is called \"Uhr\" and is read as item No. 1, not as a part of the time; Time_Column = '1, 2' "
        "takes "
        "it as one"}},
      {usual, "date,Q,peak at\n2000-01-01,1,9:30\n", {}},
      {usual, "date,hours\n2000-01-01,12\n", {}},
      {usual, "date,hours,Q\n2000-01-01 06:00,12,1\n", {}},
      {{.timeColumn = "1,2"}, "date,hour,Q\n2000-01-01,12:00,1\n", {}},
      // Comments.
      {usual,
       "# missing: -999\nt,q\n2000-01-01,1\n",
       {":1: this comment marks no missing values; if -999 is one, the line must be \"# missing = -999\""}},
      {{.commentSign = "C"},
       "C NODATA = -999\nt,q\n2000-01-01,1\nC missing: -7\n",
       {":1: this comment marks no missing values; if -999 is one, the line must be \"C missing = -999\""}},
      {{.missingValues = {-7, -99.9}}, "# missing: -99.9\nt,q\n2000-01-01,1\n", {}},
      {usual,
       "# missing = -9\n# missing = -99\nt,q\n2000-01-01,1\n",
       {":2: -99 marks missing values, and no longer -9, as line 1 says: only one value does"}},
      // Header rows of numbers: column numbers, or a row where the rows are counted.
      {{.headerRows = 2, .timeUnit = TimeUnit::days, .timeOrigin = origin}, "t,q\n1,2\n1,5\n", {}},
      {counted, "q,1001\n1,2\n", {}},
      {counted,
       "1.5,2\n1,2\n\n",
       {":1: these numbers are read as names of the columns; if they are values, Header_Rows = 0 or fewer Skip_Rows "
        "must say so"}},
  };
  for (const auto& [form, content, expected] : cases) {
    SCOPED_TRACE(content);
    ASSERT_FALSE(findFault(form)) << findFault(form)->explanation;
    TextTable series(given(form));
    ASSERT_TRUE(series.parse("s.txt", content)) << series.lastError();
    std::vector<std::string> doubts;
    for (const std::string& doubt : expected) doubts.push_back("s.txt" + doubt);
    EXPECT_EQ(series.doubts(), doubts);
  }
}

TEST(TextForm, ContradictionsAreFound) {
  const DateRecord origin{2000, 1, 1};
  const std::tuple<TextForm, const char*, const char*> cases[] = {
      {{.columnSeparator = ";", .columnWidths = {3}}, "Column_Separator", "expected it or Column_Widths, found both"},
      {{.columnSeparator = "semicolon"}, "Column_Separator", "or 'tab' or 'blank', found \"semicolon\""},
      {{.columnSeparator = "7"}, "Column_Separator", "found \"7\""},
      {{.columnSeparator = ",", .decimalSign = ","}, "Column_Separator", "another character than the Decimal_Sign"},
      {{.columnWidths = {3, 0.5}}, "Column_Widths", "whole numbers from 1 to 100000, found 0.5"},
      {{.table = "0"}, "Table", "expected a table number of 1 or more, or the beginning"},
      {{.table = " -1"}, "Table", "found \" -1\""},
      {{.headerRows = 0, .timeColumn = "1, date"}, "Time_Column", "Header_Rows = 0 and columns have no names"},
      {{.timeColumn = "1,,2"}, "Time_Column", "on either side of a comma"},
      {{.timeColumn = "none"}, "Time_Column", "expected Time_Unit, Time_Origin and Time_Step beside 'none'"},
      {{.timeUnit = TimeUnit::days}, "Time_Unit", "expected Time_Origin beside it"},
      {{.timeOrigin = origin}, "Time_Origin", "expected Time_Unit beside it"},
      {{.timeStep = 2}, "Time_Step", "expected Time_Unit and Time_Origin"},
      {{.timeColumn = "1,2", .timeUnit = TimeUnit::days, .timeOrigin = origin}, "Time_Column", "expected one column"},
      {{.timeFormat = "YYYY MM DD", .timeUnit = TimeUnit::days, .timeOrigin = origin}, "Time_Format", "found both"},
      {{.timeFormat = "DD.MM.YY"}, "Time_Format", "found \"YY\""},
      {{.timeFormat = "MM/DD hh:mm"}, "Time_Format", "found \"MM/DD hh:mm\""},
      {{.timeFormat = "YYYY-MM-DD mm"}, "Time_Format", "found \"YYYY-MM-DD mm\""},
      {{.timeFormat = "YYYY-MM-DD MM"}, "Time_Format", "found MM twice"},
      {{.timeFormat = "YYYY-DDD-DD"}, "Time_Format", "expected YYYY, MM (MMM: Jan) and DD"},
  };
  for (const auto& [form, keyword, explanation] : cases) {
    const auto fault = findFault(form);
    ASSERT_TRUE(fault) << keyword << explanation;
    EXPECT_EQ(fault->keyword, keyword);
    EXPECT_THAT(fault->explanation, HasSubstr(explanation));
  }
}

TEST(TimeFormat, ReadsValidTimesOnly) {
  const std::tuple<const char*, const char*, const char*> cases[] = {
      {"YYYY MM", "2001  2", "2001-02-01 00:00"},
      {"YYYY", "2001", "2001-01-01 00:00"},
      {"YYYYDDD hh", "2001365 24", "2002-01-01 00:00"},
      {"YYYY DDD", "2001 366", ""},
      {"YYYY DDD", "2000 0", ""},
      {"YYYYMMDD", "2001228", ""},
      {"MM/DD/YYYY", "2/28/01", ""},
      {"DD.MM.YYYY", "28.02.2001 12:00", ""},
      {"DD.MM.YYYY", "29.02.2001", ""},
      {"DD MMM YYYY", "1 Mai 2001", ""},
      {"YYYY-MM-DD hh:mm:ss", "2001-01-01 1:2:3.0", "2001-01-01 01:02:03"},
      {"YYYY-MM-DD hh:mm:ss", "2001-01-01 1:2:3.5", ""},
      {"YYYY-MM-DD hh:mm:ss", "2001-01-01 1:2:60", ""},
      {"YYYY-MM-DD hh:mm", "2001-01-01 24:01", ""},
      {"YYYY-MM-DD", "", ""},
  };
  for (const auto& [form, text, expected] : cases) {
    std::string reason;
    const auto format = TimeFormat::parse(form, reason);
    ASSERT_TRUE(format) << form << reason;
    const auto second = format->read(text);
    EXPECT_EQ(second ? formatDate(dateOfSecond(*second)) : "", expected) << form << " " << text;
  }
}

TEST(TextTable, ShowsTheFirstLinesAsTheyWereUnderstood) {
  std::string content = "# c\x01\xff\nskipped\nDate;Q \xC3\xBC\n";
  for (int i = 0; i < 9; ++i) content += "2001;" + std::string(300, 'x') + "\n";
  TextTable series(given({.skipRows = 2}));
  EXPECT_FALSE(series.parse("s.csv", content));
  const std::string row = "row: 2001 | " + std::string(93, 'x');
  EXPECT_THAT(series.firstLines(),
              StartsWith("\nthe first lines as they were understood, with columns separated by ';':\n  1 skipped: # "
                         "c\\x01\\xff\n  2 skipped: skipped\n  3 header: Date | Q \xC3\xBC\n  4 row: 2001 | xxx"));
  EXPECT_LT(series.firstLines().size(), 600U);
  CsvTimeSeries plain;
  EXPECT_FALSE(plain.parse("s.csv", "1,5 2,5\n7,1\n"));
  EXPECT_THAT(plain.firstLines(), AllOf(HasSubstr("\n  1 header: 1 | 5 2 | 5"), HasSubstr("\nHeader_Rows, ")));
}

TEST(TextTable, IsMadeForFilesThatAreTextTables) {
  const TemporaryFolder folder;
  const TextForm form = given({});
  std::string reason;
  for (const char* name : {"a.csv", "a.txt", "a.dat", "a", "a.out"}) {
    EXPECT_NE(createTimeSeriesObject(folder / name, reason, nullptr, form), nullptr) << reason;
  }
  folder.write("b.out", std::string("\x91\0\0\0", 4));
  for (const char* name : {"a.nc", "a.rdb", "a.XML", "a.hds", "b.out"}) {
    EXPECT_EQ(createTimeSeriesObject(folder / name, reason, nullptr, form), nullptr);
    EXPECT_THAT(reason, HasSubstr("is a file of another format")) << name;
  }
}

}  // namespace
}  // namespace mirevo

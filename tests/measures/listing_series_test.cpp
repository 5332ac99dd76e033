#include "measures/listing_series.h"

#include <cstdlib>
#include <tuple>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "common/files.h"
#include "matchers.h"

namespace mirevo {
namespace {

ListingSettings byDates(const std::string& pattern) {
  return {.instructionFile = "i.ins", .dates = pattern};
}
ListingSettings byTable() {
  return {.instructionFile = "i.ins", .timesFile = "t.csv"};
}
ListingSettings bySteps(double hours) {
  return {.instructionFile = "i.ins", .start = DateRecord{2001, 1, 31}, .stepHours = hours};
}

std::string withHead(const std::string& lines) {
  return "pif ~\n" + lines + "\n";
}

/// "flow: 2001-01-31 00:00 = 1, ..." of each series, or why there are none.
std::vector<std::string> seriesOf(const ListingSettings& settings, const std::string& instructions,
                                  const std::string& times, const std::string& listing,
                                  std::vector<std::string>* doubts = nullptr) {
  ListingFault fault;
  const auto form = ListingForm::make(settings, withHead(instructions), times, fault);
  if (!form) return {fmt::format("{}: {}", fault.keyword, fault.text)};
  ListingSeries series(form);
  if (!series.parse("out.lst", listing)) return {series.lastError()};
  if (doubts != nullptr) *doubts = series.doubts();
  std::vector<std::string> texts;
  for (int item = 1; item <= series.itemCount(); ++item) {
    EXPECT_TRUE(series.getData(item));
    std::string& text = texts.emplace_back(series.itemName(item) + ":");
    for (std::size_t step = 0; step < series.times().size(); ++step) {
      const float value = series.values(item)[step];
      if (std::isnan(value)) continue;
      const std::int64_t second = secondNumber(*series.startTime()) + std::llround(series.times()[step] * 86400.0);
      text += fmt::format(" {} = {},", formatDate(dateOfSecond(second)), value);
    }
  }
  return texts;
}

TEST(ListingSeries, GivesTheNumbersOfAListingTheirSeriesAndTimes) {
  const std::string flows = "l1 !flow_20010131! !flow_20010201!";
  const std::string inTurn = "l1 !h1_1! !H2_1!\nl1 !h1_2! !h2_2!";  // a line for each time
  const std::tuple<ListingSettings, std::string, std::string, std::vector<std::string>> cases[] = {
      {byDates("YYYYMMDD"), flows, "", {"flow: 2001-01-31 00:00 = 1, 2001-02-01 00:00 = 2,"}},
      {byDates("YYYYMM"), "l1 !q.200101! !q.200102!", "", {"q: 2001-01-01 00:00 = 1, 2001-02-01 00:00 = 2,"}},
      {byDates("DD-MM-YYYYThh"),
       "l1 !q:31-01-2001t06! !31-01-2001T18!",
       "",  // one of them has no other name
       {"q: 2001-01-31 06:00 = 1,", "values: 2001-01-31 18:00 = 2,"}},
      {byDates("YYYYMMDD_hhmmss"), "l1 !q_20010131_240000!", "", {"q: 2001-02-01 00:00 = 1,"}},
      {bySteps(12),
       inTurn,
       "",
       {"h1: 2001-01-31 00:00 = 1, 2001-01-31 12:00 = 3,", "H2: 2001-01-31 00:00 = 2, 2001-01-31 12:00 = 4,"}},
      {bySteps(0.1), "l1 !q0009! !q0010!", "", {"q: 2001-01-31 00:00 = 1, 2001-01-31 00:06 = 2,"}},
      {byTable(),
       flows,
       "name,time\nFLOW_20010131,2001-03-01\n\n# later\nflow_20010201,\"2001-03-01 12:30\"\n",
       {"flow: 2001-03-01 00:00 = 1, 2001-03-01 12:30 = 2,"}},
      {byTable(),
       "l1 !a! !total! !b!\nl1 !c!",
       "series;time;name\nwell 1;2001-01-01;a\nwell 1;2001-01-02;b\nwell 2;2001-01-09;c\n;;total\nwell "
       "9;2001-01-01;other\n",
       {"well 1: 2001-01-01 00:00 = 1, 2001-01-02 00:00 = 3,", "well 2: 2001-01-09 00:00 = 3,"}},
  };
  for (const auto& [settings, instructions, times, expected] : cases) {
    EXPECT_EQ(seriesOf(settings, instructions, times, "1 2 3\n3 4\n"), expected) << instructions;
  }
}

TEST(ListingSeries, SaysWhichNamesHaveNoTime) {
  const std::string two = "l1 !q_1! !q_2!";
  const std::tuple<ListingSettings, std::string, std::string, const char*> cases[] = {
      {{.instructionFile = "i.ins"}, two, "", "Instruction_File: expected one way of telling the times"},
      {{.instructionFile = "i.ins", .dates = "YYYYMM", .start = DateRecord{2001, 1, 1}, .stepHours = 1.0},
       two,
       "",
       "Instruction_File: expected one way"},
      {{.instructionFile = "i.ins", .start = DateRecord{2001, 1, 1}}, two, "", "Instruction_File: expected one way"},
      {bySteps(24), "x", "", "Instruction_File: i.ins:2:1: expected a line to begin with a marker"},
      // Steps
      {bySteps(24), "l1 !q_1! !q_3!", "",
       "Instruction_Start: i.ins: the numbers at the ends of names count the steps of each series: expected 2 for the "
       "next one of \"q\", found \"q_3\". For other names Instruction_Times gives each its time"},
      {bySteps(24), "l1 !q_2! !q_1!", "", "expected 3 for the next one of \"q\", found \"q_1\""},
      {bySteps(24), "l1 !q_1! !q1!", "", "expected 2 for the next one of \"q\", found \"q1\""},
      {bySteps(24), "l1 !q_1! !h_2!", "", "expected 1 for the next one of \"h\", found \"h_2\""},
      {bySteps(24), "l1 !q_12345678901!", "", "found \"q_12345678901\""},
      {bySteps(24), "l1 !q! !h!", "", "i.ins: no name gives a number of a series, such as \"q\", \"h\""},
      {bySteps(1e-9), two, "",
       "the number \"q_2\", of 2001-01-31 00:00, is read behind \"q_1\", of 2001-01-31 00:00, "
       "in the series \"q\": expected times that rise in the order of reading"},
      // Dates
      {byDates("YYMMDD"), two, "", "Instruction_Dates: expected each of YYYY, MM, DD, hh, mm and ss at most once"},
      {byDates("YYYYMMDDMM"), two, "", "at most once"},
      {byDates("YYYYDD"), two, "", "Instruction_Dates: expected MM in the form of dates, found \"YYYYDD\""},
      {byDates("YYYYMMhh"), two, "", "expected DD in the form of dates"},
      {byDates("YYYYMM"), two, "", "no name gives a number of a series"},
      {byDates("YYYYMMDD"), "l1 !q_199001011200!", "", "no name gives a number of a series, such as \"q_1990"},
      {byDates("YYYYMMDD"), "l1 !q_20010229!", "", "expected a date as YYYYMMDD at the end of the name \"q_20010229\""},
      {byDates("YYYYMM"), "l1 !q_200102! !q_200101!", "", "expected times that rise in the order of reading"},
      {byDates("YYYYMM"), "l1 !q_200102! !q:200102!", "", "expected times that rise in the order of reading"},
      // Tables
      {byTable(), two, "", "Instruction_Times: t.csv: it is empty: expected a row with the column names name and time"},
      {byTable(), two, "q_1,2001-01-01\n", "t.csv:1: expected a row with the column names name and time, found"},
      {byTable(), two, "name,time\nq_1\n", "t.csv:2: expected 2 cells as in the row of column names, found 1"},
      {byTable(), two, "name,time\nq_1,1.1.2001\n", "t.csv:2: expected a time like 2001-01-31 or"},
      {byTable(), two, "name,time\nq_1,2001-01-01Z\n", "t.csv:2: expected a time like"},
      {byTable(), two, "name,time\n,2001-01-01\n", "t.csv:2: expected a name"},
      {byTable(), two, "name,time\nq_1,2001-01-01\nQ_1,2001-01-02\n",
       "t.csv:3: the name \"Q_1\" is there twice, first in line 2"},
      {byTable(), two, "name,time\nq_2,2001-01-01\n",
       "t.csv: expected a row for each name in i.ins, found none for \"q_1\"; the time of a number that belongs to no "
       "series is left blank"},
      {byTable(), two, "name,time\nq_1,2001-01-02\nq_2,2001-01-01\n", "expected times that rise"},
      {byTable(), two, "name,time\nq_1,\nq_2,\n", "no name gives a number of a series"},
  };
  for (const auto& [settings, instructions, times, expected] : cases) {
    EXPECT_THAT(seriesOf(settings, instructions, times, "1 2\n"), ElementsAre(HasSubstr(expected)))
        << instructions << "\n"
        << times;
  }
}

TEST(ListingSeries, NamesOfNoSeriesAndColumnsThatCutNumbersAreDoubtful) {
  std::vector<std::string> doubts;
  seriesOf(bySteps(24), "l1 [q_1]1:2 !rms! !a! !b! !c!", "", "12.5 7 8 9 1", &doubts);
  EXPECT_THAT(doubts,
              ElementsAre("i.ins: names without a number at the end are of no series: \"rms\", \"a\", \"b\" and "
                          "1 more",
                          HasSubstr("out.lst:1:1: the columns 1:2 cut \"12.5\"")));
  seriesOf(byDates("YYYYMM"), "l1 !q_200101! !q_2!", "", "1 2", &doubts);
  EXPECT_THAT(doubts, ElementsAre("i.ins: names without a date as YYYYMM at the end are of no series: \"q_2\""));
}

TEST(ListingSeries, AListingThatIsCutOffIsNotReadAndOneWithoutLinesHasNoStep) {
  const std::string whole = "1 2.5\n3 4.5\n";
  ListingFault fault;
  const auto form = ListingForm::make(bySteps(24), withHead("l1 !a_1! !b_1!\nl1 !a_2! !b_2!"), "", fault);
  ASSERT_TRUE(form) << fault.text;
  for (std::size_t length = 0; length <= whole.size(); ++length) {
    ListingSeries series(form);
    const bool isRead = series.parse("out.lst", whole.substr(0, length));
    const bool isWhole = length >= whole.size() - 3;  // digits may be missing, which the end of the line tells
    EXPECT_EQ(isRead, length == 0 || isWhole) << length;
    EXPECT_EQ(series.timeStepCount(), isWhole ? 2 : 0) << length;
    EXPECT_EQ(series.itemCount(), isRead ? 2 : 0) << length;
    EXPECT_TRUE(!isWhole || series.endsLine() == (length == whole.size()));
    EXPECT_THAT(series.lastError(), isRead ? ::testing::Matcher<std::string>("") : StartsWith("out.lst:"));
  }
}

/// Files that others have written, with the outputs that they read.
TEST(ListingSeriesSamples, AreReadAsSeries) {
  const char* const folder = std::getenv("MIREVO_IMPORT_SAMPLES");
  if (folder == nullptr || *folder == 0) GTEST_SKIP() << "MIREVO_IMPORT_SAMPLES names no folder of samples";
  const std::string samples = std::string(folder) + "/pest/";
  ListingFault fault;
  ListingSettings settings = bySteps(24);
  settings.instructionFile = samples + "secondary_marker/out1.dat.ins";
  auto form = ListingForm::read(settings, fault);
  ASSERT_TRUE(form) << fault.text;
  ListingSeries seepage(form);
  ASSERT_TRUE(seepage.open(samples + "secondary_marker/out1.dat_bak")) << seepage.lastError();
  EXPECT_EQ(seepage.itemCount(), 3);
  EXPECT_EQ(seepage.itemName(3), "obs3");
  EXPECT_THAT(seepage.exactValues(3), ElementsAre(1962323.838381852, 1012443.579448908));

  // 10 cells at 3 times, a line each.
  settings.instructionFile = samples + "xsec10/10par_xsec.hds.ins";
  form = ListingForm::read(settings, fault);
  ASSERT_TRUE(form) << fault.text;
  ListingSeries heads(form);
  ASSERT_TRUE(heads.open(samples + "xsec10/misc/10par_xsec_truth.hds")) << heads.lastError();
  EXPECT_EQ(heads.itemName(1), "h01");
  EXPECT_EQ(heads.timeStepCount(), 10);

  // Their names end in minutes that are no steps.
  settings.instructionFile = samples + "tplins/AOC_obs.txt.ins";
  EXPECT_FALSE(ListingForm::read(settings, fault));
  EXPECT_THAT(fault.text, HasSubstr("expected 1 for the next one of \"SUM_MASS\", found \"SUM_MASS5\""));
}

}  // namespace
}  // namespace mirevo

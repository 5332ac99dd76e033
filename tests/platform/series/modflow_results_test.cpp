#include <cmath>
#include <filesystem>
#include <fstream>
#include <string>
#include <sys/resource.h>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/bytes.h"
#include "platform/series/format_samples.h"
#include "platform/series/modflow_budget.h"
#include "platform/series/modflow_clock.h"
#include "platform/series/modflow_heads.h"
#include "platform/series/shown_values.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

/// A record of one layer with 2 rows and 3 columns; the value of the first cell, others are one more each.
std::string headRecord(double time, int layer, double first, bool isSingle = false, const std::string& text = "HEAD") {
  Bytes record;
  record.ints({1, 1});
  if (isSingle) record.floats({0, static_cast<float>(time)});
  if (!isSingle) record.doubles({0, time});
  record.field(text, 16, ' ').ints({3, 2, layer});
  for (int i = 0; i < 6; ++i) {
    if (isSingle) record.floats({static_cast<float>(first + i)});
    if (!isSingle) record.doubles({first + i});
  }
  return record.content;
}

/// 2 columns, 2 rows, 1 layer.
Bytes budgetRecord(const std::string& text, int method, double time, int columns = 2, int rows = 2) {
  Bytes record;
  record.ints({1, 1}).text(std::string(16 - text.size(), ' ') + text).ints({columns, rows, -1, method});
  record.doubles({1, 1, time});
  return record;
}

Bytes& names(Bytes& record, const std::string& package) {
  return record.field("GWF", 16, ' ').field("GWF", 16, ' ').field("GWF", 16, ' ').field(package, 16, ' ');
}

TEST(ModflowHeads, ReadsACellOfEitherWidth) {
  const TemporaryFolder folder;
  std::string reason;
  for (const bool isSingle : {false, true}) {
    const std::string path =
        folder.write("h.hds", headRecord(1, 1, 10, isSingle) + headRecord(1, 2, 20, isSingle) +
                                  headRecord(2.5, 1, 1e30, isSingle) + headRecord(2.5, 1, 1.5, isSingle, "DRAWDOWN"));
    const auto series = createTimeSeriesObject(path, reason);
    ASSERT_TRUE(series->open(path)) << series->lastError();
    EXPECT_EQ(formatDate(series->startTime().value()), "2000-01-02 00:00");
    EXPECT_THAT(timesOf(*series), ElementsAre(0.0, 1.5));
    ASSERT_EQ(series->itemCount(), 24);
    EXPECT_EQ(series->itemName(6) + " " + series->itemName(7), "head(1,2,3) head(2,1,1)");
    EXPECT_EQ(series->itemName(14), "drawdown(1,1,2)");
    EXPECT_THAT(valuesOf(*series, 5), ElementsAre(14.0F, -999999.0F));
    EXPECT_THAT(valuesOf(*series, 12), ElementsAre(25.0F, -999999.0F));
    EXPECT_THAT(valuesOf(*series, 14), ElementsAre(-999999.0F, 2.5F));
  }
}

TEST(ModflowHeads, TakesUnitAndStartFromTheTimeDiscretization) {
  const TemporaryFolder folder;
  const std::string path = folder.write("output/h.hds", headRecord(3600, 1, 10) + headRecord(7200.0004, 1, 11));
  folder.write("model.tdis", "BEGIN options\n  TIME_UNITS  seconds\n  START_DATE_TIME 2012-03-04T05:00\nEND options\n");
  ModflowHeads series;
  ASSERT_TRUE(series.open(path)) << series.lastError();
  EXPECT_EQ(formatDate(series.startTime().value()), "2012-03-04 06:00");
  EXPECT_THAT(timesOf(series), ElementsAre(0.0, 1.0 / 24));

  const std::string second = folder.write("b.tdis", "");
  EXPECT_FALSE(series.open(path));
  EXPECT_EQ(series.lastError(), path + ": expected one .tdis file in " + folder.path() +
                                    ", which says the unit and the start of its times, found 2");
  std::filesystem::remove(second);
  const std::tuple<const char*, const char*> cases[] = {
      {"\n time_units weeks", "2: expected a unit of time (seconds, minutes, hours, days, years), found \"weeks\""},
      {"START_DATE_TIME 1/2/2012", "1: expected a start like 2001-01-31T12:30:00, found \"1/2/2012\""}};
  for (const auto& [content, error] : cases) {
    folder.write("model.tdis", content);
    EXPECT_FALSE(series.open(path));
    EXPECT_EQ(series.lastError(), path + ": " + (folder / "model.tdis") + ":" + error);
  }
}

TEST(ModflowHeads, RefusesWhatIsNotWholeOrNotItsOwn) {
  const std::string first = headRecord(1, 1, 10);
  const std::string foreign =
      "expected a binary file of heads of MODFLOW, with a text such as HEAD at byte 24 (or 16 "
      "with numbers of 32 bits), found none";
  const std::string second = "record 2, at byte 100: expected ";
  const std::tuple<std::string, std::string> cases[] = {
      {"", foreign},
      {std::string(200, '\0'), foreign},
      {first + first.substr(0, 20), second + "a header of 52 bytes, found 20: the file is cut off"},
      {first + first.substr(0, 99), second + "6 values of 8 bytes, found 47 bytes: the file is cut off"},
      {first + headRecord(0.5, 1, 0), second + "a time not earlier than that of the record before, found 0.5"},
      {first + headRecord(NAN, 1, 0),
       second + "a time from 0 to 8000 years (in days, or in the unit that a .tdis file beside it gives), found nan"},
      {first + headRecord(1, 0, 0), second + "numbers of columns, rows and the layer, found 3, 2 and 0"},
      {first + Bytes::with(first, 40, 2), second + "3 columns and 2 rows as before, found 2 and 2"},
      {first + headRecord(1, 2147483647, 0), second + "at most 2000000000 cells, found a layer No. 2147483647"},
  };
  const TemporaryFolder folder;
  for (const auto& [content, error] : cases) {
    const std::string path = folder.write("s.hds", content);
    ModflowHeads series;
    EXPECT_FALSE(series.open(path));
    EXPECT_EQ(series.lastError(), path + ": " + error);
    EXPECT_EQ(series.timeStepCount(), 0);
  }
}

TEST(ModflowHeads, ReadsOneCellOfAGigabyteWithoutTheOthers) {
  const TemporaryFolder folder;
  const std::string path = folder / "large.hds";
  constexpr std::int32_t kColumns = 1 << 10;
  constexpr std::int32_t kRows = 1 << 7;
  constexpr int kSteps = 1024;
  std::ofstream file(path, std::ios::binary);
  // Only headers and one value of each record are written; the rest of the file has no blocks.
  for (std::int64_t step = 0; step < kSteps; ++step) {
    const std::int64_t begin = step * (52 + std::int64_t{8} * kColumns * kRows);
    Bytes header;
    header.ints({1, 1}).doubles({0, static_cast<double>(step)}).field("HEAD", 16, ' ').ints({kColumns, kRows, 1});
    file.seekp(begin) << header.content;
    file.seekp(begin + 52 + 8 * (3 * kColumns + 4)) << Bytes::of(0.5 * static_cast<double>(step));
  }
  file.close();
  std::filesystem::resize_file(path, kSteps * (52 + std::uint64_t{8} * kColumns * kRows));
  const auto usedKilobytes = [] {
    rusage usage{};
    ::getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
  };
  const auto before = usedKilobytes();
  ModflowHeads series;
  ASSERT_TRUE(series.open(path)) << series.lastError();
  EXPECT_EQ(series.itemCount(), kColumns * kRows);
  EXPECT_EQ(series.itemName(3 * kColumns + 5), "head(1,4,5)");
  const auto values = valuesOf(series, 3 * kColumns + 5);
  EXPECT_EQ(values.size(), kSteps);
  EXPECT_EQ(values.back(), 511.5F);
  EXPECT_LT(usedKilobytes() - before, 64 * 1024);
}

TEST(ModflowBudget, ReadsArraysAndLists) {
  Bytes storage = budgetRecord("STO-SS", 1, 1);
  storage.doubles({1, 2, 3, 4});
  Bytes faces = budgetRecord("FLOW-JA-FACE", 1, 1, 7, 1);
  faces.doubles({0, 0, 0, 0, 0, 0, 0});
  Bytes wells = budgetRecord("WEL", 6, 1);
  names(wells, "WEL-1")
      .ints({2})
      .field("DEPTH", 16, ' ')
      .ints({2, 3, 1})
      .doubles({-5, 7})
      .ints({3, 2})
      .doubles({-1, 8});
  Bytes others = budgetRecord("WEL", 6, 1);
  names(others, "WEL-2").ints({1, 1, 1, 1}).doubles({-9});
  Bytes later = budgetRecord("WEL", 6, 2);
  names(later, "WEL-1").ints({1, 0});
  Bytes recharge = budgetRecord("RECHARGE", 3, 2);
  recharge.ints({1, 1, 2, 1}).doubles({0.1, 0.2, 0.3, 0.4});
  Bytes lakes = budgetRecord("LAK", 2, 2);
  lakes.ints({1, 4}).doubles({6});
  const TemporaryFolder folder;
  std::string reason;
  const std::string path = folder.write("m.cbc", storage.content + faces.content + wells.content + others.content +
                                                     later.content + recharge.content + lakes.content);
  const auto series = createTimeSeriesObject(path, reason);
  ASSERT_TRUE(series->open(path)) << series->lastError();
  EXPECT_THAT(timesOf(*series), ElementsAre(0.0, 1.0));
  const std::tuple<int, const char*, float, float> items[] = {{2, "sto-ss(1,1,2)", 2.0F, -999999.0F},
                                                              {7, "wel wel-1(1,2,1)", -6.0F, 0.0F},
                                                              {13, "wel wel-2(1,1,1)", -9.0F, -999999.0F},
                                                              {17, "recharge(1,1,1)", -999999.0F, 0.1F},
                                                              {24, "lak(1,2,2)", -999999.0F, 6.0F}};
  ASSERT_EQ(series->itemCount(), 24);
  for (const auto& [item, name, first, second] : items) {
    EXPECT_EQ(series->itemName(item), name);
    EXPECT_THAT(valuesOf(*series, item), ElementsAre(first, second)) << name;
  }
  const std::tuple<int, const char*> refused[] = {
      {5, "item No. 5 (wel wel-1(1,1,1)): wel has no entry for this cell at any time"},
      {11,
       "item No. 11 (wel wel-1 depth(1,2,1)): the cell has several entries, whose auxiliary values cannot be added up"},
      {19, "item No. 19 (recharge(1,2,1)): recharge has no entry for this cell at any time"}};
  for (const auto& [item, error] : refused) {
    EXPECT_FALSE(series->getData(item));
    EXPECT_EQ(series->lastError(), path + ": " + error);
  }
}

TEST(ModflowBudget, RefusesWhatIsNotWholeOrNotItsOwn) {
  Bytes storage = budgetRecord("STO-SS", 1, 1);
  const std::string array = storage.doubles({1, 2, 3, 4}).content;
  Bytes wells = budgetRecord("WEL", 6, 1);
  const std::string list = names(wells, "W").ints({1, 1, 3, 1}).doubles({-5}).content;
  const std::string second = "record 2, at byte 96: expected ";
  const std::tuple<std::string, std::string> cases[] = {
      {"", "expected a binary budget of MODFLOW, found an empty file"},
      {"time,Q\n", "record 1, at byte 0: expected a header of 64 bytes, found 7: the file is cut off"},
      {std::string(100, '\0'), "record 1, at byte 0: expected a text such as STORAGE, found none"},
      {Bytes::with(array, 32, 1),
       "record 1, at byte 0: expected the compact form of a budget (in MODFLOW-2005 the option "
       "COMPACT BUDGET), which has times, found the other one"},
      {Bytes::with(array, 36, 7), "record 1, at byte 0: expected a method from 0 to 6, found 7"},
      {array + list.substr(0, 63), second + "a header of 64 bytes, found 63: the file is cut off"},
      {array + list.substr(0, list.size() - 1), second + "152 bytes, found 151: the file is cut off"},
      {array + Bytes::with(list, 132, -1), second + "the length of a list, found -1"},
      {array + Bytes::with(list, 24, 3), second + "2 x 2 x 1 cells as before, found 3 x 2 x 1"},
      {array + array, second + "one record of sto-ss for a time, found another"},
      {array + budgetRecord("STO-SS", 1, 0.5).content + std::string(32, '\0'),
       second + "a time not earlier than that of the record before, found 0.5"},
  };
  const TemporaryFolder folder;
  for (const auto& [content, error] : cases) {
    const std::string path = folder.write("s.cbc", content);
    ModflowBudget series;
    EXPECT_FALSE(series.open(path));
    EXPECT_EQ(series.lastError(), path + ": " + error);
    EXPECT_EQ(series.timeStepCount(), 0);
  }
}

TEST(ModflowResults, OfTheEngineAreRead) {
  MIREVO_REQUIRE_SAMPLE(heads, "modflow6_freyberg.hds");
  MIREVO_REQUIRE_SAMPLE(transient, "modflow6_transient.hds");
  MIREVO_REQUIRE_SAMPLE(budget, "modflow6_freyberg.cbc");
  ModflowHeads head;
  ASSERT_TRUE(head.open(heads)) << head.lastError();
  EXPECT_EQ(head.itemCount(), 800);
  EXPECT_FLOAT_EQ(valuesOf(head, 1).front(), 27.261627F);
  EXPECT_FALSE(head.open(transient));  // its times are seconds, which it does not say
  const TemporaryFolder folder;
  folder.write("t.tdis", "TIME_UNITS SECONDS\n");
  const std::string path = folder.write("t.hds", TemporaryFolder::readFile(transient));
  ASSERT_TRUE(head.open(path)) << head.lastError();
  EXPECT_EQ(head.timeStepCount() * head.itemCount(), 20 * 150);
  EXPECT_EQ(valuesOf(head, 3).front(), -999999.0F);
  ModflowBudget flows;
  ASSERT_TRUE(flows.open(budget)) << flows.lastError();
  ASSERT_EQ(flows.itemCount(), 6 * 800);
  // The whole budget closes.
  double sum = 0.0;
  for (int item = 1; item <= flows.itemCount(); ++item) {
    if (flows.getData(item)) sum += flows.exactValues(item).front();
  }
  EXPECT_NEAR(sum, 0.0, 1e-2);
}

}  // namespace
}  // namespace mirevo

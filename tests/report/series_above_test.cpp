#include "report/series_above.h"

#include <filesystem>

#include <gmock/gmock.h>

#include "common/calendar.h"
#include "measures/series_tables.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

TEST(SeriesAbove, IsRequiredAtTheStartOfARunAndMissedWithANoteInAReport) {
  const TemporaryFolder folder;
  folder.write("flow.csv", "time,Q\n2001-01-01,1\n2001-01-02,2\n");
  folder.write("rain.csv", "time,T,P\n2000-12-31,7,9\n2001-01-01,7,0\n2001-01-01 12:00,7,4\n2001-01-02,7,1\n");
  OutputMeasure plain{.name = "Q", .simulation = {folder / "flow.csv"}, .observation = {folder / "flow.csv"}};
  OutputMeasure with = plain;
  with.shownAbove = {.fileName = folder / "rain.csv",
                     .itemNo = 2,
                     .fileLocation = "setup.kdx:9:1: File_Name: ",
                     .itemLocation = "setup.kdx:10:1: Item_No: "};
  std::vector<OutputMeasure> measures{plain, with};
  const std::vector<std::int64_t> seconds{secondNumber({2001, 1, 1}), secondNumber({2001, 1, 2})};
  const auto start = [&] { SeriesTables::MirevoTSobjectInit(measures, {{2001, 1, 1}, {2001, 1, 2}}); };
  std::string fault;

  EXPECT_EQ(refusalOf(start), "accepted");
  const auto above = seriesAbove(measures, 0, seconds, fault);
  ASSERT_TRUE(above) << fault;
  EXPECT_EQ(above->name, "P");
  EXPECT_THAT(above->series.values, ElementsAre(0, 4, 1));

  measures[1].shownAbove.itemNo = 3;
  EXPECT_THAT(refusalOf(start), HasSubstr("Error: Item No. 3 not found in " + folder / "rain.csv\nsetup.kdx:10:1: "));
  std::filesystem::remove(folder / "rain.csv");
  EXPECT_THAT(refusalOf(start), HasSubstr("Error opening TS object for file: " + folder / "rain.csv\nsetup.kdx:9:1: "));
  EXPECT_FALSE(seriesAbove(measures, 0, seconds, fault));
  EXPECT_THAT(fault, HasSubstr("No series is shown above the hydrograph of Q: Error opening TS object for file"));
  measures[1].shownAbove.fileName.clear();
  fault.clear();
  EXPECT_FALSE(seriesAbove(measures, 0, seconds, fault));
  EXPECT_EQ(fault, "");
}

TEST(SeriesAbove, ALongOneKeepsTheLargestValueOfEachSpan) {
  const TemporaryFolder folder;
  std::string text = "time,P\n";
  for (std::int64_t i = 0; i < 2 * static_cast<std::int64_t>(kMostTimesAbove); ++i) {
    text += isoTime(secondNumber({2001, 1, 1}) + 60 * i) + (i == 4321 ? ",99\n" : i % 2 == 0 ? ",1\n" : ",\n");
  }
  folder.write("rain.csv", text);
  const std::vector<OutputMeasure> measures{{.name = "Q", .shownAbove = {folder / "rain.csv"}}};
  const std::vector<std::int64_t> seconds{secondNumber({2001, 1, 1}), secondNumber({2002, 1, 1})};
  std::string fault;
  const auto above = seriesAbove(measures, 0, seconds, fault);
  ASSERT_TRUE(above && above->isThinned) << fault;
  EXPECT_EQ(above->series.values.size(), kMostTimesAbove);
  EXPECT_EQ(above->series.values[2160], 99.0F);
  EXPECT_EQ(above->series.seconds[2160], secondNumber({2001, 1, 1}) + 60 * 4321);
  EXPECT_EQ(std::count(above->series.values.begin(), above->series.values.end(), 1.0F), 7999);
}

}  // namespace
}  // namespace mirevo

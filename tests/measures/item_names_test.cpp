#include "measures/item_names.h"

#include <string>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "platform/series/csv_time_series.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

TEST(ItemNames, TellItemsByNameThenWithoutCaseThenWithoutUnit) {
  CsvTimeSeries series;
  ASSERT_TRUE(series.parse("s.csv", "time,Flow [m3/s],flow,Level (m),level (cm),FLOW\n2001-01-01,1,2,3,4,5\n"));
  const std::tuple<const char*, std::vector<std::int32_t>> cases[] = {
      {"flow", {2}},     {"FLOW", {5}},      {"Flow", {2, 5}},     {"flow [M3/S]", {1}},
      {"level", {3, 4}}, {"level (m)", {3}}, {" Level (m) ", {3}}, {"m3/s", {}},
  };
  for (const auto& [written, items] : cases) EXPECT_EQ(itemsCalled(series, written), items) << written;
}

TEST(ItemNames, ReferencesGetTheNumberOrAreRefused) {
  const TemporaryFolder folder;
  folder.write("q.csv", "time,flow,level,flow,sd\n2001-01-01,1,2,3,4\n");
  const std::string file = folder / "q.csv";
  SeriesReference reference{.fileName = file, .itemNo = 1, .itemName = "level", .itemLocation = "s.kdx:1:1: "};
  const std::string unknown = "\nthe file";
  const std::tuple<const char*, int, std::string> cases[] = {
      // name, Item_No (0: none), refusal; empty: found as item 2 or 3
      {"level", 0, ""},
      {"Level", 2, ""},
      {"flow", 3, ""},
      {"levle", 0,
       "Error: Item \"levle\" not found in " + file +
           "|s.kdx:1:1: did you mean \"level\"? the file has 4 items\n1: flow\n2: level\n3: flow\n4: sd"},
      {"flow", 0,
       "Error: Item \"flow\" is ambiguous in " + file +
           "|s.kdx:1:1: 2 items are called so, No. 1, 3: the number beside the name tells which is meant"},
      {"flow", 2,
       "Error: Item No. 2 not found in " + file +
           "|s.kdx:1:1: expected the item called \"flow\", which is No. 1, 3, found the number of \"level\": leave one "
           "of the two keywords out"},
      {"level", 9,
       "Error: Item No. 9 not found in " + file +
           "|s.kdx:1:1: expected the item called \"level\", which is No. 2, found 9 in a file of 4 items: leave one of "
           "the two keywords out"},
  };
  for (const auto& [name, number, refusal] : cases) {
    SCOPED_TRACE(name);
    reference.itemName = name;
    reference.hasItemNo = number != 0;
    reference.itemNo = number != 0 ? number : 1;
    OutputMeasure measure{.name = "m", .simulation = reference, .observation = {.fileName = file, .itemNo = 4}};
    std::string found;
    try {
      const auto numbered = withItemNumbers(std::span(&measure, 1));
      EXPECT_EQ(numbered[0].simulation.itemNo, number == 3 ? 3 : 2);
      EXPECT_TRUE(numbered[0].simulation.hasItemNo);
      EXPECT_EQ(numbered[0].simulation.itemName, name);
    } catch (const FatalError& error) {
      found = error.message() + "|" + error.detail();
    }
    EXPECT_EQ(found, refusal);
  }
  OutputMeasure weighed{.name = "m",
                        .simulation = {.fileName = file, .itemNo = 1},
                        .observation = {.fileName = file, .itemNo = 1, .itemName = "level"},
                        .weighting = {.errorName = "SD"}};
  EXPECT_EQ(withItemNumbers(std::span(&weighed, 1))[0].weighting.errorItem, 4);
  weighed.weighting.errorName = "level";
  EXPECT_THAT([&] { withItemNumbers(std::span(&weighed, 1)); },
              Throws<FatalError>(Property(&FatalError::detail, HasSubstr("expected another item than the observed"))));
}

TEST(ItemNames, OfAnEarlierRunAreLeftWhereTheyAreNotFound) {
  const TemporaryFolder folder;
  folder.write("o.csv", "time,level,sd\n2001-01-01,2,4\n");
  const OutputMeasure measure{
      .name = "m",
      .simulation = {.fileName = folder / "gone.csv", .itemNo = 1, .itemName = "level"},
      .observation = {.fileName = folder / "o.csv", .itemNo = 1, .itemName = "Level"},
      .weighting = {.errorName = "sd", .qualityName = "code", .leftOut = {5}},
  };
  EXPECT_THROW(withItemNumbers(std::span(&measure, 1)), FatalError);
  const OutputMeasure found = withItemNumbers(std::span(&measure, 1), UnknownItems::left).front();
  EXPECT_FALSE(found.simulation.hasItemNo);
  EXPECT_TRUE(found.observation.hasItemNo);
  EXPECT_EQ(found.weighting.errorItem, 2);
  EXPECT_EQ(found.weighting.qualityItem, 0);
}

}  // namespace
}  // namespace mirevo

#include "platform/series/epanet_results.h"

#include <string>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/bytes.h"
#include "platform/series/shown_values.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

constexpr std::int32_t kEpanetMark = 516114521;

/// Junction J and tank T, the pipe P between them, one pump's energy, litres per second; every half hour from 1:00 on.
std::string epanetFile(std::int32_t steps) {
  Bytes file;
  file.ints({kEpanetMark, 20012, 2, 1, 1, 1, 0, 1, 0, 5, 2, 0, 3600, 1800, 7200});
  file.field("title", 3 * 80).field("n.inp", 2 * 260).field("Chlorine", 32).field("ug/L", 32);
  for (const char* name : {"J", "T", "P"}) file.field(name, 32);
  file.ints({1, 2, 1, 2}).floats({0, 10, 20, 500, 300});  // ends, type of the pipe and tank; area, elevations, pipe
  file.ints({1}).floats({0, 0, 0, 0, 0, 0, 0});           // energy of the pump, peak
  for (std::int32_t step = 0; step < steps; ++step) {
    for (int column = 0; column < 16; ++column) file.floats({static_cast<float>(100 * step + column)});
  }
  file.floats({0, 0, 0, 0}).ints({steps, 0, kEpanetMark});
  return file.content;
}

TEST(EpanetResults, ReadsEveryItem) {
  const TemporaryFolder folder;
  std::string reason;
  const std::string path = folder.write("run.out", epanetFile(2));
  const auto series = createTimeSeriesObject(path, reason);
  ASSERT_TRUE(series->open(path)) << series->lastError();
  EXPECT_EQ(formatDate(series->startTime().value()), "2000-01-01 01:00");
  EXPECT_THAT(timesOf(*series), ElementsAre(0.0, DoubleEq(1.0 / 48)));
  ASSERT_EQ(series->itemCount(), 16);
  const std::tuple<int, const char*, const char*, float> items[] = {
      {1, "node J: demand", "L/s", 0.0F},    {3, "node J: pressure", "m", 4.0F},
      {8, "node T: quality", "ug/L", 7.0F},  {9, "link P: flow", "L/s", 8.0F},
      {10, "link P: velocity", "m/s", 9.0F}, {16, "link P: friction factor", "", 15.0F}};
  for (const auto& [item, name, unit, first] : items) {
    EXPECT_EQ(series->itemName(item), name);
    EXPECT_EQ(series->itemUnit(item), unit);
    EXPECT_THAT(valuesOf(*series, item), ElementsAre(first, first + 100)) << name;
  }
}

/// The codes that EPANET 2.3.5 writes for UNITS and PRESSURE of a network.
TEST(EpanetResults, KnowsTheUnitsOfEveryVersion) {
  const std::tuple<std::int32_t, std::int32_t, const char*, const char*, const char*> cases[] = {
      {0, 0, "ft3/s", "ft", "psi"}, {1, 4, "gal/min", "ft", "ft"}, {4, 1, "acre ft/d", "ft", "kPa"},
      {5, 3, "L/s", "m", "bar"},    {9, 1, "m3/d", "m", "kPa"},    {10, 2, "m3/s", "m", "m"},
      {11, 5, "", "m", ""},  // of a version to come
  };
  const TemporaryFolder folder;
  for (const auto& [flowCode, pressureCode, flow, head, pressure] : cases) {
    const std::string path =
        folder.write("u.out", Bytes::with(Bytes::with(epanetFile(1), 36, flowCode), 40, pressureCode));
    EpanetResults series;
    ASSERT_TRUE(series.open(path)) << series.lastError();
    EXPECT_EQ(series.itemUnit(1), flow) << flowCode;
    EXPECT_EQ(series.itemUnit(2), head) << flowCode;
    EXPECT_EQ(series.itemUnit(3), pressure) << pressureCode;
    EXPECT_EQ(series.itemUnit(9), flow) << flowCode;
  }
}

TEST(EpanetResults, RefusesWhatIsNotWholeOrNotItsOwn) {
  const std::string whole = epanetFile(2);
  const std::size_t size = whole.size();
  const std::string closing = ", found none: the file is cut off, or the model has not ended its run";
  const std::tuple<std::string, std::string> cases[] = {
      {"", "expected the results of EPANET 2, found a file that does not begin with their mark"},
      {whole.substr(0, 20), "expected the closing record of EPANET 2 at its end, byte 0" + closing},
      {whole.substr(0, size - 1),
       "expected the closing record of EPANET 2 at its end, byte " + std::to_string(size - 29) + closing},
      {Bytes::with(whole, 8, -1), "expected a number of objects at byte 8, found -1"},
      {Bytes::with(whole, 36, -1), "expected codes of units at byte 36, found -1 and 2"},
      {Bytes::with(whole, 44, 1),
       "it has a statistic of each result in place of a time series: set STATISTIC to NONE in [TIMES]"},
      {Bytes::with(whole, 52, 0), "expected a time later than 2000-01-01 01:00 at step 2, found 2000-01-01 01:00"},
      {Bytes::with(whole, size - 12, 3), "expected " + std::to_string(size + 64) +
                                             " bytes for 3 records of 64 bytes each, found " + std::to_string(size)},
  };
  const TemporaryFolder folder;
  for (const auto& [content, error] : cases) {
    const std::string path = folder.write("s.out", content);
    EpanetResults series;
    EXPECT_FALSE(series.open(path));
    EXPECT_EQ(series.lastError(), path + ": " + error);
    EXPECT_EQ(series.timeStepCount(), 0);
  }
}

}  // namespace
}  // namespace mirevo

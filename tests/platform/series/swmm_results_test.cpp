#include "platform/series/swmm_results.h"

#include <cmath>
#include <string>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/bytes.h"
#include "platform/series/format_samples.h"
#include "platform/series/shown_values.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

constexpr std::int32_t kSwmmMark = 516114522;

/// One subcatchment with its rainfall, nodes J1 and J2 with depth and lead, no link, the system's temperature; metric.
std::string swmmFile(std::int32_t steps, std::int32_t errorCode = 0) {
  Bytes file;
  file.ints({kSwmmMark, 51015, 3, 1, 2, 0, 1});
  for (const std::string name : {"S", "J1", "J2", "lead"})
    file.ints({static_cast<std::int32_t>(name.size())}).text(name);
  file.ints({1});                                            // unit of lead
  file.ints({1, 1}).floats({5});                             // area of S
  file.ints({1, 2}).floats({1, 2});                          // inverts of J1 and J2
  file.ints({0});                                            // no properties of links
  file.ints({1, 0}).ints({2, 0, 6}).ints({0}).ints({1, 0});  // variables of each kind
  file.doubles({36526}).ints({3600});                        // start and step, which the records repeat
  const auto results = static_cast<std::int32_t>(file.content.size());
  for (std::int32_t step = 0; step < steps; ++step) {
    const auto k = static_cast<float>(step);
    // The dates lie up to a millisecond beside the hour.
    file.doubles({36526 + (step + 1) / 24.0 + (step % 2 == 0 ? 1 : -1) * 1e-3 / 86400});
    file.floats({k, 10 + k, 20 + k, 30 + k, 40 + k, 50 + k});
  }
  file.ints({28, 60, results, steps, errorCode, kSwmmMark});
  return file.content;
}

TEST(SwmmResults, ReadsEveryItemAtRoundTimes) {
  const TemporaryFolder folder;
  std::string reason;
  const std::string path = folder.write("run.out", swmmFile(3));
  const auto series = createTimeSeriesObject(path, reason);
  ASSERT_TRUE(series->open(path)) << series->lastError();
  EXPECT_EQ(formatDate(series->startTime().value()), "2000-01-01 01:00");
  EXPECT_THAT(timesOf(*series), ElementsAre(0.0, 1.0 / 24, 2.0 / 24));
  const std::tuple<const char*, const char*, float> items[] = {
      {"subcatchment S: rainfall", "mm/h", 0.0F}, {"node J1: depth", "m", 10.0F},
      {"node J1: lead", "ug/L", 20.0F},           {"node J2: depth", "m", 30.0F},
      {"node J2: lead", "ug/L", 40.0F},           {"system: air temperature", "deg C", 50.0F}};
  ASSERT_EQ(series->itemCount(), 6);
  int item = 0;
  for (const auto& [name, unit, first] : items) {
    ++item;
    EXPECT_EQ(series->itemName(item), name);
    EXPECT_EQ(series->itemUnit(item), unit);
    EXPECT_THAT(valuesOf(*series, item), ElementsAre(first, first + 1, first + 2));
  }
  EXPECT_FALSE(series->getData(7));
  EXPECT_EQ(series->lastError(), path + ": no item 7");
}

TEST(SwmmResults, RefusesWhatIsNotWholeOrNotItsOwn) {
  const std::string whole = swmmFile(2);
  const std::string closing = ": the file is cut off, or the model has not ended its run";
  const std::size_t size = whole.size();
  const std::tuple<std::string, std::string> cases[] = {
      {"", "expected results of SWMM 5 or EPANET 2, found a file that begins with the mark of neither"},
      {"time,Q\n", "expected results of SWMM 5 or EPANET 2, found a file that begins with the mark of neither"},
      {whole.substr(0, 10), "expected the closing record of SWMM 5 at its end, byte 0, found none" + closing},
      {whole.substr(0, size - 1), "expected the closing record of SWMM 5 at its end, byte " +
                                      std::to_string(size - 25) + ", found none" + closing},
      {swmmFile(2, 317), "the model ended with the error code 317, which its report explains"},
      {Bytes::with(whole, 4, 50022), "expected results of SWMM 5.1 or later, found those of version 50022"},
      {Bytes::with(whole, 8, 6), "expected a code of flow units from 0 to 5 at byte 8, found 6"},
      {Bytes::with(whole, 16, -1), "expected a number of objects at byte 16, found -1"},
      {Bytes::with(whole, 28, -5), "expected the length of a name at byte 28, found -5"},
      {Bytes::with(whole, size - 12, 3), "expected " + std::to_string(size + 32) +
                                             " bytes for 3 records of 32 bytes each, found " + std::to_string(size)},
  };
  const TemporaryFolder folder;
  const std::string path = folder / "s.out";
  for (const auto& [content, error] : cases) {
    folder.write("s.out", content);
    SwmmResults series;
    EXPECT_FALSE(series.open(path));
    EXPECT_EQ(series.lastError(), path + ": " + error);
    EXPECT_EQ(series.timeStepCount(), 0);
  }
  SwmmResults none;
  EXPECT_FALSE(none.open(folder / "none.out"));
  EXPECT_EQ(none.lastError(), folder / "none.out" + ": No such file or directory");
}

TEST(SwmmResults, ReadsTheResultsOfTheEngine) {
  MIREVO_REQUIRE_SAMPLE(path, "swmm5_example1.out");
  SwmmResults series;
  ASSERT_TRUE(series.open(path)) << series.lastError();
  EXPECT_EQ(series.timeStepCount(), 36);
  EXPECT_EQ(formatDate(series.startTime().value()), "1998-01-01 01:00");
  for (int step = 0; step < 36; ++step) EXPECT_EQ(series.times()[static_cast<std::size_t>(step)], step / 24.0);
  EXPECT_EQ(series.itemName(1) + ", " + series.itemUnit(1), "subcatchment 1: rainfall, in/h");
  for (int item = 1; item <= series.itemCount(); ++item) {
    for (const float value : valuesOf(series, item)) EXPECT_TRUE(std::isfinite(value)) << series.itemName(item);
  }
}

}  // namespace
}  // namespace mirevo

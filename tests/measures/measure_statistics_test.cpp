#include "measures/measure_statistics.h"

#include <cmath>
#include <functional>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/series/csv_time_series.h"
#include "platform/series/memory_time_series.h"
#include "refusal.h"

namespace mirevo {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::StartsWith;

constexpr float kGap = -99.0F;
const EvaluationPeriod kJanuary{{2001, 1, 1}, {2001, 1, 31}};

OutputMeasure measure(StatisticType statistic = StatisticType::mean) {
  OutputMeasure m;
  m.statisticType = statistic;
  m.simulation = {"/base/sim.csv  ", 1};
  m.observation = {"/base/obs.csv", 1};
  return m;
}

/// A daily series from 2001-01-01 on.
MemoryTimeSeries daily(std::vector<float> values, DateRecord start = {2001, 1, 1}) {
  std::vector<double> times;
  for (std::size_t day = 0; day < values.size(); ++day) times.push_back(static_cast<double>(day));
  return MemoryTimeSeries(start, std::move(times), {std::move(values)}, kGap);
}

TEST(MeasureStatistics, WorkedExampleInSinglePrecision) {
  // Differences 0.1 (above), -0.3 (below), 0: weighted 2 * 0.1 and 0.5 * -0.3, each operation rounded to 32 bits.
  MemoryTimeSeries simulation = daily({1.1F, 1.7F, 3.0F});
  MemoryTimeSeries observation = daily({1.0F, 2.0F, 3.0F});
  const MeasureStatistics s = computeMeasureStatistics(measure(), kJanuary, simulation, observation, 0.5F, 2.0F, true);
  // 1.1f - 1 is 0.10000002384185791 and 1.7f - 2 is -0.2999999523162842; doubled and halved they stay exact.
  const float e1 = 0.20000004768371582F;
  const float e2 = -0.1499999761581421F;
  EXPECT_EQ(s.mean, 0.016666690508524577F);
  EXPECT_FLOAT_EQ(s.mean, (e1 + e2) / 3.0F);
  EXPECT_EQ(s.rootMeanSquare, std::sqrt((e1 * e1 + e2 * e2) / 3.0F));
  EXPECT_EQ(s.standardDeviation, std::sqrt(s.rootMeanSquare * s.rootMeanSquare - s.mean * s.mean));
  EXPECT_EQ(s.peakDifference, 0.0F);
  EXPECT_EQ(s.lowDifference, e1);
  EXPECT_THAT(s.simulatedValues, ElementsAre(1.1F, 1.7F, 3.0F));
}

TEST(MeasureStatistics, AccumulationIsSinglePrecisionOnPurpose) {
  // 2^24 + 1 is 2^24 in 32 bits: the two differences of 1 after the large one are lost.
  MemoryTimeSeries simulation = daily({16777216.0F, 1.0F, 1.0F, 0.0F});
  MemoryTimeSeries observation = daily({0.0F, 0.0F, 0.0F, 0.0F});
  const MeasureStatistics s = computeMeasureStatistics(measure(), kJanuary, simulation, observation, 1.0F, 1.0F, false);
  EXPECT_EQ(s.mean, 4194304.0F);
  EXPECT_EQ(s.rootMeanSquare, 8388608.0F);
}

TEST(MeasureStatistics, EqualDifferencesKeepTheirRoundedVariance) {
  // Ten differences of 0.1: summed in 32 bits they give 1.0000001, their squares 0.1 (rounded up), and v = rms² - mean²
  // is a tiny number that is returned as it is, negative ones included.
  bool negativeSeen = false;
  for (int n = 1; n <= 31; ++n) {
    for (const float d : {0.1F, 0.3F, 0.7F, 1.1F}) {
      MemoryTimeSeries simulation = daily(std::vector<float>(static_cast<std::size_t>(n), d));
      MemoryTimeSeries observation = daily(std::vector<float>(static_cast<std::size_t>(n), 0.0F));
      const MeasureStatistics s =
          computeMeasureStatistics(measure(), kJanuary, simulation, observation, 1.0F, 1.0F, false);
      const float v = s.rootMeanSquare * s.rootMeanSquare - s.mean * s.mean;
      EXPECT_EQ(s.standardDeviation, v > 0.0F ? std::sqrt(v) : v) << n << " times " << d;
      negativeSeen = negativeSeen || s.standardDeviation < 0.0F;
    }
  }
  EXPECT_TRUE(negativeSeen);
}

TEST(MeasureStatistics, UsesTheObservationsThatCount) {
  const float nan = std::nanf("");
  struct Case {
    const char* name;
    std::vector<float> simulated, observed;
    DateRecord simulationStart;
    EvaluationPeriod period;
    std::vector<float> used;
  };
  const Case cases[] = {
      {"both ends of the period",
       {1, 2, 3, 4, 5},
       {0, 0, 0, 0, 0},
       {2001, 1, 1},
       {{2001, 1, 2}, {2001, 1, 4}},
       {2, 3, 4}},
      {"a period that ends at 24:00", {1, 2, 3}, {0, 0, 0}, {2001, 1, 1}, {{2001, 1, 1}, {2001, 1, 1, 24, 0}}, {1, 2}},
      {"missing observations", {1, 2, 3}, {kGap, nan, 0}, {2001, 1, 1}, kJanuary, {3}},
      {"missing simulated values", {1, kGap, 3}, {0, 0, 0}, {2001, 1, 1}, kJanuary, {1, 3}},
      {"a simulation that starts later", {5, 6}, {0, 0, 0, 0}, {2001, 1, 2}, kJanuary, {5, 6}},
      {"a simulation that starts in between", {5, 7}, {0, 0, 0}, {2000, 12, 31, 12, 0}, kJanuary, {6}},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    MemoryTimeSeries simulation = daily(c.simulated, c.simulationStart);
    MemoryTimeSeries observation = daily(c.observed);
    const MeasureStatistics s =
        computeMeasureStatistics(measure(), c.period, simulation, observation, 1.0F, 1.0F, false);
    EXPECT_EQ(s.simulatedValues, c.used);
    EXPECT_EQ(s.peakDifference, 0.0F);
  }
}

TEST(MeasureStatistics, WeightsBySideAndSelectsByType) {
  MemoryTimeSeries simulation = daily({3, 1, 5, 2});
  MemoryTimeSeries observation = daily({2, 2, 2, 2});
  OutputMeasure m = measure();
  m.weightAbove = 0.0;  // of the differences 1, -1, 3, 0 only -1 is left, but all four count
  const std::pair<StatisticType, double> expected[] = {
      {StatisticType::mean, -0.25},
      {StatisticType::rootMeanSquare, 0.5},
      {StatisticType::standardDeviation, std::sqrt(0.25F - 0.0625F)},
      {StatisticType::peakDifference, 0.0},
      {StatisticType::lowDifference, -1.0},
  };
  for (const auto& [statistic, value] : expected) {
    m.statisticType = statistic;
    EXPECT_EQ(measureValue(m, kJanuary, simulation, observation), value) << static_cast<int>(statistic);
  }
  MemoryTimeSeries perfect = daily({2, 2, 2, 2});
  for (const auto& [statistic, value] : expected) {
    m.statisticType = statistic;
    EXPECT_EQ(measureValue(m, kJanuary, perfect, observation), 0.0);
  }
}

TEST(MeasureStatistics, PeaksAreThoseWithinTheSimulatedTimeSpan) {
  MemoryTimeSeries observation = daily({90, 1, 7, kGap, 4, -90});
  MemoryTimeSeries simulation = daily({2, 9, 3, 5}, {2001, 1, 2});
  const MeasureStatistics s = computeMeasureStatistics(measure(), kJanuary, simulation, observation, 1.0F, 10.0F, true);
  EXPECT_EQ(s.peakDifference, 20.0F);  // 9 over 7
  EXPECT_EQ(s.lowDifference, 10.0F);   // 2 over 1
}

TEST(MeasureStatistics, AxesThatStartAtDifferentTimesMeetWithoutRounding) {
  // Observations daily at 06:00 from 1980-10-01, a simulation hourly from 1981-01-01 01:00, over 30 years; every second
  // simulated value is missing, so that a time missed by a rounding error finds no value to interpolate.
  constexpr int kDays = 30 * 365;
  std::vector<double> hours;
  std::vector<float> simulated;
  for (int hour = 0; hour < kDays * 24; ++hour) {
    hours.push_back(static_cast<double>(hour * 3600) / 86400.0);
    simulated.push_back(hour % 2 == 1 ? static_cast<float>(hour) : kGap);
  }
  MemoryTimeSeries simulation({1981, 1, 1, 1, 0}, std::move(hours), {std::move(simulated)}, kGap);
  std::vector<double> days;
  for (int day = 0; day < 92 + kDays; ++day) days.push_back(day);
  MemoryTimeSeries observation({1980, 10, 1, 6, 0}, std::move(days),
                               {std::vector<float>(static_cast<std::size_t>(92 + kDays), 0.0F)}, kGap);
  const EvaluationPeriod all{{1980, 1, 1}, {2020, 1, 1}};
  const MeasureStatistics s = computeMeasureStatistics(measure(), all, simulation, observation, 1.0F, 1.0F, false);
  ASSERT_EQ(s.simulatedValues.size(), static_cast<std::size_t>(kDays));
  for (int day = 0; day < kDays; ++day) {
    ASSERT_EQ(s.simulatedValues[static_cast<std::size_t>(day)], static_cast<float>(day * 24 + 5)) << day;
  }
}

TEST(MeasureStatistics, FailuresHaveTheirFixedTextsAndSayMore) {
  struct Case {
    const char* message;
    const char* detail;
    std::function<void()> call;
  };
  const auto run = [](int simulationItem, int observationItem, std::vector<float> simulated, EvaluationPeriod period) {
    return [=] {
      MemoryTimeSeries simulation = daily(simulated);
      MemoryTimeSeries observation = daily({1, 2, 3});
      OutputMeasure m = measure();
      m.simulation.itemNo = simulationItem;
      m.observation.itemNo = observationItem;
      computeMeasureStatistics(m, period, simulation, observation, 1.0F, 1.0F, true);
    };
  };
  const Case cases[] = {
      {"Error: Item No. 2 not found in /base/sim.csv", "the file has 1 item\n1: item 1", run(2, 1, {1}, kJanuary)},
      {"Error: Item No. 0 not found in /base/obs.csv", "the file has 1 item", run(1, 0, {1}, kJanuary)},
      {"Error getting time properties of TS object of file /base/sim.csv", "no time step", run(1, 1, {}, kJanuary)},
      {"Error: No simulated data found at observation times for item No. 1 in /base/sim.csv",
       "the evaluation period is 2002-01-01 00:00 to 2002-01-02 00:00\n"
       "/base/sim.csv begins 2001-01-01 00:00 and has 2 time steps over 1 days",
       run(1, 1, {1, 2}, {{2002, 1, 1}, {2002, 1, 2}})},
      {"Error: No simulated data found at observation times for item No. 1 in /base/sim.csv", "",
       run(1, 1, {kGap, kGap}, kJanuary)},
  };
  for (const Case& c : cases) {
    EXPECT_THAT(refusalOf(c.call), AllOf(StartsWith(c.message + std::string("\n")), HasSubstr(c.detail)));
  }
}

TEST(MeasureStatistics, APeriodWithoutASimulatedStepHasNoPeak) {
  // A simulated value is found between the steps at day 0 and day 10, but no step lies within days 4 to 6.
  MemoryTimeSeries simulation({2001, 1, 1}, {0.0, 10.0}, {{1.0F, 2.0F}});
  MemoryTimeSeries observation = daily({1, 1, 1, 1, 1, 1, 1, 1});
  const EvaluationPeriod period{{2001, 1, 5}, {2001, 1, 7}};
  EXPECT_NO_THROW(measureValue(measure(), period, simulation, observation));
  EXPECT_EQ(
      refusalMessageOf([&] { measureValue(measure(StatisticType::lowDifference), period, simulation, observation); }),
      "Error extracting max value of TS item in /base/sim.csv");
}

TEST(MeasureStatistics, ATextColumnIsRefusedWithItsPlace) {
  CsvTimeSeries simulation;
  ASSERT_TRUE(simulation.parse("sim.csv", "time,Q\n2001-01-01,A:e\n"));
  MemoryTimeSeries observation = daily({1});
  EXPECT_THAT(refusalOf([&] { measureValue(measure(), kJanuary, simulation, observation); }),
              AllOf(StartsWith("Error getting data of TS item in /base/sim.csv\n"),
                    HasSubstr("sim.csv:2:12: expected a number")));
}

TEST(MeasureFile, FreeFormat) {
  std::string reason;
  const auto numbers = parseMeasureFile("m.txt", "# measures\r\n1.5, -2 ;\t3D2\r\n\n.25# the last\n,,7", reason);
  ASSERT_TRUE(numbers.has_value()) << reason;
  EXPECT_THAT(*numbers, ElementsAre(1.5, -2.0, 300.0, 0.25, 7.0));
  EXPECT_THAT(parseMeasureFile("m.txt", "", reason).value(), IsEmpty());
  EXPECT_FALSE(parseMeasureFile("m.txt", "1 2\n3, NaN\n", reason).has_value());
  EXPECT_EQ(reason, "m.txt:2:4: expected a number, found \"NaN\"");
  EXPECT_FALSE(readMeasureFile("no_such_folder/m.txt", reason).has_value());
  EXPECT_EQ(reason, "no_such_folder/m.txt: No such file or directory");
}

}  // namespace
}  // namespace mirevo

#include "measures/measure_statistics.h"

#include <array>
#include <bit>
#include <cmath>
#include <cstdint>
#include <functional>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/reading_watch.h"
#include "matchers.h"
#include "measures/observed_series.h"
#include "platform/series/csv_time_series.h"
#include "platform/series/memory_time_series.h"
#include "refusal.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

constexpr float kGap = -99.0F;
const EvaluationPeriod kJanuary{{2001, 1, 1}, {2001, 1, 31}};

OutputMeasure measure(StatisticType statistic = StatisticType::mean) {
  return {.statisticType = statistic, .simulation = {"/base/sim.csv  ", 1}, .observation = {"/base/obs.csv", 1}};
}

/// A daily series from 2001-01-01 on.
MemoryTimeSeries daily(std::vector<float> values, DateRecord start = {2001, 1, 1}) {
  std::vector<double> times;
  for (std::size_t day = 0; day < values.size(); ++day) times.push_back(static_cast<double>(day));
  return MemoryTimeSeries(start, std::move(times), {std::move(values)}, kGap);
}

using Figures = std::array<float, 5>;  // in the order of their codes

/// Of daily series, the simulated one from that day of January on.
void expectBits(const char* name, std::vector<float> simulated, std::vector<float> observed, double weight,
                double weightAbove, Figures expected, int firstSimulatedDay = 1) {
  MemoryTimeSeries simulation = daily(std::move(simulated), {2001, 1, firstSimulatedDay});
  MemoryTimeSeries observation = daily(std::move(observed));
  OutputMeasure m = measure();
  m.weight = weight;
  m.weightAbove = weightAbove;
  for (std::size_t code = 0; code < expected.size(); ++code) {
    m.statisticType = static_cast<StatisticType>(code);
    const auto value = static_cast<float>(measureValue(m, kJanuary, simulation, observation));
    EXPECT_EQ(std::bit_cast<std::uint32_t>(value), std::bit_cast<std::uint32_t>(expected[code]))
        << name << ", statistic " << code << ": " << value << ", expected " << expected[code];
  }
}

// The figures were computed apart from the program, every operation rounded to 32 bits, the differences added in order.
TEST(MeasureStatistics, AreTheSameBitsAsEver) {
  expectBits("differences on both sides", {1.1F, 1.7F, 3}, {1, 2, 3}, 0.5, 2,
             {0.0166666899F, 0.14433758F, 0.143372104F, 0, 0.200000048F});
  expectBits("weights that 32 bits round", {1.1F, 1.7F, 3, 9.3F}, {1, 2, 3.3F, 9.3F}, 0.1, 0.3,
             {-0.00749999564F, 0.0259807631F, 0.0248746891F, 0, 0.0300000086F});
  expectBits("only what is too low", {3, 1, 5, 2}, {2, 2, 2, 2}, 1, 0, {-0.25F, 0.5F, 0.433012694F, 0, -1});
  expectBits("no weight below", {1, 1.5F}, {2, 2}, 0, 1, {0, 0, 0, -0.0F, -0.0F});
  expectBits("one pair", {0.7F}, {0.1F}, 1, 1, {0.599999964F, 0.599999964F, 0, 0.599999964F, 0.599999964F});
  expectBits("zeros", {0, 0, 0}, {0, 0, 0}, 1, 1, {0, 0, 0, 0, 0});
  expectBits("the large value first", {16777216, 1, 1, 0}, {0, 0, 0, 0}, 1, 1,
             {4194304, 8388608, 7264747.5F, 16777216, 0});
  expectBits("the large value last", {1, 1, 0, 16777216}, {0, 0, 0, 0}, 1, 1,
             {4194304.5F, 8388608, 7264747.5F, 16777216, 0});
  expectBits("differences that cancel", {100000000, -100000000, 0.1F, 0.2F}, {0, 0, 0, 0}, 1, 1,
             {0.075000003F, 70710680, 70710680, 100000000, -100000000});
  expectBits("equal differences, variance below 0", {1.3F, 1.3F, 1.3F, 1.3F, 1.3F, 1.3F}, {0, 0, 0, 0, 0, 0}, 1, 1,
             {1.30000007F, 1.29999983F, -5.96046448e-07F, 1.29999995F, 1.29999995F});
  expectBits("equal differences, variance above 0", {2.3F, 2.3F, 2.3F, 2.3F, 2.3F, 2.3F}, {0, 0, 0, 0, 0, 0}, 1, 1,
             {2.29999995F, 2.30000019F, 0.0009765625F, 2.29999995F, 2.29999995F});
  expectBits("gaps", {1.3F, kGap, 2.2F, 9.1F, kGap, 0.4F}, {1.1F, 8, kGap, 7.7F, -3, 0.9F}, 1.5, 0.7,
             {0.123333476F, 0.717054307F, 0.706368029F, 0.770000279F, 2.38000011F});
  expectBits("simulated from the second day on", {2, 9, 3, 5}, {90, 1, 7, kGap, 4, -90}, 1, 10,
             {13.333333F, 14.1421356F, 4.714046F, 20, 10}, 2);
}

// 32 bits know neither 1e9 + 1 nor the sum of 1e8 and 1.
TEST(MeasureStatistics, Exact) {
  const TemporaryFolder folder;
  folder.write("sim.csv", "time,y\n2001-01-01,1000000001\n2001-01-02,3\n2001-01-03,\n");
  folder.write("obs.csv", "time,y\n2001-01-01,1000000000\n2001-01-02,2.5\n2001-01-03,7\n");
  CsvTimeSeries simulation;
  CsvTimeSeries observation;
  ASSERT_TRUE(simulation.open(folder / "sim.csv"));
  ASSERT_TRUE(observation.open(folder / "obs.csv"));
  const double expected[] = {0.75, std::sqrt(0.625), 0.25, 1, 0.5};
  for (std::size_t code = 0; code < 5; ++code) {
    OutputMeasure m = measure(static_cast<StatisticType>(code));
    EXPECT_NEAR(measureValue(m, kJanuary, simulation, observation, SeriesPrecision::exact), expected[code], 1e-14);
    m.weightAbove = 0.1;
    EXPECT_NEAR(measureValue(m, kJanuary, simulation, observation, SeriesPrecision::exact), 0.1 * expected[code],
                1e-15);
  }
}

TEST(MeasureStatistics, UsesTheObservationsThatCount) {
  const DateRecord first{2001, 1, 1};
  const DateRecord noon{2000, 12, 31, 12};
  const EvaluationPeriod middle{{2001, 1, 2}, {2001, 1, 4}};
  const EvaluationPeriod firstDay{first, {2001, 1, 1, 24, 0}};
  using Values = std::vector<float>;
  // The simulated values from their start on and the observed ones, the period, the simulated values that count, and
  // their times in days since the simulation's start.
  const std::tuple<const char*, Values, DateRecord, Values, EvaluationPeriod, Values, std::vector<double>> cases[] = {
      {"both ends of the period", {1, 2, 3, 4, 5}, first, {0, 0, 0, 0, 0}, middle, {2, 3, 4}, {1, 2, 3}},
      {"a period that ends at 24:00", {1, 2, 3}, first, {0, 0, 0}, firstDay, {1, 2}, {0, 1}},
      {"missing observations", {1, 2, 3}, first, {kGap, NAN, 0}, kJanuary, {3}, {2}},
      {"missing simulated values", {1, kGap, 3}, first, {0, 0, 0}, kJanuary, {1, 3}, {0, 2}},
      {"steps as far apart as may be", {5, 7}, noon, {0, 0, 0}, {first, {2001, 1, 31}, 24.0}, {6}, {0.5}},
      {"steps too far apart",
       {5, 7, 9},
       {2001, 1, 2},
       {1, 1, 1, 1},
       {first, {2001, 1, 31}, 23.9},
       {5, 7, 9},
       {0, 1, 2}},
      {"a simulation that starts later", {5, 6}, {2001, 1, 2}, {0, 0, 0, 0}, kJanuary, {5, 6}, {0, 1}},
      {"a simulation that starts in between", {5, 7}, noon, {0, 0, 0}, kJanuary, {6}, {0.5}}};
  for (const auto& [name, simulated, start, observed, period, used, times] : cases) {
    SCOPED_TRACE(name);
    MemoryTimeSeries simulation = daily(simulated, start);
    MemoryTimeSeries observation = daily(observed);
    const MeasureStatistics s = computeMeasureStatistics(measure(), period, simulation, observation, 1.0F, 1.0F, false);
    EXPECT_THAT(s.simulatedValues, ::testing::ElementsAreArray(used));
    EXPECT_EQ(s.times, times);
    EXPECT_EQ(s.peakDifference, 0.0F);
  }
  MemoryTimeSeries simulation = daily({5, 7}, noon);
  MemoryTimeSeries observation = daily({0, 0});
  EXPECT_FALSE(hasPairs(measure(), {first, {2001, 1, 31}, 23.9}, simulation, observation)) << "steps too far apart";
  std::vector<double> values;
  const ObservedSeries observed = readObservedSeries(0, measure(), kJanuary, SeriesPrecision::exact, observation);
  appendSimulatedValues(observed, measure(), SeriesPrecision::exact, 24.0 / 24, simulation, values);
  appendSimulatedValues(observed, measure(), SeriesPrecision::exact, 23.9 / 24, simulation, values);
  EXPECT_EQ(values.at(0), 6.0);
  EXPECT_TRUE(std::isnan(values.at(4)));
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
  const std::tuple<const char*, const char*, std::function<void()>> cases[] = {
      {"Error: Item No. 2 not found in /base/sim.csv", "the file has 1 item\n1: item 1", run(2, 1, {1}, kJanuary)},
      {"Error: Item No. 0 not found in /base/obs.csv", "the file has 1 item", run(1, 0, {1}, kJanuary)},
      {"Error getting time properties of TS object of file /base/sim.csv", "no time step", run(1, 1, {}, kJanuary)},
      {"Error: No simulated data found at observation times for item No. 1 in /base/sim.csv",
       "\nthere is nothing to compare with: item No. 1 (item 1) of the observed /base/obs.csv has no value in the "
       "evaluation period\nthe evaluation period is 2002-01-01 00:00 to 2002-01-02 00:00\n"
       "/base/sim.csv begins 2001-01-01 00:00 and has 2 time steps over 1 days",
       run(1, 1, {1, 2}, {{2002, 1, 1}, {2002, 1, 2}})},
      {"Error: No simulated data found at observation times for item No. 1 in /base/sim.csv", "",
       run(1, 1, {kGap, kGap}, kJanuary)},
  };
  for (const auto& [message, detail, call] : cases) {
    EXPECT_THAT(refusalOf(call), AllOf(StartsWith(message + std::string("\n")), HasSubstr(detail)));
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
  const auto file =
      parseMeasureFile("m.txt", "\xEF\xBB\xBF# measures\r\n1.5, -2 ;\t3D2\r\n\n.25# the last\n,,7", 1, reason);
  ASSERT_TRUE(file.has_value()) << reason;
  EXPECT_THAT(file->numbers, ElementsAre(1.5, -2.0, 300.0, 0.25, 7.0));
  EXPECT_THAT(parseMeasureFile("m.txt", "", 1, reason).value().numbers, IsEmpty());
  EXPECT_FALSE(parseMeasureFile("m.txt", "1 2\n3, NaN\n", 1, reason).has_value());
  EXPECT_EQ(reason, "m.txt:2:4: expected a number, found \"NaN\"");
  EXPECT_FALSE(parseMeasureFile("m.txt", "\xFF\xFE", 1, reason).has_value());
  EXPECT_THAT(reason, HasSubstr("; the file is UTF-16 text; save it as UTF-8"));
  ReadingWatch watch;
  EXPECT_FALSE(readMeasureFile("no_such_folder/m.txt", 1, reason, watch).has_value());
  EXPECT_EQ(reason, "no_such_folder/m.txt: No such file or directory");
}

TEST(MeasureFile, ACommaThatMayBeADecimalOneIsRefused) {
  // content, numbers that are needed, numbers read; none: refused
  const std::tuple<const char*, std::size_t, std::size_t> cases[] = {
      {"0,153", 1, 0},  {"# a,b\n7;-0,2D1,\n", 2, 0},
      {"0,153", 2, 2},  {"0, 153", 1, 2},
      {"1,2,3", 1, 3},  {"0,5 1.5", 1, 3},
      {"2,3\n4", 2, 0}, {"1,-2", 1, 2},
      {"1,,2", 1, 2},
  };
  for (const auto& [content, needed, count] : cases) {
    std::string reason;
    const auto file = parseMeasureFile("m.txt", content, needed, reason);
    EXPECT_EQ(file ? file->numbers.size() : 0, count) << content << reason;
  }
  std::string reason;
  parseMeasureFile("m.txt", "7 8\n 0,153", 1, reason);
  EXPECT_EQ(reason,
            "m.txt:2:2: \"0,153\" may be one number with a decimal comma or two: a decimal point, or a blank behind a "
            "comma that separates, tells");
}

}  // namespace
}  // namespace mirevo

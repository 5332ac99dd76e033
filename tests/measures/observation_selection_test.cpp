#include "measures/observation_selection.h"

#include <cmath>
#include <functional>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "measures/measure_statistics.h"
#include "measures/period_series.h"
#include "measures/statistics.h"
#include "platform/series/csv_time_series.h"
#include "platform/series/memory_time_series.h"

namespace mirevo {
namespace {

using Numbers = std::vector<double>;

OutputMeasure ofFiles(const char* statistic = "mean") {
  return {.statisticType = findStatistic(statistic).value(), .simulation = {"s", 1}, .observation = {"o", 1}};
}

TEST(ObservationSelection, TheSameObservationsCountEverywhere) {
  // Monthly values; the simulated ones are 10 more, and 90 in those of the observations that each case leaves out.
  const std::vector<std::string> dates{"2000-11-20", "2000-12-20", "2001-01-20", "2001-02-20", "2001-03-20"};
  const std::vector<std::string> values{"0.1", "4", "0.3", "2", "8"};
  const EvaluationPeriod whole{{2000, 11, 20}, {2001, 3, 20}};
  EvaluationPeriod late = whole;
  late.warmUpDays = 30;
  using Change = std::function<void(ObservationSelection&)>;
  const std::tuple<EvaluationPeriod, Change, Numbers> cases[] = {
      // the days that count
      {whole, [](auto&) {}, {0, 30, 61, 92, 120}},
      {late, [](auto&) {}, {30, 61, 92, 120}},
      {late,
       [](auto& s) {
         s.end = DateRecord{2001, 1, 20};
       },
       {30, 61}},
      {late,
       [](auto& s) {
         s.start = DateRecord{2001, 2, 20};
       },
       {92, 120}},
      {whole,
       [](auto& s) {
         s.months = {3, 12, 1};
       },
       {30, 61, 120}},
      {whole, [](auto& s) { s.lowestObserved = 0.3; }, {30, 61, 92, 120}},
      {whole, [](auto& s) { s.highestObserved = 0.1; }, {0}},
  };
  for (const auto& [period, change, days] : cases) {
    OutputMeasure measure = ofFiles();
    change(measure.selection);
    std::string observed = "time,y\n";
    std::string simulated = "time,y\n";
    double sum = 0.0;
    for (std::size_t i = 0; i < dates.size(); ++i) {
      const double day = std::array{0.0, 30.0, 61.0, 92.0, 120.0}.at(i);
      const bool counts = std::ranges::find(days, day) != days.end();
      observed += dates[i] + "," + values[i] + "\n";
      simulated += dates[i] + "," + (counts ? std::to_string(std::stod(values[i]) + 10.0) : "90") + "\n";
      sum += counts ? 10.0 : 0.0;
    }
    SCOPED_TRACE(describeSelection(measure.selection) + simulated);
    CsvTimeSeries simulation;
    CsvTimeSeries observation;
    ASSERT_TRUE(simulation.parse("s", simulated) && observation.parse("o", observed));
    const double mean = sum / static_cast<double>(days.size());
    EXPECT_NEAR(measureValue(measure, period, simulation, observation), mean, 1e-5);
    EXPECT_NEAR(measureValue(measure, period, simulation, observation, SeriesPrecision::exact), mean, 1e-12);
    EXPECT_EQ(readObservedSeries(0, measure, period, SeriesPrecision::exact, observation).days, days);
    PeriodSeries shown = readPeriodSeries(observation, measure.observation, period);
    keepCounted(shown, measure, period);
    EXPECT_EQ(std::ranges::count_if(shown.values, [](float v) { return !std::isnan(v); }), std::ssize(days));
    if (!measure.selection.leavesHoles()) {  // a period of the measure's own, and a warm-up, are of this period alone
      shown = readPeriodSeries(observation, measure.observation, period);
      keepCounted(shown, measure, period, std::array{whole});
      EXPECT_TRUE(std::ranges::none_of(shown.values, [](float v) { return std::isnan(v); }));
      continue;
    }
    for (const auto type : {StatisticType::peakDifference, StatisticType::lowDifference}) {
      measure.statisticType = type;
      EXPECT_NEAR(measureValue(measure, period, simulation, observation), 10, 1e-5) << "not those of the files";
    }
  }
}

TEST(ObservationSelection, AVolumeEndsWhereObservationsDoNotCount) {
  // Days 0, 1 and 3 are compared, then days 4 and 5: 8 is left out, and so is the missing one, which breaks nothing.
  MemoryTimeSeries observation({2001, 1, 1}, {0, 1, 2, 3, 3.5, 4, 5}, {{1, 1, -99, 1, 8, 2, 2}}, -99.0F);
  MemoryTimeSeries simulation({2001, 1, 1}, {0, 1, 2, 3, 3.5, 4, 5}, {{2, 2, 2, 2, 2, 2, 2}});
  OutputMeasure measure = ofFiles("volume error");
  measure.selection.highestObserved = 2;
  EXPECT_NEAR(measureValue(measure, {{2001, 1, 1}, {2001, 1, 31}}, simulation, observation), 60.0, 1e-12);
  // Without observations in the months between, too.
  MemoryTimeSeries seasons({2001, 1, 30}, {0, 1, 366, 368}, {{1, 1, 4, 4}});
  MemoryTimeSeries model({2001, 1, 30}, {0, 1, 366, 368}, {{3, 3, 4, 4}});
  measure.selection = {.months = {1, 2}};
  EXPECT_NEAR(measureValue(measure, {{2001, 1, 1}, {2002, 12, 31}}, model, seasons), 100.0 * 2 / 9, 1e-5);
}

TEST(TimeMatch, FindsTheSimulatedValueOfADay) {
  // Hourly from 2001-01-01 10:00 on to the end of the 6th: the value is the hour of January.
  std::vector<double> times;
  std::vector<float> hours;
  for (int hour = 10; hour < 6 * 24; ++hour) {
    if (hour == 75) continue;  // no step on the 4th at 03:00
    times.push_back((hour - 10) / 24.0);
    hours.push_back(hour == 97 ? -99.0F : static_cast<float>(hour));  // missing on the 5th at 01:00
  }
  MemoryTimeSeries simulation({2001, 1, 1, 10}, times, {hours}, -99.0F);
  // The last on the 7th; taken at noon, but for the third.
  MemoryTimeSeries observation({2001, 1, 1, 12}, {0, 1, 2.25, 3, 4, 5, 6}, {{0, 0, 0, 0, 0, 0, 0}});
  const EvaluationPeriod january{{2001, 1, 1}, {2001, 1, 31}};
  using enum TimeMatch;
  const double none = std::nan("");
  const std::tuple<TimeMatching, Numbers> cases[] = {
      {{}, {12, 36, 66, 84, 108, 132, none}},
      {{exact}, {12, 36, 66, 84, 108, 132, none}},
      {{interpolate, -9.5}, {none, 26.5, 56.5, 74.5, 98.5, 122.5, none}},
      {{exact, -9.5}, {none, none, none, none, none, none, none}},
      {{exact, 12}, {24, 48, 78, 96, 120, none, none}},
      {{mean}, {none, 35.5, 59.5, none, none, 131.5, none}},
      {{mean, 1.0}, {none, 36.5, 60.5, none, none, none, none}},
      {{mean, 0.0, 10.0}, {21.5, 45.5, none, none, 117.5, none, none}},
      {{mean, 0.0, 0.0, DayStamp::end}, {none, none, 35.5, 59.5, none, none, 131.5}},
      {{mean, -1.0, 24.0, DayStamp::end}, {none, 34.5, 58.5, none, none, 130.5, none}},
  };
  for (const auto& [matching, expected] : cases) {
    SCOPED_TRACE(describeMatching(matching));
    OutputMeasure measure = ofFiles();
    measure.timeMatch = matching;
    const ObservedSeries observed = readObservedSeries(0, measure, january, SeriesPrecision::exact, observation);
    Numbers values;
    appendSimulatedValues(observed, measure, SeriesPrecision::exact, kAnyGap, simulation, values);
    Numbers found;
    for (std::size_t i = 0; i < expected.size(); ++i) {
      EXPECT_THAT(values[i], ::testing::NanSensitiveDoubleNear(expected[i], 1e-5)) << i;
      if (!std::isnan(expected[i])) found.push_back(expected[i]);
    }
    ASSERT_EQ(hasPairs(measure, january, simulation, observation), !found.empty());
    if (found.empty()) continue;
    EXPECT_EQ(computeMeasureStatistics(measure, january, simulation, observation).simulatedValues, found);
    // What is shown has the same values at the times of the observations.
    const PeriodSeries observations = readPeriodSeries(observation, measure.observation, january);
    const std::vector<float> shown =
        valuesAt(readMatchedSeries(simulation, observation, measure, january), observations.seconds);
    for (std::size_t i = 0; i < expected.size(); ++i) {
      EXPECT_THAT(shown.at(i), NanSensitiveFloatEq(static_cast<float>(expected[i]))) << i;
    }
  }
}

}  // namespace
}  // namespace mirevo

#include "measures/period_series.h"

#include <cmath>
#include <utility>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"
#include "platform/series/memory_time_series.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

TEST(PeriodSeries, HasTheStepsOfThePeriodAndOneOnEitherSide) {
  const std::int64_t day = secondNumber({2001, 1, 1});
  MemoryTimeSeries series({2001, 1, 1}, {0, 1, 2, 3, 4, 5}, {{9, 9, 9, 9, 9, 9}, {10, 11, 12, -99, 14, 15}}, -99.0F);
  const std::pair<EvaluationPeriod, std::vector<std::int64_t>> cases[] = {
      {{{2001, 1, 2, 12}, {2001, 1, 4, 12}}, {1, 2, 3, 4}},
      {{{2001, 1, 2}, {2001, 1, 3}}, {1, 2}},
      {{{1999, 1, 1}, {2000, 1, 1}}, {0}},
      {{{2002, 1, 1}, {2003, 1, 1}}, {5}},
      {{{1999, 1, 1}, {2003, 1, 1}}, {0, 1, 2, 3, 4, 5}}};
  for (const auto& [period, days] : cases) {
    const PeriodSeries read = readPeriodSeries(series, {"s.csv", 2}, period);
    ASSERT_EQ(read.seconds.size(), days.size());
    for (std::size_t i = 0; i < days.size(); ++i) {
      EXPECT_EQ(read.seconds[i], day + 86400 * days[i]);
      const auto expected = days[i] == 3 ? NAN : static_cast<float>(10 + days[i]);
      EXPECT_THAT(read.values[i], NanSensitiveFloatEq(expected));
    }
  }
}

TEST(PeriodSeries, ValuesBetweenStepsAreLinearAndNeverBesideAMissingOne) {
  const PeriodSeries series{{10, 20, 30, 40}, {1.0F, 2.0F, NAN, 4.0F}};
  const auto nan = NanSensitiveFloatEq(NAN);
  const std::vector<std::int64_t> seconds{9, 10, 15, 20, 25, 30, 35, 40, 41};
  EXPECT_THAT(valuesAt(series, seconds), ElementsAre(nan, 1.0F, 1.5F, 2.0F, nan, nan, nan, 4.0F, nan));
  EXPECT_THAT(valuesAt(series, seconds, 10 / 86400.0), ElementsAre(nan, 1.0F, 1.5F, 2.0F, nan, nan, nan, 4.0F, nan));
  EXPECT_THAT(valuesAt(series, seconds, 9.9 / 86400.0), ElementsAre(nan, 1.0F, nan, 2.0F, nan, nan, nan, 4.0F, nan));
}

TEST(PeriodSeries, OfMoreThanAHundredPairsThoseOfTheSameItemsAreShownOnce) {
  // Selections of the observations of each item, and a second way of matching of the first one.
  const auto measuresOf = [](int items, int selections) {
    std::vector<OutputMeasure> measures;
    for (int i = 0; i < items * selections; ++i) {
      OutputMeasure& measure = measures.emplace_back();
      measure.simulation = {"s.csv", i % items + 1};
      measure.observation = {"o.csv", i % items + 1};
      measure.selection.lowestObserved = 0.1 * (i / items);
    }
    measures.push_back(measures.front());
    measures.push_back(measures.front());
    measures.back().timeMatch.offsetHours = 12.0;
    return measures;
  };
  const auto few = measuresOf(9, 11);  // 99 pairs, and the one that is matched otherwise
  EXPECT_EQ(measuresOfDistinctPairs(few).size(), 100U);
  EXPECT_EQ(pairsShownWithOthers(few), 0U);
  const auto many = measuresOf(10, 10);
  EXPECT_THAT(measuresOfDistinctPairs(many), ElementsAre(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 101));
  EXPECT_EQ(pairsShownWithOthers(many), 90U);
  EXPECT_EQ(measuresOfDistinctPairs(measuresOf(150, 1)).size(), 151U) << "all are of different items";
}

TEST(PeriodSeries, ItemsAndFormsAreComparedByWhatTheyMean) {
  const auto measureOf = [](const SeriesReference& observation, const ObservationWeighting& weighting = {}) {
    return OutputMeasure{.simulation = {"s.csv", 1}, .observation = observation, .weighting = weighting};
  };
  const auto formOf = [](auto&& change) {
    TextForm form{.isGiven = true};
    change(form);
    return form;
  };
  const SeriesReference numbered{.fileName = "o.csv", .itemNo = 2};
  const SeriesReference named{.fileName = "o.csv", .itemName = "flow"};
  const SeriesReference found{.fileName = "o.csv", .itemNo = 2, .itemName = "flow", .hasItemNo = true};
  const SeriesReference foundOtherwise{.fileName = "o.csv", .itemNo = 2, .itemName = "Flow", .hasItemNo = true};
  const SeriesReference foundElsewhere{.fileName = "o.csv", .itemNo = 3, .itemName = "flow", .hasItemNo = true};
  const auto inForm = [&](const TextForm& form, const char* file = "o.csv") {
    SeriesReference reference = numbered;
    reference.fileName = file;
    reference.form = form;
    return reference;
  };
  const TextForm written = formOf([](TextForm&) {});
  const TextForm marked = formOf([](TextForm& form) { form.missingValues = {-99, 0}; });
  const TextForm markedOtherwise = formOf([](TextForm& form) { form.missingValues = {0, -99}; });
  struct Case {
    OutputMeasure a, b;
    bool sameItems, samePair;
  };
  const Case cases[] = {
      {measureOf(numbered), measureOf(found), true, true},
      {measureOf(found), measureOf(foundOtherwise), true, true},
      {measureOf(found), measureOf(foundElsewhere), false, false},
      {measureOf(named), measureOf(found), true, true},
      {measureOf(named), measureOf(numbered), false, false},
      {measureOf(named), measureOf(foundOtherwise), false, false},
      {measureOf(inForm({})), measureOf(inForm(written)), true, true},
      {measureOf(inForm(written, "o.dat")), measureOf(inForm({}, "o.dat")), false, false},
      {measureOf(inForm(written)), measureOf(inForm(formOf([](TextForm& form) { form.headerRows = 2; }))), false,
       false},
      {measureOf(inForm(formOf([](TextForm& form) { form.columnSeparator = "blank"; }))),
       measureOf(inForm(formOf([](TextForm& form) { form.columnSeparator = " "; }))), true, true},
      {measureOf(inForm(formOf([](TextForm& form) { form.timeColumn = "1,2"; }))),
       measureOf(inForm(formOf([](TextForm& form) { form.timeColumn = "1, 2"; }))), true, true},
      {measureOf(inForm({})), measureOf(inForm(marked)), true, false},
      {measureOf(inForm(marked)), measureOf(inForm(markedOtherwise)), true, true},
      {measureOf(numbered, {.errorItem = 3}), measureOf(numbered, {.errorItem = 3, .errorName = "sd"}), true, true},
      {measureOf(numbered, {.errorName = "sd"}), measureOf(numbered, {.errorItem = 3, .errorName = "sd"}), true, true},
      {measureOf(numbered, {.errorItem = 3}), measureOf(numbered, {.errorItem = 4}), true, false},
      {measureOf(numbered, {.errorItem = 3}), measureOf(numbered, {.weightItem = 3}), true, false},
      {measureOf(numbered, {.errorItem = 3}), measureOf(numbered, {.errorName = "sd"}), true, false},
      {measureOf(numbered, {.errorItem = 3}), measureOf(numbered), true, false},
  };
  for (const Case& each : cases) {
    SCOPED_TRACE(&each - cases);
    EXPECT_EQ(isSameItems(each.a, each.b), each.sameItems);
    EXPECT_EQ(isSameItems(each.b, each.a), each.sameItems);
    EXPECT_EQ(isSamePair(each.a, each.b), each.samePair);
    EXPECT_EQ(isSamePair(each.b, each.a), each.samePair);
  }
}

TEST(PeriodSeries, AFileThatTellsItsFormIsNotATableOfTheDefaultForm) {
  const TemporaryFolder folder;
  folder.write("table.txt", "time,flow\n2001-01-01,1\n");
  folder.write("station.txt", "# retrieved\nagency_cd\tsite_no\tdatetime\tflow\n5s\t15s\t20d\t14n\n");
  for (const bool isTable : {true, false}) {
    OutputMeasure a{.simulation = {"s.csv", 1}, .observation = {folder / (isTable ? "table.txt" : "station.txt"), 1}};
    OutputMeasure b = a;
    b.observation.form.isGiven = true;
    EXPECT_EQ(isSameItems(a, b), isTable);
  }
}

}  // namespace
}  // namespace mirevo

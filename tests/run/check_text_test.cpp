#include "run/check_text.h"

#include <fmt/core.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "matchers.h"

namespace mirevo {
namespace {

TEST(CheckText, OfSharedSeriesNoObservationsAreShownThatMayNotBeTheMeasures) {
  RunConfig config;
  config.period = {{2001, 1, 1}, {2001, 1, 3}};
  EvaluationResult result;
  std::vector<MeasureSource> sources;
  const std::int64_t first = secondNumber({2001, 1, 1});
  // The first two are the same pair.
  for (std::size_t i = 0; i <= kMostShownPairs + 1; ++i) {
    OutputMeasure& measure = config.measures.emplace_back();
    measure.simulation = {"s.csv", 1};
    measure.observation = {"o.csv", 1};
    if (i >= 2) measure.selection.lowestObserved = 0.01 * static_cast<double>(i);
    sources.push_back(
        {.name = fmt::format("m{}", i), .simulated = "s.csv, item No. 1", .observed = "o.csv, item No. 1"});
    result.measureValues.push_back(0.0);
    MeasurePairs& pairs = result.pairs.emplace_back();
    pairs.measure = i;
    pairs.count = 2;
    pairs.first = first;
    pairs.last = first + 86400;
  }
  const std::vector<std::size_t> shown = measuresOfDistinctPairs(config.measures);
  ASSERT_THAT(shown, ElementsAre(0));
  result.shownSeries = {{{first, first + 86400}, {1.0F, 2.0F}}};
  const std::vector<PeriodSeries> observations{{{first, first + 86400}, {3.0F, 4.0F}}};
  std::string text;
  for (const std::string& line : checkedRunLines({config, result, sources, shown, observations})) text += line + "\n";
  const auto ofMeasure = [&text](int number) {
    const std::size_t at = text.find(fmt::format("Output measure m{},", number));
    return text.substr(at, text.find("Output measure", at + 1) - at);
  };
  for (const int own : {0, 1}) {
    EXPECT_THAT(ofMeasure(own), AllOf(HasSubstr("observed: o.csv, item No. 1: 2 values, the first 3 at"),
                                      HasSubstr("first pair: simulated 1, observed 3 at 2001-01-01 00:00\n")));
  }
  EXPECT_THAT(ofMeasure(2), AllOf(HasSubstr("simulated: s.csv, item No. 1: 2 values, the first 1 at"),
                                  HasSubstr("observed: o.csv, item No. 1\n"),
                                  HasSubstr("last pair: simulated 2 at 2001-01-02 00:00\n")));
}

}  // namespace
}  // namespace mirevo

#include <algorithm>
#include <cmath>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/calendar.h"
#include "report/drawn_lines.h"
#include "report/json_writer.h"
#include "report/report_file.h"
#include "report/report_json.h"
#include "report/thinning.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

TEST(JsonWriter, TextsCannotLeaveTheirScriptElementAndAreUtf8) {
  const std::pair<std::string_view, const char*> cases[] = {
      {"</script><!--&", R"("\u003c/script\u003e\u003c!--\u0026")"},
      {"\"\\\n\t\x01", R"("\"\\\u000a\u0009\u0001")"},
      {"Müßig 流 \xF0\x9F\x8C\x8A", "\"Müßig 流 \xF0\x9F\x8C\x8A\""},
      {"a\xE2\x80\xA8"
       "b\xE2\x80\xA9",
       R"("a\u2028b\u2029")"},
      {"\xFC", "\"\uFFFD\""},                                // Latin-1
      {"\xC0\x80", "\"\uFFFD\uFFFD\""},                      // overlong
      {"\xED\xA0\x80", "\"\uFFFD\uFFFD\uFFFD\""},            // surrogate
      {"\xF4\x90\x80\x80", "\"\uFFFD\uFFFD\uFFFD\uFFFD\""},  // past the last character
      {"x\xE2\x82", "\"x\uFFFD\uFFFD\""},                    // cut off
      {std::string_view("a\0b", 3), R"("a\u0000b")"},
  };
  for (const auto& [text, json] : cases) EXPECT_EQ(JsonWriter().text(text).take(), json);
}

TEST(JsonWriter, NumbersThatAreNoneAreNullAndCommasComeBetweenValues) {
  const double infinity = std::numeric_limits<double>::infinity();
  JsonWriter json;
  json.beginObject().member("a", 0.1).member("b", true).member("c", 3).key("d");
  json.numbers(std::vector{std::nan(""), infinity, -infinity, 1.0 / 3.0, 1e300}, JsonWriter::Digits::drawn);
  json.key("e").rows(std::vector<std::vector<float>>{{}, {1.5F}, {2.0F, 3.0F}}, JsonWriter::Digits::drawn);
  json.optionalMember("f", "").endObject();
  EXPECT_EQ(json.take(),
            R"({"a":0.1,"b":true,"c":3,"d":[null,null,null,0.3333333,1e+300],"e":[[],[1.5],[2,3]],"f":null})");
}

ShownSeries daily(std::size_t count) {
  ShownSeries series;
  series.measure = "flow";
  const std::int64_t start = secondNumber({1970, 1, 1});
  for (std::size_t i = 0; i < count; ++i) {
    series.seconds.push_back(start + 86400 * static_cast<std::int64_t>(i));
    series.observed.push_back(static_cast<float>(i % 100));
    series.initial.push_back(std::nanf(""));
    series.best.push_back(i == count / 2 + 1 ? 1000.0F : 5.0F);
  }
  return series;
}

TEST(ReportPage, FillsBothPlacesOnceWhateverTheTitleHolds) {
  ReportData data;
  data.run.title = "</title>@REPORT_DATA@ & \n\"x\"";
  const std::string page = reportPage("<title>@REPORT_TITLE@</title>|@REPORT_DATA@|end", data);
  EXPECT_THAT(page, ::testing::StartsWith("<title>&lt;/title&gt;@REPORT_DATA@ &amp;  \"x\"</title>|{\"format\":1,"));
  EXPECT_THAT(page, ::testing::EndsWith("}|end"));
  EXPECT_THAT(page, HasSubstr(R"("title":"\u003c/title\u003e@REPORT_DATA@ \u0026 \u000a\"x\"")"));
}

TEST(ReportPage, AGapIsAStepMuchLongerThanTheUsualOne) {
  const std::vector<float> values = {1, 1, 1, NAN, NAN, 1, 1, NAN};
  const std::vector<std::int64_t> seconds = {0, 10, 20, 30, 40, 50, 60, 70};
  EXPECT_THAT(gapsOf({seconds, values}, {seconds, values}), ElementsAre(5));
  const std::vector<float> often = {1, NAN, 1, NAN, 1, NAN, 1, NAN};  // between finer steps of another column
  EXPECT_THAT(gapsOf({seconds, often}, {seconds, often}), ElementsAre());
  EXPECT_THAT(gapsOf({std::span(seconds).first(3), often}, {std::span(seconds).first(3), often}), ElementsAre(0, 2));
  EXPECT_THAT(gapsOf({std::vector<std::int64_t>{0, 60}, std::vector<float>{1, 1}}, {seconds, values}), ElementsAre(1));
}

TEST(ReportPage, TimesAreAStepWhereTheyAreRegularAndALongSeriesIsThinnedForDrawingAlone) {
  ReportData data;
  data.series.best = ShownEvaluation{3, 0.5};
  data.series.series = {daily(3), daily(kMostDrawnTimes + 1)};
  std::string json = reportJson(data);
  EXPECT_THAT(json, HasSubstr(R"("count":3,"start":"1970-01-01T00:00:00","step":86400000,"observed":[0,1,2],)"
                              R"("best":[5,5,1000],"bestNumber":3)"));
  EXPECT_THAT(json, HasSubstr(R"("n":100001,)"));  // the figures are of all values
  EXPECT_THAT(json, HasSubstr(R"("thinned":true,"flowDuration":{"exceedance":[0.05,)"));

  data.series.series = {daily(3)};
  data.series.series[0].seconds[2] += 1;
  json = reportJson(data);
  EXPECT_THAT(json, HasSubstr(R"("times":[0,86400000,172801000])"));
  EXPECT_THAT(json, Not(HasSubstr("\"step\"")));

  ShownSeries whole = daily(kMostDrawnTimes + 1);
  for (const std::size_t i : {41, 42, 43}) whole.best[i] = std::nanf("");
  whole.initial[62] = whole.initial[63] = 3.0F;  // few, and none of them an extreme
  const ShownSeries drawn = thinned(whole);
  EXPECT_LE(drawn.seconds.size(), kMostDrawnTimes);
  EXPECT_TRUE(std::is_sorted(drawn.seconds.begin(), drawn.seconds.end()));
  EXPECT_EQ(std::count(drawn.best.begin(), drawn.best.end(), 1000.0F), 1) << "its only peak";
  const auto gap = std::find_if(drawn.best.begin(), drawn.best.end(), [](float value) { return std::isnan(value); });
  EXPECT_LT(gap - drawn.best.begin(), 43) << "no line is drawn over it";
  EXPECT_EQ(std::count(drawn.initial.begin(), drawn.initial.end(), 3.0F), 2);
  const ShownSeries ofMany = thinned(whole, mostDrawnTimes(50));
  EXPECT_LE(ofMany.seconds.size(), kMostDrawnTimes / 8);
  EXPECT_EQ(*std::max_element(ofMany.best.begin(), ofMany.best.end()), 1000.0F);
  const std::vector<double> curve = flowDuration(whole.observed);
  EXPECT_EQ(curve.front(), 99.0);
  EXPECT_EQ(curve[curve.size() / 2], 49.0);
  EXPECT_EQ(curve.back(), 0.0);
}

TEST(DrawnLines, AreInterruptedInGapsAndDotsWhereValuesAreUneven) {
  struct Case {
    std::vector<int> simulated;  // hours of the rows with a simulated value
    std::vector<int> observed;
    bool isPoints;
    std::vector<std::int64_t> breaks;  // of the observations, in hours
    std::vector<std::int64_t> simulatedBreaks;
  };
  const std::vector<int> hours{0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 60, 61, 62, 63};
  const Case cases[] = {
      {hours, {0, 3, 6, 9, 60, 63}, false, {9}, {9}},                   // even, with the model's gap
      {hours, {0, 1, 2, 4, 5, 6, 7}, false, {2}, {9}},                  // one of them is missing
      {hours, {0, 1, 7, 60, 63}, true, {}, {9}},                        // samples
      {{0, 24, 48, 72, 96}, {0, 24, 48, 72, 96}, false, {}, {}},        // all days
      {{0, 24, 48, 72, 96, 120, 144}, {0, 48, 96, 144}, true, {}, {}},  // the model steps between them
      {{0, 24, 48, 50, 72, 96, 120}, {48, 50}, true, {}, {}},           // an interpolated value is no step of the model
  };
  for (const Case& each : cases) {
    ShownSeries series;
    for (int hour = 0; hour < 200; ++hour) {
      const auto valueIf = [hour](const std::vector<int>& there) {
        return std::find(there.begin(), there.end(), hour) == there.end() ? std::nanf("") : 1.0F;
      };
      if (std::isnan(valueIf(each.simulated))) continue;
      series.seconds.push_back(3600 * hour);
      series.observed.push_back(valueIf(each.observed));
      series.best.push_back(1.0F);
      series.initial.push_back(std::nanf(""));
    }
    const DrawnLines lines = drawnLines(series);
    const auto hoursOf = [](std::vector<std::int64_t> seconds) {
      for (std::int64_t& second : seconds) second /= 3600;
      return seconds;
    };
    EXPECT_EQ(lines.observed.isPoints, each.isPoints);
    EXPECT_EQ(hoursOf(lines.observed.breaks), each.breaks);
    EXPECT_EQ(hoursOf(lines.best.breaks), each.simulatedBreaks);
  }
}

}  // namespace
}  // namespace mirevo

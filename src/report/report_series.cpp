#include "report/report_series.h"

#include <algorithm>
#include <cmath>

#include "common/calendar.h"
#include "report/thinning.h"

namespace mirevo {

void writeTimes(JsonWriter& json, const std::vector<std::int64_t>& seconds) {
  json.member("count", seconds.size());
  if (seconds.empty()) return;
  json.member("start", isoTime(seconds.front()));
  const std::int64_t step = seconds.size() > 1 ? seconds[1] - seconds[0] : 0;
  const bool isRegular =
      step > 0 && std::adjacent_find(seconds.begin(), seconds.end(),
                                     [step](std::int64_t a, std::int64_t b) { return b - a != step; }) == seconds.end();
  if (isRegular) {
    json.member("step", step * 1000);
    return;
  }
  json.key("times").beginArray();
  for (const std::int64_t second : seconds) json.integer(epochMilliseconds(second));
  json.endArray();
}

void writeBreaks(JsonWriter& json, std::string_view name, const DrawnLine& line) {
  if (line.breaks.empty()) return;
  json.key(name).beginArray();
  for (const std::int64_t second : line.breaks) json.integer(epochMilliseconds(second));
  json.endArray();
}

void writeSimulated(JsonWriter& json, const ScenarioSeries& one, std::size_t count) {
  const std::vector<float> none(one.series.values.size(), std::nanf(""));
  ShownSeries shown{one.measure, one.series.seconds, none, none, one.series.values};
  const DrawnLine line = drawnSimulated(shown.seconds, shown.best, shown.observed);
  const std::size_t most = mostDrawnTimes(count);
  const bool isThinned = shown.seconds.size() > most;
  if (isThinned) shown = thinned(shown, most);
  json.member("number", one.number).member("thinned", isThinned);
  writeTimes(json, shown.seconds);
  json.key("values").numbers(shown.best, JsonWriter::Digits::drawn);
  writeBreaks(json, "breaks", line);
}

}  // namespace mirevo

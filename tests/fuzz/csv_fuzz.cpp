// Any bytes as a CSV series: no crash, and what is accepted keeps the promises of TimeSeriesObject.

#include <cstdint>
#include <string>

#include "platform/series/csv_time_series.h"
#include "require.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  mirevo::CsvTimeSeries series;
  if (!series.parse("fuzz.csv", std::string(reinterpret_cast<const char*>(data), size))) {
    require(series.lastError().starts_with("fuzz.csv:") && series.timeStepCount() == 0);
    return 0;
  }
  const std::span<const double> times = series.times();
  for (std::size_t step = 1; step < times.size(); ++step) require(times[step - 1] < times[step]);
  require(times.empty() || times[0] == 0.0);
  require(series.startTime().has_value() == !times.empty());
  // Upwards, then downwards: the cells are found from either side.
  const int count = series.itemCount() < 12 ? series.itemCount() : 12;
  for (int item = 1; item <= count; ++item) {
    if (!series.getData(item)) {
      require(series.values(item).empty() && series.lastError().starts_with("fuzz.csv:"));
      continue;
    }
    require(series.values(item).size() == times.size());
    if (times.empty()) continue;
    const double last = times.back();
    const auto value = mirevo::valueAt(series, item, last);
    require(!value || !mirevo::isMissing(*value, series.deleteValue()));
    const auto largest = mirevo::extractMaxValue(series, item, 0.0, last);
    const auto smallest = mirevo::extractMinValue(series, item, 0.0, last);
    require(largest.has_value() == smallest.has_value() && (!largest || *smallest <= *largest));
  }
  for (int item = count; item >= 1; --item) series.getData(item);
  return 0;
}

// Any bytes as a station file of the GRDC: no crash, and what is accepted keeps the promises of TimeSeriesObject.

#include <cstdint>
#include <string>

#include "platform/series/grdc_time_series.h"
#include "series_promises.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string text(reinterpret_cast<const char*>(data), size);
  mirevo::GrdcTimeSeries::fits(text);
  mirevo::GrdcTimeSeries series;
  requirePromises(series, series.parse("fuzz.txt", text), "fuzz.txt:");
  return 0;
}

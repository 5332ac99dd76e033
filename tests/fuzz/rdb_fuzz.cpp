// Any bytes as an RDB file: no crash, and what is accepted keeps the promises of TimeSeriesObject.

#include <cstdint>
#include <string_view>

#include "platform/series/rdb_time_series.h"
#include "series_promises.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  mirevo::RdbTimeSeries::fits(text);
  mirevo::RdbTimeSeries series;
  requirePromises(series, series.parse("fuzz.rdb", text), "fuzz.rdb:");
  return 0;
}

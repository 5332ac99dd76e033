// Any bytes as an XML file of series: no crash, and what is accepted keeps the promises of TimeSeriesObject.

#include <cstdint>
#include <string_view>

#include "platform/series/xml_time_series.h"
#include "series_promises.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  mirevo::XmlTimeSeries series;
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  requirePromises(series, series.parse("fuzz.xml", text), "fuzz.xml:");
  return 0;
}

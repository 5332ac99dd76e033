// Any bytes as a results file of SWMM 5: no crash, and what is accepted keeps the promises of TimeSeriesObject.

#include <cstdint>

#include "file_of_bytes.h"
#include "platform/series/swmm_results.h"
#include "series_promises.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  mirevo::SwmmResults series;
  const std::string file = fileOfBytes(data, size);
  requirePromises(series, series.open(file), file + ":");
  return 0;
}

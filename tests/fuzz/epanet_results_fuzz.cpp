// Any bytes as a results file of EPANET 2: no crash, and what is accepted keeps the promises of TimeSeriesObject.

#include <cstdint>

#include "file_of_bytes.h"
#include "platform/series/epanet_results.h"
#include "series_promises.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  mirevo::EpanetResults series;
  const std::string file = fileOfBytes(data, size);
  requirePromises(series, series.open(file), file + ":");
  return 0;
}

// Any bytes as a NetCDF file that the library reads: what it accepts keeps the promises of TimeSeriesObject. A finding
// within the library (its functions are named nc_, NC_ or H5) is the library's own. scripts/fuzz leaves this target out
// unless it is named.

#include <cstdint>

#include "file_of_bytes.h"
#include "platform/series/netcdf_time_series.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (size < 4 || data[0] != 'C' || data[1] != 'D' || data[2] != 'F') return 0;  // not into the library for HDF5
  mirevo::NetcdfTimeSeries series;
  if (!series.open(fileOfBytes(data, size))) {
    require(!series.lastError().empty() && series.timeStepCount() == 0);
    return 0;
  }
  const auto times = series.times();
  for (std::size_t step = 1; step < times.size(); ++step) require(times[step - 1] < times[step]);
  const int count = series.itemCount() < 12 ? series.itemCount() : 12;
  for (int item = 1; item <= count; ++item) {
    require(series.getData(item) ? series.values(item).size() == times.size() : !series.lastError().empty());
  }
  return 0;
}

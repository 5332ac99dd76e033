// Any bytes as a NetCDF file of a classic format and as the units of its time: the walk through its header, which is
// ours, ends soon and without a crash. The library that reads the values has a target of its own, netcdf_reader_fuzz.

#include <cstdint>
#include <string_view>

#include "file_of_bytes.h"
#include "platform/series/netcdf_classic.h"
#include "platform/series/netcdf_units.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  if (const auto cut = mirevo::findCutOff(fileOfBytes(data, size))) {
    require(cut->starts_with("expected ") || cut->starts_with("it ends within its header"));
  }
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  std::string reason;
  for (const char* calendar : {"", "proleptic_gregorian"}) {
    const auto units = mirevo::parseTimeUnits(text, calendar, reason);
    require(units ? units->secondsPerUnit > 0.0 : !reason.empty());
  }
  return 0;
}

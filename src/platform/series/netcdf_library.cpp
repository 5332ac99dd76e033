#include "platform/series/netcdf_library.h"

#include <string_view>

#include <fmt/core.h>
#include <netcdf.h>

#include "common/loaded_function.h"

namespace mirevo {

std::vector<std::string> netcdfLibraries() {
  const std::string_view netcdf = ::nc_inq_libvers();  // followed by the time when it was built
  std::vector<std::string> libraries{fmt::format("NetCDF {}", netcdf.substr(0, netcdf.find(' ')))};
  using GetLibraryVersion = int(unsigned*, unsigned*, unsigned*);
  auto* const hdf5Version = loadedFunction<GetLibraryVersion>("H5get_libversion");
  unsigned major = 0;
  unsigned minor = 0;
  unsigned release = 0;
  if (hdf5Version != nullptr && hdf5Version(&major, &minor, &release) >= 0) {
    libraries.push_back(fmt::format("HDF5 {}.{}.{}", major, minor, release));
  }
  return libraries;
}

}  // namespace mirevo

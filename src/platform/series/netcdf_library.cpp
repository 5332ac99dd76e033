#include "platform/series/netcdf_library.h"

#include <string_view>

#include <fmt/core.h>

#include "common/program_module.h"
#include "platform/series/netcdf_functions.h"

namespace mirevo {

const NetcdfFunctions* netcdfFunctions(std::string& reason) {
  static const NetcdfFunctions* functions = nullptr;
  if (functions == nullptr) {
    functions = static_cast<const NetcdfFunctions*>(contentOfModule("netcdf", kNetcdfFunctionsName, reason));
  }
  return functions;
}

std::vector<std::string> netcdfLibraries() {
  std::string reason;
  const NetcdfFunctions* const netcdf = netcdfFunctions(reason);
  if (netcdf == nullptr) return {fmt::format("no NetCDF ({})", reason)};
  const std::string_view version = netcdf->inq_libvers();  // followed by the time when it was built
  std::vector<std::string> libraries{fmt::format("NetCDF {}", version.substr(0, version.find(' ')))};
  unsigned major = 0;
  unsigned minor = 0;
  unsigned release = 0;
  if (netcdf->hdf5Version != nullptr && netcdf->hdf5Version(&major, &minor, &release) >= 0) {
    libraries.push_back(fmt::format("HDF5 {}.{}.{}", major, minor, release));
  }
  return libraries;
}

}  // namespace mirevo

#pragma once

#include <string>
#include <vector>

namespace mirevo {

/// The library that reads NetCDF files and its version, "NetCDF 4.9.0", and that of HDF5 if it uses it.
std::vector<std::string> netcdfLibraries();

}  // namespace mirevo

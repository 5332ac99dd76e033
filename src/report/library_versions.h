#pragma once

#include <string>
#include <vector>

namespace mirevo {

/// The libraries that a run and its report use, with their versions as they are loaded, for versionText(): "muParser
/// 2.3.3", "NetCDF 4.9.0", "HDF5 1.10.8" if NetCDF uses it, LAPACK, and Boost as it was compiled in.
std::vector<std::string> libraryVersions();

}  // namespace mirevo

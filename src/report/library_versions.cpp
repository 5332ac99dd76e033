#include "report/library_versions.h"

#include "algorithms/numbers/number_libraries.h"
#include "platform/equations/equation_library.h"
#include "platform/series/netcdf_library.h"

namespace mirevo {

std::vector<std::string> libraryVersions() {
  std::vector<std::string> versions{equationLibrary()};
  for (const auto& libraries : {netcdfLibraries(), numberLibraries()}) {
    versions.insert(versions.end(), libraries.begin(), libraries.end());
  }
  return versions;
}

}  // namespace mirevo

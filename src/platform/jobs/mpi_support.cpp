#include "platform/jobs/mpi_support.h"

#include <string_view>
#include <vector>

#include "common/loaded_function.h"

namespace mirevo {

/// MPI_Get_library_version() may be called without MPI_Init() (MPI 3.0, 8.1.1). Implementations need 256 to 8192 bytes
/// for the answer, of which the first part names the library.
std::string mpiSupport() {
  if (!MIREVO_BUILT_WITH_MPI) return "no";
  using GetLibraryVersion = int(char*, int*);
  auto* const libraryVersion = loadedFunction<GetLibraryVersion>("MPI_Get_library_version");
  if (libraryVersion == nullptr) return "yes";
  constexpr std::size_t kRoom = 16384;
  std::vector<char> text(kRoom);
  int length = 0;
  if (libraryVersion(text.data(), &length) != 0 || length <= 0) return "yes";
  const std::string_view name(text.data(), static_cast<std::size_t>(length));
  return "yes, " + std::string(name.substr(0, name.find_first_of(",\n")));
}

}  // namespace mirevo

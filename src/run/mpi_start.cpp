#include "run/mpi_start.h"

#include <cstdlib>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "common/text.h"

namespace mirevo {

void startMpi(RunState& state) {
  for (const char* name : {"OMPI_COMM_WORLD_SIZE", "PMI_SIZE"}) {
    const char* value = std::getenv(name);
    if (value == nullptr || parseInteger(value).value_or(1) <= 1) continue;
    fatalError("Error: Runs over several MPI processes are not available in this version",
               fmt::format("{} is {}: a job launcher started {} processes. Start Mirevo once, without the launcher; "
                           "NoSimultaneousSim in the setup runs several models at once.",
                           name, value, value));
  }
  state.mpiRank = -1;
  state.mpiProcessCount = 1;
  state.mpiInUse = false;
}

}  // namespace mirevo

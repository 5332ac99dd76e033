#include "run/mpi_start.h"

namespace mirevo {

void startMpi(RunState& state) {
  state.mpi.start();
  state.mpiRank = state.mpi.rank();
  state.mpiProcessCount = state.mpi.processCount();
  state.mpiInUse = state.mpi.inUse();
}

}  // namespace mirevo

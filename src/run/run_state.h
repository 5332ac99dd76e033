#pragma once

#include <memory>
#include <vector>

#include "common/clock.h"
#include "platform/jobs/single_process.h"
#include "run/progress/progress_reporter.h"
#include "run/progress/run_log.h"

namespace mirevo {

/// What a run has once, owned by the run driver and handed down.
struct RunState {
  std::unique_ptr<Job> job = std::make_unique<SingleProcess>();
  int mpiRank = -1;  ///< -1 without MPI, 0 the master, above 0 a worker
  int mpiProcessCount = 1;
  bool mpiInUse = false;
  RunLog log;
  ProgressReporter progress{runTimeClock};
  std::vector<double> objectiveValues;  ///< of the last model run, one an objective function
};

}  // namespace mirevo

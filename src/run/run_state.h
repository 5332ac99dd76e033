#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "common/clock.h"
#include "evaluation/ranks/worker_watch.h"
#include "platform/jobs/single_process.h"
#include "run/progress/progress_reporter.h"
#include "run/progress/run_log.h"

namespace mirevo {

/// The state that all parts of a run share, owned by the run driver and passed to them.
struct RunState {
  std::function<double()> clock = runTimeClock;
  std::unique_ptr<Job> job = std::make_unique<SingleProcess>();
  int mpiRank = -1;  ///< -1 without MPI, 0 the master, above 0 a worker
  int mpiProcessCount = 1;
  bool mpiInUse = false;
  std::optional<WorkerWatch> workers;    ///< in a job that has workers, once the setup is read
  std::optional<double> workersStopped;  ///< when they were told to
  RunLog log;
  ProgressReporter progress{runTimeClock};
  std::string lastTold;                 ///< the warning that the user was told last
  std::vector<double> objectiveValues;  ///< of the last model run, one per objective function
};

}  // namespace mirevo

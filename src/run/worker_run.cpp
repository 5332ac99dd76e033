#include "run/worker_run.h"

#include <new>
#include <optional>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "evaluation/ranks/mpi_worker.h"
#include "parameters/parameter_model.h"
#include "platform/processes/posix_process_launcher.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/front_end.h"
#include "run/run_model.h"
#include "run/setup/setup_reader.h"
#include "run/signal_handlers.h"

namespace mirevo {
namespace {

/// For the farewell to be taken; the master is waiting for it.
constexpr double kFarewellSeconds = 30.0;

/// Works until the master says stop; when this returns, the model's processes are gone.
void work(MpiSession& mpi) {
  const auto begin = awaitBegin(mpi);
  if (!begin) return;
  RunLog unread;  // the master's log has all of it
  const RunConfig config = readSetup(begin->setupFile, begin->text, unread, true);
  ParameterModel parameters(config.parameters, config.constraints);
  ObjectiveAggregator aggregator(config.objectives, config.aggregationMethod);
  PosixProcessLauncher launcher;
  signalState.haltProcesses = haltProcessesFromSignal;
  ModelRunner runner(describeModel(config), parameters, aggregator, launcher, launcherSettings(config, 1, mpi.rank()));
  runWorkerLoop(mpi, runner);
}

void workOrReport(MpiSession& mpi) {
  try {
    work(mpi);
  } catch (const FatalError& error) {
    reportFailure(mpi, {error.message(), error.detail()});
  } catch (const std::bad_alloc&) {
    reportFailure(mpi, {"Error: Unable to allocate memory", {}});
  } catch (const std::exception& error) {
    reportFailure(mpi, {"Error: Unexpected failure", error.what()});
  }
}

}  // namespace

int runWorker(MpiSession& mpi) {
  installSignalHandlers();
  // The master says it once for all of them.
  signalState.showsMessageBox = false;
  signalState.writesStandardOutput = false;
  try {
    workOrReport(mpi);
    sayFarewell(mpi);
    mpi.finalise(kFarewellSeconds);
    return 0;
  } catch (const FatalError& error) {
    // Nobody can be told any more but whoever reads this.
    showMessage(fmt::format("Worker {}: {}\n{}", mpi.rank(), error.message(), error.detail()));
    mpi.abort(1);
  }
}

}  // namespace mirevo

#include "run/worker_run.h"

#include <new>
#include <optional>
#include <utility>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "evaluation/ranks/rank_worker.h"
#include "parameters/parameter_model.h"
#include "platform/processes/posix_process_launcher.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/front_end.h"
#include "run/run_model.h"
#include "run/setup/setup_reader.h"
#include "run/signal_handlers.h"

namespace mirevo {
namespace {

/// Time for the master, which waits for it, to receive the farewell.
constexpr double kFarewellSeconds = 30.0;

/// Works until the master sends stop; the model processes have ended when it returns.
void work(Job& job) {
  const auto begin = awaitBegin(job);
  if (!begin) return;
  RunLog unread;  // discarded: the master's log has all of it
  const RunConfig config = readSetup(begin->setupFile, begin->text, unread, true);
  ParameterModel parameters(config.parameters, config.constraints);
  ObjectiveAggregator aggregator(config.objectives, config.aggregationMethod);
  PosixProcessLauncher launcher;
  signalState.haltProcesses = haltProcessesFromSignal;
  ModelDescription model = describeModel(config);
  model.runsAtOnce = job.processCount() - 1;  // they may share a disk
  ModelRunner runner(std::move(model), parameters, aggregator, launcher, launcherSettings(config, 1, job.rank()));
  runWorkerLoop(job, runner);
}

void workOrReport(Job& job) {
  try {
    work(job);
  } catch (const FatalError& error) {
    reportFailure(job, {error.message(), error.detail()});
  } catch (const std::bad_alloc&) {
    reportFailure(job, {"Error: Unable to allocate memory", {}});
  } catch (const std::exception& error) {
    reportFailure(job, {"Error: Unexpected failure", error.what()});
  }
}

}  // namespace

int runWorker(Job& job) {
  installSignalHandlers();
  // The master shows messages, once for all processes.
  signalState.showsMessageBox = false;
  signalState.writesStandardOutput = false;
  try {
    workOrReport(job);
    sayFarewell(job);
    job.finalise(kFarewellSeconds);
    return 0;
  } catch (const FatalError& error) {
    // The master cannot be reached any more.
    showMessage(fmt::format("Worker {}: {}\n{}", job.rank(), error.message(), error.detail()));
    job.abort(1);
    return 1;
  }
}

}  // namespace mirevo

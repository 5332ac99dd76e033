#include "run/worker_run.h"

#include <new>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/run_files.h"
#include "evaluation/ranks/rank_worker.h"
#include "measures/item_names.h"
#include "parameters/parameter_model.h"
#include "platform/processes/child_guard.h"
#include "platform/processes/posix_process_launcher.h"
#include "platform/signals/signal_state.h"
#include "platform/terminal/front_end.h"
#include "run/run_model.h"
#include "run/setup/setup_reader.h"
#include "run/signal_handlers.h"

namespace mirevo {
namespace {

/// Works until the master sends stop; the model processes have ended when it returns.
void work(Job& job, std::optional<MasterWatch>& watch) {
  const auto begin = awaitBegin(job);
  if (!begin) return;
  const SetupLocation setup = locateSetup(begin->setupFile);
  watch.emplace(runFilePath(setup.folder + "/" + setup.name, run_files::kKill), runTimeClock, [&job] {
    showMessage(
        fmt::format("Warning: All processes of the {} job are aborted by worker {}: the master does not end the "
                    "run, which the kill file cancels",
                    job.means(), job.rank()),
        {}, MessageType::warning);
    job.abort(1);
  });
  RunLog unread;  // discarded: the master's log has all of it
  RunConfig config = readSetup(begin->setupFile, begin->text, unread, true);
  ParameterModel parameters(config.parameters, config.constraints);
  ObjectiveAggregator aggregator(config.objectives, config.aggregationMethod);
  PosixProcessLauncher launcher;
  signalState.haltProcesses = haltProcessesFromSignal;
  config.measures = withItemNumbers(config.measures);
  ModelDescription model = describeModel(config);
  model.runsAtOnce = job.processCount() - 1;  // they may share a disk
  LauncherSettings settings = launcherSettings(config, 1, job.rank());
  std::vector<std::string> warnings;
  settings.warn = [&warnings](std::string_view text) { warnings.emplace_back(text); };
  ModelRunner runner(std::move(model), parameters, aggregator, launcher, settings);
  LifeSigns signs(job, runTimeClock, config.maxWorkerSilence);
  runWorkerLoop(job, runner, *watch, signs, std::exchange(warnings, {}));
}

void workOrReport(Job& job, std::optional<MasterWatch>& watch) {
  const auto report = [&](const FailureMessage& failure) { reportFailure(job, failure, watch ? &*watch : nullptr); };
  try {
    work(job, watch);
  } catch (const FatalError& error) {
    report({error.message(), error.detail()});
  } catch (const std::bad_alloc&) {
    report({"Error: Unable to allocate memory", {}});
  } catch (const std::exception& error) {
    report({"Error: Unexpected failure", error.what()});
  }
}

}  // namespace

int runWorker(Job& job) {
  installSignalHandlers();
  // The master shows messages, once for all processes.
  signalState.showsMessageBox = false;
  signalState.writesStandardOutput = false;
  try {
    std::optional<MasterWatch> watch;
    workOrReport(job, watch);
    sayFarewell(job, watch ? &*watch : nullptr);
    return 0;
  } catch (const FatalError& error) {
    // The master cannot be reached any more.
    showMessage(fmt::format("Worker {}: {}\n{}", job.rank(), error.message(), error.detail()));
    return 1;  // and the job is aborted, as this process has not left it
  }
}

}  // namespace mirevo

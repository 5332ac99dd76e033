#include "run/job_end.h"

#include <string>

#include <fmt/core.h>

#include "common/fatal_error.h"
#include "evaluation/ranks/rank_evaluator.h"
#include "platform/terminal/front_end.h"

namespace mirevo {
namespace {

/// Time for all workers to end their models, including the grace time before a kill.
constexpr double kWorkerStopSeconds = 20.0;
/// The same at the end of a task, when a worker that was not needed may still be copying a large base folder.
constexpr double kWorkerPatienceSeconds = 600.0;

}  // namespace

void leaveJob(RunState& state, int exitCode, std::string_view ending) {
  std::string reason = "a worker did not answer the request to stop";
  const auto warn = [&state, exitCode](const std::string& text) {
    if (exitCode != 0) return;  // the run has failed already; the first reason counts
    state.log.warning(text);
    showMessage("Warning: " + text, {}, MessageType::warning);
  };
  try {
    if (stopWorkers(*state.job, exitCode == 0 ? kWorkerPatienceSeconds : kWorkerStopSeconds, warn)) {
      state.job->finalise(kWorkerStopSeconds);
      return;
    }
  } catch (const FatalError& error) {
    reason = error.message() + "\n" + error.detail();
  }
  showMessage(fmt::format("Warning: All processes of the {} job are aborted: {}", state.job->means(), reason), {},
              MessageType::warning);
  state.progress.progressEnd(ending);
  state.job->abort(exitCode);
}

}  // namespace mirevo

#include "run/job_end.h"

#include <algorithm>
#include <iterator>
#include <set>
#include <string>

#include <fmt/core.h>
#include <fmt/ranges.h>

#include "common/fatal_error.h"
#include "evaluation/ranks/rank_evaluator.h"
#include "platform/terminal/front_end.h"

namespace mirevo {
namespace {

/// Time for all workers to end their models, including the grace time before a kill.
constexpr double kWorkerStopSeconds = 20.0;
/// The same at the end of a task, when a worker that was not needed may still be copying a large base folder.
constexpr double kWorkerPatienceSeconds = 600.0;
/// The same once there is a kill file. It ends the job within five seconds, of which the launcher takes one on each of
/// its two levels.
constexpr double kCancelledSeconds = 2.5;

/// Whether the workers have had their time.
class Patience {
 public:
  Patience(RunState& state, double seconds) : state_(state), end_(*state.workersStopped + seconds) {}

  bool isOver() {
    const double now = state_.clock();
    if (!isCancelled_ && state_.progress.isCancelled()) {
      isCancelled_ = true;
      end_ = std::min(end_, (isFirst_ ? *state_.workersStopped : now) + kCancelledSeconds);
    }
    isFirst_ = false;
    return now >= end_;
  }

 private:
  RunState& state_;
  double end_;
  bool isCancelled_ = false;
  bool isFirst_ = true;
};

std::set<int> lostWorkers(const RunState& state) {
  return state.workers ? state.workers->lost() : std::set<int>{};
}

/// At the end of a task: a worker that is not ready yet gives no signs of life.
double patienceSeconds(const RunState& state) {
  const double limit = state.workers ? state.workers->silenceLimit() : 0.0;
  return limit > 0.0 ? std::clamp(limit, kWorkerStopSeconds, kWorkerPatienceSeconds) : kWorkerPatienceSeconds;
}

/// The workers of a job that outlives losses have all said their farewells, but those.
void leaveWithout(const std::set<int>& missing, RunState& state) {
  state.job->leaveWithout(missing);
  dismissWorkers(*state.job, missing);
}

}  // namespace

void stopWorkersOf(RunState& state) {
  if (!state.job->hasWorkers() || state.workersStopped) return;
  state.workersStopped = state.clock();
  try {
    stopWorkers(*state.job, lostWorkers(state));
  } catch (const FatalError&) {
    // leaveJob() meets it, too
  }
}

void leaveJob(RunState& state, int exitCode) {
  if (!state.job->hasWorkers()) return;
  stopWorkersOf(state);
  const auto warn = [&state, exitCode](const std::string& text) {
    if (exitCode != 0) return;  // the run has failed already; the first reason counts
    state.log.warning(text);
    showMessage("Warning: " + text, {}, MessageType::warning);
  };
  Patience patience(state, exitCode == 0 ? patienceSeconds(state) : kWorkerStopSeconds);
  const auto isEnough = [&patience] { return patience.isOver(); };
  std::string reason = "a worker that has stopped does not end";
  try {
    const std::set<int> lost = lostWorkers(state);
    const std::set<int> missing = awaitFarewells(*state.job, lost, isEnough, warn);
    std::set<int> silent;
    std::set_difference(missing.begin(), missing.end(), lost.begin(), lost.end(), std::inserter(silent, silent.end()));
    if (!missing.empty()) reason = fmt::format("worker {} is lost", fmt::join(missing, ", "));
    if (!silent.empty()) {
      reason = fmt::format("no answer to the request to stop from worker {}", fmt::join(silent, ", "));
    }
    if (state.job->outlivesLosses() && (missing.empty() || exitCode == 0)) {
      if (!silent.empty()) warn("The job was left with " + reason);
      return leaveWithout(missing, state);
    }
    if (missing.empty() && state.job->finalise(isEnough)) return;
  } catch (const FatalError& error) {
    reason = error.message() + "\n" + error.detail();
  }
  showMessage(fmt::format("Warning: All processes of the {} job are aborted: {}", state.job->means(), reason), {},
              MessageType::warning);
}

}  // namespace mirevo

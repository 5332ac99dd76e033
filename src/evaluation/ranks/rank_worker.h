#pragma once

#include <optional>
#include <string>
#include <vector>

#include "evaluation/model_run.h"
#include "evaluation/ranks/life_signs.h"
#include "evaluation/ranks/master_watch.h"
#include "evaluation/ranks/rank_messages.h"
#include "platform/jobs/job.h"

namespace mirevo {

/// The loop of a worker: runs each set that the master sends, in slot 1, and sends back its result, until the master
/// sends stop; a model that is still running is then ended. `signs` are given while it runs. `warnings`: on the making
/// of its process folder. Throws FatalError as ModelRunner does, and when the master's process is known to have ended.
void runWorkerLoop(Job& job, ModelRunner& runner, MasterWatch& watch, LifeSigns& signs,
                   std::vector<std::string> warnings = {});

/// Waits for the master's begin message; empty when stop comes instead.
std::optional<BeginMessage> awaitBegin(Job& job);

/// Reports a fatal error to the master and waits for its stop message. `watch`: null before the run has begun.
void reportFailure(Job& job, const FailureMessage& failure, MasterWatch* watch);

/// Sends the worker's last message: nothing of it is running any more. Then leaves the job, when the master says so in
/// one that outlives losses.
void sayFarewell(Job& job, MasterWatch* watch);

}  // namespace mirevo

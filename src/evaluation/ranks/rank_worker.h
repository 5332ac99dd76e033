#pragma once

#include <optional>

#include "evaluation/model_run.h"
#include "evaluation/ranks/rank_messages.h"
#include "platform/jobs/job.h"

namespace mirevo {

/// The loop of a worker: runs each set that the master sends, in slot 1, and sends back its result, until the
/// master says stop; a model that still runs is then ended. Throws FatalError as ModelRunner does.
void runWorkerLoop(Job& job, ModelRunner& runner);

/// Waits for the master to say begin; nothing when it says stop instead.
std::optional<BeginMessage> awaitBegin(Job& job);

/// Tells the master of a fatal error and waits for its stop.
void reportFailure(Job& job, const FailureMessage& failure);

/// The worker's last message: it has nothing running any more.
void sayFarewell(Job& job);

}  // namespace mirevo

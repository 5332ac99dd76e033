#pragma once

#include "evaluation/model_run.h"
#include "platform/processes/process_launcher.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// What turns a parameter set into a result, as the setup says.
ModelDescription describeModel(const RunConfig& config);

/// How the model is launched in `slotCount` slots, whose process folders are numbered from `firstFolderNumber` on.
LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber = 1);

}  // namespace mirevo

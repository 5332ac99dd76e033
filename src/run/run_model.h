#pragma once

#include "evaluation/model_run.h"
#include "platform/processes/process_launcher.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The description of the model in the setup.
ModelDescription describeModel(const RunConfig& config);

/// The launcher's settings for `slotCount` slots, whose process folders are numbered from `firstFolderNumber` on.
LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber = 1);

}  // namespace mirevo

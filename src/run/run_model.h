#pragma once

#include <set>
#include <string>
#include <vector>

#include "evaluation/model_run.h"
#include "platform/process_launcher.h"
#include "run/run_config.h"

namespace mirevo {

/// What turns a parameter set into a result, as the setup says.
ModelDescription describeModel(const RunConfig& config);

/// Removes the folders of failed model runs that an earlier run has kept, but those of evaluations with `numbers`.
/// Returns a line for each that could not be removed.
std::vector<std::string> removeFailedRunFolders(const RunConfig& config, const std::set<int>& numbers);

/// How the model is launched in `slotCount` slots, whose process folders are numbered from `firstFolderNumber` on.
LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber = 1);

}  // namespace mirevo

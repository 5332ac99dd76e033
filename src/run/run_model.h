#pragma once

#include <string>
#include <vector>

#include "evaluation/model_run.h"
#include "parameters/parameter_model.h"
#include "platform/processes/process_launcher.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// The description of the model in the setup, whose measures have the numbers of their items (withItemNumbers()).
ModelDescription describeModel(const RunConfig& config);

/// The launcher's settings for `slotCount` slots, whose process folders are numbered from `firstFolderNumber` on.
LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber = 1);

/// What the user should know, before the model is run, of settings and files that work but may not be meant.
std::vector<std::string> modelDoubts(const RunConfig& config, const ParameterModel& parameters, ModelRunner& runner);

}  // namespace mirevo

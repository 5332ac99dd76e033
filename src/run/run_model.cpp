#include "run/run_model.h"

#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <system_error>

#include <fmt/core.h>

#include "common/text.h"
#include "run/tasks/tasks.h"

namespace mirevo {
ModelDescription describeModel(const RunConfig& config) {
  ModelDescription model;
  model.baseFolder = config.baseFolder;
  model.fileTag = config.setupName;
  model.parameterFiles = config.parameterFiles;
  model.measures = config.measures;
  model.measureFile = config.measureFile;
  model.period = config.period;
  model.objectives = config.objectives;
  model.savedFiles = config.savedOutputFiles;
  model.savedFolder = fmt::format("{}/{}_Saved", config.setupFolder, config.setupName);
  model.failedFolderPrefix = processFolderPrefix(config) + "_Failed";
  model.keepSimulatedValues = keepsSimulatedValues(config);
  return model;
}

LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber) {
  LauncherSettings settings;
  settings.baseFolder = config.baseFolder;
  settings.processFolderPrefix = processFolderPrefix(config) + "_Process";
  settings.batchItems = config.batchItems;
  settings.slotCount = slotCount;
  settings.firstFolderNumber = firstFolderNumber;
  settings.useSingleThread = config.useSingleThread;
  settings.maxSeconds = config.maxSimulationTime;
  return settings;
}

}  // namespace mirevo

#include "run/run_model.h"

#include <cstdint>
#include <string>
#include <string_view>

#include <fmt/format.h>

#include "run/tasks.h"

namespace mirevo {
namespace {

/// The FNV-1a hash: the same number for the same text on every machine.
std::uint32_t hashOf(std::string_view text) {
  std::uint32_t hash = 2166136261U;
  for (const char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 16777619U;
  return hash;
}

std::string processFolderPrefix(const RunConfig& config) {
  if (config.processFolder.empty()) return fmt::format("{}/{}_Process", config.setupFolder, config.setupName);
  // Setups of one name that lie in different folders may share this one.
  return fmt::format("{}/{}-{:08x}_Process", config.processFolder, config.setupName, hashOf(config.setupFolder));
}

}  // namespace

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
  model.keepSimulatedValues = keepsSimulatedValues(config);
  return model;
}

LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber) {
  LauncherSettings settings;
  settings.baseFolder = config.baseFolder;
  settings.processFolderPrefix = processFolderPrefix(config);
  settings.batchItems = config.batchItems;
  settings.slotCount = slotCount;
  settings.firstFolderNumber = firstFolderNumber;
  settings.useSingleThread = config.useSingleThread;
  return settings;
}

}  // namespace mirevo

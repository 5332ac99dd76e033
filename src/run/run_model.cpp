#include "run/run_model.h"

#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <system_error>

#include <fmt/format.h>

#include "common/text.h"
#include "run/tasks.h"

namespace mirevo {
namespace {

/// The FNV-1a hash: the same number for the same text on every machine.
std::uint32_t hashOf(std::string_view text) {
  std::uint32_t hash = 2166136261U;
  for (const char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 16777619U;
  return hash;
}

/// What the names of folders that the run makes for its slots begin with.
std::string folderPrefix(const RunConfig& config) {
  if (config.processFolder.empty()) return fmt::format("{}/{}", config.setupFolder, config.setupName);
  // Setups of one name that lie in different folders may share this one.
  return fmt::format("{}/{}-{:08x}", config.processFolder, config.setupName, hashOf(config.setupFolder));
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
  model.failedFolderPrefix = folderPrefix(config) + "_Failed";
  model.keepSimulatedValues = keepsSimulatedValues(config);
  return model;
}

std::vector<std::string> removeFailedRunFolders(const RunConfig& config, const std::set<int>& numbers) {
  const std::filesystem::path prefix(folderPrefix(config) + "_Failed");
  const std::string beginning = prefix.filename().string();
  std::vector<std::string> problems;
  std::error_code failed;
  std::filesystem::directory_iterator entry(prefix.parent_path(), failed);
  for (; !failed && entry != std::filesystem::directory_iterator(); entry.increment(failed)) {
    const std::string name = entry->path().filename().string();
    if (!name.starts_with(beginning)) continue;
    const std::string digits = name.substr(beginning.size());
    const auto number = parseInteger(digits);
    const bool isMade = number && std::to_string(*number) == digits;
    if (!isMade || numbers.count(*number) > 0) continue;
    std::error_code reason;
    std::filesystem::remove_all(entry->path(), reason);
    if (reason) problems.push_back(fmt::format("{} was not removed: {}", entry->path().string(), reason.message()));
  }
  return problems;
}

LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber) {
  LauncherSettings settings;
  settings.baseFolder = config.baseFolder;
  settings.processFolderPrefix = folderPrefix(config) + "_Process";
  settings.batchItems = config.batchItems;
  settings.slotCount = slotCount;
  settings.firstFolderNumber = firstFolderNumber;
  settings.useSingleThread = config.useSingleThread;
  settings.maxSeconds = config.maxSimulationTime;
  return settings;
}

}  // namespace mirevo

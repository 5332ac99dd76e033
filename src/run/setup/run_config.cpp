#include "run/setup/run_config.h"

#include <algorithm>
#include <filesystem>
#include <limits>
#include <string_view>
#include <system_error>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

/// The 32-bit FNV-1a hash: the same number for the same text on every machine.
std::uint32_t hashOf(std::string_view text) {
  std::uint32_t hash = 2166136261U;
  for (const char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 16777619U;
  return hash;
}

}  // namespace

bool RunConfig::usesExactMeasures() const {
  return task && task->usesExactMeasures() &&
         std::any_of(measures.begin(), measures.end(),
                     [](const OutputMeasure& measure) { return measure.interfaceType == InterfaceType::timeSeries; });
}

bool RunConfig::readsMeasureFile() const {
  return std::any_of(measures.begin(), measures.end(),
                     [](const OutputMeasure& measure) { return measure.interfaceType == InterfaceType::measureFile; });
}

std::size_t RunConfig::variableParameterCount() const {
  return static_cast<std::size_t>(std::count_if(
      parameters.begin(), parameters.end(),
      [](const ModelParameter& parameter) { return parameter.parameterType == ParameterType::variable; }));
}

int RunConfig::plannedEvaluations() const {
  return task ? task->plannedEvaluations() : 0;
}

int RunConfig::mostAtOnce() const {
  return std::max(1, task ? task->mostAtOnce() : 0);
}

int RunConfig::plannedModelRuns() const {
  const int planned = plannedEvaluations();
  const bool hasFinalRun = task && task->hasFinalRun();
  return hasFinalRun && planned < std::numeric_limits<int>::max() ? planned + 1 : planned;
}

std::string processFolderPrefix(const RunConfig& config) {
  if (config.processFolder.empty()) return fmt::format("{}/{}", config.setupFolder, config.setupName);
  // Setups with the same name in different folders may share this folder.
  return fmt::format("{}/{}-{:08x}", config.processFolder, config.setupName, hashOf(config.setupFolder));
}

SetupLocation locateSetup(const std::string& fileName) {
  const std::filesystem::path given{std::string(trim(fileName))};
  std::error_code failed;
  std::filesystem::path absolute = std::filesystem::absolute(given, failed);
  absolute = (failed ? given : absolute).lexically_normal();
  const std::string file = absolute.filename().string();
  constexpr std::size_t kEndingLength = 4;
  const bool hasEnding =
      file.size() > kEndingLength && equalIgnoringCase(file.substr(file.size() - kEndingLength), ".kdx");
  return {absolute.string(), absolute.parent_path().string(),
          hasEnding ? file.substr(0, file.size() - kEndingLength) : file};
}

}  // namespace mirevo

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

/// The FNV-1a hash: the same number for the same text on every machine.
std::uint32_t hashOf(std::string_view text) {
  std::uint32_t hash = 2166136261U;
  for (const char c : text) hash = (hash ^ static_cast<unsigned char>(c)) * 16777619U;
  return hash;
}

}  // namespace

std::int64_t OptimisationConfig::populationSize() const {
  if (algorithmType == AlgorithmType::sce) return std::int64_t{sce.complexCount} * sce.pointsPerComplex;
  return pse.populationSize;
}

double OptimisationConfig::evaluationsAfter(double loops) const {
  const double perLoop = algorithmType == AlgorithmType::sce
                             ? static_cast<double>(sce.complexCount) * sce.evolutionSteps
                             : static_cast<double>(pse.populationSize);
  return static_cast<double>(populationSize()) + perLoop * loops;
}

std::size_t RunConfig::variableParameterCount() const {
  return static_cast<std::size_t>(std::count_if(
      parameters.begin(), parameters.end(),
      [](const ModelParameter& parameter) { return parameter.parameterType == ParameterType::variable; }));
}

bool RunConfig::drawsRandomNumbers() const {
  return simulationOption == SimulationOption::parameterOptimisation ||
         simulationOption == SimulationOption::uncertaintyAnalysis;
}

int RunConfig::plannedEvaluations() const {
  switch (simulationOption) {
    case SimulationOption::scenarioRuns:
      return scenario.runCount;
    case SimulationOption::sensitivityAnalysis: {
      const int perParameter = sensitivity.local.differencing == 1 ? 2 : 1;
      return 1 + perParameter * static_cast<int>(variableParameterCount());
    }
    case SimulationOption::parameterOptimisation:
      return optimisation.stopping.maxEvaluations;
    case SimulationOption::uncertaintyAnalysis:
      return uncertainty.sampleSize;
  }
  return 0;
}

int RunConfig::plannedModelRuns() const {
  const int planned = plannedEvaluations();
  const bool isSearch = simulationOption == SimulationOption::parameterOptimisation;
  return isSearch && planned < std::numeric_limits<int>::max() ? planned + 1 : planned;
}

bool keepsSimulatedValues(const RunConfig& config) {
  return config.simulationOption == SimulationOption::uncertaintyAnalysis ||
         (config.simulationOption == SimulationOption::sensitivityAnalysis &&
          config.sensitivity.calculateCovarianceMatrix);
}

std::string_view resultFileEnding(const RunConfig& config) {
  switch (config.simulationOption) {
    case SimulationOption::scenarioRuns:
    case SimulationOption::uncertaintyAnalysis:
      return ".dat";
    case SimulationOption::sensitivityAnalysis:
      return "_Sensitivity.dat";
    case SimulationOption::parameterOptimisation:
      return "_Optimisation.dat";
  }
  return {};
}

std::string processFolderPrefix(const RunConfig& config) {
  if (config.processFolder.empty()) return fmt::format("{}/{}", config.setupFolder, config.setupName);
  // Setups of one name that lie in different folders may share this one.
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

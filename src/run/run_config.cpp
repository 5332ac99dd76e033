#include "run/run_config.h"

#include <algorithm>
#include <filesystem>
#include <limits>
#include <system_error>

#include "common/text.h"

namespace mirevo {

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

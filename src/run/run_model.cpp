#include "run/run_model.h"

#include <cstdint>
#include <filesystem>
#include <string>
#include <string_view>
#include <system_error>

#include <fmt/core.h>

#include "common/run_files.h"
#include "common/text.h"
#include "run/setup/setup_warnings.h"

namespace mirevo {
ModelDescription describeModel(const RunConfig& config) {
  ModelDescription model;
  model.baseFolder = config.baseFolder;
  model.fileTag = config.setupName;
  model.parameterFiles = config.parameterFiles;
  model.measures = config.measures;
  if (config.readsMeasureFile()) model.measureFile = config.measureFile;
  model.instructions = config.instructions;
  if (config.readsMeasureFile()) model.furtherMeasureFiles = config.furtherMeasureFiles;
  model.period = config.period;
  model.validationPeriods = config.validationPeriods;
  model.minimumCoverage = config.minimumCoverage;
  model.objectives = config.objectives;
  for (const SavedOutputFile& file : config.savedOutputFiles) model.savedFiles.push_back(file.fileName);
  model.savedFolder = runFilePath(config.setupFolder + "/" + config.setupName, run_files::kSavedFolder);
  model.failedFolderPrefix = runFilePath(processFolderPrefix(config), run_files::kFailedFolder);
  model.runsAtOnce = config.simultaneousSimulations;
  model.isForRuns = config.task != nullptr;
  model.reusesResults = config.reusesResults();
  model.computeExactMeasures = config.usesExactMeasures();
  model.keepSimulatedValues = config.keepsSimulatedValues();
  model.hasShownSeries = config.writesReport;
  if (config.task) model.shownRuns = config.task->shownRuns();
  if (config.task) model.keptPrecision = config.task->keptPrecision();
  if (config.task) model.keptSteps = config.task->keptSteps();
  return model;
}

LauncherSettings launcherSettings(const RunConfig& config, int slotCount, int firstFolderNumber) {
  LauncherSettings settings;
  settings.baseFolder = config.baseFolder;
  settings.processFolderPrefix = runFilePath(processFolderPrefix(config), run_files::kProcessFolder);
  settings.batchItems = config.batchItems;
  settings.slotCount = slotCount;
  settings.firstFolderNumber = firstFolderNumber;
  settings.linksReadOnlyFiles = config.linksReadOnlyFiles;
  settings.useSingleThread = config.useSingleThread;
  settings.maxSeconds = config.maxSimulationTime;
  return settings;
}

std::vector<std::string> modelDoubts(const RunConfig& config, const ParameterModel& parameters, ModelRunner& runner) {
  std::vector<std::string> doubts;
  const auto add = [&doubts](const std::vector<std::string>& texts) {
    doubts.insert(doubts.end(), texts.begin(), texts.end());
  };
  if (config.task) add(config.task->warnings(parameters.searchSpace()));
  add(runner.warnings());
  add(runner.output().warnings());
  add(unusedParameterWarnings(config.parameters, config.constraints, runner.templates()));
  for (const ParameterTemplate& parameterTemplate : runner.templates()) {
    add(parameterTemplate.narrowPlaceholderWarnings(config.parameters));
  }
  return doubts;
}

}  // namespace mirevo

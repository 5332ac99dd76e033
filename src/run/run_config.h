#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "algorithms/analysis_settings.h"
#include "algorithms/search_settings.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "parameters/model_parameter.h"
#include "parameters/template_file.h"
#include "platform/process_launcher.h"

namespace mirevo {

enum class SimulationOption : std::int32_t {
  scenarioRuns = 0,
  sensitivityAnalysis = 1,
  parameterOptimisation = 2,
  uncertaintyAnalysis = 3
};
enum class AlgorithmType : std::int32_t { sce = 0, pse = 1, dds = 2 };

struct ScenarioConfig {
  std::int32_t scenarioType = 0;          ///< 0 single run with the initial set, 1 multiple runs
  std::int32_t runCount = 0;              ///< 1 for a single run
  std::vector<std::vector<double>> runs;  ///< one value a model parameter, model scale
};

struct SensitivityConfig {
  std::int32_t sensitivityType = 0;
  SensitivitySettings local;
  bool calculateCovarianceMatrix = false;
};

struct OptimisationConfig {
  AlgorithmType algorithmType = AlgorithmType::dds;
  std::int32_t useSurrogateModel = 0;
  SceSettings sce;
  PseSettings pse;
  DdsSettings dds;
  SimplexSettings simplex;  ///< shared by SCE and PSE
  SurrogateSettings surrogate;
  StoppingCriteria stopping;
  InitialSampleSettings initialSample;
};

/// All settings of a run. File names are absolute. Composed of the settings that each part defines for itself; no part
/// below the run driver sees the whole.
struct RunConfig {
  std::string setupFile;    ///< absolute path
  std::string setupFolder;  ///< absolute, without a trailing separator
  std::string setupName;    ///< file name without the ending ".kdx"

  SimulationOption simulationOption = SimulationOption::scenarioRuns;
  std::string title;
  bool writesReport = true;  ///< at the end of the run
  std::vector<BatchItem> batchItems;
  std::string baseFolder;  ///< the folder of the first batch file
  std::vector<ParameterFileItem> parameterFiles;
  std::vector<ModelParameter> parameters;
  std::vector<InternalConstraint> constraints;
  EvaluationPeriod period;
  AggregationMethod aggregationMethod = AggregationMethod::none;
  std::vector<OutputMeasure> measures;
  std::string measureFile;
  std::vector<ObjectiveFunction> objectives;
  std::vector<std::string> savedOutputFiles;

  ScenarioConfig scenario;
  SensitivityConfig sensitivity;
  OptimisationConfig optimisation;
  UncertaintySettings uncertainty;
  std::int32_t randomSeed = 1;  ///< of the initial sample and of the uncertainty analysis: one setting

  std::int32_t simultaneousSimulations = 1;
  bool usesMpiWorkers = false;  ///< then `simultaneousSimulations` is 1, on each worker
  bool useSingleThread = false;
  std::string processFolder;  ///< where the process folders are made; empty: beside the setup

  /// Model evaluations that the task plans; sizes the failed-run limit and the progress report. 0 where the simulation
  /// option names no task.
  int plannedEvaluations() const;
  std::size_t variableParameterCount() const;
};

/// Where a setup file lies and what the files of its run are named after.
struct SetupLocation {
  std::string file;    ///< absolute path
  std::string folder;  ///< absolute, without a trailing separator
  std::string name;    ///< file name without the ending ".kdx"
};

/// The location of a setup file named on the command line; `fileName` may be relative and have blanks behind it. Asks
/// the system for the current folder only.
SetupLocation locateSetup(const std::string& fileName);

}  // namespace mirevo

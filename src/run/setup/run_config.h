#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "algorithms/analyses/analysis_settings.h"
#include "algorithms/searches/search_settings.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "common/run_files.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "parameters/model_parameter.h"
#include "parameters/template_file.h"
#include "platform/processes/process_launcher.h"

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

/// A search with a smaller budget from whose best set a DDS with a raised one goes on.
struct EarlierSearch {
  std::int32_t maxEvaluations = 0;  ///< its budget, counted from the first evaluation of the run
  std::int32_t lastEvaluation = 0;  ///< the number of its last evaluation
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
  std::vector<EarlierSearch> earlierSearches;  ///< of DDS; not from the setup but from the run that is taken up

  /// Points of the initial sample of SCE or PSE.
  std::int64_t populationSize() const;
  /// Model evaluations that the sample and so many loops after it make, of SCE at the least.
  double evaluationsAfter(double loops) const;
};

/// A setting that bears on the results, as the setup has it.
struct ResultSetting {
  std::string section;  ///< names below the target, `/` between them
  std::string keyword;
  std::string value;  ///< as in the log; a file's name relative to the setup's folder
  bool isDefault = false;
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
  std::string processFolder;       ///< where the process folders are made; empty: beside the setup
  double maxSimulationTime = 0.0;  ///< seconds that a model run may take; 0: any

  std::int32_t restart = 0;           ///< 0 begins anew, 1 goes on, 2 goes on and repeats failed runs at the end
  std::int32_t failedRunFolders = 3;  ///< failed model runs whose process folder is kept
  std::vector<ResultSetting> resultSettings;  ///< in reading order; what may not change when a run is taken up again

  /// Model evaluations that the task plans; sizes the failed-run limit. 0 where the simulation option names no task.
  int plannedEvaluations() const;
  /// These and the final model run of a search: what progress counts towards.
  int plannedModelRuns() const;
  /// Whether the task's results depend on the random seed.
  bool drawsRandomNumbers() const;
  std::size_t variableParameterCount() const;
};

/// Whether the task works with simulated values at the observation times, which the results then have to hold.
bool keepsSimulatedValues(const RunConfig& config);

/// What the files of the task's results are called; nothing for a task without any.
std::optional<ResultFileNames> resultFileNames(const RunConfig& config);

/// What the names of folders that the run makes for its model runs begin with.
std::string processFolderPrefix(const RunConfig& config);

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

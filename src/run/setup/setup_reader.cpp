#include "run/setup/setup_reader.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <filesystem>
#include <unordered_map>

#include <fmt/core.h>

#include "algorithms/surrogate/proposal_selector.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "run/setup/setup_access.h"
#include "run/setup/setup_warnings.h"
#include "run/setup/validation.h"

namespace mirevo {
namespace {

/// Endings of files that set up or start a model. Beside the setup file and under its name, such a file could be taken
/// for, or overwritten by, a file of the run.
constexpr std::array<std::string_view, 14> kModelSetupEndings = {
    ".bat", ".cmd", ".sh", ".exe", ".sim", ".mod", ".run", ".inp", ".ini", ".cfg", ".ctl", ".par", ".set", ".dat"};

/// One method a section, called in the order of the sections; each validates what it has read before it returns.
class SetupReader final {
 public:
  SetupReader(SetupFile& file, const SetupLocation& location, bool usesMpiWorkers) : target_(file.target()) {
    config_.usesMpiWorkers = usesMpiWorkers;
    config_.setupFile = location.file;
    config_.setupFolder = location.folder;
    config_.setupName = location.name;
  }

  RunConfig read() {
    readSimulationOption();
    readModelParameters();
    readInternalConstraints();
    readObjectiveFunctions();
    readSavedFiles();
    switch (config_.simulationOption) {
      case SimulationOption::scenarioRuns:
        readScenarios();
        break;
      case SimulationOption::sensitivityAnalysis:
        readSensitivityAnalysis();
        break;
      case SimulationOption::parameterOptimisation:
        readOptimisation();
        break;
      case SimulationOption::uncertaintyAnalysis:
        readUncertainty();
        break;
    }
    readSimultaneousSimulations();
    readMeasureFile();
    return std::move(config_);
  }

 private:
  /// Reads a list's count and its items, each with `readItem(section, index)`.
  template <class Items, class ReadItem>
  void readItems(const SetupSection& list, std::string_view prefix, Items& items, ReadItem readItem) {
    const std::size_t count = list.readCount(prefix);
    for (std::size_t i = 0; i < count; ++i) {
      const SetupSection section = list.openItem(prefix, i + 1);
      items.emplace_back();
      section.read(config_, i);
      readItem(section, i);
    }
  }

  /// The same for a list that must not be empty.
  template <class Items, class ReadItem>
  void readItems(const SetupSection& list, std::string_view prefix, Items& items, std::string_view emptyMessage,
                 ReadItem readItem) {
    readItems(list, prefix, items, readItem);
    if (items.empty()) list.refuse(emptyMessage, kItemCountKeyword, "expected 1 or more, found 0");
  }

  void readSimulationOption();
  void readBatchItem(const SetupSection& section, std::size_t i);
  void refuseNameOfSetup(const std::string& path, std::string_view keyword, const SetupSection& section) const;
  void readParameterFile(const SetupSection& section, std::size_t i);
  void readModelParameters();
  void readInternalConstraints();
  void readObjectiveFunctions();
  void readOutputMeasure(const SetupSection& section, std::size_t i);
  void connectMeasures(const std::vector<SetupSection>& measureSections);
  void readSavedFiles();
  void readScenarios();
  void readSensitivityAnalysis();
  void readOptimisation();
  void refuseEmptyRanges() const;
  void readUncertainty();
  void readSimultaneousSimulations();
  void readMeasureFile();
  void validateTransformations(bool hasInitialSample) const;

  SetupSection target_;
  RunConfig config_;
  std::vector<SetupSection> parameterSections_;
  std::vector<SetupSection> objectiveSections_;
};

void SetupReader::readSimulationOption() {
  const SetupSection section = target_.open("MIREVO_SIMULATION_OPTION");
  section.read(config_);
  const auto option = static_cast<std::int32_t>(config_.simulationOption);
  section.check("Restart", config_.restart, "Error: Invalid restart option");
  section.check("FailedRunFolders", config_.failedRunFolders, "Error: Invalid No. of folders of failed model runs");
  if (option < 0 || option > 3) section.warn("Option", "no task has this number, nothing will be run");
  readItems(section.open("SIMBATCH"), "SIMBATCHITEM_", config_.batchItems,
            "Error: No model simulation sequence defined",
            [this](const SetupSection& item, std::size_t i) { readBatchItem(item, i); });
  readItems(section.open("SIMPARAM"), "SIMPARAMITEM_", config_.parameterFiles,
            "Error: No model parameter files defined",
            [this](const SetupSection& item, std::size_t i) { readParameterFile(item, i); });
}

void SetupReader::readBatchItem(const SetupSection& section, std::size_t i) {
  constexpr std::string_view kKeyword = "BatchFileName";
  const std::string& path = config_.batchItems[i].batchFileName;
  if (path.empty()) {
    section.refuse("Error: No model simulation sequence defined", kKeyword, "expected the name of a file");
  }
  if (i == 0) config_.baseFolder = std::filesystem::path(path).parent_path().string();
  validateInBaseFolder(path, config_.baseFolder, kKeyword, section);
  validateFileExists(path, kKeyword, section);
  refuseNameOfSetup(path, kKeyword, section);
}

void SetupReader::refuseNameOfSetup(const std::string& path, std::string_view keyword,
                                    const SetupSection& section) const {
  const std::filesystem::path file(path);
  const std::string ending = toLowerAscii(file.extension().string());
  if (file.parent_path().string() != config_.setupFolder ||
      !equalIgnoringCase(file.stem().string(), config_.setupName) ||
      std::find(kModelSetupEndings.begin(), kModelSetupEndings.end(), ending) == kModelSetupEndings.end()) {
    return;
  }
  section.refuse(
      "Error: Model simulation file and mirevo file are located in the same directory with an identical name", keyword,
      fmt::format("expected another name or folder than those of the setup file, found {}", path));
}

void SetupReader::readParameterFile(const SetupSection& section, std::size_t i) {
  const ParameterFileItem& item = config_.parameterFiles[i];
  if (item.paramFileName.empty()) {
    section.refuse("Error: No model parameter files defined", "ParamFileName", "expected the name of a file");
  }
  validateInBaseFolder(item.paramFileName, config_.baseFolder, "ParamFileName", section);
  validateFileOpens(item.paramFileName, "ParamFileName", section);
  refuseNameOfSetup(item.paramFileName, "ParamFileName", section);

  constexpr std::string_view kUnopened = "Error: Unable to open template file ";
  validateFileOpens(item.templateFileName, "TemplateFileName", section, kUnopened);
  validateInBaseFolder(item.templateFileName, config_.baseFolder, "TemplateFileName", section);
  if (item.templateFileName == item.paramFileName) {
    section.refuse(
        "Error: The template file " + section.written("TemplateFileName") + " is a model parameter file, too",
        "TemplateFileName", "expected another file, since each model run overwrites this one");
  }
  if (item.fileType == kNumericIdTemplate) return;
  std::string reason;
  const auto text = readTextFile(item.templateFileName, reason);
  if (!text) fatalError(std::string(kUnopened) + item.templateFileName, reason);
  const auto lines = splitLines(std::string_view(*text).substr(0, text->find('\n')));
  if (lines.empty() || trim(lines.front()).empty()) {
    section.refuse("Error: Delimiter not defined in template file " + section.written("TemplateFileName"),
                   "TemplateFileName",
                   item.templateFileName + ":1:1: expected the character that stands on both sides of a name");
  }
}

void SetupReader::readModelParameters() {
  const SetupSection list = target_.open("MODEL_PARAMETERS");
  const std::size_t count = list.readCount("PARAMETER_");
  for (std::size_t i = 0; i < count; ++i) {
    parameterSections_.push_back(list.openItem("PARAMETER_", i + 1));
    config_.parameters.emplace_back();
    if (const auto keyLines = parameterSections_.back().openIfPresent("Keywords")) keyLines->read(config_, i);
  }
  NamesUsed names;
  for (std::size_t i = 0; i < count; ++i) {
    const SetupSection& section = parameterSections_[i];
    section.echoName();
    section.read(config_, i);
    validateParameterBounds(config_.parameters[i], section);
    validateParameterDefinition(config_.parameters[i], names, section);
  }
  if (count == 0) list.refuse("Error: No model parameters defined", kItemCountKeyword, "expected 1 or more, found 0");
  if (config_.variableParameterCount() == 0) {
    list.refuse("Error: No variable model parameters defined", kItemCountKeyword,
                "expected a parameter with Parameter_Type = 0, found none");
  }
}

void SetupReader::readInternalConstraints() {
  readItems(
      target_.open("MODEL_PARAMETERS").open("INTERNAL_CONSTRAINTS"), "CONSTRAINT_", config_.constraints,
      [this](const SetupSection& section, std::size_t i) { validateLogicalOperator(config_.constraints[i], section); });
}

void SetupReader::readObjectiveFunctions() {
  const SetupSection section = target_.open("ObjectiveFunctions");
  section.read(config_);
  validateEvaluationPeriod(config_.period, section);
  validateAggregationMethod(config_.aggregationMethod, section);

  std::vector<SetupSection> measureSections;
  readItems(section.open("OUTPUT_MEASURES"), "MEASURE_", config_.measures, "Error: No output measures defined",
            [this, &measureSections](const SetupSection& item, std::size_t i) {
              readOutputMeasure(item, i);
              measureSections.push_back(item);
            });
  NamesUsed names;
  readItems(section.open("OBJECTIVE_FUNCTIONS"), "OBJECTIVE_", config_.objectives,
            "Error: No objective functions defined", [this, &names](const SetupSection& item, std::size_t i) {
              validateObjectiveFunction(config_.objectives[i], names, item);
              objectiveSections_.push_back(item);
            });
  connectMeasures(measureSections);
  if (config_.simulationOption != SimulationOption::parameterOptimisation) validateTransformations(false);
}

void SetupReader::readOutputMeasure(const SetupSection& section, std::size_t i) {
  const OutputMeasure& measure = config_.measures[i];
  validateOutputMeasure(measure, section);
  const auto number = static_cast<std::int64_t>(i) + 1;
  // A measure that the model writes itself needs no series; such sections are read where they stand.
  const bool needsSeries = measure.interfaceType == InterfaceType::timeSeries;
  const auto open = [&](std::string_view name) {
    return needsSeries ? std::optional(section.open(name)) : section.openIfPresent(name);
  };
  if (const auto simulated = open("SIMULATION_FILE")) {
    simulated->read(config_, i);
    if (measure.simulation.fileName.empty() && needsSeries) {
      simulated->refuse(withNumber("Error: No output file defined for output measure No. %", number), "File_Name",
                        "expected the name of a file");
    }
    if (!measure.simulation.fileName.empty()) {
      validateInBaseFolder(measure.simulation.fileName, config_.baseFolder, "File_Name", *simulated);
    }
  }
  if (const auto observed = open("OBSERVATION_FILE")) {
    observed->read(config_, i);
    if (measure.observation.fileName.empty() && needsSeries) {
      observed->refuse(withNumber("Error: No observation file defined for output measure No. %", number), "File_Name",
                       "expected the name of a file");
    }
  }
}

/// Gives each objective function the measures that name it.
void SetupReader::connectMeasures(const std::vector<SetupSection>& measureSections) {
  std::vector<std::string> names;
  std::unordered_map<std::string_view, std::size_t> byName;
  for (std::size_t i = 0; i < config_.objectives.size(); ++i) {
    names.push_back(config_.objectives[i].name);
    byName.emplace(config_.objectives[i].name, i);
  }
  for (std::size_t i = 0; i < config_.measures.size(); ++i) {
    const OutputMeasure& measure = config_.measures[i];
    if (measure.functionName.empty()) continue;
    const auto found = byName.find(measure.functionName);
    if (found == byName.end()) {
      const auto nearest = nearestName(measure.functionName, names);
      measureSections[i].refuse(
          "Error: Invalid function name for output measure " + measure.name, "Function_Name",
          fmt::format("no objective function is called {}{}", quotedForMessage(measure.functionName),
                      nearest ? fmt::format(", did you mean {}?", quotedForMessage(*nearest)) : ""));
    }
    // cppcheck-suppress derefInvalidIteratorRedundantCheck ; refuse() does not return
    config_.objectives[found->second].measures.push_back(i);
  }
  for (std::size_t i = 0; i < config_.objectives.size(); ++i) {
    if (!config_.objectives[i].measures.empty()) continue;
    objectiveSections_[i].warn("Name", "no output measure has this Function_Name, the objective function is always 0");
  }
}

void SetupReader::validateTransformations(bool hasInitialSample) const {
  for (std::size_t i = 0; i < config_.objectives.size(); ++i) {
    validateTransformation(config_.objectives[i], config_.aggregationMethod, hasInitialSample, objectiveSections_[i]);
  }
}

void SetupReader::readSavedFiles() {
  readItems(target_.open("SAVE_OUTPUT_FILES"), "OUTPUT_FILE_", config_.savedOutputFiles,
            [this](const SetupSection& section, std::size_t i) {
              const std::string& path = config_.savedOutputFiles[i];
              if (path.empty()) {
                section.refuse("Error: No output file defined to be saved", "File_name", "expected the name of a file");
              }
              validateInBaseFolder(path, config_.baseFolder, "File_name", section);
            });
}

void SetupReader::readScenarios() {
  const SetupSection section = target_.open("SCENARIOS");
  section.read(config_);
  validateScenarioType(config_.scenario, section);
  if (config_.scenario.scenarioType == 0) {
    config_.scenario.runCount = 1;
    return;
  }
  readItems(section.open("SCENARIO_RUNS"), "SCENARIO_", config_.scenario.runs, "Error: No scenario runs defined",
            [this](const SetupSection& item, std::size_t i) {
              validateScenarioRun(config_.scenario.runs[i], config_.parameters, item);
            });
  config_.scenario.runCount = static_cast<std::int32_t>(config_.scenario.runs.size());
}

void SetupReader::readSensitivityAnalysis() {
  const SetupSection section = target_.open("SENSITIVITY_ANALYSIS");
  section.read(config_);
  validateSensitivityType(config_.sensitivity, section);
  const SetupSection local = section.open("LOCAL_SA");
  local.read(config_);
  validateLocalSensitivity(config_.sensitivity, config_.parameters, local);
}

/// Too small a population or simplex spans too few directions and ends early, away from the optimum.
void warnAboutFewPoints(const SetupSection& section, std::string_view keyword, std::int64_t found,
                        std::int64_t advised) {
  if (found >= advised) return;
  section.warn(keyword,
               fmt::format("found {}, at least {} are advised for the number of variable parameters", found, advised));
}

/// A budget that is spent before the surrogate model has enough evaluated sets is spent without it.
void warnAboutLateSurrogate(const SetupSection& stopping, const OptimisationConfig& search, std::size_t variableCount) {
  const auto sample = static_cast<double>(search.populationSize());
  const auto sets = static_cast<double>(leastSetCount(search.surrogate, variableCount));
  // PSE asks once a generation, SCE at every step.
  const double loops = search.algorithmType == AlgorithmType::pse ? std::ceil(sets / sample) - 1.0 : 0.0;
  const double initialLoops = search.surrogate.initialGenerations;
  const double before = std::max(sets, search.evaluationsAfter(std::max(loops, initialLoops)));
  const std::int32_t budget = search.stopping.maxEvaluations;
  if (budget <= sample || budget > before) return;  // where there is no loop, the surrogate makes no difference
  stopping.warn(
      "Max_No_Evaluations",
      fmt::format("found {}, the surrogate model chooses nothing before {} model evaluations: it waits for "
                  "No_Initial_Generations = {}, and a {} for {} sets",
                  budget, before, search.surrogate.initialGenerations, surrogateModelName(search.surrogate), sets));
}

void SetupReader::readOptimisation() {
  OptimisationConfig& search = config_.optimisation;
  const SetupSection section = target_.open("OPTIMISATION_ALGORITHM");
  section.read(config_);
  validateAlgorithmType(search.algorithmType, section);
  const bool isDds = search.algorithmType == AlgorithmType::dds;
  const auto variableCount = static_cast<std::int64_t>(config_.variableParameterCount());
  if (search.useSurrogateModel != 0 && search.useSurrogateModel != 1) {
    section.warn("Use_Surrogate_Model", "neither 0 nor 1, no search will be run");
  }
  if (!isDds) refuseEmptyRanges();

  switch (search.algorithmType) {
    case AlgorithmType::sce: {
      const SetupSection control = section.open("SCE_CONTROL_PARAMETERS");
      control.read(config_);
      validateSceControl(search.sce, search.simplex, control);
      warnAboutFewPoints(control, "No_Points_Complex", search.sce.pointsPerComplex, 2 * variableCount + 1);
      warnAboutFewPoints(control, "No_Points_Subcomplex", search.simplex.pointCount, variableCount + 1);
      break;
    }
    case AlgorithmType::pse: {
      const SetupSection control = section.open("PSE_CONTROL_PARAMETERS");
      control.read(config_);
      validatePseControl(search.pse, search.simplex, control);
      warnAboutFewPoints(control, "Population_Size", search.pse.populationSize, 4 * (2 * variableCount + 1));
      warnAboutFewPoints(control, "No_Points_Simplex", search.simplex.pointCount, variableCount + 1);
      break;
    }
    case AlgorithmType::dds: {
      const SetupSection control = section.open("DDS_CONTROL_PARAMETERS");
      control.read(config_);
      validateDdsControl(search.dds, control);
      break;
    }
  }
  const SetupSection sample = section.open("INITIAL_SAMPLE");
  sample.read(config_);
  validateInitialSampleMethod(search.initialSample, sample);
  // DDS that starts from the initial values has no sample to take a scale from.
  validateTransformations(!(isDds && search.initialSample.includeInitialParameters));

  const SetupSection stopping = section.open("STOPPING_CRITERIA");
  stopping.read(config_);
  if (isDds) validateDdsBudget(search.stopping, stopping);
  validateStoppingCriteria(search.stopping, stopping);
  const std::int64_t sampleSize = search.populationSize();
  if (!isDds && sampleSize > search.stopping.maxEvaluations) {
    stopping.warn("Max_No_Evaluations", fmt::format("the initial sample of {} sets is cut to {}, and no search follows",
                                                    sampleSize, search.stopping.maxEvaluations));
  }

  if (search.useSurrogateModel != 1) return;
  const SetupSection surrogate = section.open("SURROGATE_MODEL_PARAMETERS");
  surrogate.read(config_);
  validateSurrogateControl(search, config_.variableParameterCount(), surrogate);
  if (isDds) {
    section.warn("Use_Surrogate_Model", "Dynamically Dimensioned Search uses no surrogate model");
  } else {
    warnAboutLateSurrogate(stopping, search, config_.variableParameterCount());
  }
}

/// SCE and PSE measure their population by each parameter's range. An integer parameter always has one.
void SetupReader::refuseEmptyRanges() const {
  for (std::size_t i = 0; i < config_.parameters.size(); ++i) {
    const ModelParameter& parameter = config_.parameters[i];
    if (parameter.parameterType != ParameterType::variable || parameter.lowerBound < parameter.upperBound ||
        parameter.transformationType == TransformationType::integer) {
      continue;
    }
    parameterSections_[i].refuse(
        "Error: Lower bound equal to upper bound for parameter " + parameter.name, "Upper_Bound",
        fmt::format("expected more than {} for a search by SCE or PSE; Parameter_Type = 1 fixes a parameter",
                    parameter.lowerBound));
  }
}

void SetupReader::readUncertainty() {
  const SetupSection section = target_.open("UNCERTAINTY_ESTIMATION");
  section.read(config_);
  validateUncertaintyType(config_.uncertainty, section);
  const std::size_t count = config_.variableParameterCount();
  for (std::size_t i = 0; i < count; ++i) {
    const SetupSection item = section.openItem("PARAMETER_", i + 1);
    config_.uncertainty.parameters.emplace_back();
    item.read(config_, i);
    validateUncertaintyDeviation(config_.uncertainty.parameters[i], item);
  }
}

void SetupReader::readSimultaneousSimulations() {
  const SetupSection section = target_.open("SimultaneousSimulations");
  section.read(config_);
  validateProcessCount(config_, section);
  section.check("MaxSimulationTime", config_.maxSimulationTime, "Error: Invalid maximum simulation time");
  if (config_.usesMpiWorkers) {
    if (config_.simultaneousSimulations > 1)
      section.note("NoSimultaneousSim", "taken as 1 on each worker of the MPI job");
    config_.simultaneousSimulations = 1;
    return;
  }
  // A slot has its own copy of the model: ones without work would only fill the disk.
  const int mostUsed = std::max(1, config_.plannedEvaluations());
  if (config_.simultaneousSimulations <= mostUsed) return;
  section.warn("NoSimultaneousSim", fmt::format("only {} can be used by the evaluations of this run", mostUsed));
  config_.simultaneousSimulations = mostUsed;
}

void SetupReader::readMeasureFile() {
  const SetupSection section = target_.open("ObjectiveFunctions").open("OUTPUT_MEASURES").open("OUTPUT_MEASURE_FILE");
  section.read(config_);
  const bool isNeeded = std::any_of(config_.measures.begin(), config_.measures.end(), [](const OutputMeasure& measure) {
    return measure.interfaceType == InterfaceType::measureFile;
  });
  if (!config_.measureFile.empty()) {
    validateInBaseFolder(config_.measureFile, config_.baseFolder, "File_Name", section);
  } else if (isNeeded) {
    section.refuse("Error: File containing output measures not defined", "File_Name",
                   "expected the name of a file, since an output measure has Interface_Type = 1");
  }
}

}  // namespace

RunConfig readSetup(const std::string& fileName, std::string_view text, RunLog& log, bool usesMpiWorkers) {
  const SetupLocation location = locateSetup(fileName);
  SetupFile file(std::string(trim(fileName)), location.folder, text, log);
  warnAboutUnusedEntries(file);
  return SetupReader(file, location, usesMpiWorkers).read();
}

RunConfig readSetupFile(const std::string& fileName, RunLog& log) {
  return readSetup(fileName, readSetupText(fileName), log);
}

std::string readSetupText(const std::string& fileName) {
  const std::string name(trim(fileName));
  std::string reason;
  auto text = readTextFile(name, reason);
  if (!text) fatalError("Error: Unable to open " + name, reason);
  return std::move(*text);
}

}  // namespace mirevo

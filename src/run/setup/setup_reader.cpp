#include "run/setup/setup_reader.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <optional>
#include <unordered_map>

#include <fmt/core.h>

#include "common/encoding.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "measures/listing_series.h"
#include "measures/text_form_keywords.h"
#include "parameters/read_template.h"
#include "platform/processes/argument_text.h"
#include "run/access/file_validation.h"
#include "run/setup/equation_check.h"
#include "run/setup/file_roles.h"
#include "run/setup/model_keywords.h"
#include "run/setup/run_keywords.h"
#include "run/setup/setting_doubts.h"
#include "run/setup/setup_warnings.h"
#include "run/setup/validation.h"
#include "run/tasks/tasks.h"

namespace mirevo {
namespace {

/// Endings of files that set up or start a model. Such a file beside the setup, with the setup's name, could be
/// mistaken for or overwritten by a file of the run.
constexpr std::array<std::string_view, 14> kModelSetupEndings = {
    ".bat", ".cmd", ".sh", ".exe", ".sim", ".mod", ".run", ".inp", ".ini", ".cfg", ".ctl", ".par", ".set", ".dat"};

/// The sections of the measures that compare time series: of those that are there, or of the first one to be added.
std::vector<std::string> seriesSections(const SetupSection& target) {
  std::vector<std::string> paths;
  constexpr std::string_view kList = "ObjectiveFunctions/OUTPUT_MEASURES";
  const auto add = [&paths](const std::string& measure) {
    paths.insert(paths.end(), {measure + "/SIMULATION_FILE", measure + "/OBSERVATION_FILE"});
  };
  if (!target.holds(kList)) add(fmt::format("{}/MEASURE_1", kList));
  const auto count = target.peek(kList, kItemCountKeyword);
  for (int number = 1; count && number <= std::get<std::int32_t>(*count); ++number) {
    const std::string measure = fmt::format("{}/MEASURE_{}", kList, number);
    if (!target.holds(measure)) break;
    if (target.peek(measure, "Interface_Type") == SetupValue(std::int32_t{0})) add(measure);
  }
  return paths;
}

/// What is wrong with a selection shows once the observations are read.
void locateSelection(const SetupSection& section, ObservationSelection& selection) {
  for (const std::string_view keyword : kSelectionKeywords) {
    if (!section.isWritten(keyword)) continue;
    selection.location = fmt::format("{}: {}: ", section.location(keyword), keyword);
    return;
  }
}

/// One method per section, called in the order of the sections; each checks what it has read before it returns.
class SetupReader final {
 public:
  SetupReader(SetupFile& file, const SetupLocation& location, bool usesMpiWorkers)
      : file_(file), target_(file.target()) {
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
    if (config_.task) {
      config_.task->read({target_, config_.parameters, sections_.parameters, config_.constraints,
                          config_.variableParameterCount(),
                          [this](bool hasInitialSample) { requireScales(hasInitialSample); }, config_.period,
                          config_.setupFolder + "/" + config_.setupName, config_.measures, config_.objectives});
      for (std::size_t i = 0; i < config_.parameters.size(); ++i) {
        config_.parameters[i].givenValues = config_.task->givenValues(i);
      }
    }
    readSimultaneousSimulations();
    readMeasureFile();
    checkFileRoles(config_, sections_);
    warnOfDoubtfulSettings(config_, sections_);
    config_.resultSettings = std::move(file_.resultSettings());
    return std::move(config_);
  }

 private:
  void readSimulationOption();
  void checkBaseFolder(const SetupSection& section);
  void checkBatchItem(const SetupSection& section, const BatchItem& item);
  void refuseNameOfSetup(const std::string& path, std::string_view keyword, const SetupSection& section) const;
  void checkParameterFile(const SetupSection& section, const ParameterFileItem& item) const;
  void checkTemplates() const;
  void readModelParameters();
  void readInternalConstraints();
  void readObjectiveFunctions();
  void readValidationPeriods(const SetupSection& parent);
  static void locateReference(const SetupSection& section, SeriesReference& reference);
  void readSeries(const SetupSection& section, OutputMeasure& measure);
  void readListing(const SetupSection& section, SeriesReference& simulation);
  void connectMeasures();
  void readSavedFiles();
  void readSimultaneousSimulations();
  void readMeasureFile();
  void readInstructions(const SetupSection& section);
  static std::shared_ptr<const InstructionFile> openInstructions(const SetupSection& section, const std::string& file);
  void readFurtherMeasureFiles(const SetupSection& section);
  void gatherMeasurements(const SetupSection& section);
  void findMeasurement(const SetupSection& section, OutputMeasure& measure) const;
  void requireScales(bool hasInitialSample) const;

  /// The numbers that instructions read.
  struct Measurements {
    std::vector<std::string> names;
    std::unordered_map<std::string, std::size_t> places;  ///< by name in lower case
    std::vector<std::size_t> ends;                        ///< of the files, in `names`
    std::string files;                                    ///< of instructions, for messages
  };

  SetupFile& file_;
  SetupSection target_;
  Measurements measurements_;
  RunConfig config_;
  SectionsRead sections_;
  std::optional<EquationCheck> equations_;  ///< over the parameters, once they are read
  using Listing = std::pair<ListingSettings, std::shared_ptr<const ListingForm>>;
  std::vector<Listing> listings_;  ///< that were read
};

void SetupReader::readSimulationOption() {
  const SetupSection section = target_.open("MIREVO_SIMULATION_OPTION");
  section.read(simulationOptionSection(), config_);
  checkBaseFolder(section);
  file_.need(seriesSections(target_));
  if (config_.task) {
    if (auto form = selectedForm(*config_.task, target_)) config_.task = std::move(form);
    file_.need(config_.task->neededSections(target_));
  } else {
    section.warn("Option", "no task has this number, nothing will be run");
  }
  section.open("SIMBATCH")
      .readItems("SIMBATCHITEM_", batchItemSection(), config_.batchItems, "Error: No model simulation sequence defined",
                 [this](const SetupSection& opened, const BatchItem& item) {
                   checkBatchItem(opened, item);
                   sections_.batchItems.push_back(opened);
                 });
  section.open("SIMPARAM")
      .readItems("SIMPARAMITEM_", parameterFileSection(), config_.parameterFiles,
                 "Error: No model parameter files defined",
                 [this](const SetupSection& opened, const ParameterFileItem& item) {
                   checkParameterFile(opened, item);
                   sections_.parameterFiles.push_back(opened);
                 });
}

/// As the setup has it; most have none.
void SetupReader::checkBaseFolder(const SetupSection& section) {
  std::string& folder = config_.baseFolder;
  if (folder.empty()) return;
  while (folder.size() > 1 && folder.back() == '/') folder.pop_back();
  std::error_code failed;
  if (std::filesystem::is_directory(folder, failed)) return;
  section.refuse("Error: Invalid base folder", "Base_Folder", fmt::format("there is no folder {}", folder));
}

void SetupReader::checkBatchItem(const SetupSection& section, const BatchItem& item) {
  constexpr std::string_view kKeyword = "BatchFileName";
  const std::string& path = item.batchFileName;
  if (path.empty()) {
    section.refuse("Error: No model simulation sequence defined", kKeyword, "expected the name of a file");
  }
  const bool isFirst = &item == &config_.batchItems.front();
  if (isFirst && config_.baseFolder.empty()) {
    config_.baseFolder = std::filesystem::path(path).parent_path().string();
  }
  validateInBaseFolder(path, config_.baseFolder, kKeyword, section);
  validateFileExists(path, kKeyword, section);
  refuseNameOfSetup(path, kKeyword, section);
  if (std::string reason; !splitArguments(item.arguments, reason)) {
    section.refuse("Error: Unable to initialise MirevoSimpleLaunch", "Arguments",
                   fmt::format("{}, found {}", reason, quotedForMessage(item.arguments)));
  }
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

void SetupReader::checkParameterFile(const SetupSection& section, const ParameterFileItem& item) const {
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
  if (item.templateType == TemplateType::numericId) return;
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
    sections_.parameters.push_back(list.openItem("PARAMETER_", i + 1));
    ModelParameter& parameter = config_.parameters.emplace_back();
    if (const auto keyLines = sections_.parameters.back().openIfPresent("Keywords")) {
      keyLines->read(keyLinesSection(), parameter);
    }
  }
  NamesUsed names;
  for (std::size_t i = 0; i < count; ++i) {
    const SetupSection& section = sections_.parameters[i];
    section.echoName();
    section.read(parameterSection(), config_.parameters[i]);
    section.require(validateParameterDefinition(config_.parameters[i], names));
  }
  if (count == 0) list.refuse("Error: No model parameters defined", kItemCountKeyword, "expected 1 or more, found 0");
  if (config_.variableParameterCount() == 0) {
    list.refuse("Error: No variable model parameters defined", kItemCountKeyword,
                "expected a parameter with Parameter_Type = 0, found none");
  }
  equations_.emplace(config_.parameters);
  equations_->checkDependentParameters(config_.parameters, sections_.parameters);
  checkTemplates();
}

/// Which parameters there are is known only after the templates' section was read.
void SetupReader::checkTemplates() const {
  for (std::size_t i = 0; i < sections_.parameterFiles.size(); ++i) {
    sections_.parameterFiles[i].checkAt("TemplateFileName",
                                        [&] { readTemplate(config_.parameterFiles[i], config_.parameters); });
  }
}

void SetupReader::readInternalConstraints() {
  target_.open("MODEL_PARAMETERS")
      .open("INTERNAL_CONSTRAINTS")
      .readItems("CONSTRAINT_", constraintSection(), config_.constraints,
                 [this](const SetupSection& section, const InternalConstraint& constraint) {
                   equations_->checkConstraint(constraint, section);
                 });
}

void SetupReader::readObjectiveFunctions() {
  const SetupSection section = target_.open("ObjectiveFunctions");
  section.read(judgementSection(), config_);
  sections_.judgement = section;
  readValidationPeriods(section);

  section.open("OUTPUT_MEASURES")
      .readItems("MEASURE_", measureSection(), config_.measures, "Error: No output measures defined",
                 [this](const SetupSection& opened, OutputMeasure& measure) {
                   opened.require(validateOwnPeriod(measure, config_.period));
                   locateSelection(opened, measure.selection);
                   readSeries(opened, measure);
                   sections_.measures.push_back(opened);
                 });
  NamesUsed names;
  section.open("OBJECTIVE_FUNCTIONS")
      .readItems(
          "OBJECTIVE_", objectiveSection(), config_.objectives, "Error: No objective functions defined",
          [this](const SetupSection& opened, const ObjectiveFunction&) { sections_.objectives.push_back(opened); },
          [&names](ObjectiveFunction& function) {
            return ObjectiveSection{function, names};
          });
  connectMeasures();
  if (!config_.task || !config_.task->mayHaveInitialSample()) requireScales(false);
}

void SetupReader::readValidationPeriods(const SetupSection& parent) {
  const auto list = parent.openIfPresent("VALIDATION_PERIODS");
  if (!list) return;
  NamesUsed names;
  list->readItems("VALIDATION_", validationPeriodSection(), config_.validationPeriods,
                  [&](const SetupSection& section, ValidationPeriod& period) {
                    if (trim(period.name).empty()) period.name = namedByDates(period);
                    section.require(validatePeriodName(period, names));
                    sections_.validationPeriods.push_back(section);
                  });
}

/// Files of series are opened when the whole setup has been read; what is wrong with them is then told with its
/// location.
void SetupReader::locateReference(const SetupSection& section, SeriesReference& reference) {
  reference.fileLocation = section.location("File_Name") + ": File_Name: ";
  reference.isOfModel = section.name() == "SIMULATION_FILE";
  reference.itemName = trim(reference.itemName);
  const std::string_view itemKeyword = reference.itemName.empty() ? "Item_No" : "Item_Name";
  reference.itemLocation = fmt::format("{}: {}: ", section.location(itemKeyword), itemKeyword);
  reference.hasItemNo = section.isWritten("Item_No");
  reference.isDefaultItem = !reference.hasItemNo && reference.itemName.empty();
  for (const KeywordRow& row : textFormRows<TextForm>([](auto& form) -> auto& { return form; })) {
    if (!section.isWritten(row.name()) || reference.form.isGiven) continue;
    reference.form.isGiven = true;
    reference.formLocation = fmt::format("{}: {}: ", section.location(row.name()), row.name());
  }
  if (const auto fault = findFault(reference.form)) {
    section.refuse("Error: Form of a text file invalid", fault->keyword, fault->explanation);
  }
}

void SetupReader::readSeries(const SetupSection& section, OutputMeasure& measure) {
  const std::int64_t number = std::ssize(config_.measures);
  // A measure that the model writes itself needs no series; its sections are read if present.
  const bool needsSeries = measure.interfaceType == InterfaceType::timeSeries;
  const auto open = [&](std::string_view name) {
    return needsSeries ? std::optional(section.open(name)) : section.openIfPresent(name);
  };
  if (const auto simulated = open("SIMULATION_FILE")) {
    simulated->read(simulationFileSection(), measure);
    locateReference(*simulated, measure.simulation);
    if (measure.simulation.fileName.empty() && needsSeries) {
      simulated->refuse(withNumber("Error: No output file defined for output measure No. %", number), "File_Name",
                        "expected the name of a file");
    }
    if (!measure.simulation.fileName.empty()) {
      validateInBaseFolder(measure.simulation.fileName, config_.baseFolder, "File_Name", *simulated);
    }
    if (needsSeries) readListing(*simulated, measure.simulation);
  }
  if (const auto observed = open("OBSERVATION_FILE")) {
    observed->read(observationFileSection(), measure);
    locateReference(*observed, measure.observation);
    const auto locationOf = [&observed](std::string_view item, const std::string& name) {
      const std::string keyword = fmt::format("{}{}", item, name.empty() ? "_No" : "_Name");
      return fmt::format("{}: {}: ", observed->location(keyword), keyword);
    };
    const ObservationWeighting& weighting = measure.weighting;
    measure.weighting.weightLocation = weighting.hasErrors() ? locationOf("Error_Item", weighting.errorName)
                                                             : locationOf("Weight_Item", weighting.weightName);
    measure.weighting.qualityLocation = locationOf("Quality_Item", weighting.qualityName);
    if (observed->isWritten("Quality_Weight") && measure.weighting.downWeighted.empty()) {
      observed->warn("Quality_Weight", "has no effect without Quality_Down_Weighted");
    }
    if (measure.observation.fileName.empty() && needsSeries) {
      observed->refuse(withNumber("Error: No observation file defined for output measure No. %", number), "File_Name",
                       "expected the name of a file");
    }
  }
  if (const auto above = section.openIfPresent("SHOWN_ABOVE")) {
    above->read(shownAboveSection(), measure.shownAbove);
    locateReference(*above, measure.shownAbove);
  }
}

/// What of a listing is a series. Files are read once for all measures with the same settings.
void SetupReader::readListing(const SetupSection& section, SeriesReference& simulation) {
  const ListingSettings& settings = simulation.listingSettings;
  if (settings.instructionFile.empty()) {
    for (const std::string_view keyword :
         {kInstructionTimesKeyword, kInstructionDatesKeyword, kInstructionStartKeyword, kInstructionStepKeyword}) {
      if (section.isWritten(keyword)) {
        section.warn(keyword, fmt::format("has no effect without {}", kInstructionFileKeyword));
      }
    }
    return;
  }
  if (simulation.form.isGiven) {
    section.refuse("Error: Form of a text file invalid", kInstructionFileKeyword,
                   "the file is either a text table or a listing that instructions read: leave out this keyword, or "
                   "those that tell the form of a table");
  }
  const auto known = std::ranges::find(listings_, settings, &Listing::first);
  if (known != listings_.end()) {
    simulation.listing = known->second;
    return;
  }
  ListingFault fault;
  simulation.listing = ListingForm::read(settings, fault);
  if (!simulation.listing) {
    section.refuse(fault.keyword == kInstructionFileKeyword ? "Error: Invalid instruction file"
                                                            : "Error: Invalid times of the numbers in a listing",
                   fault.keyword, fault.text);
  }
  listings_.emplace_back(settings, simulation.listing);
}

/// Adds to each objective function the measures that name it.
void SetupReader::connectMeasures() {
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
      sections_.measures[i].refuse(
          "Error: Invalid function name for output measure " + measure.name, "Function_Name",
          fmt::format("no objective function is called {}{}", quotedForMessage(measure.functionName),
                      nearest ? fmt::format(", did you mean {}?", quotedForMessage(*nearest)) : ""));
    }
    // cppcheck-suppress derefInvalidIteratorRedundantCheck ; refuse() does not return
    config_.objectives[found->second].measures.emplace_back(i, measure);
  }
  for (std::size_t i = 0; i < config_.objectives.size(); ++i) {
    if (!config_.objectives[i].measures.empty()) continue;
    sections_.objectives[i].warn("Name",
                                 "no output measure has this Function_Name, the objective function is always 0");
  }
}

void SetupReader::requireScales(bool hasInitialSample) const {
  for (std::size_t i = 0; i < config_.objectives.size(); ++i) {
    sections_.objectives[i].require(
        validateTransformation(config_.objectives[i], config_.aggregationMethod, hasInitialSample));
  }
}

void SetupReader::readSavedFiles() {
  target_.open("SAVE_OUTPUT_FILES")
      .readItems("OUTPUT_FILE_", savedFileSection(), config_.savedOutputFiles,
                 [this](const SetupSection& section, const SavedOutputFile& file) {
                   if (file.fileName.empty()) {
                     section.refuse("Error: No output file defined to be saved", "File_name",
                                    "expected the name of a file");
                   }
                   validateInBaseFolder(file.fileName, config_.baseFolder, "File_name", section);
                 });
}

void SetupReader::readSimultaneousSimulations() {
  const SetupSection section = target_.open("SimultaneousSimulations");
  section.read(slotsSection(), config_);
  sections_.slots = section;
  if (config_.usesMpiWorkers) {
    if (config_.simultaneousSimulations > 1) section.note(kSlotsKeyword, "taken as 1 on each worker of the MPI job");
    config_.simultaneousSimulations = 1;
    return;
  }
  // A slot has its own copy of the model; unused slots would only fill the disk.
  const int mostUsed = config_.mostAtOnce();
  if (config_.simultaneousSimulations <= mostUsed) return;
  config_.simultaneousSimulations = mostUsed;
  if (config_.task && !config_.task->earlierResultFile().empty()) return;  // it runs no model
  section.warn(kSlotsKeyword, fmt::format("only {} can be used by the evaluations of this run", mostUsed));
}

void SetupReader::readMeasureFile() {
  const SetupSection section = target_.open("ObjectiveFunctions").open("OUTPUT_MEASURES").open("OUTPUT_MEASURE_FILE");
  section.read(measureFileSection(), config_);
  sections_.measureFile = section;
  if (!config_.measureFile.empty()) {
    validateInBaseFolder(config_.measureFile, config_.baseFolder, "File_Name", section);
  } else if (config_.readsMeasureFile()) {
    section.refuse("Error: File containing output measures not defined", "File_Name",
                   "expected the name of a file, since an output measure has Interface_Type = 1");
  }
  readInstructions(section);
}

std::shared_ptr<const InstructionFile> SetupReader::openInstructions(const SetupSection& section,
                                                                     const std::string& file) {
  std::string reason;
  const auto text = readTextFile(file, reason);
  if (!text) {
    section.refuse("Error: Unable to open instruction file", "Instruction_File", fmt::format("{}: {}", file, reason));
  }
  auto instructions = InstructionFile::parse(file, *text, reason);
  if (!instructions) section.refuse("Error: Invalid instruction file", "Instruction_File", reason);
  return std::make_shared<const InstructionFile>(*std::move(instructions));
}

/// The output-measure files behind the one of `section`.
void SetupReader::readFurtherMeasureFiles(const SetupSection& section) {
  const auto list = target_.open("ObjectiveFunctions").open("OUTPUT_MEASURES").openIfPresent("FURTHER_FILES");
  if (!list) return;
  list->readItems("FURTHER_FILE_", furtherMeasureFileSection(), config_.furtherMeasureFiles,
                  [this](const SetupSection& opened, MeasureFileSource& file) {
                    if (file.fileName.empty()) {
                      opened.refuse("Error: File containing output measures not defined", "File_Name",
                                    "expected the name of a file");
                    }
                    validateInBaseFolder(file.fileName, config_.baseFolder, "File_Name", opened);
                    file.instructions = openInstructions(opened, file.instructionFile);
                    sections_.furtherMeasureFiles.push_back(opened);
                  });
  if (config_.furtherMeasureFiles.empty()) return;
  if (!config_.instructions) {
    section.refuse("Error: Instruction file of the output-measure file not defined", "Instruction_File",
                   "expected the name of a file, since there are FURTHER_FILES, whose numbers are counted on from its");
  }
}

/// Names of all output-measure files: each tells one number of them.
void SetupReader::gatherMeasurements(const SetupSection& section) {
  const auto gather = [&](const InstructionFile& instructions, const std::string& file) {
    for (const std::string& name : instructions.names()) {
      if (!measurements_.places.emplace(toLowerAscii(name), measurements_.names.size()).second) {
        section.refuse("Error: Invalid instruction file", "Instruction_File",
                       fmt::format("expected a name in {} that is not in {}, found {}", file, measurements_.files,
                                   quotedForMessage(name)));
      }
      measurements_.names.push_back(name);
    }
    measurements_.ends.push_back(measurements_.names.size());
    measurements_.files += (measurements_.files.empty() ? "" : ", ") + file;
  };
  if (config_.instructions) gather(*config_.instructions, config_.instructionFile);
  for (const MeasureFileSource& file : config_.furtherMeasureFiles) gather(*file.instructions, file.instructionFile);
}

/// Where the numbers of the output-measure files are, and the numbers of the measures that name them.
void SetupReader::readInstructions(const SetupSection& section) {
  if (!config_.instructionFile.empty() && !config_.readsMeasureFile()) {
    section.warn("Instruction_File", "not read, as no output measure has Interface_Type = 1");
  } else if (!config_.instructionFile.empty()) {
    config_.instructions = openInstructions(section, config_.instructionFile);
  }
  if (config_.readsMeasureFile()) readFurtherMeasureFiles(section);
  gatherMeasurements(section);
  for (std::size_t i = 0; i < config_.measures.size(); ++i) {
    OutputMeasure& measure = config_.measures[i];
    if (measure.interfaceType == InterfaceType::measureFile) {
      findMeasurement(sections_.measures[i], measure);
    } else if (!measure.measurementName.empty()) {
      sections_.measures[i].warn("Measurement_Name", "has no effect with Interface_Type = 0");
    }
  }
}

/// Which number of the output-measure files a measure is.
void SetupReader::findMeasurement(const SetupSection& section, OutputMeasure& measure) const {
  const std::string message = "Error: Measurement No. invalid for output measure " + measure.name;
  const InstructionFile* const instructions = config_.instructions.get();
  const std::string_view name = trim(measure.measurementName);
  if (instructions == nullptr) {
    if (name.empty()) return;
    section.refuse(message, "Measurement_Name",
                   "expected MeasurementNo, or Instruction_File in OUTPUT_MEASURE_FILE, of which this would be a name");
  }
  const std::vector<std::string>& names = measurements_.names;
  const std::string& files = measurements_.files;
  if (name.empty()) {
    if (static_cast<std::size_t>(measure.measurementNo) > names.size()) {
      section.refuse(message, "MeasurementNo",
                     fmt::format("expected 1 to {}, since so many numbers are read by {}, found {}", names.size(),
                                 files, measure.measurementNo));
    }
  } else {
    if (section.isWritten("MeasurementNo")) {
      section.refuse(message, "Measurement_Name", "expected this or MeasurementNo, found both");
    }
    const auto place = measurements_.places.find(toLowerAscii(name));
    if (place == measurements_.places.end()) {
      const auto nearest = nearestName(name, names);
      section.refuse(message, "Measurement_Name",
                     fmt::format("expected a name in {}, found {}{}", files, quotedForMessage(name),
                                 nearest ? fmt::format(", did you mean {}?", *nearest) : ""));
    }
    measure.measurementNo = static_cast<std::int32_t>(place->second) + 1;
  }
  const auto number = static_cast<std::size_t>(measure.measurementNo);
  const auto file = static_cast<std::size_t>(
      std::lower_bound(measurements_.ends.begin(), measurements_.ends.end(), number) - measurements_.ends.begin());
  if (file > 0) measure.measureFile = config_.furtherMeasureFiles[file - 1].fileName;
}

}  // namespace

RunConfig readSetup(const std::string& fileName, std::string_view text, RunLog& log, bool usesMpiWorkers) {
  const SetupLocation location = locateSetup(fileName);
  const std::string name(trim(fileName));
  const DecodedText decoded = decodeText(text);
  if (decoded.encoding != "UTF-8") {
    log.warning(fmt::format("{}: the text is not UTF-8 and is read as {}", name, decoded.encoding));
  }
  SetupFile file(name, location.folder, decoded.text, setupSchema(), log);
  warnAboutUnusedEntries(file);
  return SetupReader(file, location, usesMpiWorkers).read();
}

RunConfig readSetupFile(const std::string& fileName, RunLog& log) {
  return readSetup(fileName, readSetupText(fileName), log);
}

void requireSetupFile(const SetupLocation& setup) {
  const std::string unopened = "Error: Unable to open " + setup.file;
  if (const std::string fault = faultOfFile(setup.folder); fault == std::strerror(ENOENT)) {
    fatalError(unopened, fmt::format("there is no folder {}", setup.folder));
  } else if (fault.empty()) {
    fatalError(unopened, fmt::format("{} is a file and no folder", setup.folder));
  }
  const std::string fault = faultOfFile(setup.file);
  if (fault.empty()) return;
  std::error_code ignored;
  if (std::filesystem::exists(setup.file, ignored)) fatalError(unopened, fault);  // it may be in /dev
  // The run's files would be those of that setup, of which a run may be going on.
  const std::string meant = setup.file + ".kdx";
  if (faultOfFile(meant).empty()) fatalError(unopened, fmt::format("{}; did you mean {}?", fault, meant));
}

std::string readSetupText(const std::string& fileName) {
  const std::string name(trim(fileName));
  std::string reason;
  auto text = readTextFile(name, reason);
  if (!text) fatalError("Error: Unable to open " + name, reason);
  return std::move(*text);
}

}  // namespace mirevo

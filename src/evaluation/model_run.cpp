#include "evaluation/model_run.h"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <memory>
#include <new>
#include <numeric>
#include <sys/stat.h>
#include <unistd.h>
#include <utility>
#include <variant>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/file_copy.h"
#include "common/files.h"
#include "common/paths.h"
#include "common/reading_watch.h"
#include "common/run_files.h"
#include "common/text.h"
#include "measures/measure_file.h"
#include "parameters/read_template.h"
#include "platform/processes/folder_room.h"
#include "platform/processes/leaving_links.h"
#include "platform/processes/own_files.h"
#include "platform/processes/process_folder.h"

namespace mirevo {
namespace {

using Kind = EvaluationFailure::Kind;

/// Number of last lines of a failed batch's output that are kept as evidence.
constexpr int kEvidenceLines = 20;
constexpr std::string_view kCrossSectionExtension = ".qcsr";

EvaluationFailure::Kind failureKind(BatchFailure::Kind kind) {
  switch (kind) {
    case BatchFailure::Kind::signal:
      return Kind::signal;
    case BatchFailure::Kind::couldNotStart:
      return Kind::couldNotStart;
    case BatchFailure::Kind::timedOut:
      return Kind::timedOut;
    default:
      return Kind::exitCode;
  }
}

EvaluationFailure parameterFailure(const ParameterFailure& failure) {
  const bool violated = failure.kind == ParameterFailure::Kind::constraintViolated;
  return {violated ? Kind::constraintsViolated : Kind::equationNotFinite, failure.detail, {}};
}

std::string_view resistanceUpdateText(ResistanceUpdate outcome) {
  switch (outcome) {
    case ResistanceUpdate::updated:
      break;
    case ResistanceUpdate::functionNotFound:
      return "Function \"R35UpdateResistanceNumbers\" not found in DLL";
    case ResistanceUpdate::libraryNotFound:
      return "DLL \"ProfileTool.dll\" not found";
    case ResistanceUpdate::writeError:
      return "Error writing the .qcs cross section file";
    case ResistanceUpdate::readError:
      return "Error reading the .qcs cross section file";
    case ResistanceUpdate::documentCreationFailed:
      return "Creation of document object failed";
    case ResistanceUpdate::noReadAccess:
      return "Read access to the .qcs cross section file not found";
    case ResistanceUpdate::wrongExtension:
      return "File extension \".qcsr\" is expected";
  }
  return {};
}

template <class Values>
ValueSummary summaryOf(const Values& values) {
  const auto [least, largest] = std::minmax_element(values.begin(), values.end());
  const double sum = std::accumulate(values.begin(), values.end(), 0.0);
  return {*least, sum / static_cast<double>(values.size()), *largest};
}

MeasurePairs pairsOf(std::size_t measure, const MeasureStatistics& statistics, const TimeSeriesObject& simulation,
                     const FileForm& file) {
  const std::int64_t start = secondNumber(simulation.startTime().value());
  constexpr double kDaySeconds = 86400.0;
  const auto second = [start](double days) { return start + std::llround(days * kDaySeconds); };
  const std::size_t count = statistics.simulatedValues.size();
  return {measure,
          count,
          statistics.observationCount - count,
          second(statistics.times.front()),
          second(statistics.times.back()),
          summaryOf(statistics.observedValues),
          summaryOf(statistics.simulatedValues),
          file};
}

/// 0 if the file is gone, else errno.
int errorOfRemoval(const std::string& path) {
  return ::unlink(path.c_str()) == 0 || errno == ENOENT || errno == ENOTDIR ? 0 : errno;
}

/// Such a file the model has left (immutable, mounted over); any other reason is the disk's.
bool isDoneByModel(int error) {
  return error == EPERM || error == EACCES || error == EBUSY;
}

}  // namespace

ModelRunner::ModelRunner(ModelDescription description, ParameterModel& parameters, ObjectiveAggregator& aggregator,
                         ProcessLauncher& launcher, const LauncherSettings& launcherSettings)
    : description_(std::move(description)),
      parameters_(parameters),
      aggregator_(aggregator),
      launcher_(launcher),
      processFolderPrefix_(launcherSettings.processFolderPrefix),
      shownRuns_(ToModelScale(parameters.searchSpace(), parameters.searchSpace().initial)) {
  requireFilesInBaseFolder();
  LauncherSettings settings = launcherSettings;
  maxSeconds_ = settings.maxSeconds;
  needs_ = folderNeeds(settings);
  settings.ownFiles = needs_.ownFiles();
  warnings_ = requireOwnFiles(description_.baseFolder, settings.ownFiles);
  readTemplates();
  series_ = SeriesTables::MirevoTSobjectInit(description_.measures, description_.period, description_.isForRuns);
  shownMeasures_ = measuresOfDistinctPairs(description_.measures);
  for (const OutputMeasure& measure : description_.measures) {
    if (measure.interfaceType != InterfaceType::measureFile) continue;
    numbersNeeded_ = std::max(numbersNeeded_, static_cast<std::size_t>(measure.measurementNo));
  }
  if (std::error_code none; !description_.measureFile.empty()) {
    const std::uintmax_t size = std::filesystem::file_size(trimTrailing(description_.measureFile), none);
    if (!none) usualNumbers_ = size;
  }
  savedFiles_ = SavedFiles(description_.savedFiles, description_.baseFolder, description_.savedFolder);
  for (std::size_t i = 0; i < description_.measures.size() && description_.keepSimulatedValues; ++i) {
    const OutputMeasure& measure = description_.measures[i];
    if (measure.interfaceType != InterfaceType::timeSeries) continue;
    observedSeries_.push_back(
        readObservedSeries(i, measure, description_.period, description_.keptPrecision, series_.observation(i)));
  }
  if (settings.slotCount > 0 && !launcher_.initialise(settings)) {
    fatalError("Error: Unable to initialise MirevoSimpleLaunch", launcher_.lastError());
  }
  if (settings.slotCount > 0 && settings.firstFolderNumber == 1 && description_.runsAtOnce > 1) {
    const std::vector<std::string> own{description_.baseFolder, folderOf(processFolderPrefix_),
                                       folderOf(description_.savedFolder)};
    sharedTargets_ = SharedTargets(launcher_.getProcessFolder(1), own);
  }
  for (int slot = 1; slot <= settings.slotCount; ++slot) {
    SlotFiles& files = slots_.emplace_back();
    for (const ParameterFileItem& item : description_.parameterFiles) {
      files.parameterFiles.push_back(slotPath(item.paramFileName, slot));
    }
    writeConvertedTemplates(slot);
    for (const std::string& name : series_.simulationFileNames()) files.simulationFiles.push_back(slotPath(name, slot));
    if (!description_.measureFile.empty()) files.measureFile = slotPath(description_.measureFile, slot);
  }
}

/// For inspection only; in the copies, since the base folder is never written to.
void ModelRunner::writeConvertedTemplates(int slot) const {
  for (std::size_t i = 0; i < convertedTexts_.size(); ++i) {
    const std::string& templateName = description_.parameterFiles[i].templateFileName;
    // One behind a link that all slots share is not theirs to write beside.
    const bool isShared =
        findLeavingLink(launcher_.getProcessFolder(slot), folderOf(belowBase(templateName))).has_value();
    if (convertedTexts_[i].empty() || isShared) continue;
    const std::string name = slotPath(templateName, slot) + description_.fileTag + ".tpl";
    std::string reason;
    if (!writeByUnlinkAndCreate(name, convertedTexts_[i], 0666, reason))
      fatalError("Error: Unable to open " + name, reason);
  }
}

FolderNeeds ModelRunner::folderNeeds(const LauncherSettings& settings) const {
  FolderNeeds needs;
  for (const ParameterFileItem& item : description_.parameterFiles) {
    needs.parameterFiles.push_back(belowBase(item.paramFileName));
  }
  for (const OutputMeasure& measure : description_.measures) {
    if (measure.interfaceType == InterfaceType::timeSeries)
      needs.outputs.push_back(belowBase(measure.simulation.fileName));
  }
  if (!description_.measureFile.empty()) needs.outputs.push_back(belowBase(description_.measureFile));
  for (const std::string& name : description_.savedFiles) needs.savedFiles.push_back(belowBase(name));
  for (const BatchItem& item : settings.batchItems) needs.batchFiles.push_back(belowBase(item.batchFileName));
  return needs;
}

std::string ModelRunner::belowBase(const std::string& file) const {
  return std::string(trimTrailing(file).substr(description_.baseFolder.size()));
}

void ModelRunner::requireFilesInBaseFolder() const {
  std::vector<std::string> names;
  for (const ParameterFileItem& item : description_.parameterFiles) {
    names.push_back(item.paramFileName);
    names.push_back(item.templateFileName);
  }
  for (const OutputMeasure& measure : description_.measures) {
    if (measure.interfaceType == InterfaceType::timeSeries) names.push_back(measure.simulation.fileName);
  }
  if (!description_.measureFile.empty()) names.push_back(description_.measureFile);
  names.insert(names.end(), description_.savedFiles.begin(), description_.savedFiles.end());
  for (const std::string& name : names) {
    if (name.starts_with(description_.baseFolder + "/")) continue;
    fatalError(
        fmt::format("Error: The file {} does not lie in the model's folder", trimTrailing(name)),
        fmt::format("expected a file in {} or below it, the folder of the first batch file, which every slot has "
                    "a copy of",
                    description_.baseFolder));
  }
}

void ModelRunner::readTemplates() {
  const std::vector<ModelParameter>& parameters = parameters_.parameters();
  for (const ParameterFileItem& item : description_.parameterFiles) {
    ReadTemplate read = readTemplate(item, parameters);
    templates_.push_back(std::move(read.filled));
    warnings_.insert(warnings_.end(), read.doubts.begin(), read.doubts.end());
    convertedTexts_.push_back(std::move(read.converted));
  }
}

EqualMeasures ModelRunner::equalMeasures() const {
  std::vector<std::string> written;
  for (const ParameterFileItem& item : description_.parameterFiles) {
    written.push_back(item.paramFileName.substr(description_.baseFolder.size() + 1));
  }
  std::vector<std::string> names;
  std::vector<std::string> read;
  for (MeasureSource& source :
       measureSources(description_.measures, description_.measureFile, description_.baseFolder)) {
    names.push_back(std::move(source.name));
    read.push_back(std::move(source.fileName));
  }
  return {parameters_.searchSpace(),
          parameterFields(parameters_, widestPlaceholders(templates_, parameters_.parameters().size())),
          std::move(names), std::move(written), std::move(read)};
}

RunComparison ModelRunner::runComparison() const {
  PairRules rules;
  for (std::size_t i = 0; i < description_.measures.size(); ++i) {
    if (description_.measures[i].interfaceType != InterfaceType::timeSeries) continue;
    rules.requiresShare = description_.minimumCoverage > 0.0;
    rules.requiresProof = rules.requiresProof || !series_.needsPairs(i);
  }
  return {measureSources(description_.measures, description_.measureFile, description_.baseFolder), rules};
}

std::string ModelRunner::slotPath(const std::string& baseFile, int slot) const {
  return launcher_.getProcessFolder(slot) + belowBase(baseFile);
}

std::optional<EvaluationFailure> ModelRunner::findUnwritable(std::span<const double> modelValues) const {
  for (const ParameterTemplate& parameterTemplate : templates_) {
    std::string reason = parameterTemplate.unwritableValue(modelValues, parameters_.parameters());
    if (!reason.empty()) return EvaluationFailure{Kind::valueNotWritable, std::move(reason), {}};
  }
  return std::nullopt;
}

std::optional<EvaluationFailure> ModelRunner::findUnrunnable(std::span<const double> set) {
  const auto mapped = parameters_.MapToModelValues(set);
  if (const auto* failure = std::get_if<ParameterFailure>(&mapped)) return parameterFailure(*failure);
  return findUnwritable(std::get<std::span<const double>>(mapped));
}

std::optional<FolderDamage> ModelRunner::renewIfDamaged(int slot, std::vector<std::string>& warnings) {
  SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  if (!files.isUsed) return std::nullopt;
  const std::string folder = launcher_.getProcessFolder(slot);
  auto damage = findDamage(folder, needs_);
  if (!damage) damage = removeResults(files);
  if (!damage) {
    files.isRenewed = false;
    return std::nullopt;
  }
  if (files.isRenewed) return damage;
  if (!launcher_.renewFolder(slot)) {
    damage->why += fmt::format("; the process folder could not be made anew: {}", launcher_.lastError());
    return damage;
  }
  writeConvertedTemplates(slot);
  files.isUsed = false;
  files.isRenewed = true;
  warnings.push_back(
      fmt::format("The process folder {} was made anew, as the model had damaged it. {}", folder, damage->text()));
  return std::nullopt;
}

/// Files of an earlier run must never be taken for results of the next one.
std::optional<FolderDamage> ModelRunner::removeResults(const SlotFiles& files) {
  std::vector<std::string> results = files.simulationFiles;
  if (!files.measureFile.empty()) results.push_back(files.measureFile);
  for (const std::string& path : results) {
    const int error = errorOfRemoval(path);
    if (isDoneByModel(error)) return FolderDamage{"Unable to remove " + path, std::strerror(error)};
    if (error != 0) fatalError("Error: Unable to remove " + path, std::strerror(error));
  }
  return std::nullopt;
}

std::optional<EvaluationFailure> ModelRunner::prepareModelRun(std::span<const double> set, int slot) {
  const auto mapped = parameters_.MapToModelValues(set);
  if (const auto* failure = std::get_if<ParameterFailure>(&mapped)) return parameterFailure(*failure);
  const auto modelValues = std::get<std::span<const double>>(mapped);
  if (auto failure = findUnwritable(modelValues)) return failure;
  SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  files.isUsed = true;
  if (const auto damage = removeResults(files)) fatalError("Error: " + damage->what, damage->why);
  savedFiles_.markAsOld(launcher_.getProcessFolder(slot));
  for (std::size_t i = 0; i < templates_.size(); ++i) {
    const std::string& path = files.parameterFiles[i];
    WriteParameterFile(path, templates_[i], modelValues);
    if (equalIgnoringCase(std::filesystem::path(path).extension().string(), kCrossSectionExtension)) {
      updateResistanceNumbers(path);
    }
  }
  files.started = runTimeClock() - readingSeconds_;
  shownRuns_.begin(slot, ToModelScale(parameters_.searchSpace(), set));
  launcher_.createProcesses(slot);
  return std::nullopt;
}

void ModelRunner::updateResistanceNumbers(const std::string& path) {
  const ResistanceUpdate outcome = launcher_.r35UpdateResistanceNumbers(path);
  if (outcome == ResistanceUpdate::updated) return;
  fatalError(fmt::format("Error updating resistance numbers: {}", resistanceUpdateText(outcome)), path);
}

EvaluationResult ModelRunner::collect(int slot, std::function<void()> look) {
  beginReading(slot, std::move(look));
  const auto endReading = [this, began = runTimeClock()](ReadingWatch* watch) {
    watch->end();
    const double seconds = runTimeClock() - began;
    readingSeconds_ += seconds;
    launcher_.excludeTime(seconds);
  };
  const std::unique_ptr<ReadingWatch, decltype(endReading)> reading(&series_.watch(), endReading);
  try {
    return read(slot);
  } catch (const std::bad_alloc&) {
    series_.releaseSimulationFiles();
    return failedResult(makeFailure(Kind::resultsNotReadable,
                                    "reading the files of the model run takes more memory than there is", slot));
  }
}

/// A model that ended shortly before its limit is left some time for its results.
void ModelRunner::beginReading(int slot, std::function<void()> look) {
  constexpr double kLeastSeconds = 1.0;
  double seconds = kLongestReading;
  std::string limit = fmt::format("{:g} seconds", kLongestReading);
  if (maxSeconds_ > 0.0) {
    // Without the time in which the results of other slots were read, and this one had to wait.
    const double used = runTimeClock() - readingSeconds_ - slots_.at(static_cast<std::size_t>(slot - 1)).started;
    seconds = std::max(maxSeconds_ - used, kLeastSeconds);
    limit = fmt::format("the model run had left of its {:g} seconds", maxSeconds_);
  }
  series_.watch().begin(seconds, std::move(limit), std::move(look));
}

EvaluationResult ModelRunner::read(int slot) {
  EvaluationResult result = judge(slot);
  for (std::string& line : sharedTargets_.takeChanged()) result.warnings.push_back(std::move(line));
  for (std::string& line : sharedTargets_.takeHardLinked(launcher_.getProcessFolder(slot), needs_.outputs)) {
    result.warnings.push_back(std::move(line));
  }
  for (std::string& line : launcher_.takeWarnings()) result.warnings.push_back(std::move(line));
  // A result that may turn out to be cut off must not keep others from being shown.
  if (result.ok() && (mayBeCutOff(result) || shownRuns_.mayBeShown(slot, result.aggregate))) {
    for (const std::size_t i : shownMeasures_) {
      result.shownSeries.push_back(
          readPeriodSeries(series_.simulation(i), description_.measures[i].simulation, description_.period));
    }
  }
  series_.releaseSimulationFiles();
  return result;
}

std::optional<std::int64_t> ModelRunner::observationLeftOut(std::size_t measure) {
  constexpr std::int64_t kSecondsOfDay = 86400;
  EvaluationPeriod rest{description_.period.end, description_.period.end};
  const std::int64_t end = secondNumber(rest.start);
  if (end % kSecondsOfDay != 0) return std::nullopt;
  rest.end = dateOfSecond(end + kSecondsOfDay - 1);
  const PeriodSeries series =
      readPeriodSeries(series_.observation(measure), description_.measures[measure].observation, rest);
  for (std::size_t i = 0; i < series.seconds.size(); ++i) {
    const bool isOfDay = series.seconds[i] > end && series.seconds[i] < end + kSecondsOfDay;
    if (isOfDay && !std::isnan(series.values[i])) return series.seconds[i];
  }
  return std::nullopt;
}

std::vector<PeriodSeries> ModelRunner::readShownObservations() {
  std::vector<PeriodSeries> observations;
  for (const std::size_t i : shownMeasures_) {
    observations.push_back(
        readPeriodSeries(series_.observation(i), description_.measures[i].observation, description_.period));
  }
  return observations;
}

EvaluationResult ModelRunner::judge(int slot) {
  EvaluationResult result;
  result.measureValues.assign(description_.measures.size(), std::nan(""));
  if (description_.computeExactMeasures) result.exactMeasures = result.measureValues;
  auto failure = findBatchFailure(slot);
  if (!failure) failure = findMissingResults(slot);
  if (!failure) failure = readMeasures(slot, result);
  if (failure) return failedResult(std::move(*failure));

  const auto isFinite = [](double value) { return std::isfinite(value); };
  const auto measure = std::find_if_not(result.measureValues.begin(), result.measureValues.end(), isFinite);
  if (measure != result.measureValues.end()) {
    const auto i = static_cast<std::size_t>(measure - result.measureValues.begin());
    return failedResult(makeFailure(
        Kind::resultNotFinite,
        fmt::format("output measure \"{}\" is {}", trimTrailing(description_.measures[i].name), formatReal(*measure)),
        slot));
  }
  result.objectiveValues = objectiveFunctionValues(description_.objectives, result.measureValues);
  const auto objective = std::find_if_not(result.objectiveValues.begin(), result.objectiveValues.end(), isFinite);
  if (objective != result.objectiveValues.end()) {
    const auto i = static_cast<std::size_t>(objective - result.objectiveValues.begin());
    return failedResult(makeFailure(Kind::resultNotFinite,
                                    fmt::format("objective function \"{}\" is {}",
                                                trimTrailing(description_.objectives[i].name), formatReal(*objective)),
                                    slot));
  }
  result.aggregate = aggregator_.aggregate(result.objectiveValues);
  if (mayBeCutOff(result)) result.lastOutput = launcher_.lastOutput(slot, kEvidenceLines);
  return result;
}

bool ModelRunner::mayBeCutOff(const EvaluationResult& result) const {
  return std::any_of(result.pairs.begin(), result.pairs.end(), [this](const MeasurePairs& pairs) {
    const std::vector<std::size_t>& endless = standard_.withoutLineEnds;
    return !pairs.file.endsLine && std::find(endless.begin(), endless.end(), pairs.measure) == endless.end();
  });
}

void ModelRunner::keepOutputFiles(int slot, int number, EvaluationResult& result,
                                  std::span<const double> repeatedMeasures) const {
  const bool isRepeated = !repeatedMeasures.empty();
  // What was kept of the run that the row describes is not replaced with something else.
  if (isRepeated && (!result.ok() || !std::equal(repeatedMeasures.begin(), repeatedMeasures.end(),
                                                 result.measureValues.begin(), result.measureValues.end()))) {
    return;
  }
  for (UnkeptFile& file : savedFiles_.save(launcher_.getProcessFolder(slot), number, isRepeated)) {
    if (file.isModelsDoing) {
      result.absentFiles.push_back(std::move(file));
    } else {
      result.warnings.push_back(file.reason);
      result.unkeptFiles.push_back(std::move(file));
    }
  }
}

void ModelRunner::keepFailedFolder(int slot, int number, std::vector<std::string>& warnings) const {
  const std::string folder = launcher_.getProcessFolder(slot);
  const std::string kept = fmt::format("{}{}", description_.failedFolderPrefix, number);
  std::string reason = whyNoRoom(folder, folderOf(kept), description_.runsAtOnce);
  try {
    if (reason.empty()) {
      makeProcessFolder(folder, kept, processFolderPrefix_);
      const std::string log = std::string("/") + run_files::kBatchLog;  // not part of the model, so not copied with it
      struct stat status {};
      const bool hasLog = ::stat((folder + log).c_str(), &status) == 0 || errno != ENOENT;
      if (!hasLog || copyWhole(folder + log, kept + log, reason)) return;
      removeIfPossible(kept);
    }
  } catch (const FatalError& error) {
    reason = error.message();
  }
  warnings.push_back(fmt::format("The folder of this run was not kept as {}: {}", kept, reason));
}

EvaluationResult ModelRunner::failedResult(EvaluationFailure failure) const {
  EvaluationResult result;
  result.measureValues.assign(description_.measures.size(), kFailedRunValue);
  result.objectiveValues.assign(description_.objectives.size(), kFailedRunValue);
  result.failure = std::move(failure);
  return result;
}

EvaluationFailure ModelRunner::makeFailure(Kind kind, std::string reason, int slot) const {
  return {kind, std::move(reason), launcher_.lastOutput(slot, kEvidenceLines)};
}

std::optional<EvaluationFailure> ModelRunner::findBatchFailure(int slot) const {
  BatchFailure failure = launcher_.failure(slot);
  if (failure.kind == BatchFailure::Kind::none) return std::nullopt;
  return makeFailure(failureKind(failure.kind), std::move(failure.detail), slot);
}

std::optional<EvaluationFailure> ModelRunner::findMissingResults(int slot) const {
  const SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  std::vector<std::string> wanted = files.simulationFiles;
  if (!files.measureFile.empty()) wanted.push_back(files.measureFile);
  for (const std::string& path : wanted) {
    struct stat status {};
    if (::stat(path.c_str(), &status) == 0) {
      const std::string folder = launcher_.getProcessFolder(slot);
      const auto link = findLeavingLink(folder, std::string_view(path).substr(folder.size()));
      if (!link) continue;
      return makeFailure(Kind::resultsNotReadable, fmt::format("{}: {}", path, describe(*link)), slot);
    }
    if (errno == ENOENT || errno == ENOTDIR) {
      return makeFailure(Kind::resultsNotWritten, "the batch ended well but did not write " + path, slot);
    }
    return makeFailure(Kind::resultsNotReadable, fmt::format("{}: {}", path, std::strerror(errno)), slot);
  }
  return std::nullopt;
}

std::optional<EvaluationFailure> ModelRunner::readMeasures(int slot, EvaluationResult& result) {
  const SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  MeasureFile written;
  if (!files.measureFile.empty()) {
    std::string reason;
    std::optional<MeasureFile> file;
    if (const std::string tooLarge = faultOfSize(files.measureFile, usualNumbers_); !tooLarge.empty()) {
      reason = fmt::format("{}: {}", files.measureFile, tooLarge);
    } else {
      file = readMeasureFile(files.measureFile, numbersNeeded_, reason, series_.watch());
    }
    if (!file) return makeFailure(Kind::resultsNotReadable, std::move(reason), slot);
    written = std::move(*file);
  }
  if (auto unusable = series_.tryOpenSimulationFiles(files.simulationFiles)) {
    return makeFailure(Kind::resultsNotReadable, std::move(*unusable), slot);
  }
  std::optional<EvaluationFailure> failure;
  std::vector<std::optional<FileForm>> forms(files.simulationFiles.size());
  bool hasForm = false;  // of the output-measure file
  for (std::size_t i = 0; i < result.measureValues.size() && !failure; ++i) {
    const OutputMeasure& measure = description_.measures[i];
    if (measure.interfaceType != InterfaceType::measureFile) {
      std::optional<FileForm>& form = forms.at(series_.simulationIndex(i));
      if (!form) form = formOfSeries(series_.simulation(i), description_.period);
      failure = readSeriesMeasure(slot, i, *form, result);
      continue;
    }
    if (!std::exchange(hasForm, true)) {
      MeasurePairs& first = result.pairs.emplace_back();
      first.measure = i;
      first.file.endsLine = written.endsLine;
      first.file.numberCount = written.numbers.size();
    }
    const auto number = static_cast<std::size_t>(measure.measurementNo);
    if (number <= written.numbers.size()) {
      result.measureValues[i] = written.numbers[number - 1];
      if (description_.computeExactMeasures) result.exactMeasures[i] = written.numbers[number - 1];
    } else {
      failure = makeFailure(
          Kind::resultsNotReadable,
          fmt::format("{}: expected at least {} numbers, found {}", files.measureFile, number, written.numbers.size()),
          slot);
    }
  }
  for (const ObservedSeries& observed : observedSeries_) {
    if (failure) break;
    appendSimulatedValues(observed, description_.measures[observed.measure], description_.keptPrecision,
                          description_.period.largestGapDays(), series_.simulation(observed.measure),
                          result.simulatedValues);
  }
  return failure;
}

std::optional<EvaluationFailure> ModelRunner::readSeriesMeasure(int slot, std::size_t i, const FileForm& form,
                                                                EvaluationResult& result) {
  const OutputMeasure& measure = description_.measures[i];
  const std::string path = slotPath(measure.simulation.fileName, slot);
  TimeSeriesObject& simulation = series_.simulation(i);
  if (measure.simulation.itemNo > simulation.itemCount()) {
    return makeFailure(Kind::resultsNotReadable,
                       fmt::format("{}: expected item No. {}, found {} items", path, measure.simulation.itemNo,
                                   simulation.itemCount()),
                       slot);
  }
  try {
    // A model that stopped early is a failed evaluation; a setup whose period no model run can match ends the run.
    const bool canHavePairs = series_.needsPairs(i) || standard_.anyHasSucceeded;
    if (canHavePairs && !hasPairs(measure, description_.period, simulation, series_.observation(i))) {
      return makeFailure(Kind::resultsNotWritten,
                         fmt::format("{}: item No. {} ({}) has no value at any observation time in the evaluation "
                                     "period",
                                     path, measure.simulation.itemNo, simulation.itemName(measure.simulation.itemNo)),
                         slot);
    }
    const MeasureStatistics statistics =
        computeMeasureStatistics(measure, description_.period, simulation, series_.observation(i));
    result.measureValues[i] = selectStatistic(statistics, measure.statisticType);
    if (description_.computeExactMeasures) {
      result.exactMeasures[i] =
          measureValue(measure, description_.period, simulation, series_.observation(i), SeriesPrecision::exact);
    }
    noteUnusedObservations(i, statistics, result);
    result.pairs.push_back(pairsOf(i, statistics, simulation, form));
    return findLackOfPairs(i, statistics.simulatedValues.size(), slot);
  } catch (const FatalError& error) {  // the message names the file as in the setup
    fatalError(error.message(), error.detail() + "\nread from " + path);
  }
}

std::optional<EvaluationFailure> ModelRunner::findLackOfPairs(std::size_t i, std::size_t count, int slot) const {
  if (standard_.firstCounts.empty()) return std::nullopt;
  const std::size_t ofFirst = standard_.firstCounts.at(i);
  // A quotient is rounded to the number that the setup gives, a product need not be: 3 of 30 pairs are 0.1.
  if (ofFirst == 0 || static_cast<double>(count) / static_cast<double>(ofFirst) >= description_.minimumCoverage) {
    return std::nullopt;
  }
  return makeFailure(Kind::tooFewPairs,
                     fmt::format("output measure \"{}\" has {} pairs of simulated and observed values, {} in the "
                                 "first successful run, No. {}: a share below Minimum_Coverage = {}",
                                 trimTrailing(description_.measures[i].name), count, ofFirst, standard_.firstNumber,
                                 formatReal(description_.minimumCoverage)),
                     slot);
}

void ModelRunner::noteUnusedObservations(std::size_t i, const MeasureStatistics& statistics,
                                         EvaluationResult& result) const {
  if (!statistics.firstUnused) return;
  const std::size_t pairs = statistics.simulatedValues.size();
  const OutputMeasure& measure = description_.measures[i];
  result.unusedObservations.push_back(
      {i, pairs,
       fmt::format(
           "output measure \"{}\": {} of {} observations in the evaluation period are not used, as item No. {} of "
           "{} has no value at their time; the first is at {}",
           trimTrailing(measure.name), statistics.observationCount - pairs, statistics.observationCount,
           measure.simulation.itemNo, trimTrailing(measure.simulation.fileName), formatDate(*statistics.firstUnused))});
}

}  // namespace mirevo

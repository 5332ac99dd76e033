#include "evaluation/model_run.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <memory>
#include <new>
#include <sys/stat.h>
#include <sys/sysinfo.h>
#include <unistd.h>
#include <utility>
#include <variant>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/file_copy.h"
#include "common/files.h"
#include "common/paths.h"
#include "common/reading_watch.h"
#include "common/run_files.h"
#include "common/text.h"
#include "measures/statistics.h"
#include "parameters/read_template.h"
#include "platform/processes/folder_room.h"
#include "platform/processes/folder_tree.h"
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
      shownRuns_(ToModelScale(parameters.searchSpace(), parameters.searchSpace().initial), description_.shownRuns) {
  requireFilesInBaseFolder();
  LauncherSettings settings = launcherSettings;
  maxSeconds_ = settings.maxSeconds;
  needs_ = folderNeeds(settings);
  settings.ownFiles = needs_.ownFiles();
  warnings_ = requireOwnFiles(description_.baseFolder, settings.ownFiles);
  readTemplates();
  output_.emplace(description_, aggregator_);
  savedFiles_ = SavedFiles(description_.savedFiles, description_.baseFolder, description_.savedFolder);
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
    files.output.folder = launcher_.getProcessFolder(slot);
    for (const std::string& name : output_->simulationFileNames()) {
      files.output.simulationFiles.push_back(slotPath(name, slot));
    }
    if (!description_.measureFile.empty()) files.output.measureFile = slotPath(description_.measureFile, slot);
    for (const MeasureFileSource& file : description_.furtherMeasureFiles) {
      files.output.furtherMeasureFiles.push_back(slotPath(file.fileName, slot));
    }
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
  for (const MeasureFileSource& file : description_.furtherMeasureFiles) {
    needs.outputs.push_back(belowBase(file.fileName));
  }
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
  for (const MeasureFileSource& file : description_.furtherMeasureFiles) names.push_back(file.fileName);
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
  for (const MeasureSource& source : output_->sources()) {
    names.push_back(isWeightless(description_.measures[read.size()]) ? std::string() : source.name);
    read.push_back(source.fileName);
  }
  return {parameters_.searchSpace(),
          parameterFields(parameters_, widestPlaceholders(templates_, parameters_.parameters().size())),
          std::move(names), std::move(written), std::move(read)};
}

KnownResults ModelRunner::knownResults() const {
  return description_.reusesResults ? KnownResults(parameters_.searchSpace(), aggregator_) : KnownResults();
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

std::optional<FolderDamage> ModelRunner::renewIfDamaged(int slot, std::vector<std::string>& warnings,
                                                        const std::function<void()>& look) {
  SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  if (!files.isUsed) return std::nullopt;
  const std::string folder = launcher_.getProcessFolder(slot);
  auto damage = findDamage(folder, needs_);
  if (!damage) damage = removeResults(files);
  if (!damage) {
    files.isRenewed = false;
    files.isCleared = true;
    return std::nullopt;
  }
  if (files.isRenewed) return damage;
  if (!launcher_.renewFolder(slot, look)) {
    damage->why += fmt::format("; the process folder could not be made anew: {}", launcher_.lastError());
    damage->isFinal = true;
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
  std::vector<std::string> results = files.output.simulationFiles;
  if (!files.output.measureFile.empty()) results.push_back(files.output.measureFile);
  const std::vector<std::string>& further = files.output.furtherMeasureFiles;
  results.insert(results.end(), further.begin(), further.end());
  for (const std::string& path : results) {
    const int error = errorOfRemoval(path);
    if (isDoneByModel(error)) return FolderDamage{"Unable to remove " + path, std::strerror(error)};
    if (error != 0) fatalError("Error: Unable to remove " + path, std::strerror(error));
  }
  return std::nullopt;
}

std::optional<EvaluationFailure> ModelRunner::prepareModelRun(std::span<const double> set, int slot, int number,
                                                              bool isFinal) {
  const auto mapped = parameters_.MapToModelValues(set);
  if (const auto* failure = std::get_if<ParameterFailure>(&mapped)) return parameterFailure(*failure);
  const auto modelValues = std::get<std::span<const double>>(mapped);
  if (auto failure = findUnwritable(modelValues)) return failure;
  SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  files.isUsed = true;
  const auto damage = std::exchange(files.isCleared, false) ? std::nullopt : removeResults(files);
  if (damage) fatalError("Error: " + damage->what, damage->why);
  savedFiles_.markAsOld(launcher_.getProcessFolder(slot));
  for (std::size_t i = 0; i < templates_.size(); ++i) {
    const std::string& path = files.parameterFiles[i];
    WriteParameterFile(path, templates_[i], modelValues);
    if (equalIgnoringCase(std::filesystem::path(path).extension().string(), kCrossSectionExtension)) {
      updateResistanceNumbers(path);
    }
  }
  files.started = runTimeClock() - readingSeconds_;
  files.ended.reset();
  shownRuns_.begin(slot, number, ToModelScale(parameters_.searchSpace(), set), isFinal);
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
  const std::unique_ptr<ReadingWatch, decltype(endReading)> reading(&output_->watch(), endReading);
  try {
    return complete(slot, read(slot));
  } catch (const std::bad_alloc&) {
    output_->release();
    return failedResult({Kind::resultsNotReadable, "reading the files of the model run takes more memory than there is",
                         launcher_.lastOutput(slot, kEvidenceLines)});
  }
}

std::optional<EvaluationResult> ModelRunner::collectBeside(int slot, const std::function<void()>& look) {
  SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  if (!files.ended) files.ended = runTimeClock() - readingSeconds_;
  if (!files.reading) {
    const bool hasFailed = launcher_.failure(slot).kind != BatchFailure::Kind::none;  // and nothing is read of it
    if (hasFailed || !isWorthProcess()) return collect(slot, look);
    if (!mayStartReading(files) || startReading(slot)) return std::nullopt;
    return collect(slot, look);
  }
  switch (files.reading->look()) {
    case ReadingProcess::State::reading:
      return std::nullopt;
    case ReadingProcess::State::done: {
      const std::unique_ptr<ReadingProcess> reading = std::move(files.reading);
      return complete(slot, reading->take());
    }
    case ReadingProcess::State::lost:
      break;
  }
  files.reading.reset();
  return collect(slot, look);  // whatever ended it, which the files may have nothing to do with
}

bool ModelRunner::isWorthProcess() const {
  constexpr double kStarts = 4.0;
  // What is told once would be told by every process.
  if (description_.saysHowToRead()) return false;
  const double expected = std::min(lastReadings_[0], lastReadings_[1]);
  return leastSecondsBeside_ <= 0.0 || expected >= std::max(leastSecondsBeside_, kStarts * lastStart_);
}

/// As many at a time as there are processors, and first what has waited longest.
bool ModelRunner::mayStartReading(const SlotFiles& files) const {
  const auto count =
      std::count_if(slots_.begin(), slots_.end(), [](const SlotFiles& each) { return each.reading != nullptr; });
  if (count >= std::max(1, ::get_nprocs())) return false;
  return std::none_of(slots_.begin(), slots_.end(), [&files](const SlotFiles& other) {
    return other.ended && !other.reading && *other.ended < *files.ended;
  });
}

bool ModelRunner::startReading(int slot) {
  // It ends by itself when its time is over, unless it was stopped, or waits for a disk.
  constexpr double kPatience = 5.0;
  SlotFiles& files = slots_.at(static_cast<std::size_t>(slot - 1));
  files.reading = std::make_unique<ReadingProcess>();
  const double began = runTimeClock();
  const auto readThere = [this, slot] {
    beginReading(slot, {});
    RunReading reading = read(slot);
    output_->endHelper();
    return reading;
  };
  const bool isStarted = files.reading->start(readThere, secondsToRead(files) + kPatience);
  lastStart_ = runTimeClock() - began;
  if (!isStarted) files.reading.reset();
  return isStarted;
}

std::vector<int> ModelRunner::readingSockets() const {
  std::vector<int> sockets;
  for (const SlotFiles& files : slots_) {
    if (files.reading) sockets.push_back(files.reading->socket());
  }
  return sockets;
}

void ModelRunner::endReading() {
  for (SlotFiles& files : slots_) files.reading.reset();
}

/// A model that ended shortly before its limit is left some time for its results.
double ModelRunner::secondsToRead(const SlotFiles& files) const {
  constexpr double kLeastSeconds = 1.0;
  if (maxSeconds_ <= 0.0) return kLongestReading;
  // Without the time in which the results of other slots were read, and this one had to wait.
  const double ended = files.ended.value_or(runTimeClock() - readingSeconds_);
  return std::max(maxSeconds_ - (ended - files.started), kLeastSeconds);
}

void ModelRunner::beginReading(int slot, std::function<void()> look) {
  std::string limit = maxSeconds_ > 0.0 ? fmt::format("the model run had left of its {:g} seconds", maxSeconds_)
                                        : fmt::format("{:g} seconds", kLongestReading);
  output_->watch().begin(secondsToRead(slots_.at(static_cast<std::size_t>(slot - 1))), std::move(limit),
                         std::move(look));
}

/// What a process that reads can find out: nothing here changes this object for good.
RunReading ModelRunner::read(int slot) {
  const double began = runTimeClock();
  auto failure = findBatchFailure(slot);
  RunReading reading;
  EvaluationResult& result = reading.result;
  result =
      failure ? failedResult(std::move(*failure)) : output_->read(slots_.at(static_cast<std::size_t>(slot - 1)).output);
  reading.mayBeCutOff = result.ok() && output_->mayBeCutOff(result);
  if (result.ok() && description_.hasShownSeries &&
      (reading.mayBeCutOff || shownRuns_.wouldBeShown(slot, result.aggregate))) {
    result.shownSeries = output_->readShownSeries();
  }
  output_->release();
  reading.seconds = runTimeClock() - began;
  return reading;
}

/// Adds what depends on other model runs, and on more than the files.
EvaluationResult ModelRunner::complete(int slot, RunReading reading) {
  slots_.at(static_cast<std::size_t>(slot - 1)).ended.reset();
  EvaluationResult result = std::move(reading.result);
  if (result.ok()) {
    lastReadings_ = {lastReadings_[1], reading.seconds};
    result.aggregate = aggregator_.aggregate(result.objectiveValues);  // which may have been settled meanwhile
  }
  if (!result.ok()) result.failure->lastOutput = launcher_.lastOutput(slot, kEvidenceLines);
  if (reading.mayBeCutOff) result.lastOutput = launcher_.lastOutput(slot, kEvidenceLines);
  for (std::string& line : sharedTargets_.takeChanged()) result.warnings.push_back(std::move(line));
  for (std::string& line : sharedTargets_.takeHardLinked(launcher_.getProcessFolder(slot), needs_.outputs)) {
    result.warnings.push_back(std::move(line));
  }
  for (std::string& line : launcher_.takeWarnings()) result.warnings.push_back(std::move(line));
  // A result that may turn out to be cut off must not keep others from being shown.
  const bool isShown = result.ok() && description_.hasShownSeries &&
                       (reading.mayBeCutOff || shownRuns_.mayBeShown(slot, result.aggregate));
  if (!isShown) result.shownSeries = {};
  return result;
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

void ModelRunner::noteUnkeptFiles(EvaluationResult& result, std::string_view reason) const {
  for (UnkeptFile& file : savedFiles_.unkept(reason)) {
    result.warnings.push_back(file.reason);
    result.unkeptFiles.push_back(std::move(file));
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

std::optional<EvaluationFailure> ModelRunner::findBatchFailure(int slot) const {
  BatchFailure failure = launcher_.failure(slot);
  if (failure.kind == BatchFailure::Kind::none) return std::nullopt;
  return EvaluationFailure{failureKind(failure.kind), std::move(failure.detail), {}};
}

}  // namespace mirevo

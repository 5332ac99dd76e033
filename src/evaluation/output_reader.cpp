#include "evaluation/output_reader.h"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <filesystem>
#include <numeric>
#include <string_view>
#include <sys/stat.h>
#include <utility>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/reading_watch.h"
#include "common/text.h"
#include "measures/dates.h"
#include "measures/item_names.h"
#include "measures/measure_file.h"
#include "measures/statistics.h"
#include "platform/processes/leaving_links.h"

namespace mirevo {
namespace {

using Kind = EvaluationFailure::Kind;

EvaluationFailure failureOf(Kind kind, std::string reason) {
  return {kind, std::move(reason), {}};
}

template <class Values>
ValueSummary summaryOf(const Values& values) {
  const auto [least, largest] = std::minmax_element(values.begin(), values.end());
  const double sum = std::accumulate(values.begin(), values.end(), 0.0);
  return {*least, sum / static_cast<double>(values.size()), *largest};
}

/// What a simulated item does that has no value for some observations.
const char* lackAtTimesOf(const OutputMeasure& measure) {
  return measure.timeMatch.kind == TimeMatch::mean ? "lacks a value on their day" : "has no value at their time";
}

MeasurePairs pairsOf(std::size_t measure, const MeasureStatistics& statistics, const TimeSeriesObject& simulation,
                     const FileForm& file) {
  const std::int64_t start = secondNumber(simulation.startTime().value());
  const std::size_t count = statistics.simulatedValues.size();
  return {measure,
          count,
          statistics.observationCount - count,
          secondAfter(start, statistics.times.front()),
          secondAfter(start, statistics.times.back()),
          summaryOf(statistics.observedValues),
          summaryOf(statistics.simulatedValues),
          file};
}

}  // namespace

OutputReader::OutputReader(const ModelDescription& description, const ObjectiveAggregator& aggregator)
    : description_(description),
      aggregator_(aggregator),
      sources_(measureSources(description.measures, description.measureFile, description.baseFolder)),
      series_(SeriesTables::MirevoTSobjectInit(description.measures, description.period, description.isForRuns)),
      shownMeasures_(measuresOfDistinctPairs(description.measures)),
      shownPeriod_(hullOf(description.period, description.validationPeriods)),
      warnings_(series_.warnings()) {
  for (std::size_t i = 0; i < sources_.size(); ++i) {
    const ComparedItems& items = series_.comparedItems(i);
    if (!items.simulated.empty()) sources_[i].simulated += ", " + items.simulated;
    if (!items.observed.empty()) sources_[i].observed += ", " + items.observed;
  }
  for (const OutputMeasure& measure : description.measures) {
    if (measure.interfaceType != InterfaceType::measureFile) continue;
    numbersNeeded_ = std::max(numbersNeeded_, static_cast<std::size_t>(measure.measurementNo));
  }
  const auto noteSize = [this](const std::string& file, const std::shared_ptr<const InstructionFile>& instructions) {
    std::error_code none;
    const std::uintmax_t size = std::filesystem::file_size(trimTrailing(file), none);
    usualNumbers_.push_back(none ? 0 : size);
    if (!none && instructions) tryInstructions(std::string(trimTrailing(file)), *instructions);
  };
  noteSize(description.measureFile, description.instructions);
  for (const MeasureFileSource& file : description.furtherMeasureFiles) noteSize(file.fileName, file.instructions);
  for (std::size_t i = 0; i < description.measures.size() && description.keepSimulatedValues; ++i) {
    const OutputMeasure& measure = description.measures[i];
    if (measure.interfaceType != InterfaceType::timeSeries) continue;
    observedSeries_.push_back(
        readObservedSeries(i, measure, description.period, description.keptPrecision, series_.observation(i)));
  }
  if (description.keptSteps) {
    addSimulatedSteps(*description.keptSteps, description.measures, description.period, observedSeries_);
  }
  prepareValidation();
}

/// A listing that is in the model's folder tells of wrong instructions before all model runs fail with them. It may be
/// one of another version of the model, and a run writes its own.
void OutputReader::tryInstructions(const std::string& listing, const InstructionFile& instructions) {
  std::string reason;
  std::vector<std::string> doubts;
  if (readMeasureFile(listing, 0, reason, series_.watch(), &instructions, &doubts)) {
    warnings_.insert(warnings_.end(), doubts.begin(), doubts.end());
    hasToldDoubts_ = hasToldDoubts_ || !doubts.empty();
    return;
  }
  warnings_.push_back(fmt::format(
      "{}\nThis listing, as it is in the model's folder now, is not as the instruction file says. A model run that "
      "writes such a one has failed",
      reason));
}

void OutputReader::prepareValidation() {
  for (const auto& [i, k] : validationTargets(description_.measures, description_.validationPeriods)) {
    const ValidationPeriod& period = description_.validationPeriods[k];
    Validated& made =
        validated_.emplace_back(Validated{i, k, description_.measures[i], judgedAs(period, description_.period)});
    made.measure.selection.start.reset();  // its own period is one of calibration
    made.measure.selection.end.reset();
    if (!description_.isForRuns) continue;
    try {
      ObservedSeries observed =
          readObservedSeries(i, made.measure, made.period, SeriesPrecision::single, series_.observation(i));
      const bool isEmpty = observed.values.empty();
      if (!isEmpty && description_.keepSimulatedValues) validationObservations_.push_back({k, std::move(observed)});
      if (!isEmpty) continue;
    } catch (const FatalError& error) {  // such as a weight that cannot be one
      warnings_.push_back(fmt::format("{}\nThe measure has no value in the validation period {}",
                                      error.message() + "\n" + error.detail(), quotedForMessage(period.name)));
      continue;
    }
    warnings_.push_back(
        fmt::format("output measure {} has no observation in the validation period {}, and so no value there",
                    quotedForMessage(made.measure.name), quotedForMessage(period.name)));
  }
}

RunComparison OutputReader::runComparison() const {
  PairRules rules;
  for (std::size_t i = 0; i < description_.measures.size(); ++i) {
    if (description_.measures[i].interfaceType != InterfaceType::timeSeries) continue;
    rules.requiresShare = description_.minimumCoverage > 0.0;
    rules.requiresProof = rules.requiresProof || !series_.needsPairs(i);
  }
  return {sources_, rules};
}

std::optional<std::int64_t> OutputReader::observationLeftOut(std::size_t measure) {
  const OutputMeasure& compared = description_.measures[measure];
  const DateRecord last = countedPeriod(compared, description_.period).end;
  EvaluationPeriod rest{last, last};
  const std::int64_t end = secondNumber(rest.start);
  if (end % kSecondsOfDay != 0) return std::nullopt;
  rest.end = dateOfSecond(end + kSecondsOfDay - 1);
  const PeriodSeries series = readPeriodObservations(series_.observation(measure), compared, rest);
  const ObservationFilter filter(compared.selection, last);
  for (std::size_t i = 0; i < series.seconds.size(); ++i) {
    const bool isOfDay = series.seconds[i] > end && series.seconds[i] < end + kSecondsOfDay;
    const double days = static_cast<double>(series.seconds[i] - end) / kSecondsPerDay;
    if (isOfDay && !std::isnan(series.values[i]) && filter.counts(days, series.values[i])) return series.seconds[i];
  }
  return std::nullopt;
}

std::vector<PeriodSeries> OutputReader::readShownObservations() {
  std::vector<EvaluationPeriod> judgedPeriods;
  for (const ValidationPeriod& period : description_.validationPeriods) {
    judgedPeriods.push_back(judgedAs(period, description_.period));
  }
  std::vector<PeriodSeries> observations;
  for (const std::size_t i : shownMeasures_) {
    observations.push_back(readPeriodObservations(series_.observation(i), description_.measures[i], shownPeriod_));
    keepCounted(observations.back(), description_.measures[i], description_.period, judgedPeriods);
  }
  return observations;
}

bool OutputReader::mayBeCutOff(const EvaluationResult& result) const {
  return std::any_of(result.pairs.begin(), result.pairs.end(), [this](const MeasurePairs& pairs) {
    const std::vector<std::size_t>& endless = standard_.withoutLineEnds;
    return !pairs.file.endsLine && std::find(endless.begin(), endless.end(), pairs.measure) == endless.end();
  });
}

EvaluationResult OutputReader::read(const OutputFiles& files) {
  EvaluationResult result;
  result.measureValues.assign(description_.measures.size(), std::nan(""));
  if (description_.computeExactMeasures) result.exactMeasures = result.measureValues;
  auto failure = findMissing(files);
  if (!failure) failure = readMeasures(files, result);
  if (failure) return failedResult(std::move(*failure));

  const auto isFinite = [](double value) { return std::isfinite(value); };
  const auto measure = std::find_if_not(result.measureValues.begin(), result.measureValues.end(), isFinite);
  if (measure != result.measureValues.end()) {
    const auto i = static_cast<std::size_t>(measure - result.measureValues.begin());
    return failedResult(failureOf(
        Kind::resultNotFinite, fmt::format("output measure \"{}\" is {}{}", trimTrailing(description_.measures[i].name),
                                           formatReal(*measure), describeUndefined(description_.measures[i]))));
  }
  result.objectiveValues = objectiveFunctionValues(description_.objectives, result.measureValues);
  const auto objective = std::find_if_not(result.objectiveValues.begin(), result.objectiveValues.end(), isFinite);
  if (objective != result.objectiveValues.end()) {
    const auto i = static_cast<std::size_t>(objective - result.objectiveValues.begin());
    return failedResult(failureOf(Kind::resultNotFinite,
                                  fmt::format("objective function \"{}\" is {}",
                                              trimTrailing(description_.objectives[i].name), formatReal(*objective))));
  }
  result.aggregate = aggregator_.aggregate(result.objectiveValues);
  validate(result);
  return result;
}

void OutputReader::validate(EvaluationResult& result) {
  for (std::size_t k = 0; k < validated_.size(); ++k) {
    const Validated& one = validated_[k];
    const ValidationValue found =
        validationValue(one.measure, one.period, series_.simulation(one.index), series_.observation(one.index));
    result.validationValues.push_back(found.value);
    result.validationPairs.push_back({found.pairCount, found.missingCount});
    if (found.missingCount == 0) continue;
    result.unusedObservations.push_back(
        {description_.measures.size() + k, found.pairCount,
         fmt::format("output measure {}: {} of {} observations in the validation period {} are not used, as item No. "
                     "{} of {} {}{}",
                     quotedForMessage(one.measure.name), found.missingCount, found.pairCount + found.missingCount,
                     quotedForMessage(description_.validationPeriods[one.periodIndex].name),
                     one.measure.simulation.itemNo, trimTrailing(one.measure.simulation.fileName),
                     lackAtTimesOf(one.measure),
                     found.firstUnused ? "; the first is at " + formatDate(*found.firstUnused) : "")});
  }
}

std::vector<PeriodSeries> OutputReader::readShownSeries() {
  std::vector<PeriodSeries> shown;
  for (const std::size_t i : shownMeasures_) {
    shown.push_back(
        readMatchedSeries(series_.simulation(i), series_.observation(i), description_.measures[i], shownPeriod_));
  }
  return shown;
}

EvaluationResult OutputReader::failedResult(EvaluationFailure failure) const {
  EvaluationResult result;
  result.measureValues.assign(description_.measures.size(), kFailedRunValue);
  result.objectiveValues.assign(description_.objectives.size(), kFailedRunValue);
  result.validationValues.assign(validated_.size(), std::nan(""));
  result.failure = std::move(failure);
  return result;
}

std::optional<EvaluationFailure> OutputReader::findMissing(const OutputFiles& files) {
  std::vector<std::string> wanted = files.simulationFiles;
  if (!files.measureFile.empty()) wanted.push_back(files.measureFile);
  wanted.insert(wanted.end(), files.furtherMeasureFiles.begin(), files.furtherMeasureFiles.end());
  for (const std::string& path : wanted) {
    struct stat status {};
    if (::stat(path.c_str(), &status) == 0) {
      const auto link = findLeavingLink(files.folder, std::string_view(path).substr(files.folder.size()));
      if (!link) continue;
      return failureOf(Kind::resultsNotReadable, fmt::format("{}: {}", path, describe(*link)));
    }
    if (errno == ENOENT || errno == ENOTDIR) {
      return failureOf(Kind::resultsNotWritten, "the batch ended well but did not write " + path);
    }
    return failureOf(Kind::resultsNotReadable, fmt::format("{}: {}", path, std::strerror(errno)));
  }
  return std::nullopt;
}

std::optional<MeasureFile> OutputReader::readNumbers(const OutputFiles& files, std::string& reason,
                                                     std::vector<std::string>& doubts) {
  const auto isTooLarge = [&reason](const std::string& file, std::uintmax_t usual) {
    const std::string fault = faultOfSize(file, usual);
    if (!fault.empty()) reason = fmt::format("{}: {}", file, fault);
    return !fault.empty();
  };
  if (isTooLarge(files.measureFile, usualNumbers_.front())) return std::nullopt;
  auto all = readMeasureFile(files.measureFile, numbersNeeded_, reason, series_.watch(),
                             description_.instructions.get(), &doubts);
  for (std::size_t i = 0; all && i < files.furtherMeasureFiles.size(); ++i) {
    const std::string& name = files.furtherMeasureFiles[i];
    if (isTooLarge(name, usualNumbers_[i + 1])) return std::nullopt;
    const InstructionFile* const instructions = description_.furtherMeasureFiles[i].instructions.get();
    const auto more = readMeasureFile(name, 0, reason, series_.watch(), instructions, &doubts);
    if (!more) return std::nullopt;
    all->numbers.insert(all->numbers.end(), more->numbers.begin(), more->numbers.end());
    all->endsLine = all->endsLine && more->endsLine;
  }
  return all;
}

std::optional<EvaluationFailure> OutputReader::readMeasures(const OutputFiles& files, EvaluationResult& result) {
  MeasureFile written;
  if (!files.measureFile.empty()) {
    std::string reason;
    std::vector<std::string> doubts;
    std::optional<MeasureFile> file = readNumbers(files, reason, doubts);
    if (file && !doubts.empty() && !std::exchange(hasToldDoubts_, true)) {
      const std::size_t behindSeries = files.simulationFiles.size();
      for (std::string& doubt : doubts) result.doubts.push_back({behindSeries, result.doubts.size(), std::move(doubt)});
    }
    if (!file) return failureOf(Kind::resultsNotReadable, std::move(reason));
    written = std::move(*file);
  }
  if (auto unusable = series_.tryOpenSimulationFiles(files.simulationFiles)) {
    return failureOf(Kind::resultsNotReadable, std::move(*unusable));
  }
  for (FileDoubt& doubt : series_.takeDoubts()) result.doubts.push_back(std::move(doubt));
  std::optional<EvaluationFailure> failure;
  std::vector<std::optional<FileForm>> forms(files.simulationFiles.size());
  bool hasForm = false;  // of the output-measure file
  for (std::size_t i = 0; i < result.measureValues.size() && !failure; ++i) {
    const OutputMeasure& measure = description_.measures[i];
    if (measure.interfaceType != InterfaceType::measureFile) {
      const std::size_t file = series_.simulationIndex(i);
      std::optional<FileForm>& form = forms.at(file);
      if (!form) form = formOfSeries(series_.simulation(i), description_.period);
      failure = readSeriesMeasure(files.simulationFiles[file], i, *form, result);
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
      result.measureValues[i] = measure.valueOf(written.numbers[number - 1]);
      if (description_.computeExactMeasures) result.exactMeasures[i] = result.measureValues[i];
    } else {
      failure = failureOf(Kind::resultsNotReadable, fmt::format("{}: expected at least {} numbers, found {}",
                                                                files.measureFile, number, written.numbers.size()));
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

std::optional<EvaluationFailure> OutputReader::readSeriesMeasure(const std::string& path, std::size_t i,
                                                                 const FileForm& form, EvaluationResult& result) {
  const OutputMeasure& measure = description_.measures[i];
  TimeSeriesObject& simulation = series_.simulation(i);
  if (measure.simulation.itemNo > simulation.itemCount()) {
    return failureOf(Kind::resultsNotReadable, fmt::format("{}: expected item No. {}, found {} items", path,
                                                           measure.simulation.itemNo, simulation.itemCount()));
  }
  if (const std::string found = simulation.itemName(measure.simulation.itemNo);
      !measure.simulation.itemName.empty() && !isItemCalled(found, measure.simulation.itemName)) {
    return failureOf(
        Kind::resultsNotReadable,
        fmt::format("{}: expected item No. {} to be {}, as in the file of the model's folder, found {}", path,
                    measure.simulation.itemNo, quotedForMessage(measure.simulation.itemName), quotedForMessage(found)));
  }
  try {
    // A model that stopped early is a failed evaluation; a setup whose period no model run can match ends the run.
    const bool canHavePairs = series_.needsPairs(i) || standard_.anyHasSucceeded;
    if (canHavePairs && !hasPairs(measure, description_.period, simulation, series_.observation(i))) {
      return failureOf(Kind::resultsNotWritten,
                       fmt::format("{}: item No. {} ({}) has no value at any observation time in the evaluation "
                                   "period",
                                   path, measure.simulation.itemNo, simulation.itemName(measure.simulation.itemNo)));
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
    return findLackOfPairs(i, statistics.simulatedValues.size());
  } catch (const FatalError& error) {  // the message names the file as in the setup
    fatalError(error.message(), error.detail() + "\nread from " + path);
  }
}

std::optional<EvaluationFailure> OutputReader::findLackOfPairs(std::size_t i, std::size_t count) const {
  if (standard_.firstCounts.empty()) return std::nullopt;
  const std::size_t ofFirst = standard_.firstCounts.at(i);
  // A quotient is rounded to the number that the setup gives, a product need not be: 3 of 30 pairs are 0.1.
  if (ofFirst == 0 || static_cast<double>(count) / static_cast<double>(ofFirst) >= description_.minimumCoverage) {
    return std::nullopt;
  }
  return failureOf(Kind::tooFewPairs,
                   fmt::format("output measure \"{}\" has {} pairs of simulated and observed values, {} in the "
                               "first successful run, No. {}: a share below Minimum_Coverage = {}",
                               trimTrailing(description_.measures[i].name), count, ofFirst, standard_.firstNumber,
                               formatReal(description_.minimumCoverage)));
}

void OutputReader::noteUnusedObservations(std::size_t i, const MeasureStatistics& statistics,
                                          EvaluationResult& result) const {
  if (!statistics.firstUnused) return;
  const std::size_t pairs = statistics.simulatedValues.size();
  const OutputMeasure& measure = description_.measures[i];
  result.unusedObservations.push_back(
      {i, pairs,
       fmt::format(
           "output measure \"{}\": {} of {} observations in the evaluation period are not used, as item No. {} of "
           "{} {}; the first is at {}",
           trimTrailing(measure.name), statistics.observationCount - pairs, statistics.observationCount,
           measure.simulation.itemNo, trimTrailing(measure.simulation.fileName), lackAtTimesOf(measure),
           formatDate(*statistics.firstUnused))});
}

}  // namespace mirevo

#include "report/run_report.h"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <exception>
#include <filesystem>
#include <limits>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "common/calendar.h"
#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/replaceable_files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "common/version.h"
#include "evaluation/chosen_evaluations.h"
#include "evaluation/run_comparison.h"
#include "measures/observation_selection.h"
#include "measures/observation_weights.h"
#include "measures/period_series.h"
#include "measures/statistics.h"
#include "measures/time_match.h"
#include "parameters/parameter_model.h"
#include "report/page/page_template.h"
#include "report/report_analyses.h"
#include "report/report_file.h"
#include "report/report_parameters.h"
#include "report/report_sample.h"
#include "report/report_searches.h"
#include "report/report_validation.h"
#include "report/run_sources.h"
#include "run/results/restart_settings.h"
#include "run/setup/setup_summary.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// A value of an evaluation; NaN where there is no such evaluation.
double valueOf(const ResultRow* row, std::vector<double> ResultRow::*values, std::size_t i) {
  return row == nullptr ? kNaN : (row->*values)[i];
}

/// Puts a report together, part by part; later parts use earlier ones.
class ReportBuilder final {
 public:
  ReportBuilder(const RunConfig& config, const std::string& filePrefix)
      : config_(config), filePrefix_(filePrefix), parameters_(config.parameters, config.constraints) {}

  /// Nothing to build from without a task: false then, too.
  bool readResults(std::string& reason);
  ReportData build();

 private:
  void addRun();
  void noteChangedSetup();
  void noteRowFaults();
  void addEvaluations();
  void findBestAndInitial();
  void addMeasures();
  PairsByNumber pairsOfRuns() const;
  void notePairsThatAreLost(const PairsByNumber& pairs);
  void addComparisons();
  void noteDifferencesOfBest();
  void addFailures();
  void addSeries();
  void addScenarios(const std::vector<std::string>& names, const std::vector<std::size_t>& shown);
  void addAnalyses();
  void note(std::string sentence) { data_.run.notes.push_back(std::move(sentence)); }

  const ResultRow* rowOf(int number) const;
  /// Of each pair of series; reads the observed files, at the first call alone.
  const std::vector<SeriesLabel>& pairLabels();
  const SearchSpace& space() const { return parameters_.searchSpace(); }

  const RunConfig& config_;
  const std::string& filePrefix_;
  ParameterModel parameters_;
  RunSources sources_;
  const ResultRow* best_ = nullptr;
  const ResultRow* initial_ = nullptr;
  std::optional<std::vector<SeriesLabel>> pairLabels_;
  ReportData data_;
};

bool ReportBuilder::readResults(std::string& reason) {
  auto sources = readRunSources(config_, space(), filePrefix_, reason);
  if (!sources) return false;
  sources_ = *std::move(sources);
  return true;
}

ReportData ReportBuilder::build() {
  ResultTable& table = sources_.results;
  data_.program = fmt::format("Mirevo {}", programVersion());
  data_.summary = table.closingLines;
  data_.periodFirst = secondNumber(config_.period.start);
  data_.periodLast = secondNumber(config_.period.end);
  addRun();
  if (sources_.isOfOtherSetup) {
    note(fmt::format("The results name another setup, {}. They are of that one, unless this is its new name.",
                     sources_.setup));
  }
  if (isLaterVersion(sources_.record.program)) {
    note(fmt::format(
        "The results are of Mirevo {}, a later version than this one, {}, which may not know all that is in "
        "them.",
        sources_.record.program, programVersion()));
  }
  if (!sources_.recordFault.empty()) {
    note(fmt::format("How the run ended is taken from its results alone: {}.", sources_.recordFault));
  }
  if (table.unusableLines > 0 && sources_.stage != RunStage::running) {
    const bool isOne = table.unusableLines == 1;
    note(fmt::format("{} of the result file {} cut off or damaged and left out.",
                     countText(table.unusableLines, "line"), isOne ? "is" : "are"));
  }
  noteChangedSetup();
  if (!table.hasExpectedColumns) {
    if (table.hasHeader) {
      note(fmt::format("The results are left out: they have other columns than {}.",
                       sources_.isOfOtherSetup ? "this setup" : "the setup as it is now"));
    }
    table.rows.clear();
  }
  noteRowFaults();
  addEvaluations();
  findBestAndInitial();
  data_.parameters = reportedParameters(config_, parameters_, best_);
  addMeasures();
  addComparisons();
  noteDifferencesOfBest();
  addFailures();
  addSeries();
  addValidation(config_, sources_.results.rows, best_, data_);
  addAnalyses();
  addSearchTables(config_, filePrefix_, space().names, data_);
  return std::move(data_);
}

void ReportBuilder::noteRowFaults() {
  constexpr std::size_t kMostShown = 5;
  if (!sources_.checksumFault.empty()) {
    note(fmt::format("Whether rows were changed is not known: {}.", sources_.checksumFault));
  }
  const std::vector<RowFault>& faults = sources_.rowFaults;
  if (faults.empty() || sources_.results.rows.empty()) return;
  std::string lines;
  for (std::size_t i = 0; i < std::min(faults.size(), kMostShown); ++i) {
    lines += fmt::format("{}{}", i == 0 ? "" : "; ", rowFaultText(faults[i]));
  }
  if (faults.size() > kMostShown) lines += fmt::format("; and {} more", faults.size() - kMostShown);
  note(fmt::format("{} of the result file {} not hold, but {} shown: {}.", countText(faults.size(), "row"),
                   faults.size() == 1 ? "does" : "do", faults.size() == 1 ? "is" : "are", lines));
}

void ReportBuilder::addRun() {
  ReportedRun& run = data_.run;
  run.title = config_.title;
  run.setupFile = std::filesystem::path(config_.setupFile).filename().string();
  run.setupName = config_.setupName;
  run.taskName = config_.taskDescription();
  run.started = sources_.record.started;
  run.ended = sources_.ended;
  run.stage = sources_.stage;
  run.message = sources_.record.message;
  run.reportMade = dateAndTimeNow();
  const RunRecord& record = sources_.record;
  for (const std::string& text : record.warnings) {
    const std::string warning = "Warning: " + text;
    const bool isInSummary = std::find(data_.summary.begin(), data_.summary.end(), warning) != data_.summary.end();
    (isInSummary ? run.closingWarnings : run.notes).push_back(warning);
  }
  if (const int more = record.warningCount - static_cast<int>(record.warnings.size()); more > 0) {
    note(fmt::format("{} more of {} warnings are in {}.log.", more, record.warningCount, config_.setupName));
  }
  run.planned = config_.plannedModelRuns();  // the final model run with the best set has a number, too
  run.aggregation = config_.aggregationMethod == AggregationMethod::zero
                        ? "every aggregate is 0"
                        : aggregationMethodName(config_.aggregationMethod);
  run.periodStart = formatDate(config_.period.start);
  run.periodEnd = formatDate(config_.period.end);
  run.task = config_.task->facts().name.name;
  if (config_.drawsRandomNumbers()) run.seed = config_.task->randomSeed;
  const TaskReport task = config_.task->report();
  run.algorithm = task.algorithm;
  run.populationSize = task.populationSize;
  run.surrogate = task.surrogate;
  data_.runNames = task.runNames;
}

/// Bounds, period and all else that the setup says are those of the setup as it is now.
void ReportBuilder::noteChangedSetup() {
  constexpr std::size_t kMostChanges = 5;
  const auto source = readSettings(filePrefix_, config_.task->facts().resultFiles);
  if (!source.content) {
    note(fmt::format("Whether the setup was changed since is not known: {}.", source.reason));
    return;
  }
  const std::vector<std::string> changes = changedSettings(*source.content, restartSettings(config_));
  if (changes.empty()) return;
  std::string text;
  for (std::size_t i = 0; i < std::min(changes.size(), kMostChanges); ++i) text += (i == 0 ? "" : "; ") + changes[i];
  if (changes.size() > kMostChanges) text += fmt::format("; and {} more", changes.size() - kMostChanges);
  note(fmt::format(
      "{}: {}. The report has what the setup says now.",
      sources_.isOfOtherSetup ? "This setup is another one than that of the results" : "The setup was changed since",
      text));
}

void ReportBuilder::addEvaluations() {
  ReportedEvaluations& evaluations = data_.evaluations;
  evaluations.parameters.resize(space().size());
  evaluations.measures.resize(config_.measures.size());
  evaluations.objectives.resize(config_.objectives.size());
  for (const ResultRow& row : sources_.results.rows) {
    evaluations.numbers.push_back(row.number);
    evaluations.ok.push_back(row.ok);
    if (row.repeats.value_or(0) > 0) ++data_.run.repeats;
    const auto addTo = [](std::vector<std::vector<double>>& columns, const std::vector<double>& values, bool isKnown) {
      for (std::size_t i = 0; i < columns.size(); ++i) columns[i].push_back(isKnown ? values[i] : kNaN);
    };
    addTo(evaluations.parameters, row.parameters, true);
    addTo(evaluations.measures, row.measures, row.ok);
    addTo(evaluations.objectives, row.objectives, row.ok);
    evaluations.aggregate.push_back(row.ok ? row.aggregate : kNaN);
  }
}

void ReportBuilder::findBestAndInitial() {
  BestChoice best;
  InitialChoice initial(ToModelScale(space(), space().initial));
  for (const ResultRow& row : sources_.results.rows) {
    if (!row.ok) continue;
    best.consider(row.number, row.aggregate, row.parameters);
    initial.consider(row.number, row.parameters);
  }
  if (best.best()) best_ = rowOf(best.best()->number);
  if (initial.number()) initial_ = rowOf(*initial.number());
  // The search knows which of equally good ones it took; one by residuals judges by their sum of squares, which may
  // differ a little from the aggregate.
  if (const auto& recorded = sources_.record.best) {
    const ResultRow* row = rowOf(recorded->number);
    const bool isOfSearch = data_.run.task == "optimisation" && sources_.stage == RunStage::finished;
    if (row != nullptr && best_ != nullptr && row->ok &&
        row->aggregate == (isOfSearch ? recorded->aggregate : best_->aggregate)) {
      best_ = row;
    }
  }
  if (best_ != nullptr) data_.best = ShownEvaluation{best_->number, best_->aggregate};
  data_.initialNumber = initial.number();
  data_.isOfInitialParameters = initial.hasSetupValues();
}

const ResultRow* ReportBuilder::rowOf(int number) const {
  const std::vector<ResultRow>& rows = sources_.results.rows;
  const auto row = std::find_if(rows.begin(), rows.end(),
                                [number](const ResultRow& candidate) { return candidate.number == number; });
  return row == rows.end() ? nullptr : &*row;
}

void ReportBuilder::addMeasures() {
  for (std::size_t i = 0; i < config_.measures.size(); ++i) {
    const OutputMeasure& measure = config_.measures[i];
    data_.measures.push_back({measure.name, statisticWithBest(measure), measure.weight, measure.functionName,
                              isCriterion(measure), valueOf(initial_, &ResultRow::measures, i),
                              valueOf(best_, &ResultRow::measures, i)});
  }
  for (std::size_t i = 0; i < config_.objectives.size(); ++i) {
    data_.objectives.push_back({config_.objectives[i].name, valueOf(initial_, &ResultRow::objectives, i),
                                valueOf(best_, &ResultRow::objectives, i)});
  }
}

/// For people: which observations of a measure count, how much each does, and what they are compared with.
std::string countedText(const OutputMeasure& measure, const EvaluationPeriod& period) {
  const std::string selection = describeSelection(measure.selection);
  std::string text = selection.empty() ? "" : "Observations: " + selection + ". ";
  if (period.warmUpDays > 0.0) {
    text += fmt::format("Observations count from {} on, after a warm-up. ", formatDate(endOfWarmUp(period)));
  }
  const std::string weighting = describeWeighting(measure.weighting);
  if (!weighting.empty()) text += fmt::format("Weights and codes: {}. ", weighting);
  const std::string matching = describeMatching(measure.timeMatch);
  if (!matching.empty()) text += fmt::format("Compared with {}. ", matching);
  return std::string(trimTrailing(text));
}

/// Of the best evaluation its own pairs or those of another model run of its set, as a search ends with one.
void ReportBuilder::addComparisons() {
  const PairsByNumber all = pairsOfRuns();
  if (all.empty()) return;
  const auto& [firstNumber, first] = *all.begin();
  auto shown = all.begin();
  for (auto entry = all.begin(); best_ != nullptr && entry != all.end(); ++entry) {
    const ResultRow* const row = rowOf(entry->first);
    if (row != nullptr && row->parameters == best_->parameters) shown = entry;
  }
  for (const MeasurePairs& pairs : shown->second) {
    if (pairs.measure >= config_.measures.size() || pairs.count == 0) continue;
    ReportedComparison& comparison = data_.comparisons.emplace_back();
    comparison.measure = config_.measures[pairs.measure].name;
    comparison.counted = countedText(config_.measures[pairs.measure], config_.period);
    comparison.pairs = pairs;
    comparison.number = shown->first;
    const auto items = sources_.record.compared.find(static_cast<int>(pairs.measure) + 1);
    if (items != sources_.record.compared.end()) comparison.items = items->second;
    const auto same = std::find_if(first.begin(), first.end(),
                                   [&pairs](const MeasurePairs& other) { return other.measure == pairs.measure; });
    if (shown->first != firstNumber && same != first.end()) comparison.simulatedFirst = same->simulated;
  }
}

PairsByNumber ReportBuilder::pairsOfRuns() const {
  return readPairs(filePrefix_, config_.task->facts().resultFiles).content.value_or(PairsByNumber{});
}

/// Versions of the program that wrote none left no file.
void ReportBuilder::notePairsThatAreLost(const PairsByNumber& pairs) {
  const OptionalSource<PairsByNumber> source = readPairs(filePrefix_, config_.task->facts().resultFiles);
  if (!pairs.empty() || (!source.content && source.reason == std::strerror(ENOENT))) return;
  note(fmt::format("Whether the best evaluation differs from the first successful run is not known: {}: {}.",
                   source.file, source.content ? "it is cut off or damaged" : source.reason));
}

/// In a run that has come to its end, other than by a signal, the closing lines of its results say so.
void ReportBuilder::noteDifferencesOfBest() {
  if (best_ == nullptr) return;
  const PairsByNumber pairs = pairsOfRuns();
  notePairsThatAreLost(pairs);
  const auto sources = measureSources(config_.measures, config_.measureFile, config_.baseFolder);
  std::vector<RunDifference> differences = findLackOfBest(best_->number, pairs, sources);
  if (const auto ofBest = pairs.find(best_->number); ofBest != pairs.end()) {
    const auto& [firstNumber, first] = *pairs.begin();
    const auto fromFirst = findDifferences(best_->number, ofBest->second, firstNumber, first, sources);
    differences.insert(differences.end(), fromFirst.begin(), fromFirst.end());
  }
  for (const std::string& text : sentencesOnBest(best_->number, differences)) {
    const std::string sentence = text.substr(0, text.find(':'));
    const bool isSaid = std::any_of(data_.summary.begin(), data_.summary.end(),
                                    [&](const std::string& line) { return line.find(sentence) != std::string::npos; });
    if (!isSaid) note(text + ".");
  }
}

void ReportBuilder::addFailures() {
  if (std::count(data_.evaluations.ok.begin(), data_.evaluations.ok.end(), false) == 0) return;
  const OptionalSource<std::vector<FailureRow>> source = readFailures(filePrefix_, config_.task->facts().resultFiles);
  if (source.content) data_.failures = groupFailures(*source.content);
  if (!data_.failures.empty()) return;
  note(fmt::format("Why evaluations failed is not shown: {}: {}.", source.file,
                   source.content ? "it holds no failures of this run" : source.reason));
}

const std::vector<SeriesLabel>& ReportBuilder::pairLabels() {
  if (!pairLabels_) pairLabels_ = seriesLabels(config_.measures, measuresOfDistinctPairs(config_.measures));
  return *pairLabels_;
}

void ReportBuilder::addSeries() {
  const std::vector<std::size_t> shown = measuresOfDistinctPairs(config_.measures);
  if (shown.empty() || initial_ == nullptr) return;
  OptionalSource<SeriesTable> source = readSeries(filePrefix_);
  if (!source.content) {
    note(fmt::format("Hydrographs are not shown: {}: {}.", source.file, source.reason));
    return;
  }
  data_.series = *std::move(source.content);
  if (const std::string remains = data_.series.remains(); !remains.empty()) {
    note(fmt::format("{} is cut off or damaged: {}.", source.file, remains));
  }
  if (!data_.series.isOf(data_.run.task)) {
    note(
        fmt::format("Hydrographs are not shown: {} is of a run of another task ({}).", source.file, data_.series.task));
    data_.series = {};
    return;
  }
  const std::vector<std::string> names = seriesNames(config_.measures, shown);
  std::vector<ShownSeries> series;
  for (std::size_t i = 0; i < shown.size(); ++i) {
    for (ShownSeries& read : data_.series.series) {
      if (read.measure != names[i]) continue;
      series.push_back(std::move(read));
      data_.seriesLabels.push_back(pairLabels()[i]);
      data_.seriesMeasures.push_back(shown[i]);
      series.back().measure = pairName(config_.measures, shown[i]);
      std::string fault;
      data_.above.push_back(seriesAbove(config_.measures, shown[i], series.back().seconds, fault));
      if (!fault.empty()) note(fault + ".");
      break;
    }
  }
  data_.series.series = std::move(series);
  if (const std::size_t others = pairsShownWithOthers(config_.measures); others > 0) {
    note(fmt::format(
        "Of {} pairs of series {} are shown: of measures that compare the same items in the same way, with other "
        "observations or weights, the first.",
        shown.size() + others, shown.size()));
  }
  addScenarios(names, shown);
  if (!data_.series.initial) {
    note(fmt::format("The series of the initial evaluation are not shown: {} does not have them.", source.file));
  }
  const std::optional<ShownEvaluation>& best = data_.series.best;
  if (!best || best_ == nullptr || best->number == best_->number) return;
  const std::string shownAsBest = fmt::format("The series shown as best are those of evaluation {}", best->number);
  if (rowOf(best->number) == nullptr) {
    note(fmt::format("{}, which the result file does not hold; the best that it holds is evaluation {}.", shownAsBest,
                     best_->number));
  } else {
    note(fmt::format("{}: the file of the series has not been written since evaluation {}, which is better, was found.",
                     shownAsBest, best_->number));
  }
}

/// The series of successful scenarios, one beside another. `names`: of the measures `shown`, in the files of series.
void ReportBuilder::addScenarios(const std::vector<std::string>& names, const std::vector<std::size_t>& shown) {
  const int most = config_.task->shownRuns();
  if (most == 0 || data_.evaluations.numbers.size() < 2) return;
  OptionalSource<std::vector<ScenarioSeries>> source = readScenarios(filePrefix_);
  if (!source.content && source.reason == std::strerror(ENOENT)) return;  // earlier versions wrote none
  if (!source.content) {
    note(fmt::format("The scenarios are not shown one beside another: {}: {}.", source.file, source.reason));
    return;
  }
  for (ScenarioSeries& one : *source.content) {
    const ResultRow* row = rowOf(one.number);
    const auto name = std::find(names.begin(), names.end(), one.measure);
    if (row == nullptr || !row->ok || name == names.end()) continue;
    one.measure = pairName(config_.measures, shown[static_cast<std::size_t>(name - names.begin())]);
    data_.scenarioSeries.push_back(std::move(one));
  }
  const auto isEarlier = [](const ScenarioSeries& one, const ScenarioSeries& other) {
    return one.number < other.number;
  };
  std::stable_sort(data_.scenarioSeries.begin(), data_.scenarioSeries.end(), isEarlier);
  const std::vector<ResultRow>& rows = sources_.results.rows;
  std::vector<int> lost;
  for (const ResultRow& row : rows) {
    const auto isOfRow = [&row](const ScenarioSeries& one) { return one.number == row.number; };
    const bool isThere = std::any_of(data_.scenarioSeries.begin(), data_.scenarioSeries.end(), isOfRow);
    if (row.ok && row.number <= most && !isThere) lost.push_back(row.number);
  }
  if (!lost.empty()) {
    note(fmt::format("The series of scenario No. {} are not shown: {} does not have them.", fmt::join(lost, ", "),
                     source.file));
  }
  const auto more = std::count_if(rows.begin(), rows.end(), [most](const ResultRow& row) { return row.number > most; });
  if (more > 0) {
    note(fmt::format("The series of the first {} scenarios are shown one beside another; {} more {} left out.", most,
                     more, more == 1 ? "is" : "are"));
  }
}

void ReportBuilder::addAnalyses() {
  const bool isFinished = sources_.stage == RunStage::finished;
  const auto& analysed = sources_.record.analysed;
  const bool hasAnalysis = isFinished || analysed;
  const TaskReport task = config_.task->report();
  if (task.hasBands && hasAnalysis) {
    std::vector<std::string> faults;
    data_.bands = reportedBands(config_, filePrefix_, sources_.record, pairLabels(), faults);
    for (const std::string& fault : faults) note(fault + ".");
    const std::vector<bool>& ok = data_.evaluations.ok;
    for (ReportedBand& band : data_.bands) {
      if (band.runs.empty() && task.chains == nullptr)  // those of chains are of their states
        band.mostRuns = analysed.value_or(static_cast<int>(std::count(ok.begin(), ok.end(), true)));
    }
  }
  if (task.hasMorris && hasAnalysis) {
    std::string fault;
    data_.morris = reportedMorris(filePrefix_, fault);
    if (!fault.empty()) note(fmt::format("The screening is not shown: {}.", fault));
  }
  if (task.sobol != nullptr && hasAnalysis) {
    std::vector<std::string> faults;
    data_.sobol = reportedSobol(config_, filePrefix_, pairLabels(), faults);
    for (const std::string& fault : faults) note(fault + ".");
  }
  if (task.isGlue && hasAnalysis) {
    std::string fault;
    data_.glue = reportedGlue(filePrefix_, config_.parameters, fault);
    if (!fault.empty()) note(fmt::format("The weights of GLUE are not shown: {}.", fault));
  }
  if (task.chains != nullptr && hasAnalysis) {
    std::vector<std::string> faults;
    data_.posterior = reportedPosterior(filePrefix_, *task.chains, space().size(), faults);
    for (const std::string& fault : faults) note(fault + ".");
  }
  if (task.distributions != nullptr) data_.distributions = reportedDistributions(*task.distributions, space());
  if (task.hasBands && task.chains == nullptr && hasAnalysis) {  // of other tasks it would be that of an earlier run
    std::string fault;
    data_.sampleSensitivity = reportedSampleSensitivity(filePrefix_, space().names, fault);
    if (!fault.empty()) note(fault + ".");
  }
  if (task.sensitivity != nullptr) {
    data_.sensitivity = reportedSensitivity(config_, *task.sensitivity, space(), sources_.results.rows, pairsOfRuns());
  }
  std::string fault;
  if (data_.sensitivity && hasAnalysis) fault = takeSensitivities(filePrefix_, *data_.sensitivity);
  // The table that the run has written is of its own sets.
  if (data_.sensitivity && !data_.sensitivity->ofOtherSets.empty()) {
    note(
        fmt::format("Evaluations of other parameter sets than a sensitivity analysis of the setup, as it is now, would "
                    "make are left out, and the derivatives that need them: No. {}.",
                    fmt::join(data_.sensitivity->ofOtherSets, ", ")));
  }
  if (!isFinished && (analysed || data_.sensitivity)) {
    const std::vector<bool>& ok = data_.evaluations.ok;
    note(fmt::format("The statistics are those of an unfinished run: of {} of {} evaluations.",
                     analysed.value_or(static_cast<int>(std::count(ok.begin(), ok.end(), true))),
                     config_.plannedEvaluations()));
  }
  if (!data_.sensitivity || !hasAnalysis) return;
  if (!fault.empty()) {
    note(fmt::format("The derivatives, and the ranking by them, are computed again from the result file: {}.", fault));
  }
  fault.clear();
  data_.sensitivity->covariance = reportedCovariance(filePrefix_, fault);
  if (!fault.empty()) note(fmt::format("The covariance is not shown: {}.", fault));
}

}  // namespace

std::optional<ReportData> buildReport(const RunConfig& config, const std::string& filePrefix, std::string& reason) {
  ReportBuilder builder(config, filePrefix);
  if (!builder.readResults(reason)) return std::nullopt;
  return builder.build();
}

bool writeReport(const RunConfig& config, const std::string& filePrefix, std::string& reason,
                 std::string_view temporaryEnding) noexcept {
  try {
    if (reportPageTemplate().empty()) {
      reason = "this build has no report page (it was configured with MIREVO_REPORT_PAGE=OFF)";
      return false;
    }
    const std::optional<ReportData> data = buildReport(config, filePrefix, reason);
    if (!data) return false;
    const std::string path = runFilePath(filePrefix, run_files::kReport);
    reason = whyNotReplaceable(path, run_files::kReport);
    if (reason.empty() && replaceFile(path, reportPage(reportPageTemplate(), *data), reason, temporaryEnding))
      return true;
    reason = path + ": " + reason;
  } catch (const FatalError& error) {
    reason = error.message() + "\n" + error.detail();
  } catch (const std::exception& error) {
    reason = error.what();
  }
  return false;
}

bool isReportOf(const std::string& path, std::string_view task, std::string& reason) {
  const auto text = readTextFile(path, reason);
  return text && text->find(fmt::format(R"("task":"{}","taskName":)", task)) != std::string::npos;
}

}  // namespace mirevo

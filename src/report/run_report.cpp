#include "report/run_report.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <ctime>
#include <exception>
#include <filesystem>
#include <sys/stat.h>
#include <utility>
#include <variant>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/text.h"
#include "common/version.h"
#include "measures/period_series.h"
#include "parameters/parameter_model.h"
#include "platform/signals/signal_state.h"
#include "report/page/page_template.h"
#include "report/report_analyses.h"
#include "report/report_file.h"
#include "run/results/result_file.h"
#include "run/results/result_table.h"
#include "run/results/run_lock.h"
#include "run/setup/setup_summary.h"
#include "run/tasks/search_factory.h"
#include "run/tasks/tasks.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

std::string taskKey(SimulationOption option) {
  switch (option) {
    case SimulationOption::scenarioRuns:
      return "scenarios";
    case SimulationOption::sensitivityAnalysis:
      return "sensitivity";
    case SimulationOption::parameterOptimisation:
      return "optimisation";
    case SimulationOption::uncertaintyAnalysis:
      return "uncertainty";
  }
  return {};
}

/// Local time at which the file was last written; empty where there is none.
std::string timeOfFile(const std::string& path) {
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) return {};
  std::tm local{};
  ::localtime_r(&status.st_mtime, &local);
  std::array<char, 40> text{};
  return {text.data(), std::strftime(text.data(), text.size(), "%Y-%m-%d %H:%M:%S", &local)};
}

/// What stands behind `label` in the first line that begins with it.
std::string valueOf(std::span<const std::string> lines, std::string_view label) {
  for (const std::string& line : lines) {
    if (line.starts_with(label)) return line.substr(label.size());
  }
  return {};
}

/// Puts a report together, part by part; later parts use earlier ones.
class ReportBuilder final {
 public:
  ReportBuilder(const RunConfig& config, const std::string& filePrefix)
      : config_(config), filePrefix_(filePrefix), parameters_(config.parameters, config.constraints) {}

  bool readResults(std::string& reason);
  ReportData build(const std::optional<RunEnding>& ending);

 private:
  using Row = ResultTable::Row;

  bool hasColumnsOfSetup() const;
  void addRun();
  void addEnding(const std::optional<RunEnding>& ending);
  void addEvaluations();
  void findBestAndInitial();
  void addParameters();
  void addMeasures();
  void addFailures();
  void addSeries();
  void note(std::string sentence) { data_.run.notes.push_back(std::move(sentence)); }

  const Row* rowOf(int number) const;
  const SearchSpace& space() const { return parameters_.searchSpace(); }
  /// All parameters on the model scale for values of the variable ones; NaN where they cannot be had.
  std::vector<double> allParameters(std::span<const double> variable);
  double measureOf(const Row* row, std::size_t i) const;
  double objectiveOf(const Row* row, std::size_t i) const;

  const RunConfig& config_;
  const std::string& filePrefix_;
  ParameterModel parameters_;
  std::string resultPath_;
  ResultTable table_;
  const Row* best_ = nullptr;
  const Row* initial_ = nullptr;
  ReportData data_;
};

bool ReportBuilder::readResults(std::string& reason) {
  const std::string_view ending = resultFileEnding(config_);
  if (ending.empty()) {
    reason = "the setup names no task that has results";
    return false;
  }
  resultPath_ = filePrefix_ + std::string(ending);
  const auto text = readTextFile(resultPath_, reason);
  if (!text) {
    reason = resultPath_ + ": " + reason;
    return false;
  }
  table_ = readResultTable(*text);
  std::stable_sort(table_.rows.begin(), table_.rows.end(),
                   [](const Row& a, const Row& b) { return a.number < b.number; });
  return true;
}

ReportData ReportBuilder::build(const std::optional<RunEnding>& ending) {
  data_.program = fmt::format("Mirevo {}", programVersion());
  data_.summary = table_.closingLines;
  data_.periodFirst = secondNumber(config_.period.start);
  data_.periodLast = secondNumber(config_.period.end);
  addRun();
  addEnding(ending);
  if (table_.unusableLines > 0 && data_.run.state != RunStateShown::running) {
    const bool isOne = table_.unusableLines == 1;
    note(fmt::format("{} of the result file {} cut off or damaged and left out.",
                     isOne ? "1 line" : fmt::format("{} lines", table_.unusableLines), isOne ? "is" : "are"));
  }
  if (!hasColumnsOfSetup()) {
    if (table_.hasHeader()) note("The results are left out: they have other columns than the setup as it is now.");
    table_.rows.clear();
  }
  addEvaluations();
  findBestAndInitial();
  addParameters();
  addMeasures();
  addFailures();
  addSeries();
  const bool isFinished = data_.run.state == RunStateShown::finished;
  if (config_.simulationOption == SimulationOption::uncertaintyAnalysis && isFinished) {
    data_.bands = reportedBands(config_, filePrefix_);
  }
  if (config_.simulationOption == SimulationOption::sensitivityAnalysis) {
    data_.sensitivity = reportedSensitivity(config_, space(), table_);
  }
  return std::move(data_);
}

bool ReportBuilder::hasColumnsOfSetup() const {
  std::vector<std::string> expected;
  for (const std::string& name : space().names) expected.push_back(columnName(name));
  for (const OutputMeasure& measure : config_.measures) expected.push_back(columnName(measure.name));
  for (const ObjectiveFunction& objective : config_.objectives) expected.push_back(columnName(objective.name));
  expected.emplace_back("Aggregate");
  return std::equal(expected.begin(), expected.end(), table_.columns.begin(), table_.columns.end(),
                    [](const std::string& a, const std::string& b) { return trim(a) == trim(b); });
}

void ReportBuilder::addRun() {
  ReportedRun& run = data_.run;
  run.title = config_.title;
  run.setupFile = std::filesystem::path(config_.setupFile).filename().string();
  run.setupName = config_.setupName;
  run.task = taskKey(config_.simulationOption);
  run.taskName = taskName(config_);
  run.started = valueOf(table_.headLines, "Started: ");
  run.reportMade = dateAndTimeNow();
  run.planned = config_.plannedEvaluations();
  const bool isSearch = config_.simulationOption == SimulationOption::parameterOptimisation;
  if (isSearch) ++run.planned;  // the final model run with the best set has a number, too
  run.aggregation = config_.aggregationMethod == AggregationMethod::zero
                        ? "every aggregate is 0"
                        : aggregationMethodName(config_.aggregationMethod);
  run.periodStart = formatDate(config_.period.start);
  run.periodEnd = formatDate(config_.period.end);
  if (isSearch || config_.simulationOption == SimulationOption::uncertaintyAnalysis) run.seed = config_.randomSeed;
  if (!isSearch) return;
  const OptimisationConfig& search = config_.optimisation;
  run.algorithm = searchShortName(search.algorithmType);
  if (search.algorithmType == AlgorithmType::dds) return;
  run.populationSize = search.algorithmType == AlgorithmType::sce
                           ? search.sce.complexCount * search.sce.pointsPerComplex
                           : search.pse.populationSize;
  if (search.useSurrogateModel == 1) {
    run.surrogate = search.surrogate.modelType == 1 ? "Gaussian process" : "quadratic polynomial";
  }
}

void ReportBuilder::addEnding(const std::optional<RunEnding>& ending) {
  ReportedRun& run = data_.run;
  if (ending) {
    run.state = ending->state;
    run.message = ending->message;
    run.ended = dateAndTimeNow();
    return;
  }
  if (table_.closingLines.empty()) {
    const bool isRunning = RunLock::isHeld(config_.setupFile);
    run.state = isRunning ? RunStateShown::running : RunStateShown::cutOff;
    if (!isRunning) run.ended = timeOfFile(resultPath_);
    return;
  }
  run.message = table_.closingLines.front();
  run.ended = valueOf(table_.closingLines, "Ended: ");
  if (run.ended.empty()) run.ended = timeOfFile(resultPath_);  // a signal leaves its message alone
  const std::string message = toLowerAscii(run.message);
  if (message.ends_with("simulation cancelled")) {
    run.state = RunStateShown::cancelled;
  } else if (isEndingRequest(run.message)) {
    run.state = RunStateShown::cutOff;
  } else {
    const bool isEnd = message.starts_with("normal termination") || message.starts_with("optimisation terminated");
    run.state = isEnd ? RunStateShown::finished : RunStateShown::failed;
  }
}

void ReportBuilder::addEvaluations() {
  ReportedEvaluations& evaluations = data_.evaluations;
  evaluations.parameters.resize(space().size());
  evaluations.measures.resize(config_.measures.size());
  evaluations.objectives.resize(config_.objectives.size());
  for (const Row& row : table_.rows) {
    evaluations.numbers.push_back(row.number);
    evaluations.ok.push_back(row.ok);
    auto value = row.values.begin();
    for (auto& column : evaluations.parameters) column.push_back(*value++);
    for (auto* columns : {&evaluations.measures, &evaluations.objectives}) {
      for (auto& column : *columns) column.push_back(row.ok ? *value : kNaN), ++value;
    }
    evaluations.aggregate.push_back(row.ok ? *value : kNaN);
  }
}

void ReportBuilder::findBestAndInitial() {
  const std::vector<double> setupValues = ToModelScale(space(), space().initial);
  bool hasSetupValues = false;
  for (const Row& row : table_.rows) {
    if (!row.ok) continue;
    const double aggregate = row.values.back();
    if (!std::isnan(aggregate) && (best_ == nullptr || aggregate < best_->values.back())) best_ = &row;
    const bool isOfSetup = std::equal(setupValues.begin(), setupValues.end(), row.values.begin());
    if (initial_ == nullptr || (isOfSetup && !hasSetupValues)) initial_ = &row;
    hasSetupValues = hasSetupValues || isOfSetup;
  }
  // The search knows which of equally good ones it took.
  if (const auto number = parseInteger(valueOf(table_.closingLines, "Best evaluation: "))) {
    if (const Row* row = rowOf(*number)) best_ = row;
  }
  if (best_ != nullptr) data_.best = ShownEvaluation{best_->number, best_->values.back()};
  if (initial_ != nullptr) data_.initialNumber = initial_->number;
  data_.isOfInitialParameters = hasSetupValues;
}

const ResultTable::Row* ReportBuilder::rowOf(int number) const {
  const auto row = std::find_if(table_.rows.begin(), table_.rows.end(),
                                [number](const Row& candidate) { return candidate.number == number; });
  return row == table_.rows.end() ? nullptr : &*row;
}

std::vector<double> ReportBuilder::allParameters(std::span<const double> variable) {
  ParameterSet set;
  std::size_t next = 0;
  bool failed = false;
  for (const ModelParameter& parameter : config_.parameters) {
    if (parameter.parameterType != ParameterType::variable) continue;
    set.push_back(TransformParameterValue(variable[next++], parameter.lowerBound, parameter.transformationType,
                                          TransformDirection::forward, failed));
  }
  const auto mapped = parameters_.MapToModelValues(set);
  const auto* values = std::get_if<std::span<const double>>(&mapped);
  std::vector<double> all(config_.parameters.size(), kNaN);
  if (values != nullptr && !failed) all.assign(values->begin(), values->end());
  next = 0;
  for (std::size_t i = 0; i < all.size(); ++i) {  // exactly, where the transformation rounds
    if (config_.parameters[i].parameterType == ParameterType::variable) all[i] = variable[next++];
  }
  return all;
}

/// Whether a value lies within a hundredth of the range of a bound, on the scale on which the parameter is searched.
std::string nearBound(const ModelParameter& parameter, double value) {
  constexpr double kNear = 0.01;
  const bool isLogarithmic = parameter.transformationType == TransformationType::logarithmic;
  const auto onScale = [isLogarithmic](double x) { return isLogarithmic ? std::log(x) : x; };
  const double lower = onScale(parameter.lowerBound);
  const double upper = onScale(parameter.upperBound);
  const double reach = kNear * (upper - lower);
  if (parameter.parameterType != ParameterType::variable || !(reach > 0.0)) return {};
  if (onScale(value) <= lower + reach) return "lower";
  return onScale(value) >= upper - reach ? "upper" : "";
}

void ReportBuilder::addParameters() {
  const std::vector<double> start = allParameters(ToModelScale(space(), space().initial));
  std::vector<double> best(config_.parameters.size(), kNaN);
  if (best_ != nullptr) best = allParameters(std::span(best_->values).first(space().size()));
  for (std::size_t i = 0; i < config_.parameters.size(); ++i) {
    const ModelParameter& parameter = config_.parameters[i];
    ReportedParameter& reported = data_.parameters.emplace_back();
    reported.name = parameter.name;
    reported.comment = parameter.comment;
    const bool isDependent = parameter.parameterType == ParameterType::dependent;
    if (isDependent) reported.equation = parameter.equation;
    const bool isVariable = parameter.parameterType == ParameterType::variable;
    reported.kind = isVariable ? "variable" : isDependent ? "dependent" : "fixed";
    const bool isLogarithmic = parameter.transformationType == TransformationType::logarithmic;
    reported.transformation = isLogarithmic ? "logarithmic" : "none";
    reported.isInteger = parameter.transformationType == TransformationType::integer;
    reported.lower = isDependent ? kNaN : parameter.lowerBound;
    reported.upper = isDependent ? kNaN : parameter.upperBound;
    reported.start = isDependent ? start[i] : parameter.initialValue;
    reported.best = best[i];
    reported.nearBound = nearBound(parameter, best[i]);
  }
}

double ReportBuilder::measureOf(const Row* row, std::size_t i) const {
  return row == nullptr ? kNaN : row->values[space().size() + i];
}

double ReportBuilder::objectiveOf(const Row* row, std::size_t i) const {
  return row == nullptr ? kNaN : row->values[space().size() + config_.measures.size() + i];
}

void ReportBuilder::addMeasures() {
  for (std::size_t i = 0; i < config_.measures.size(); ++i) {
    const OutputMeasure& measure = config_.measures[i];
    data_.measures.push_back({measure.name, std::string(statisticName(measure)), measure.weight, measure.functionName,
                              measureOf(initial_, i), measureOf(best_, i)});
  }
  for (std::size_t i = 0; i < config_.objectives.size(); ++i) {
    data_.objectives.push_back({config_.objectives[i].name, objectiveOf(initial_, i), objectiveOf(best_, i)});
  }
}

void ReportBuilder::addFailures() {
  if (std::count(data_.evaluations.ok.begin(), data_.evaluations.ok.end(), false) == 0) return;
  const std::string path = std::filesystem::path(filePrefix_).replace_filename("calSimErr.dat").string();
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (text) data_.failures = readFailureReasons(*text, config_.setupName);
  if (!data_.failures.empty()) return;
  note(fmt::format("Why evaluations failed is not shown: calSimErr.dat: {}.",
                   text ? "it holds no failures of this run" : reason));
}

void ReportBuilder::addSeries() {
  const std::vector<std::size_t> shown = measuresOfDistinctPairs(config_.measures);
  if (shown.empty() || initial_ == nullptr) return;
  const std::string path = filePrefix_ + "_Series.dat";
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text) {
    note(fmt::format("Hydrographs are not shown: {}_Series.dat: {}.", config_.setupName, reason));
    return;
  }
  data_.series = readSeriesTable(*text);
  const std::vector<std::string> names = seriesNames(config_.measures, shown);
  std::vector<ShownSeries> series;
  for (std::size_t i = 0; i < shown.size(); ++i) {
    for (ShownSeries& read : data_.series.series) {
      if (read.measure != names[i]) continue;
      series.push_back(std::move(read));
      series.back().measure = pairName(config_.measures, shown[i]);
      break;
    }
  }
  data_.series.series = std::move(series);
  const std::optional<ShownEvaluation>& best = data_.series.best;
  if (best && best_ != nullptr && best->number != best_->number) {
    note(
        fmt::format("The series shown as best are those of evaluation {}: the file of the series has not been written "
                    "since evaluation {}, which is better, was found.",
                    best->number, best_->number));
  }
}

}  // namespace

std::string reportPath(const std::string& filePrefix) {
  return filePrefix + "_Report.html";
}

std::optional<ReportData> buildReport(const RunConfig& config, const std::string& filePrefix,
                                      const std::optional<RunEnding>& ending, std::string& reason) {
  ReportBuilder builder(config, filePrefix);
  if (!builder.readResults(reason)) return std::nullopt;
  return builder.build(ending);
}

bool writeReport(const RunConfig& config, const std::string& filePrefix, const std::optional<RunEnding>& ending,
                 std::string& reason) noexcept {
  try {
    if (reportPageTemplate().empty()) {
      reason = "this build has no report page (it was configured with MIREVO_REPORT_PAGE=OFF)";
      return false;
    }
    const std::optional<ReportData> data = buildReport(config, filePrefix, ending, reason);
    if (!data) return false;
    const std::string path = reportPath(filePrefix);
    if (replaceFile(path, reportPage(reportPageTemplate(), *data), reason)) return true;
    reason = path + ": " + reason;
  } catch (const FatalError& error) {
    reason = error.message() + "\n" + error.detail();
  } catch (const std::exception& error) {
    reason = error.what();
  }
  return false;
}

std::vector<std::string> seriesNames(std::span<const OutputMeasure> measures, std::span<const std::size_t> shown) {
  std::vector<std::string> names;
  for (const std::size_t i : shown) {
    std::string name = columnName(measures[i].name);
    if (std::count(names.begin(), names.end(), name) > 0) name += fmt::format(" (measure {})", i + 1);
    names.push_back(std::move(name));
  }
  return names;
}

}  // namespace mirevo

#include "report/report_analyses.h"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <limits>
#include <map>
#include <system_error>

#include <fmt/core.h>

#include "algorithms/analyses/local_sensitivity.h"
#include "algorithms/analyses/series_band.h"
#include "common/calendar.h"
#include "common/data_table.h"
#include "common/fatal_error.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/take_text.h"
#include "common/text.h"
#include "evaluation/stored_results.h"
#include "measures/dates.h"
#include "measures/period_series.h"
#include "parameters/parameter_fields.h"
#include "parameters/parameter_model.h"
#include "parameters/read_template.h"
#include "platform/series/time_series_object.h"
#include "report/analysis_table.h"
#include "report/series_labels.h"

namespace mirevo {
namespace {

/// An evaluator that answers with the results in the rows; an evaluation that is not there counts as failed.
StoredResults resultsOf(const RunConfig& config, const SearchSpace& space, std::span<const ResultRow> rows,
                        const PairsByNumber& pairs) {
  std::map<int, StoredResults::Record> records;
  for (const ResultRow& row : rows) {
    StoredResults::Record& record = records[row.number];
    record.parameterValues = row.parameters;
    EvaluationResult& result = record.result;
    result.measureValues = row.measures;
    result.objectiveValues = row.objectives;
    result.aggregate = row.aggregate;
    if (!row.ok) result.failure.emplace();
    if (const auto found = pairs.find(row.number); found != pairs.end()) result.pairs = found->second;
  }
  EvaluationResult missing;
  missing.measureValues.assign(config.measures.size(), kFailedRunValue);
  missing.objectiveValues.assign(config.objectives.size(), kFailedRunValue);
  missing.failure.emplace();
  return {space, std::move(records), std::move(missing)};
}

/// The placeholders as the run had them; a template that is no longer there has none.
std::vector<ValueField> widestFields(const RunConfig& config) {
  std::vector<ParameterTemplate> templates;
  for (const ParameterFileItem& item : config.parameterFiles) {
    try {
      templates.push_back(readTemplate(item, config.parameters).filled);
    } catch (const FatalError&) {
      continue;  // gone or changed since the run
    }
  }
  return widestPlaceholders(templates, config.parameters.size());
}

/// Puts the outputs of one table behind those of another: p rows each.
template <class Cell>
void appendColumns(std::vector<std::vector<Cell>>& rows, const std::vector<std::vector<Cell>>& more) {
  rows.resize(std::max(rows.size(), more.size()));
  for (std::size_t i = 0; i < more.size(); ++i) rows[i].insert(rows[i].end(), more[i].begin(), more[i].end());
}

/// Empty, with the fault, where there is none or it cannot be read; a damaged one has a fault, too. `lines`: how many
/// were written, if that is known.
std::optional<ReportedBand> readBand(const std::string& path, std::optional<int> lines, std::string& fault) {
  constexpr int kItems = 4;
  constexpr int kItemsWithRuns = 5;
  std::string reason;
  const auto file = createTimeSeriesObject(path, reason);
  std::error_code ignored;
  if (!std::filesystem::exists(path, ignored)) {
    fault = fmt::format("{} is not there, and its band is not shown", fileNameOf(path));
    return std::nullopt;
  }
  const std::string text = readTextFile(path, reason).value_or(std::string());
  bool isRead = file && file->open(path) && file->startTime();
  const int items = isRead ? file->itemCount() : 0;
  isRead = items == kItems || items == kItemsWithRuns;
  for (int item = 1; isRead && item <= items; ++item) isRead = file->getData(item);
  const auto wholeLines = std::count(text.begin(), text.end(), '\n');
  if (!isRead) {
    fault = fileNameOf(path) + " is damaged and left out";
    return std::nullopt;
  }
  if (lines && wholeLines != *lines) {
    fault = fmt::format("{} is cut off or damaged: {} of its {} lines are whole", fileNameOf(path), wholeLines, *lines);
  }
  ReportedBand band;
  const std::int64_t origin = secondNumber(*file->startTime());
  for (const double days : file->times()) band.seconds.push_back(secondAfter(origin, days));
  const auto column = [&file](int item) {
    const std::span<const float> values = file->values(item);
    return std::vector<float>(values.begin(), values.end());
  };
  band.observed = column(1);
  band.lower = column(2);
  band.median = column(3);
  band.upper = column(4);
  if (items == kItemsWithRuns) band.runs = column(kItemsWithRuns);
  for (const float runs : band.runs) {
    const int count = std::isfinite(runs) ? static_cast<int>(runs) : 0;
    band.mostRuns = std::max(band.mostRuns, count);
    if (count > 0 && (band.fewestRuns == 0 || count < band.fewestRuns)) band.fewestRuns = count;
  }
  CoverageCount coverage;
  for (std::size_t i = 0; i < band.seconds.size(); ++i) {
    if (!std::isfinite(band.observed[i]) || !std::isfinite(band.median[i])) continue;
    coverage.add(band.observed[i], band.lower[i], band.upper[i]);
    if (band.observed[i] >= band.lower[i] && band.observed[i] <= band.upper[i]) ++band.insideCount;
  }
  const BandCoverage found = coverage.found();
  band.observationCount = found.observationCount;
  band.meanWidth = found.meanWidth;
  band.relativeWidth = found.relativeWidth;
  return band;
}

/// The numbers in the cells from `first` on; NaN where there is none.
std::vector<double> numbersOf(const std::vector<std::string>& cells, std::size_t first) {
  std::vector<double> numbers;
  for (std::size_t i = first; i < cells.size(); ++i) {
    numbers.push_back(realCell(cells[i]).value_or(std::numeric_limits<double>::quiet_NaN()));
  }
  return numbers;
}

}  // namespace

std::string pairName(std::span<const OutputMeasure> measures, std::size_t measure) {
  std::string name;
  for (const OutputMeasure& other : measures) {
    if (other.interfaceType != InterfaceType::timeSeries || !isSamePair(other, measures[measure])) continue;
    name += name.empty() ? other.name : ", " + other.name;
  }
  return name;
}

std::vector<ReportedBand> reportedBands(const RunConfig& config, const std::string& filePrefix, const RunRecord& record,
                                        std::span<const SeriesLabel> labels, std::vector<std::string>& faults) {
  std::vector<ReportedBand> bands;
  const std::vector<std::size_t> shown = measuresOfDistinctPairs(config.measures);
  for (std::size_t k = 0; k < shown.size(); ++k) {
    const std::size_t i = shown[k];
    const std::string path = runFilePath(filePrefix, run_files::kBand, static_cast<int>(i) + 1);
    std::string fault;
    auto band = readBand(path, record.linesOf(fileNameOf(path)), fault);
    if (!fault.empty()) faults.push_back(fault);
    if (!band) continue;
    band->measure = pairName(config.measures, i);
    band->label = labels[k];
    bands.push_back(std::move(*band));
    const std::string total = runFilePath(filePrefix, run_files::kTotalBand, static_cast<int>(i) + 1);
    std::error_code ignored;
    if (!std::filesystem::exists(total, ignored) && !record.linesOf(fileNameOf(total))) continue;
    fault.clear();
    auto withErrors = readBand(total, record.linesOf(fileNameOf(total)), fault);
    if (!fault.empty()) faults.push_back(fault);
    if (!withErrors) continue;
    withErrors->measure = bands.back().measure;
    withErrors->label = labels[k];
    withErrors->isTotal = true;
    bands.push_back(std::move(*withErrors));
  }
  return bands;
}

std::optional<ReportedSensitivity> reportedSensitivity(const RunConfig& config, const SensitivitySettings& settings,
                                                       const SearchSpace& space, std::span<const ResultRow> rows,
                                                       const PairsByNumber& pairs) {
  const auto isBase = [](const ResultRow& row) { return row.number == 1 && row.ok; };
  if (std::none_of(rows.begin(), rows.end(), isBase)) return std::nullopt;
  StoredResults evaluator = resultsOf(config, space, rows, pairs);
  ParameterModel parameters(config.parameters, config.constraints);
  const LocalSensitivity found =
      localSensitivity(settings, space, evaluator, parameterFields(parameters, widestFields(config)),
                       parameters.feasibility(), config.objectives, config.measures);
  ReportedSensitivity reported;
  reported.parameters = space.names;
  for (const OutputMeasure& measure : config.measures) reported.outputs.push_back(measure.name);
  for (const ObjectiveFunction& objective : config.objectives) reported.outputs.push_back(objective.name);
  for (const SensitivityTable* table : {&found.measures, &found.objectives}) {
    appendColumns(reported.derivatives, table->derivatives);
    appendColumns(reported.dimensionless, table->scaled);
    appendColumns(reported.problems, table->problems);
  }
  reported.composite = config.objectives.empty() ? found.measures.composite : found.objectives.composite;
  for (const std::size_t i : found.ranking) reported.ranking.push_back(space.names[i]);
  reported.hasBetterFit = !betterFitText(found.results).empty();
  reported.ofOtherSets = evaluator.ofOtherSets();
  return reported;
}

std::string takeSensitivities(const std::string& filePrefix, ReportedSensitivity& sensitivity) {
  const std::string path = runFilePath(filePrefix, run_files::kSensitivities);
  std::string damaged = unshownTable(path);
  std::string fault;
  const auto read = readAnalysisTable(path, fault);
  if (!read) return fault;
  const ReadTable& table = *read;
  const auto kind = table.column("Kind");
  const auto output = table.column("Output");
  const auto derivative = table.column("Derivative");
  const auto scaled = table.column("Scaled");
  const auto composite = table.column("Composite");
  const auto problem = table.column("Problem");  // not in tables of earlier versions
  if (!kind || !output || !derivative || !scaled || !composite) return damaged;
  ReportedSensitivity found;
  found.parameters = sensitivity.parameters;
  found.outputs = sensitivity.outputs;
  found.hasBetterFit = sensitivity.hasBetterFit;
  auto row = table.rows.begin();
  std::size_t observed = 0;  // parameters with a row over the observations
  for (const std::string& parameter : found.parameters) {
    std::vector<double>& derivatives = found.derivatives.emplace_back();
    std::vector<double>& dimensionless = found.dimensionless.emplace_back();
    std::vector<std::string>& problems = found.problems.emplace_back();
    // The composite of the last kind is the one that ranks: of measures, objective functions, or the observations.
    double& ranking = found.composite.emplace_back(std::numeric_limits<double>::quiet_NaN());
    for (; row != table.rows.end() && row->front() == parameter; ++row) {
      const auto number = [&](std::size_t column) {
        return realCell((*row)[column]).value_or(std::numeric_limits<double>::quiet_NaN());
      };
      ranking = number(*composite);
      if ((*row)[*kind] == "observations") {
        ++observed;
        continue;
      }
      if (derivatives.size() == found.outputs.size() || (*row)[*output] != found.outputs[derivatives.size()]) {
        return damaged;
      }
      derivatives.push_back(number(*derivative));
      dimensionless.push_back(number(*scaled));
      problems.push_back(problem ? (*row)[*problem] : std::string());
    }
    if (derivatives.size() != found.outputs.size()) return damaged;
  }
  found.isOfObservations = observed > 0;
  if (row != table.rows.end() || (observed > 0 && observed < found.parameters.size())) return damaged;
  for (const std::size_t i : ranked(found.composite)) found.ranking.push_back(found.parameters[i]);
  sensitivity = std::move(found);
  return {};
}

std::optional<ReportedCovariance> reportedCovariance(const std::string& filePrefix, std::string& fault) {
  const std::string limitsFile = runFilePath(filePrefix, run_files::kParameterLimits);
  const std::string correlationFile = runFilePath(filePrefix, run_files::kCorrelation);
  std::error_code ignored;
  const bool hasNone =
      !std::filesystem::exists(limitsFile, ignored) && !std::filesystem::exists(correlationFile, ignored);
  if (hasNone) return std::nullopt;
  const auto limits = readAnalysisTable(limitsFile, fault);
  const auto correlation = readAnalysisTable(correlationFile, fault);
  if (!limits || !correlation) return std::nullopt;
  const auto leftOut = limits->column("LeftOut");
  constexpr std::size_t kNumbers = 4;  // behind the name
  if (!leftOut || *leftOut <= kNumbers) {
    fault = unshownTable(limitsFile);
    return std::nullopt;
  }
  ReportedCovariance found;
  found.correlationFile = fileNameOf(correlationFile);
  for (const std::string& line : limits->headLines) {
    if (line.starts_with("Lag-1 correlation")) found.lagText = line;
  }
  for (const std::vector<std::string>& cells : limits->rows) {
    if (!cells[*leftOut].empty()) {
      found.leftOut.push_back({cells.front(), cells[*leftOut]});
      continue;
    }
    const std::vector<double> numbers = numbersOf(cells, 1);
    found.names.push_back(cells.front());
    found.estimate.push_back(numbers[0]);
    found.standardDeviation.push_back(numbers[1]);
    found.lower95.push_back(numbers[2]);
    found.upper95.push_back(numbers[3]);
  }
  for (const std::vector<std::string>& cells : correlation->rows) found.correlation.push_back(numbersOf(cells, 1));
  const auto isRow = [&found](const std::vector<double>& row) { return row.size() == found.names.size(); };
  if (found.correlation.size() == found.names.size() &&
      std::all_of(found.correlation.begin(), found.correlation.end(), isRow)) {
    return found;
  }
  fault = fmt::format("{} and {} do not fit together", fileNameOf(limitsFile), fileNameOf(correlationFile));
  return std::nullopt;
}

}  // namespace mirevo

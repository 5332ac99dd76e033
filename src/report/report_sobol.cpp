#include "report/report_sobol.h"

#include <algorithm>
#include <filesystem>
#include <limits>
#include <system_error>

#include <fmt/format.h>

#include "algorithms/analyses/sobol_series.h"
#include "common/calendar.h"
#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "measures/dates.h"
#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"
#include "report/analysis_table.h"
#include "report/report_analyses.h"

namespace mirevo {
namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr std::size_t kMostTimes = 4000;  // of all factors together they are what a chart of indices can show

/// The columns of a table that are needed; empty if one is not there.
std::optional<std::vector<std::size_t>> columnsOf(const ReadTable& table, std::initializer_list<const char*> names) {
  std::vector<std::size_t> columns;
  for (const char* name : names) {
    const auto column = table.column(name);
    if (!column) return std::nullopt;
    columns.push_back(*column);
  }
  return columns;
}

double numberAt(const std::vector<std::string>& cells, std::size_t column) {
  return realCell(cells[column]).value_or(kNaN);
}

/// The position of a factor, which is added if it is new.
std::size_t factorAt(std::vector<std::string>& factors, const std::string& name) {
  const auto found = std::ranges::find(factors, name);
  const auto index = static_cast<std::size_t>(found - factors.begin());
  if (found == factors.end()) factors.push_back(name);
  return index;
}

ReportedSobolOutput& outputOf(std::vector<ReportedSobolOutput>& outputs, const std::string& kind,
                              const std::string& name) {
  const auto found = std::ranges::find_if(
      outputs, [&](const ReportedSobolOutput& one) { return one.kind == kind && one.name == name; });
  if (found != outputs.end()) return *found;
  outputs.push_back({kind, name, {}, {}, {}, {}, {}, {}, {}});
  return outputs.back();
}

void putAt(std::vector<ReportedSobolIndex>& indices, std::size_t at, const ReportedSobolIndex& index) {
  if (indices.size() <= at) indices.resize(at + 1, {kNaN, kNaN, kNaN, 0});
  indices[at] = index;
}

bool takeIndices(const ReadTable& table, ReportedSobol& sobol) {
  const auto columns =
      columnsOf(table, {"Kind", "Output", "Parameter", "With", "Order", "Index", "Lower", "Upper", "Blocks"});
  if (!columns || table.rows.empty()) return false;
  const std::vector<std::size_t>& at = *columns;
  const auto problem = table.column("Problem");  // not in tables of builds before it
  for (const std::vector<std::string>& cells : table.rows) {
    ReportedSobolOutput& output = outputOf(sobol.outputs, cells[at[0]], cells[at[1]]);
    const double blocks = numberAt(cells, at[8]);
    const ReportedSobolIndex index{numberAt(cells, at[5]), numberAt(cells, at[6]), numberAt(cells, at[7]),
                                   blocks > 0.0 ? static_cast<std::int64_t>(blocks) : 0,
                                   problem ? cells[*problem] : std::string()};
    const std::string& order = cells[at[4]];
    if (order == "sum of first") output.sumOfFirst = index;
    if (order.starts_with("sum")) continue;
    const std::size_t factor = factorAt(sobol.factors, cells[at[2]]);
    if (order == "first") putAt(output.first, factor, index);
    if (order == "total") putAt(output.total, factor, index);
    if (order == "interactions") putAt(output.interactions, factor, index);
    if (order == "second") {
      const std::size_t with = factorAt(sobol.factors, cells[at[3]]);
      const std::size_t count = sobol.factors.size();
      output.second.resize(count, std::vector<double>(count, kNaN));
      output.second[factor][with] = output.second[with][factor] = index.value;
    }
  }
  const std::size_t count = sobol.factors.size();
  return std::ranges::all_of(sobol.outputs, [count](const ReportedSobolOutput& one) {
    return one.first.size() == count && one.total.size() == count && one.interactions.size() == count &&
           (one.second.empty() || one.second.size() == count);
  });
}

void takeStages(const ReadTable& table, ReportedSobol& sobol) {
  const auto columns = columnsOf(table, {"Kind", "Output", "Parameter", "Order", "Rows", "Index", "Lower", "Upper"});
  if (!columns) return;
  const std::vector<std::size_t>& at = *columns;
  for (const std::vector<std::string>& cells : table.rows) {
    const auto factor = std::ranges::find(sobol.factors, cells[at[2]]);
    if (cells[at[3]] != "total" || factor == sobol.factors.end()) continue;
    ReportedSobolOutput& output = outputOf(sobol.outputs, cells[at[0]], cells[at[1]]);
    const auto rows = static_cast<std::int64_t>(realCell(cells[at[4]]).value_or(0.0));
    auto stage = std::ranges::find(output.stageRows, rows);
    if (stage == output.stageRows.end()) {
      output.stageRows.push_back(rows);
      output.stages.emplace_back(sobol.factors.size(), ReportedSobolIndex{kNaN, kNaN, kNaN, 0});
      stage = output.stageRows.end() - 1;
    }
    output.stages[static_cast<std::size_t>(stage - output.stageRows.begin())][static_cast<std::size_t>(
        factor - sobol.factors.begin())] = {numberAt(cells, at[5]), numberAt(cells, at[6]), numberAt(cells, at[7]), 0};
  }
}

std::optional<ReportedSobolSeries> readSeries(const std::string& path, std::size_t factors, std::string& fault) {
  std::error_code ignored;
  if (!std::filesystem::exists(path, ignored)) return std::nullopt;
  std::string reason;
  const auto file = createTimeSeriesObject(path, reason);
  const auto items = static_cast<int>(kSobolSeriesColumns + factors * kSobolColumnsPerFactor);
  bool isRead = file && file->open(path) && file->startTime() && file->itemCount() == items;
  for (int item = 1; isRead && item <= items; ++item) isRead = file->getData(item);
  if (!isRead) {
    fault = fileNameOf(path) + " is damaged and left out";
    return std::nullopt;
  }
  ReportedSobolSeries series;
  const std::span<const double> times = file->times();
  series.stride = (times.size() + kMostTimes - 1) / kMostTimes;
  series.stride = std::max<std::size_t>(series.stride, 1);
  const std::int64_t origin = secondNumber(*file->startTime());
  for (std::size_t t = 0; t < times.size(); t += series.stride) {
    series.seconds.push_back(secondAfter(origin, times[t]));
  }
  const auto column = [&](std::size_t item) {
    const std::span<const float> values = file->values(static_cast<int>(item));
    std::vector<float> taken;
    for (std::size_t t = 0; t < values.size(); t += series.stride) taken.push_back(values[t]);
    return taken;
  };
  series.observed = column(1);
  series.mean = column(2);
  series.deviation = column(3);
  for (std::size_t j = 0; j < factors; ++j) {
    const std::size_t first = kSobolSeriesColumns + j * kSobolColumnsPerFactor + 1;
    series.first.push_back(column(first));
    series.total.push_back(column(first + kSobolColumnsPerFactor / 2));
  }
  return series;
}

void writeIndices(JsonWriter& json, const char* name, const std::vector<ReportedSobolIndex>& indices) {
  json.key(name).beginArray();
  for (const ReportedSobolIndex& index : indices) {
    json.beginArray().number(index.value, JsonWriter::Digits::drawn).number(index.lower, JsonWriter::Digits::drawn);
    json.number(index.upper, JsonWriter::Digits::drawn).integer(index.blocks);
    if (!index.problem.empty()) json.text(index.problem);
    json.endArray();
  }
  json.endArray();
}

}  // namespace

std::optional<ReportedSobol> reportedSobol(const RunConfig& config, const std::string& filePrefix,
                                           std::span<const SeriesLabel> labels, std::vector<std::string>& faults) {
  const SobolSettings* settings = config.task->report().sobol;
  if (settings == nullptr) return std::nullopt;
  ReportedSobol sobol;
  sobol.negligibleIndex = settings->negligibleIndex;
  std::string fault;
  const std::string path = runFilePath(filePrefix, run_files::kSobol);
  const auto indices = readAnalysisTable(path, fault);
  if (!indices || !takeIndices(*indices, sobol)) {
    faults.push_back(indices ? unshownTable(path) : fault);
    return std::nullopt;
  }
  if (const auto stages = readAnalysisTable(runFilePath(filePrefix, run_files::kSobolConvergence), fault)) {
    takeStages(*stages, sobol);
  } else {
    faults.push_back(fault);
  }
  const std::vector<std::size_t> shown = measuresOfDistinctPairs(config.measures);
  for (std::size_t k = 0; k < shown.size(); ++k) {
    const std::string seriesFile = runFilePath(filePrefix, run_files::kSobolSeries, static_cast<int>(shown[k]) + 1);
    std::string ofSeries;
    auto series = readSeries(seriesFile, sobol.factors.size(), ofSeries);
    if (!ofSeries.empty()) faults.push_back(ofSeries);
    if (!series) continue;
    series->measure = pairName(config.measures, shown[k]);
    series->label = labels[k];
    sobol.series.push_back(std::move(*series));
  }
  return sobol;
}

void writeSobol(JsonWriter& json, const ReportedSobol& sobol) {
  using Digits = JsonWriter::Digits;
  json.key("sobol").beginObject().member("factors", sobol.factors);
  json.member("negligible", sobol.negligibleIndex);
  json.key("outputs").beginArray();
  for (const ReportedSobolOutput& output : sobol.outputs) {
    json.beginObject().member("kind", output.kind).member("name", output.name);
    writeIndices(json, "first", output.first);
    writeIndices(json, "total", output.total);
    writeIndices(json, "interactions", output.interactions);
    writeIndices(json, "sumOfFirst", {output.sumOfFirst});
    json.key("second").rows(output.second, Digits::drawn);
    json.key("rows").beginArray();
    for (const std::int64_t rows : output.stageRows) json.integer(rows);
    json.endArray().key("stages").beginArray();
    for (const std::vector<ReportedSobolIndex>& stage : output.stages) {
      json.beginObject();
      writeIndices(json, "total", stage);
      json.endObject();
    }
    json.endArray().endObject();
  }
  json.endArray().key("series").beginArray();
  for (const ReportedSobolSeries& series : sobol.series) {
    json.beginObject().member("measure", series.measure).optionalMember("quantity", series.label.quantity);
    json.optionalMember("unit", series.label.unit).member("stride", series.stride);
    json.key("times").beginArray();
    for (const std::int64_t second : series.seconds) json.integer(epochMilliseconds(second));
    json.endArray().key("observed").numbers(series.observed, Digits::drawn);
    json.key("mean").numbers(series.mean, Digits::drawn).key("deviation").numbers(series.deviation, Digits::drawn);
    json.key("first").rows(series.first, Digits::drawn).key("total").rows(series.total, Digits::drawn).endObject();
  }
  json.endArray().endObject();
}

}  // namespace mirevo

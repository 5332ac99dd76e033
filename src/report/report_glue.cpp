#include "report/report_glue.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <string_view>

#include <fmt/format.h>

#include "algorithms/numbers/weighted_sample.h"
#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "report/analysis_table.h"

namespace mirevo {
namespace {

constexpr std::size_t kBins = 20;
constexpr std::size_t kMostDots = 3000;
constexpr double kNone = std::numeric_limits<double>::quiet_NaN();

/// Columns of the table: those before the parameters.
constexpr std::size_t kValue = 1;
constexpr std::size_t kBehavioural = 2;
constexpr std::size_t kWeight = 3;
constexpr std::size_t kFirstParameter = 4;

std::vector<double> columnOf(const ReadTable& table, std::size_t column) {
  std::vector<double> values;
  values.reserve(table.rows.size());
  for (const std::vector<std::string>& row : table.rows) values.push_back(realCell(row[column]).value_or(kNone));
  return values;
}

/// Places of the sets with a weight that are drawn: of many every k-th, so that those drawn are spread as all are.
std::vector<std::size_t> dottedPlaces(std::span<const double> weights) {
  std::vector<std::size_t> places;
  for (std::size_t i = 0; i < weights.size(); ++i) {
    if (weights[i] > 0.0) places.push_back(i);
  }
  const std::size_t step = (places.size() + kMostDots - 1) / kMostDots;
  std::vector<std::size_t> dotted;
  for (std::size_t i = 0; i < places.size(); i += step) dotted.push_back(places[i]);
  return dotted;
}

template <class Value>
std::vector<Value> pick(std::span<const Value> values, std::span<const std::size_t> places) {
  std::vector<Value> picked;
  for (const std::size_t i : places) picked.push_back(values[i]);
  return picked;
}

/// The shares of drawn sets and of weight in bins of equal width.
void fillBins(std::span<const double> values, std::span<const double> weights, ReportedGlueParameter& parameter) {
  const auto [least, largest] = std::minmax_element(values.begin(), values.end());
  const auto scaled = [&](double value) { return parameter.isLogarithmic ? std::log(value) : value; };
  const double from = scaled(*least);
  const double width = (scaled(*largest) - from) / static_cast<double>(kBins);
  if (!(width > 0.0)) return;  // all are the same
  for (std::size_t k = 0; k <= kBins; ++k) {
    const double edge = from + width * static_cast<double>(k);
    parameter.edges.push_back(parameter.isLogarithmic ? std::exp(edge) : edge);
  }
  parameter.drawnShare.assign(kBins, 0.0);
  parameter.weightShare.assign(kBins, 0.0);
  for (std::size_t i = 0; i < values.size(); ++i) {
    const auto bin = static_cast<std::size_t>(std::max(0.0, (scaled(values[i]) - from) / width));
    const std::size_t k = std::min(bin, kBins - 1);
    parameter.drawnShare[k] += 1.0 / static_cast<double>(values.size());
    parameter.weightShare[k] += weights[i];
  }
}

bool isLogarithmic(std::string_view heading, std::span<const ModelParameter> parameters) {
  return std::any_of(parameters.begin(), parameters.end(), [&](const ModelParameter& parameter) {
    return columnName(parameter.name) == heading && parameter.transformationType == TransformationType::logarithmic;
  });
}

}  // namespace

std::optional<ReportedGlue> reportedGlue(const std::string& filePrefix, std::span<const ModelParameter> parameters,
                                         std::string& fault) {
  const std::string path = runFilePath(filePrefix, run_files::kGlue);
  const auto read = readAnalysisTable(path, fault);
  if (!read) return std::nullopt;
  const ReadTable& table = *read;
  if (table.columns.size() < kFirstParameter || table.columns[kWeight] != "Weight") {
    fault = unshownTable(path);
    return std::nullopt;
  }
  ReportedGlue glue;
  for (const std::string& line : table.headLines) {
    if (line.starts_with("behavioural: ") || line.starts_with("likelihood: ")) glue.choices.push_back(line);
  }
  const std::vector<double> weights = columnOf(table, kWeight);
  const std::vector<double> behavioural = columnOf(table, kBehavioural);
  glue.successCount = weights.size();
  glue.behaviouralCount = static_cast<std::size_t>(std::count(behavioural.begin(), behavioural.end(), 1.0));
  glue.effectiveCount = effectiveCount(weights);
  const bool hasWeights = glue.effectiveCount > 0.0;
  glue.distanceLimit = hasWeights ? chanceDistance(glue.effectiveCount, weights.size()) : kNone;
  const std::vector<std::size_t> places = dottedPlaces(weights);
  for (const std::size_t i : places) glue.numbers.push_back(parseInteger(table.rows[i].front()).value_or(0));
  glue.weights = pick<double>(weights, places);
  glue.judged = pick<double>(columnOf(table, kValue), places);
  for (std::size_t column = kFirstParameter; column < table.columns.size(); ++column) {
    const std::vector<double> values = columnOf(table, column);
    ReportedGlueParameter& parameter = glue.parameters.emplace_back();
    parameter.name = table.columns[column];
    const bool isPositive = std::all_of(values.begin(), values.end(), [](double value) { return value > 0.0; });
    parameter.isLogarithmic = isPositive && isLogarithmic(parameter.name, parameters);
    parameter.values = pick<double>(values, places);
    parameter.distance = distributionDistance(values, weights, values);
    if (!values.empty()) fillBins(values, weights, parameter);
  }
  return glue;
}

void writeGlue(JsonWriter& json, const ReportedGlue& glue) {
  using Digits = JsonWriter::Digits;
  json.key("glue").beginObject().member("choices", glue.choices).member("succeeded", glue.successCount);
  json.member("behavioural", glue.behaviouralCount).member("effective", glue.effectiveCount);
  json.member("distanceLimit", glue.distanceLimit).key("numbers").beginArray();
  for (const int number : glue.numbers) json.integer(number);
  json.endArray().key("weights").numbers(glue.weights, Digits::drawn).key("judged").numbers(glue.judged, Digits::drawn);
  json.key("parameters").beginArray();
  for (const ReportedGlueParameter& parameter : glue.parameters) {
    json.beginObject().member("name", parameter.name).member("logarithmic", parameter.isLogarithmic);
    json.member("distance", parameter.distance).key("values").numbers(parameter.values, Digits::drawn);
    json.key("edges").numbers(parameter.edges, Digits::drawn).key("drawn").numbers(parameter.drawnShare, Digits::drawn);
    json.key("weighed").numbers(parameter.weightShare, Digits::drawn).endObject();
  }
  json.endArray().endObject();
}

}  // namespace mirevo

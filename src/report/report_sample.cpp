#include "report/report_sample.h"

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <limits>

#include <fmt/format.h>

#include "algorithms/analyses/sample_sensitivity.h"
#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "report/analysis_table.h"

namespace mirevo {
namespace {

/// Why no parameter has a first-order index for the output in that column; empty if one has, or that is not known.
std::string problemOf(const ReportedSampleSensitivity& found, std::size_t output, double count) {
  const auto isUnknown = [output](const std::vector<double>& row) { return std::isnan(row[output]); };
  if (std::isnan(count) || !std::ranges::all_of(found.firstOrder, isUnknown)) return "";
  if (count < static_cast<double>(kLeastForIndices)) {
    return fmt::format("{:.0f} runs with a value are too few, at least {}", count, kLeastForIndices);
  }
  if (std::ranges::all_of(found.rankCorrelations, isUnknown)) return "all runs have the same value";
  return std::string(kNoFiniteVariance);
}

}  // namespace

std::vector<ReportedDistribution> reportedDistributions(const ParameterDistributions& distributions,
                                                        const SearchSpace& space) {
  // A bar of a histogram with a twentieth of the values is then drawn to a fortieth.
  constexpr int kMost = 800;
  constexpr int kFewest = 50;
  constexpr int kAll = 40'000;
  std::vector<ReportedDistribution> reported;
  if (distributions.size() != space.size()) return reported;
  const int count = std::clamp(kAll / static_cast<int>(space.size()), kFewest, kMost);
  for (std::size_t j = 0; j < space.size(); ++j) {
    const Distribution& distribution = distributions[j];
    const bool isLogarithm =
        space.transformation[j] == TransformationType::logarithmic && !distribution.isGivenOnModelScale();
    ReportedDistribution& one = reported.emplace_back();
    one.text = fmt::format("{}, {}{}", distribution.name(), distribution.text(),
                           isLogarithm ? " of the natural logarithm" : "");
    for (int k = 0; k < count; ++k)
      one.quantiles.push_back(toModelScale(space, j, distribution.quantile((k + 0.5) / count)));
  }
  return reported;
}

std::optional<ReportedSampleSensitivity> reportedSampleSensitivity(const std::string& filePrefix,
                                                                   std::span<const std::string> parameters,
                                                                   std::string& fault) {
  const std::string path = runFilePath(filePrefix, run_files::kSampleSensitivities);
  std::error_code ignored;
  if (!std::filesystem::exists(path, ignored)) return std::nullopt;
  const auto read = readAnalysisTable(path, fault);
  if (!read) return std::nullopt;
  const ReadTable& table = *read;
  ReportedSampleSensitivity found;
  found.parameters.assign(parameters.begin(), parameters.end());
  const std::size_t p = parameters.size();
  std::vector<std::vector<double>>* const members[] = {&found.rankCorrelations, &found.firstOrder, &found.lower,
                                                       &found.upper};
  for (auto* member : members) member->resize(p);
  const auto column = [&](std::string_view name) { return table.column(name); };
  const std::optional<std::size_t> numbers[] = {column("RankCorrelation"), column("FirstOrder"), column("Lower"),
                                                column("Upper")};
  const auto kind = column("Kind");
  const auto output = column("Output");
  const auto parameter = column("Parameter");
  const bool hasColumns =
      kind && output && parameter && std::ranges::all_of(numbers, [](const auto& of) { return of.has_value(); });
  const auto count = column("Count");
  std::vector<double> counts;
  bool isWhole = hasColumns && p > 0 && table.rows.size() % p == 0;
  for (std::size_t row = 0; isWhole && row < table.rows.size(); ++row) {
    const std::vector<std::string>& cells = table.rows[row];
    const std::size_t j = row % p;
    isWhole = cells[*parameter] == parameters[j];
    if (j == 0) {
      found.outputs.push_back(cells[*output]);
      found.kinds.push_back(cells[*kind]);
      constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
      counts.push_back(count ? realCell(cells[*count]).value_or(kNaN) : kNaN);
    }
    for (std::size_t k = 0; k < std::size(members); ++k) {
      (*members[k])[j].push_back(realCell(cells[*numbers[k]]).value_or(std::numeric_limits<double>::quiet_NaN()));
    }
  }
  if (!isWhole) {
    fault = unshownTable(path);
    return std::nullopt;
  }
  for (std::size_t k = 0; k < counts.size(); ++k) found.problems.push_back(problemOf(found, k, counts[k]));
  found.areCorrelated = std::ranges::any_of(
      table.headLines, [](const std::string& line) { return line.find("with correlations") != std::string::npos; });
  return found;
}

void writeSample(JsonWriter& json, const ReportData& data) {
  using Digits = JsonWriter::Digits;
  json.key("distributions").beginArray();
  for (const ReportedDistribution& one : data.distributions) {
    json.beginObject().member("text", one.text).key("quantiles").numbers(one.quantiles, Digits::drawn).endObject();
  }
  json.endArray();
  if (!data.sampleSensitivity) return;
  const ReportedSampleSensitivity& found = *data.sampleSensitivity;
  json.key("sampleSensitivity").beginObject().member("parameters", found.parameters);
  json.member("outputs", found.outputs).member("kinds", found.kinds).member("problems", found.problems);
  json.key("rankCorrelations").rows(found.rankCorrelations, Digits::drawn);
  json.key("firstOrder").rows(found.firstOrder, Digits::drawn);
  json.key("lower").rows(found.lower, Digits::drawn).key("upper").rows(found.upper, Digits::drawn);
  json.member("areCorrelated", found.areCorrelated).endObject();
}

}  // namespace mirevo

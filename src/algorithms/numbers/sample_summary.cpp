#include "algorithms/numbers/sample_summary.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {

namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

double meanOf(std::span<const double> values) {
  double sum = 0.0;
  for (const double value : values) sum += value;
  return values.empty() ? kNaN : sum / static_cast<double>(values.size());
}

std::string cellText(double value) {
  return std::isfinite(value) ? fmt::format("{:.6g}", value) : formatReal(value);
}

}  // namespace

SampleSummary summariseSample(std::span<const double> values) {
  std::vector<double> sorted;
  for (const double value : values) {
    if (std::isfinite(value)) sorted.push_back(value);
  }
  std::sort(sorted.begin(), sorted.end());

  SampleSummary summary;
  summary.count = sorted.size();
  summary.mean = meanOf(sorted);
  double squares = 0.0;
  for (const double value : sorted) squares += (value - summary.mean) * (value - summary.mean);
  summary.standardDeviation = sorted.size() < 2 ? kNaN : std::sqrt(squares / static_cast<double>(sorted.size() - 1));
  for (std::size_t k = 0; k < kSummaryProbabilities.size(); ++k) {
    summary.quantiles[k] = sortedQuantile(sorted, kSummaryProbabilities[k]);
  }
  return summary;
}

double sortedQuantile(std::span<const double> ascending, double probability) {
  if (ascending.empty()) return kNaN;
  const double position = static_cast<double>(ascending.size() - 1) * probability;
  const auto below = static_cast<std::size_t>(position);
  if (below + 1 >= ascending.size()) return ascending.back();
  return ascending[below] + (position - std::floor(position)) * (ascending[below + 1] - ascending[below]);
}

double sampleCorrelation(std::span<const double> a, std::span<const double> b) {
  const double meanA = meanOf(a);
  const double meanB = meanOf(b);
  double sumAA = 0.0;
  double sumBB = 0.0;
  double sumAB = 0.0;
  for (std::size_t i = 0; i < a.size() && i < b.size(); ++i) {
    sumAA += (a[i] - meanA) * (a[i] - meanA);
    sumBB += (b[i] - meanB) * (b[i] - meanB);
    sumAB += (a[i] - meanA) * (b[i] - meanB);
  }
  if (!(sumAA > 0.0) || !(sumBB > 0.0)) return kNaN;
  return std::clamp(sumAB / std::sqrt(sumAA) / std::sqrt(sumBB), -1.0, 1.0);
}

std::vector<std::vector<double>> correlationMatrix(std::span<const std::vector<double>> rows) {
  const std::size_t p = rows.empty() ? 0 : rows.front().size();
  std::vector<std::vector<double>> columns(p);
  for (const std::vector<double>& row : rows) {
    for (std::size_t j = 0; j < p; ++j) columns[j].push_back(row[j]);
  }
  std::vector<std::vector<double>> matrix(p, std::vector<double>(p, 1.0));
  for (std::size_t i = 0; i < p; ++i) {
    for (std::size_t j = 0; j < i; ++j) matrix[i][j] = matrix[j][i] = sampleCorrelation(columns[i], columns[j]);
  }
  return matrix;
}

DataTable matrixTable(const RunFile& file, std::string headLine, std::span<const std::string> names,
                      std::span<const std::vector<double>> matrix) {
  DataTable table;
  table.file = file;
  table.headLines = {std::move(headLine)};
  table.columns = {"Parameter"};
  table.columns.insert(table.columns.end(), names.begin(), names.end());
  for (std::size_t i = 0; i < matrix.size(); ++i) {
    std::vector<DataTable::Cell>& row = table.rows.emplace_back();
    row.emplace_back(names[i]);
    row.insert(row.end(), matrix[i].begin(), matrix[i].end());
  }
  return table;
}

std::vector<std::string> formatTable(const std::string& corner, std::span<const std::string> headings,
                                     std::span<const std::string> names, std::span<const std::vector<double>> rows) {
  std::size_t nameWidth = corner.size();
  for (const std::string& name : names) nameWidth = std::max(nameWidth, name.size());
  constexpr std::size_t kColumnWidth = 14;

  std::vector<std::string> lines;
  std::string line = fmt::format("   {:<{}}", corner, nameWidth);
  for (const std::string& heading : headings) {
    line += fmt::format(" {:>{}}", heading, std::max(kColumnWidth, heading.size()));
  }
  lines.push_back(std::move(line));
  for (std::size_t i = 0; i < rows.size(); ++i) {
    line = fmt::format("   {:<{}}", names[i], nameWidth);
    for (std::size_t j = 0; j < rows[i].size(); ++j) {
      line += fmt::format(" {:>{}}", cellText(rows[i][j]), std::max(kColumnWidth, headings[j].size()));
    }
    lines.push_back(std::move(line));
  }
  return lines;
}

std::vector<MatrixEntry> largestEntries(std::span<const std::vector<double>> matrix) {
  constexpr std::size_t kLargestShown = 10;
  std::vector<MatrixEntry> entries;
  for (std::size_t i = 0; i < matrix.size(); ++i) {
    for (std::size_t j = i + 1; j < matrix.size(); ++j) {
      if (!std::isnan(matrix[i][j])) entries.emplace_back(i, j);
    }
  }
  std::stable_sort(entries.begin(), entries.end(), [matrix](const auto& a, const auto& b) {
    return std::abs(matrix[a.first][a.second]) > std::abs(matrix[b.first][b.second]);
  });
  if (entries.size() > kLargestShown) entries.resize(kLargestShown);
  return entries;
}

std::vector<std::string> formatCorrelation(const std::string& title, std::span<const std::string> names,
                                           std::span<const std::vector<double>> matrix, std::string_view file) {
  if (matrix.size() <= kMostShownParameters) return formatTable(title, names, names, matrix);
  std::vector<std::string> pairs;
  std::vector<std::vector<double>> values;
  for (const auto& [i, j] : largestEntries(matrix)) {
    pairs.push_back(fmt::format("{}, {}", names[i], names[j]));
    values.push_back({matrix[i][j]});
  }
  const std::string headings[] = {"Largest"};
  std::vector<std::string> lines = formatTable(title, headings, pairs, values);
  lines.push_back(fmt::format("   All correlations of the {} parameters are in {}", names.size(), file));
  return lines;
}

}  // namespace mirevo

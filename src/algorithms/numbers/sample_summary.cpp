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

SampleSummary summariseSample(std::span<const double> values, QuantileKind kind) {
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
    summary.quantiles[k] = sortedQuantile(sorted, kSummaryProbabilities[k], kind);
  }
  return summary;
}

double sortedQuantile(std::span<const double> ascending, double probability, QuantileKind kind) {
  if (ascending.empty()) return kNaN;
  const double position = static_cast<double>(ascending.size() - 1) * probability;
  if (kind == QuantileKind::ofValues) {
    constexpr double kRounding = 1.0e-9;  // 20 times 0.15 is 2.9999999999999996
    return ascending[std::min(static_cast<std::size_t>(position + kRounding), ascending.size() - 1)];
  }
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
  const SampleCorrelations correlations(rows);
  const std::size_t p = correlations.size();
  std::vector<std::vector<double>> matrix(p, std::vector<double>(p, 1.0));
  for (std::size_t i = 0; i < p; ++i) {
    for (std::size_t j = 0; j < i; ++j) matrix[i][j] = matrix[j][i] = correlations.of(i, j);
  }
  return matrix;
}

SampleCorrelations::SampleCorrelations(std::span<const std::vector<double>> rows) : count_(rows.size()) {
  const std::size_t p = rows.empty() ? 0 : rows.front().size();
  centred_.reserve(p * count_);
  std::vector<double> column(count_);
  for (std::size_t j = 0; j < p; ++j) {
    for (std::size_t i = 0; i < count_; ++i) column[i] = rows[i][j];
    const double mean = meanOf(column);
    double squares = 0.0;
    for (const double value : column) {
      centred_.push_back(value - mean);
      squares += centred_.back() * centred_.back();
    }
    roots_.push_back(std::sqrt(squares));
  }
}

SampleCorrelations SampleCorrelations::ofScaled(std::span<const std::vector<double>> columns) {
  SampleCorrelations made;
  made.count_ = columns.empty() ? 0 : columns.front().size();
  for (const std::vector<double>& column : columns) {
    made.centred_.insert(made.centred_.end(), column.begin(), column.end());
    made.roots_.push_back(column.empty() || std::isnan(column.front()) ? kNaN : 1.0);
  }
  return made;
}

double SampleCorrelations::of(std::size_t i, std::size_t j) const {
  const std::size_t high = std::max(i, j);  // one order of the two divisions, whose rounding depends on it
  const std::size_t low = std::min(i, j);
  if (!(roots_[high] > 0.0) || !(roots_[low] > 0.0)) return kNaN;
  const double* const a = centred_.data() + high * count_;
  const double* const b = centred_.data() + low * count_;
  double sum = 0.0;
  for (std::size_t k = 0; k < count_; ++k) sum += a[k] * b[k];
  return std::clamp(sum / roots_[high] / roots_[low], -1.0, 1.0);
}

std::vector<PairCorrelation> largestCorrelations(const SampleCorrelations& correlations, std::size_t count) {
  const auto isLarger = [](const PairCorrelation& a, const PairCorrelation& b) {
    const double ofA = std::abs(a.value);
    const double ofB = std::abs(b.value);
    if (ofA != ofB) return ofA > ofB;
    return std::pair(a.first, a.second) < std::pair(b.first, b.second);
  };
  std::vector<PairCorrelation> largest;  // a heap, with the smallest of them in front
  for (std::size_t j = 1; count > 0 && j < correlations.size(); ++j) {
    for (std::size_t i = 0; i < j; ++i) {
      const PairCorrelation found{i, j, correlations.of(i, j)};
      if (std::isnan(found.value)) continue;
      if (largest.size() == count) {
        if (!isLarger(found, largest.front())) continue;
        std::pop_heap(largest.begin(), largest.end(), isLarger);
        largest.pop_back();
      }
      largest.push_back(found);
      std::push_heap(largest.begin(), largest.end(), isLarger);
    }
  }
  std::sort_heap(largest.begin(), largest.end(), isLarger);
  return largest;
}

DataTable matrixTable(const RunFile& file, std::string headLine, std::span<const std::string> names,
                      std::span<const std::vector<double>> matrix) {
  DataTable table;
  table.file = file;
  table.headLines = {std::move(headLine)};
  table.columns = {"Parameter"};
  table.columns.insert(table.columns.end(), names.begin(), names.end());
  for (std::size_t i = 0; i < matrix.size(); ++i) table.rows.push_back({names[i]});
  for (std::size_t j = 0; j < matrix.size(); ++j) {
    std::vector<double>& column = table.realColumns.emplace_back();
    column.reserve(matrix.size());
    for (const std::vector<double>& row : matrix) column.push_back(row[j]);
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

namespace {

/// The first of `largest` as lines of text; `note` is the last one.
std::vector<std::string> largestLines(const std::string& title, std::span<const std::string> names,
                                      std::span<const PairCorrelation> largest, const std::string& note) {
  std::vector<std::string> pairs;
  std::vector<std::vector<double>> values;
  for (const PairCorrelation& one : largest.first(std::min(largest.size(), kLargestShown))) {
    pairs.push_back(fmt::format("{}, {}", names[one.first], names[one.second]));
    values.push_back({one.value});
  }
  const std::string headings[] = {"Largest"};
  std::vector<std::string> lines = formatTable(title, headings, pairs, values);
  lines.push_back("   " + note);
  return lines;
}

}  // namespace

std::vector<std::string> formatCorrelation(const std::string& title, std::span<const std::string> names,
                                           std::span<const std::vector<double>> matrix, std::string_view file) {
  if (matrix.size() <= kMostShownParameters) return formatTable(title, names, names, matrix);
  return largestLines(title, names, largestPairs(matrix),
                      fmt::format("All correlations of the {} parameters are in {}", names.size(), file));
}

std::vector<PairCorrelation> largestPairs(std::span<const std::vector<double>> matrix) {
  std::vector<PairCorrelation> largest;
  for (const auto& [i, j] : largestEntries(matrix)) largest.push_back({i, j, matrix[i][j]});
  return largest;
}

DataTable pairTable(const RunFile& file, std::string_view headLine, std::span<const std::string> names,
                    std::span<const PairCorrelation> largest) {
  DataTable table;
  table.file = file;
  table.headLines = {fmt::format("{}: the {} largest of {} parameters", headLine, largest.size(), names.size())};
  table.columns = {"First", "Second", "Correlation"};
  for (const PairCorrelation& one : largest) {
    table.rows.push_back({names[one.first], names[one.second], one.value});
  }
  return table;
}

std::vector<std::string> formatLargest(const std::string& title, std::span<const std::string> names,
                                       std::span<const PairCorrelation> largest, std::string_view file) {
  return largestLines(
      title, names, largest,
      fmt::format("The {} largest correlations of the {} parameters are in {}", largest.size(), names.size(), file));
}

}  // namespace mirevo

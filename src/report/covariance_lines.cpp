#include "report/covariance_lines.h"

#include <algorithm>
#include <limits>
#include <string_view>
#include <utility>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

/// A row of a table: its last `count` cells, and the name before them, which may hold blanks.
struct Row {
  std::string name;
  std::vector<double> cells;
};

std::optional<Row> readRow(std::string_view line, std::size_t count) {
  Row row;
  for (std::size_t i = 0; i < count; ++i) {
    line = trimTrailing(line);
    const std::size_t blank = line.rfind(' ');
    if (blank == std::string_view::npos) return std::nullopt;
    row.cells.push_back(parseReal(line.substr(blank + 1)).value_or(std::numeric_limits<double>::quiet_NaN()));
    line = line.substr(0, blank);
  }
  std::reverse(row.cells.begin(), row.cells.end());
  row.name = std::string(trim(line));
  return row;
}

/// The rows below the line that begins with `corner` and stands below an empty one, up to `most`.
std::vector<Row> readTable(std::span<const std::string> lines, std::string_view corner, std::size_t columns,
                           std::size_t most) {
  std::vector<Row> rows;
  std::size_t i = 1;
  while (i < lines.size() && !(lines[i - 1].empty() && lines[i].starts_with(corner))) ++i;
  for (++i; i < lines.size() && !lines[i].empty() && rows.size() < most; ++i) {
    auto row = readRow(lines[i], columns);
    if (!row) break;
    rows.push_back(std::move(*row));
  }
  return rows;
}

}  // namespace

std::optional<CovarianceReport> findCovariance(std::span<const std::string> closingLines,
                                               std::span<const std::string> parameters) {
  const auto isTitle = [](const std::string& line) { return line.starts_with("Parameter covariance: "); };
  const auto title = std::find_if(closingLines.begin(), closingLines.end(), isTitle);
  if (title == closingLines.end()) return std::nullopt;
  const auto lines = closingLines.subspan(static_cast<std::size_t>(title - closingLines.begin()));

  CovarianceReport report;
  for (const std::string& name : parameters) {
    const std::string warning = fmt::format("Warning: Parameter {} is left out of the covariance matrix", name);
    const auto says = [&warning](const std::string& line) { return line.starts_with(warning); };
    if (std::any_of(lines.begin(), lines.end(), says)) report.leftOut.push_back(name);
  }
  constexpr std::size_t kLimitColumns = 4;
  const std::size_t kept = parameters.size() - report.leftOut.size();
  for (Row& row : readTable(lines, "Parameter (model scale)", kLimitColumns, kept)) {
    report.names.push_back(std::move(row.name));
    report.estimate.push_back(row.cells[0]);
    report.standardDeviation.push_back(row.cells[1]);
    report.lower95.push_back(row.cells[2]);
    report.upper95.push_back(row.cells[3]);
  }
  for (Row& row : readTable(lines, "Correlation ", kept, kept)) report.correlation.push_back(std::move(row.cells));
  if (report.names.size() != kept || report.correlation.size() != kept) return std::nullopt;
  return report;
}

}  // namespace mirevo

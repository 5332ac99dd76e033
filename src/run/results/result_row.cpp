#include "run/results/result_row.h"

#include <algorithm>
#include <cmath>
#include <concepts>
#include <set>
#include <utility>

#include <fmt/core.h>

#include "common/data_table.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::string_view kOk = "OK";
constexpr std::string_view kFailed = "FAILED";
constexpr const char* kRepeats = "Repeats";

/// Defines the order of the columns: calls `visit` for each, with its name, or the names for a group of columns. Stops
/// when it returns false; returns whether all were visited.
template <class Row, class Columns, class Visit>
bool visitColumns(Row& row, const Columns& columns, Visit&& visit) {
  return visit(row.number, "Evaluation") && visit(row.ok, "Status") && visit(row.parameters, columns.parameters) &&
         visit(row.measures, columns.measures) && visit(row.objectives, columns.objectives) &&
         visit(row.aggregate, "Aggregate") && visit(row.validation, columns.validation) &&
         (!columns.hasRepeats || visit(row.repeats, kRepeats));
}

void addCell(std::string& line, std::string_view cell) {
  if (!line.empty()) line += '\t';
  line += cell;
}

/// Collects the headings that are the same in every file.
struct FixedHeadings {
  std::set<std::string> names;
  bool operator()(const auto&, const char* name) { return names.insert(name).second; }
  bool operator()(const std::optional<int>&, const char*) { return true; }
  bool operator()(const std::vector<double>&, const std::vector<std::string>&) { return true; }
};

/// Writes the headings. `used` are those that a named column must not have.
struct HeaderWriter {
  std::set<std::string> used;
  bool isUnique = true;  ///< a name that an earlier column has gets a number
  std::string line = {};
  bool operator()(const auto&, const char* name) {
    addCell(line, name);
    return true;
  }
  /// It comes to a file that has the others already: a parameter or measure of that name keeps its heading.
  bool operator()(const std::optional<int>&, const char* name) { return (*this)({}, std::vector<std::string>{name}); }
  bool operator()(const std::vector<double>&, const std::vector<std::string>& names) {
    for (const std::string& name : names) {
      const std::string plain = columnName(name);
      std::string heading = plain;
      for (int k = 2; isUnique && !used.insert(heading).second; ++k) heading = fmt::format("{} ({})", plain, k);
      addCell(line, heading);
    }
    return true;
  }
};

std::string headerOf(const ResultColumns& columns, bool isUnique) {
  const ResultRow none;
  FixedHeadings fixed;
  visitColumns(none, columns, fixed);
  HeaderWriter writer{std::move(fixed.names), isUnique};
  visitColumns(none, columns, writer);
  return writer.line;
}

struct RowWriter {
  std::string line;
  bool operator()(int number, const char*) { return add(std::to_string(number)); }
  bool operator()(std::same_as<bool> auto ok, const char*) { return add(ok ? kOk : kFailed); }
  bool operator()(double value, const char*) { return add(value); }
  bool operator()(const std::optional<int>& repeats, const char*) { return add(std::to_string(repeats.value_or(0))); }
  bool operator()(const std::vector<double>& values, const std::vector<std::string>&) {
    for (const double value : values) add(value);
    return true;
  }
  /// As formatReal() does, without a text of its own for each.
  bool add(double value) {
    constexpr std::size_t kLongest = 32;
    if (!std::isfinite(value)) return add(formatReal(value));
    if (!line.empty()) line += '\t';
    char digits[kLongest];
    line.append(digits, fmt::format_to_n(digits, kLongest, "{}", value).out);
    return true;
  }
  bool add(std::string_view cell) {
    addCell(line, cell);
    return true;
  }
};

/// Reads the cells of a line one after another.
struct RowReader {
  std::string_view rest;
  bool isAtEnd = false;  ///< after the last cell

  bool operator()(int& number, const char*) {
    const auto read = parseInteger(next());
    number = read.value_or(0);
    return number > 0;
  }
  bool operator()(bool& ok, const char*) {
    const std::string_view cell = next();
    ok = cell == kOk;
    return ok || cell == kFailed;
  }
  bool operator()(double& value, const char*) { return read(value); }
  bool operator()(std::optional<int>& repeats, const char*) {
    repeats = parseInteger(next());
    return repeats && *repeats >= 0;
  }
  bool operator()(std::vector<double>& values, const std::vector<std::string>& names) {
    values.resize(names.size());
    return std::all_of(values.begin(), values.end(), [this](double& value) { return read(value); });
  }

  bool read(double& value) {
    const auto number = realCell(next());
    value = number.value_or(0.0);
    return number.has_value();
  }
  std::string_view next() {
    const std::size_t tab = rest.find('\t');
    const std::string_view cell = rest.substr(0, tab);
    isAtEnd = tab == std::string_view::npos;
    rest.remove_prefix(isAtEnd ? rest.size() : tab + 1);
    return cell;
  }
};

bool hasHeadings(std::string_view header, std::string_view expected) {
  RowReader given{header};
  RowReader wanted{expected};
  while (!given.isAtEnd && !wanted.isAtEnd) {
    if (trim(given.next()) != trim(wanted.next())) return false;
  }
  return given.isAtEnd && wanted.isAtEnd;
}

}  // namespace

ResultColumns resultColumns(const RunConfig& config, const SearchSpace& space) {
  ResultColumns columns;
  columns.parameters = space.names;
  for (const OutputMeasure& measure : config.measures) columns.measures.push_back(measure.name);
  for (const ObjectiveFunction& objective : config.objectives) columns.objectives.push_back(objective.name);
  columns.validation = validationNames(config.measures, config.validationPeriods);
  return columns;
}

ResultRow resultRow(std::span<const double> parameterValues, const EvaluationResult& result) {
  return {result.number,
          result.ok(),
          {parameterValues.begin(), parameterValues.end()},
          result.measureValues,
          result.objectiveValues,
          result.aggregate,
          result.validationValues};
}

std::string resultHeader(const ResultColumns& columns) {
  return headerOf(columns, true);
}

std::string resultRowText(const ResultRow& row) {
  RowWriter writer;
  writer.line.reserve(24 * (row.parameters.size() + row.measures.size() + row.objectives.size() + 2));
  ResultColumns columns;
  columns.hasRepeats = row.repeats.has_value();
  visitColumns(row, columns, writer);
  return writer.line;
}

std::size_t cellCount(std::string_view line) {
  return static_cast<std::size_t>(std::count(line.begin(), line.end(), '\t')) + 1;
}

bool isResultHeader(std::string_view line) {
  const std::string unnamed = resultHeader({});
  const std::string_view first = std::string_view(unnamed).substr(0, unnamed.find('\t') + 1);
  return line.starts_with(first) && cellCount(line) >= cellCount(unnamed);
}

ResultColumns withRepeatsOf(std::string_view header, ResultColumns columns) {
  const std::string_view last = trim(header.substr(header.rfind('\t') + 1));
  columns.hasRepeats = cellCount(header) == cellCount(headerOf(columns, true)) + 1 && last.starts_with(kRepeats);
  return columns;
}

bool hasColumns(std::string_view header, const ResultColumns& columns) {
  // Files of earlier versions have columns with equal names.
  return hasHeadings(header, headerOf(columns, true)) || hasHeadings(header, headerOf(columns, false));
}

std::optional<ResultRow> readResultRow(std::string_view line, const ResultColumns& columns) {
  ResultRow row;
  return readResultRow(line, columns, row) ? std::optional(std::move(row)) : std::nullopt;
}

bool readResultRow(std::string_view line, const ResultColumns& columns, ResultRow& row) {
  RowReader reader{line};
  return visitColumns(row, columns, reader) && reader.isAtEnd;
}

}  // namespace mirevo

#include "run/results/series_table.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <limits>

#include <fmt/core.h>

#include "common/calendar.h"
#include "common/data_table.h"
#include "common/text.h"
#include "common/utf8.h"
#include "run/results/result_row.h"

namespace mirevo {
namespace {

constexpr std::string_view kHeader = "Measure\tTime\tObserved\tInitial\tBest";

/// The head lines that say which evaluations are shown, with a tab before the value.
namespace key {
constexpr std::string_view kTask = "task";
constexpr std::string_view kInitial = "initialEvaluation";
constexpr std::string_view kInitialAggregate = "initialAggregate";
constexpr std::string_view kHasInitialParameters = "hasInitialParameters";
constexpr std::string_view kBest = "bestEvaluation";
constexpr std::string_view kBestAggregate = "bestAggregate";
constexpr std::string_view kRows = "rows";  ///< how many there are below the header
}  // namespace key

/// The same for people: "Initial: evaluation 2, the first that succeeded, aggregate 0.1". Files of earlier versions of
/// the program have these alone, and a restart reads them as they were then.
namespace head {
constexpr std::string_view kInitial = "Initial: evaluation ";
constexpr std::string_view kBest = "Best: evaluation ";
constexpr std::string_view kOfSetup = ", with the initial parameters";
constexpr std::string_view kOfFirst = ", the first that succeeded";
constexpr std::string_view kAggregate = ", aggregate ";

std::string line(std::string_view which, const ShownEvaluation& evaluation, std::string_view origin) {
  return fmt::format("# {}{}{}{}{}\n", which, evaluation.number, origin, kAggregate, formatReal(evaluation.aggregate));
}

/// Reads what follows kInitial or kBest: "2, the first that succeeded, aggregate 0.1".
std::optional<ShownEvaluation> read(std::string_view text) {
  const std::size_t aggregate = text.rfind(kAggregate);
  const auto number = parseInteger(text.substr(0, text.find(',')));
  if (!number || aggregate == std::string_view::npos) return std::nullopt;
  const auto value = realCell(text.substr(aggregate + kAggregate.size()));
  return ShownEvaluation{*number, value.value_or(std::numeric_limits<double>::quiet_NaN())};
}
}  // namespace head

void appendCell(std::string& text, float value) {
  text += '\t';
  if (std::isfinite(value)) {
    fmt::format_to(std::back_inserter(text), "{}", value);
  } else {
    text += "NaN";
  }
}

std::optional<float> readCell(std::string_view text) {
  if (text == "NaN") return std::numeric_limits<float>::quiet_NaN();
  float value = 0.0F;
  const auto read = std::from_chars(text.data(), text.data() + text.size(), value);
  if (read.ec != std::errc() || read.ptr != text.data() + text.size()) return std::nullopt;
  return value;
}

ShownEvaluation& shown(std::optional<ShownEvaluation>& evaluation) {
  return evaluation ? *evaluation : evaluation.emplace(ShownEvaluation{0, std::numeric_limits<double>::quiet_NaN()});
}

/// Takes a key and its value; false for a line that is none.
bool readKey(std::string_view line, SeriesTable& table) {
  const std::size_t tab = line.find('\t');
  if (tab == std::string_view::npos) return false;
  const std::string_view name = line.substr(0, tab);
  const std::string_view value = line.substr(tab + 1);
  const auto number = parseInteger(value);
  const auto real = realCell(value);
  if (name == key::kTask) {
    table.task = std::string(value);
  } else if (name == key::kInitial && number) {
    shown(table.initial).number = *number;
  } else if (name == key::kInitialAggregate && real) {
    shown(table.initial).aggregate = *real;
  } else if (name == key::kHasInitialParameters && number) {
    table.isOfInitialParameters = *number == 1;
  } else if (name == key::kBest && number) {
    shown(table.best).number = *number;
  } else if (name == key::kBestAggregate && real) {
    shown(table.best).aggregate = *real;
  } else if (name == key::kRows && number) {
    table.rowsWritten = static_cast<std::size_t>(*number);
  } else {
    return false;
  }
  return true;
}

void readHeadLine(std::string_view line, SeriesTable& table) {
  if (readKey(line, table)) return;
  if (line.starts_with(head::kInitial)) {
    table.initial = head::read(line.substr(head::kInitial.size()));
    table.isOfInitialParameters = line.find(head::kOfSetup) != std::string_view::npos;
  } else if (line.starts_with(head::kBest)) {
    table.best = head::read(line.substr(head::kBest.size()));
  } else {
    table.headLines.emplace_back(line);
  }
}

void readRow(std::string_view line, SeriesTable& table) {
  const std::vector<std::string_view> cells = splitAt(line, '\t');
  if (cells.size() != 5) return;
  const auto second = readIsoTime(cells[1]);
  const auto observed = readCell(cells[2]);
  const auto initial = readCell(cells[3]);
  const auto best = readCell(cells[4]);
  if (!second || !observed || !initial || !best) return;
  if (table.series.empty() || table.series.back().measure != cells[0]) {
    table.series.emplace_back().measure = std::string(cells[0]);
  }
  ShownSeries& series = table.series.back();
  if (!series.seconds.empty() && *second <= series.seconds.back()) return;
  series.seconds.push_back(*second);
  series.observed.push_back(*observed);
  series.initial.push_back(*initial);
  series.best.push_back(*best);
}

}  // namespace

std::size_t SeriesTable::rowCount() const {
  std::size_t count = 0;
  for (const ShownSeries& one : series) count += one.seconds.size();
  return count;
}

std::string SeriesTable::remains() const {
  if (endsInHead) return "it ends above its rows";
  if (!rowsWritten || rowCount() == *rowsWritten) return {};
  return fmt::format("{} of its {} rows can be read", rowCount(), *rowsWritten);
}

std::optional<std::int64_t> readIsoTime(std::string_view text) {
  constexpr std::string_view kPattern = "0000-00-00T00:00:00";
  if (text.size() != kPattern.size()) return std::nullopt;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const bool isDigit = text[i] >= '0' && text[i] <= '9';
    if (kPattern[i] == '0' ? !isDigit : text[i] != kPattern[i]) return std::nullopt;
  }
  constexpr std::array<std::size_t, 6> kStarts{0, 5, 8, 11, 14, 17};
  DateRecord date{};
  for (std::size_t field = 0; field < kStarts.size(); ++field) {
    const char* start = text.data() + kStarts[field];
    std::from_chars(start, start + (field == 0 ? 4 : 2), date[field]);
  }
  if (!isValidDate(date) || date[date_field::kSecond] > 59) return std::nullopt;
  return secondNumber(date);
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

std::string seriesTableHead(const SeriesTable& table, std::size_t rowCount) {
  std::string text;
  for (const std::string& line : table.headLines) text += fmt::format("# {}\n", withValidUtf8(line));
  if (table.initial) {
    text += head::line(head::kInitial, *table.initial, table.isOfInitialParameters ? head::kOfSetup : head::kOfFirst);
  }
  if (table.best) text += head::line(head::kBest, *table.best, {});
  const auto add = [&text](std::string_view name, std::string_view value) {
    text += fmt::format("# {}\t{}\n", name, value);
  };
  if (!table.task.empty()) add(key::kTask, table.task);
  if (table.initial) {
    add(key::kInitial, std::to_string(table.initial->number));
    add(key::kInitialAggregate, formatReal(table.initial->aggregate));
    add(key::kHasInitialParameters, table.isOfInitialParameters ? "1" : "0");
  }
  if (table.best) {
    add(key::kBest, std::to_string(table.best->number));
    add(key::kBestAggregate, formatReal(table.best->aggregate));
  }
  add(key::kRows, std::to_string(rowCount));
  return text.append(kHeader).append("\n");
}

void appendSeriesRows(std::string& text, const ShownSeries& series) {
  for (std::size_t i = 0; i < series.seconds.size(); ++i) {
    text += series.measure;
    text += '\t' + isoTime(series.seconds[i]);
    appendCell(text, series.observed[i]);
    appendCell(text, series.initial[i]);
    appendCell(text, series.best[i]);
    text += '\n';
  }
}

std::string seriesTableText(const SeriesTable& table) {
  std::string text = seriesTableHead(table, table.rowCount());
  for (const ShownSeries& series : table.series) appendSeriesRows(text, series);
  return text;
}

SeriesTable readSeriesTable(std::string_view text) {
  SeriesTable table;
  bool isBelowHeader = false;
  while (!text.empty()) {
    const std::size_t end = text.find('\n');
    if (end == std::string_view::npos) break;  // a cut-off line: digits of its last number may be missing
    const std::string_view line = trimTrailing(text.substr(0, end));
    text.remove_prefix(end + 1);
    if (isBelowHeader) {
      readRow(line, table);
    } else if (line == kHeader) {
      isBelowHeader = true;
    } else if (line.starts_with("# ")) {
      readHeadLine(line.substr(2), table);
    }
  }
  table.endsInHead = !isBelowHeader;
  return table;
}

}  // namespace mirevo

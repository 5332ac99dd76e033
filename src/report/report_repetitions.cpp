#include "report/report_repetitions.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <span>
#include <string_view>

#include <fmt/format.h>

#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Columns of the table before those of the parameters, behind which the last one stands. The ones from kOptional on
/// are there as the search and the version have them.
constexpr std::string_view kColumns[] = {"Repetition",      "Seed",        "Evaluations",
                                         "Best_Evaluation", "Aggregate",   "Loops",
                                         "Start_Aggregate", "Hypervolume", "Same_As"};
constexpr std::size_t kOptional = 6;
constexpr std::string_view kLastColumn = "Termination";

double numberIn(const std::string& cell) {
  return realCell(cell).value_or(std::numeric_limits<double>::quiet_NaN());
}

/// Where the columns stand, in the order of kColumns.
struct Places {
  std::array<std::optional<std::size_t>, std::size(kColumns)> columns;
  std::size_t firstParameter = 0;
};

/// Empty if this is another table.
std::optional<Places> placesIn(const ReadTable& table, std::size_t parameterCount) {
  if (table.columns.size() < kOptional + parameterCount + 1 || table.columns.back() != kLastColumn) return std::nullopt;
  Places places;
  places.firstParameter = table.columns.size() - parameterCount - 1;
  // A parameter may have the name of a column, which stands before it.
  const std::span<const std::string> names(table.columns.begin(), places.firstParameter);
  std::size_t count = 0;
  for (std::size_t i = 0; i < std::size(kColumns); ++i) {
    const auto found = std::ranges::find(names, kColumns[i]);
    if (found == names.end() && i < kOptional) return std::nullopt;
    if (found == names.end()) continue;
    places.columns[i] = static_cast<std::size_t>(found - names.begin());
    ++count;
  }
  // More or fewer parameters than the setup has: a column before them is unknown, or one of these stands among them.
  const bool hasOther = count < names.size() || table.columns[places.firstParameter] == kColumns[kOptional];
  return hasOther ? std::nullopt : std::optional(places);
}

std::optional<ReportedRepetition> readRepetition(const std::vector<std::string>& cells, const Places& places) {
  const auto wholeIn = [&](std::size_t column) { return parseInteger(cells[*places.columns[column]]); };
  const auto realIn = [&](std::size_t column) {
    const std::optional<std::size_t> place = places.columns[column];
    return place ? numberIn(cells[*place]) : std::numeric_limits<double>::quiet_NaN();
  };
  const auto number = wholeIn(0);
  if (!number) return std::nullopt;
  ReportedRepetition one{*number,
                         wholeIn(1).value_or(0),
                         wholeIn(2).value_or(0),
                         wholeIn(3).value_or(0),
                         realIn(4),
                         wholeIn(5).value_or(0),
                         {},
                         cells.back(),
                         realIn(6),
                         realIn(7),
                         places.columns[8] ? wholeIn(8).value_or(0) : 0};
  for (std::size_t i = places.firstParameter; i + 1 < cells.size(); ++i) one.parameters.push_back(numberIn(cells[i]));
  return one;
}

std::vector<ReportedStretch> readStretches(const std::string& filePrefix, std::string& fault) {
  const std::string path = runFilePath(filePrefix, run_files::kRepetitionRows);
  const std::string unknown = "The course of each repetition is not shown: " + fileNameOf(path);
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text) {
    fault = fmt::format("{}: {}", unknown, reason);
    return {};
  }
  const ReadTable table = readDataTable(*text);
  const auto repetition = table.column("Repetition");
  const auto first = table.column("First_Evaluation");
  const auto last = table.column("Last_Evaluation");
  std::vector<ReportedStretch> stretches;
  for (const std::vector<std::string>& cells : table.rows) {
    if (!repetition || !first || !last) break;
    const auto of = parseInteger(cells[*repetition]);
    const auto from = parseInteger(cells[*first]);
    const auto to = parseInteger(cells[*last]);
    if (of && from && to && *from <= *to) stretches.push_back({*of, *from, *to});
  }
  if (stretches.empty()) fault = unknown + " is damaged";
  return stretches;
}

/// As in the log: by those that have ended with a best set.
NearlyEqual nearlyEqualOf(const std::vector<ReportedRepetition>& all) {
  double least = std::numeric_limits<double>::infinity();
  std::vector<double> starts;
  for (const ReportedRepetition& one : all) {
    if (one.termination.empty() || one.best == 0 || one.sameAs != 0) continue;
    if (one.aggregate < least) least = one.aggregate;
    starts.push_back(one.start);
  }
  return std::isfinite(least) ? nearlyEqual(least, starts) : NearlyEqual{};
}

}  // namespace

std::optional<ReportedRepetitions> reportedRepetitions(const std::string& filePrefix, std::size_t parameterCount,
                                                       std::vector<std::string>& faults) {
  const std::string path = runFilePath(filePrefix, run_files::kRepetitions);
  const auto text = readFileIfThere(path);
  if (!text) return std::nullopt;
  const ReadTable table = readDataTable(*text);
  const auto places = placesIn(table, parameterCount);
  if (!places) {
    faults.push_back(fmt::format("The repetitions are not shown: {} is damaged, or of other parameters than the setup",
                                 fileNameOf(path)));
    return std::nullopt;
  }
  ReportedRepetitions found;
  found.parameters.assign(table.columns.begin() + static_cast<std::ptrdiff_t>(places->firstParameter),
                          table.columns.end() - 1);
  for (const std::vector<std::string>& cells : table.rows) {
    if (auto one = readRepetition(cells, *places)) found.all.push_back(*std::move(one));
  }
  if (found.all.size() < table.rows.size()) {
    faults.push_back(fmt::format("{} of {} cannot be read and left out",
                                 countText(table.rows.size() - found.all.size(), "row"), fileNameOf(path)));
  }
  if (found.all.empty()) return std::nullopt;
  found.nearly = nearlyEqualOf(found.all);
  std::string fault;
  found.stretches = readStretches(filePrefix, fault);
  if (!fault.empty()) faults.push_back(fault);
  return found;
}

void writeRepetitions(JsonWriter& json, const ReportedRepetitions& repetitions) {
  json.key("repetitions").beginObject().member("parameters", repetitions.parameters).key("all").beginArray();
  for (const ReportedRepetition& one : repetitions.all) {
    json.beginObject().member("number", one.number).member("seed", one.seed).member("evaluations", one.evaluations);
    json.member("best", one.best).member("aggregate", one.aggregate).member("loops", one.loops);
    json.member("start", one.start);
    if (one.sameAs != 0) json.member("sameAs", one.sameAs);
    if (std::isfinite(one.hypervolume)) json.member("hypervolume", one.hypervolume);
    json.key("parameters").numbers(one.parameters, JsonWriter::Digits::table);
    json.member("termination", one.termination).endObject();
  }
  json.endArray().member("tolerance", repetitions.nearly.tolerance).member("within", repetitions.nearly.text());
  json.key("stretches").beginArray();
  for (const ReportedStretch& one : repetitions.stretches) {
    json.beginArray().integer(one.repetition).integer(one.first).integer(one.last).endArray();
  }
  json.endArray().endObject();
}

}  // namespace mirevo

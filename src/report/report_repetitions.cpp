#include "report/report_repetitions.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <span>
#include <string_view>

#include <fmt/format.h>

#include "common/column_heading.h"
#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Columns of the table before those of the parameters, behind which the last one stands. The ones from kOptional on
/// are there as the search and the version have them.
constexpr std::string_view kColumns[] = {
    "Repetition",      "Seed",        "Evaluations",    "Best_Evaluation",      "Aggregate", "Loops",
    "Start_Aggregate", "Hypervolume", "Sum_of_Squares", "Start_Sum_of_Squares", "Same_As"};
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

/// Empty if this is another table, or one of other parameters.
std::optional<Places> placesIn(const ReadTable& table, std::span<const std::string> parameters) {
  if (table.columns.size() < kOptional + parameters.size() + 1 || table.columns.back() != kLastColumn) {
    return std::nullopt;
  }
  Places places;
  places.firstParameter = table.columns.size() - parameters.size() - 1;
  std::vector<std::string> taken(table.columns.begin(),
                                 table.columns.begin() + static_cast<std::ptrdiff_t>(places.firstParameter));
  std::size_t count = 0;
  for (std::size_t i = 0; i < std::size(kColumns); ++i) {
    const auto found = std::ranges::find(taken, kColumns[i]);
    if (found == taken.end() && i < kOptional) return std::nullopt;
    if (found == taken.end()) continue;
    places.columns[i] = static_cast<std::size_t>(found - taken.begin());
    ++count;
  }
  if (count < taken.size()) return std::nullopt;
  taken.emplace_back(kLastColumn);
  for (std::size_t k = 0; k < parameters.size(); ++k) {
    taken.push_back(columnHeading(parameters[k], taken));
    if (table.columns[places.firstParameter + k] != taken.back()) return std::nullopt;
  }
  return places;
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
                         realIn(8),
                         realIn(9),
                         places.columns[10] ? wholeIn(10).value_or(0) : 0};
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

/// Whether it has ended with a best set, which no other has for the same reason.
bool isCompared(const ReportedRepetition& one) {
  return !one.termination.empty() && one.best != 0 && one.sameAs == 0;
}

std::string_view nameOf(FrontAgreement::Verdict verdict) {
  static constexpr std::string_view kNames[] = {"none", "differ", "agree", "one set", "no search"};
  return kNames[static_cast<std::size_t>(verdict)];
}

/// As in the log: by those that have ended with a best set.
NearlyEqual nearlyEqualOf(const std::vector<ReportedRepetition>& all) {
  double least = std::numeric_limits<double>::infinity();
  std::vector<double> starts;
  for (const ReportedRepetition& one : all) {
    if (!isCompared(one)) continue;
    const bool isOfSums = std::isfinite(one.sumOfSquares);
    least = std::fmin(least, isOfSums ? one.sumOfSquares : one.aggregate);
    starts.push_back(isOfSums ? one.startSum : one.start);
  }
  return std::isfinite(least) ? nearlyEqual(least, starts) : NearlyEqual{};
}

}  // namespace

std::optional<ReportedRepetitions> reportedRepetitions(const std::string& filePrefix,
                                                       std::span<const std::string> parameters,
                                                       std::vector<std::string>& faults) {
  const std::string path = runFilePath(filePrefix, run_files::kRepetitions);
  const auto text = readFileIfThere(path);
  if (!text) return std::nullopt;
  const ReadTable table = readDataTable(*text);
  const auto places = placesIn(table, parameters);
  if (!places) {
    faults.push_back(fmt::format("The repetitions are not shown: {} is damaged, or of other parameters than the setup",
                                 fileNameOf(path)));
    return std::nullopt;
  }
  ReportedRepetitions found;
  found.parameters.assign(parameters.begin(), parameters.end());
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

void compareFronts(ReportedRepetitions& repetitions, const std::optional<ReportedFront>& front) {
  std::vector<double> hypervolumes;
  std::int64_t loops = 0;
  for (const ReportedRepetition& one : repetitions.all) {
    if (!isCompared(one) || !std::isfinite(one.hypervolume)) continue;
    hypervolumes.push_back(one.hypervolume);
    loops += one.loops;
  }
  if (hypervolumes.empty()) return;
  repetitions.hypervolumeOfAll = *std::ranges::max_element(hypervolumes);
  if (front && front->course) {
    for (const double hypervolume : front->course->hypervolumes) {
      if (std::isfinite(hypervolume)) repetitions.hypervolumeOfAll = hypervolume;
    }
  }
  const auto size = front ? static_cast<std::size_t>(std::ranges::count(front->ranks, 1)) : 0;
  repetitions.agreement = frontAgreement(hypervolumes, repetitions.hypervolumeOfAll, size, loops);
}

void writeRepetitions(JsonWriter& json, const ReportedRepetitions& repetitions) {
  json.key("repetitions").beginObject().member("parameters", repetitions.parameters).key("all").beginArray();
  for (const ReportedRepetition& one : repetitions.all) {
    json.beginObject().member("number", one.number).member("seed", one.seed).member("evaluations", one.evaluations);
    json.member("best", one.best).member("aggregate", one.aggregate).member("loops", one.loops);
    json.member("start", one.start);
    if (one.sameAs != 0) json.member("sameAs", one.sameAs);
    if (std::isfinite(one.hypervolume)) json.member("hypervolume", one.hypervolume);
    if (std::isfinite(one.sumOfSquares)) json.member("sum", one.sumOfSquares).member("startSum", one.startSum);
    json.key("parameters").numbers(one.parameters, JsonWriter::Digits::table);
    json.member("termination", one.termination).endObject();
  }
  json.endArray().member("tolerance", repetitions.nearly.tolerance).member("within", repetitions.nearly.text());
  json.member("atStart", repetitions.nearly.atStart);
  if (std::isfinite(repetitions.hypervolumeOfAll)) {
    json.key("fronts").beginObject().member("ofAll", repetitions.hypervolumeOfAll);
    json.member("near", repetitions.agreement.near);
    json.member("verdict", nameOf(repetitions.agreement.verdict)).endObject();
  }
  json.key("stretches").beginArray();
  for (const ReportedStretch& one : repetitions.stretches) {
    json.beginArray().integer(one.repetition).integer(one.first).integer(one.last).endArray();
  }
  json.endArray().endObject();
}

}  // namespace mirevo

#include "report/report_repetitions.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <string_view>

#include <fmt/format.h>

#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {
namespace {

/// Columns of the table before those of the parameters, behind which the last one stands.
constexpr std::string_view kColumns[] = {"Repetition", "Seed", "Evaluations", "Best_Evaluation", "Aggregate", "Loops"};
constexpr std::size_t kFirstParameter = std::size(kColumns);
constexpr std::string_view kLastColumn = "Termination";

double numberIn(const std::string& cell) {
  return realCell(cell).value_or(std::numeric_limits<double>::quiet_NaN());
}

bool isRepetitionTable(const ReadTable& table, std::size_t parameterCount) {
  return table.columns.size() == kFirstParameter + parameterCount + 1 && table.columns.back() == kLastColumn &&
         std::equal(std::begin(kColumns), std::end(kColumns), table.columns.begin());
}

std::optional<ReportedRepetition> readRepetition(const std::vector<std::string>& cells) {
  const auto number = parseInteger(cells[0]);
  const double aggregate = numberIn(cells[4]);
  if (!number) return std::nullopt;
  ReportedRepetition one{*number,
                         parseInteger(cells[1]).value_or(0),
                         parseInteger(cells[2]).value_or(0),
                         parseInteger(cells[3]).value_or(0),
                         aggregate,
                         parseInteger(cells[5]).value_or(0),
                         {},
                         cells.back()};
  for (std::size_t i = kFirstParameter; i + 1 < cells.size(); ++i) one.parameters.push_back(numberIn(cells[i]));
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

}  // namespace

std::optional<ReportedRepetitions> reportedRepetitions(const std::string& filePrefix, std::size_t parameterCount,
                                                       std::vector<std::string>& faults) {
  const std::string path = runFilePath(filePrefix, run_files::kRepetitions);
  const auto text = readFileIfThere(path);
  if (!text) return std::nullopt;
  const ReadTable table = readDataTable(*text);
  if (!isRepetitionTable(table, parameterCount)) {
    faults.push_back(fmt::format("The repetitions are not shown: {} is damaged, or of other parameters than the setup",
                                 fileNameOf(path)));
    return std::nullopt;
  }
  ReportedRepetitions found;
  found.parameters.assign(table.columns.begin() + kFirstParameter, table.columns.end() - 1);
  for (const std::vector<std::string>& cells : table.rows) {
    if (auto one = readRepetition(cells)) found.all.push_back(*std::move(one));
  }
  if (found.all.size() < table.rows.size()) {
    faults.push_back(fmt::format("{} of {} cannot be read and left out",
                                 countText(table.rows.size() - found.all.size(), "row"), fileNameOf(path)));
  }
  if (found.all.empty()) return std::nullopt;
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
    json.key("parameters").numbers(one.parameters, JsonWriter::Digits::table);
    json.member("termination", one.termination).endObject();
  }
  json.endArray().key("stretches").beginArray();
  for (const ReportedStretch& one : repetitions.stretches) {
    json.beginArray().integer(one.repetition).integer(one.first).integer(one.last).endArray();
  }
  json.endArray().endObject();
}

}  // namespace mirevo

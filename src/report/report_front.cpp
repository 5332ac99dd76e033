#include "report/report_front.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <string_view>

#include <fmt/format.h>

#include "common/data_table.h"
#include "common/files.h"
#include "common/run_files.h"
#include "common/text.h"
#include "report/report_series.h"

namespace mirevo {
namespace {

using Digits = JsonWriter::Digits;

/// Columns of the table before those of the objective functions and the parameters.
constexpr std::array<std::string_view, 6> kColumns{"Evaluation", "Rank",      "Crowding",
                                                   "Violation",  "Suggested", "Distance"};
enum Column : std::size_t { kEvaluation, kRank, kCrowding, kViolation, kSuggested, kDistance, kFirstValue };

double numberIn(const std::string& cell) {
  return realCell(cell).value_or(std::numeric_limits<double>::quiet_NaN());
}

bool isFrontTable(const ReadTable& table, std::size_t valueCount) {
  return table.columns.size() == kColumns.size() + valueCount &&
         std::equal(kColumns.begin(), kColumns.end(), table.columns.begin());
}

/// False if the row does not say which set it is, with which parameters, or, of a set on the front, how good.
bool addRow(const std::vector<std::string>& cells, ReportedFront& front) {
  const auto number = parseInteger(cells[kEvaluation]);
  const auto rank = parseInteger(cells[kRank]);
  const auto isNumber = [](const std::string& cell) { return std::isfinite(numberIn(cell)); };
  // A set that violates a constraint is not run: its objectives are not known.
  const std::size_t firstNumber = kFirstValue + (rank == 1 ? 0 : front.values.size());
  const auto first = cells.begin() + static_cast<std::ptrdiff_t>(firstNumber);
  if (!number || !rank || *rank < 1 || !std::all_of(first, cells.end(), isNumber)) return false;
  if (numberIn(cells[kSuggested]) == 1.0 && !front.suggested) front.suggested = front.numbers.size();
  front.numbers.push_back(*number);
  front.ranks.push_back(*rank);
  front.violations.push_back(numberIn(cells[kViolation]));
  front.distances.push_back(numberIn(cells[kDistance]));
  std::size_t column = kFirstValue;
  for (std::vector<double>& values : front.values) values.push_back(numberIn(cells[column++]));
  for (std::vector<double>& values : front.parameterValues) values.push_back(numberIn(cells[column++]));
  return true;
}

std::optional<ReportedFrontCourse> readCourse(const std::string& filePrefix, std::string& fault) {
  const std::string path = runFilePath(filePrefix, run_files::kParetoCourse);
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text) {
    fault = fmt::format("How the front grew is not shown: {}: {}", fileNameOf(path), reason);
    return std::nullopt;
  }
  const ReadTable table = readDataTable(*text);
  const auto evaluations = table.column("Evaluations");
  const auto sizes = table.column("Front_Size");
  const auto hypervolumes = table.column("Hypervolume");
  if (!evaluations || !sizes || !hypervolumes) {
    fault = fmt::format("How the front grew is not shown: {} is damaged", fileNameOf(path));
    return std::nullopt;
  }
  ReportedFrontCourse course;
  for (const std::vector<std::string>& cells : table.rows) {
    if (!std::isfinite(numberIn(cells[*evaluations]))) continue;
    course.evaluations.push_back(numberIn(cells[*evaluations]));
    course.sizes.push_back(numberIn(cells[*sizes]));
    course.hypervolumes.push_back(numberIn(cells[*hypervolumes]));
  }
  return course;
}

}  // namespace

std::optional<ReportedFront> reportedFront(const std::string& filePrefix, std::size_t objectiveCount,
                                           std::size_t parameterCount, std::vector<std::string>& faults) {
  const std::string path = runFilePath(filePrefix, run_files::kPareto);
  std::string reason;
  const auto text = readTextFile(path, reason);
  if (!text) {
    faults.push_back(fmt::format("The front is not shown: {}: {}", fileNameOf(path), reason));
    return std::nullopt;
  }
  const ReadTable table = readDataTable(*text);
  if (!isFrontTable(table, objectiveCount + parameterCount)) {
    faults.push_back(fmt::format(
        "The front is not shown: {} is damaged, or of other objective functions or parameters than the setup",
        fileNameOf(path)));
    return std::nullopt;
  }
  ReportedFront front;
  const auto firstName = table.columns.begin() + kFirstValue;
  const auto firstParameter = firstName + static_cast<std::ptrdiff_t>(objectiveCount);
  front.objectives.assign(firstName, firstParameter);
  front.parameters.assign(firstParameter, table.columns.end());
  front.values.resize(objectiveCount);
  front.parameterValues.resize(parameterCount);
  std::size_t unusable = 0;
  for (const std::vector<std::string>& cells : table.rows) unusable += addRow(cells, front) ? 0 : 1;
  if (unusable > 0) {
    faults.push_back(fmt::format("{} of {} cannot be read and {} left out", countText(unusable, "row"),
                                 fileNameOf(path), unusable == 1 ? "is" : "are"));
  }
  if (std::find(front.ranks.begin(), front.ranks.end(), 1) == front.ranks.end()) {
    faults.push_back(fmt::format("The front is not shown: {} has no set on it", fileNameOf(path)));
    return std::nullopt;
  }
  std::string fault;
  front.course = readCourse(filePrefix, fault);
  if (!fault.empty()) faults.push_back(fault);
  return front;
}

std::vector<ScenarioSeries> reportedFrontSeries(const std::string& filePrefix, const ReportedFront& front,
                                                const std::vector<std::string>& names,
                                                const std::vector<std::string>& shown, std::string& fault) {
  const std::string path = runFilePath(filePrefix, run_files::kParetoSeries);
  const auto text = readFileIfThere(path);
  if (!text) return {};
  std::vector<ScenarioSeries> kept;
  for (ScenarioSeries& one : readScenarioSeries(*text)) {
    const auto name = std::find(names.begin(), names.end(), one.measure);
    const auto number = std::find(front.numbers.begin(), front.numbers.end(), one.number);
    if (name == names.end() || number == front.numbers.end()) continue;
    one.measure = shown[static_cast<std::size_t>(name - names.begin())];
    kept.push_back(std::move(one));
  }
  if (kept.empty()) {
    fault = fmt::format("The hydrographs of the front are not shown: {} has none of its sets", fileNameOf(path));
  }
  return kept;
}

void writeFront(JsonWriter& json, const ReportedFront& front) {
  json.key("front").beginObject().member("objectives", front.objectives).member("parameters", front.parameters);
  json.key("numbers").beginArray();
  for (const int number : front.numbers) json.integer(number);
  json.endArray().key("ranks").beginArray();
  for (const int rank : front.ranks) json.integer(rank);
  json.endArray().key("violations").numbers(front.violations, Digits::drawn);
  json.key("distances").numbers(front.distances, Digits::drawn).key("suggested");
  if (front.suggested) {
    json.integer(static_cast<std::int64_t>(*front.suggested));
  } else {
    json.null();
  }
  json.key("values").rows(front.values, Digits::table);
  json.key("parameterValues").rows(front.parameterValues, Digits::table);
  if (front.course) {
    json.key("course").beginObject().key("evaluations").numbers(front.course->evaluations, Digits::table);
    json.key("sizes").numbers(front.course->sizes, Digits::table);
    json.key("hypervolumes").numbers(front.course->hypervolumes, Digits::table).endObject();
  }
  json.key("series").beginArray();
  for (const ScenarioSeries& one : front.series) {
    json.beginObject().member("measure", one.measure);
    writeSimulated(json, one, front.series.size());
    json.endObject();
  }
  json.endArray().endObject();
}

}  // namespace mirevo

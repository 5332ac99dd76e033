#include "run/tasks/pareto_front.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <utility>

#include <fmt/format.h>

#include "algorithms/pareto/dominance.h"
#include "algorithms/pareto/front_scale.h"
#include "common/calendar.h"
#include "common/column_heading.h"
#include "common/text.h"
#include "common/version.h"
#include "measures/dates.h"
#include "measures/period_series.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostSeries = 100;
/// Of the file of the series, which then has some 50 MB.
constexpr std::size_t kMostSeriesRows = 1'000'000;
constexpr int kMostStages = 200;
constexpr double kFarthestReference = 1.0e100;

/// A set in the table of the front.
struct FrontRow {
  ParetoPoint point;
  int rank = 1;
  double crowding = 0.0;
};

/// The front, and the members of the last population that are behind it. A member that nothing on the front dominates
/// is on it, itself or one with equal values.
std::vector<FrontRow> rowsOf(const ParetoProblem& problem) {
  std::vector<FrontRow> rows;
  std::vector<ObjectivePoint> front;
  for (const FrontMember& member : problem.archive.members()) {
    front.push_back({member.values, 0.0});
    rows.push_back({{member.number, member.set, front.back()}, 1, 0.0});
  }
  std::vector<ObjectivePoint> behind;
  for (const ParetoPoint& point : problem.population) {
    const auto isAhead = [&](const ObjectivePoint& other) { return isConstraintDominated(point.objectives, other); };
    if (std::ranges::none_of(front, isAhead)) continue;
    behind.push_back(point.objectives);
    rows.push_back({point, 1, 0.0});
  }
  const std::vector<int> ranks = nondominationRanks(behind);
  for (std::size_t i = 0; i < ranks.size(); ++i) rows[front.size() + i].rank = 1 + ranks[i];
  std::ranges::stable_sort(rows, [](const FrontRow& a, const FrontRow& b) {
    if (a.rank != b.rank) return a.rank < b.rank;
    return a.point.objectives.values < b.point.objectives.values;
  });
  for (auto begin = rows.begin(); begin != rows.end();) {
    const auto end = std::find_if(begin, rows.end(), [&](const FrontRow& row) { return row.rank != begin->rank; });
    PointTable values;
    for (auto row = begin; row != end; ++row) values.add(row->point.objectives.values);
    for (const double crowding : crowdingDistances(values)) (begin++)->crowding = crowding;
  }
  return rows;
}

/// The series of one evaluation as rows of the file.
struct SeriesOfFront {
  std::string measure;
  std::size_t first = 0;  ///< of its values among the simulated ones
  std::vector<std::string> times;
};

std::vector<SeriesOfFront> seriesOfFront(const TaskContext& context) {
  const std::vector<std::size_t> shown = measuresOfDistinctPairs(context.measures);
  std::vector<SeriesOfFront> all;
  std::vector<std::string> names;
  std::size_t first = 0;
  for (const ObservedSeries& observed : context.observedSeries) {
    const std::size_t begin = std::exchange(first, first + observed.days.size());
    if (std::ranges::find(shown, observed.measure) == shown.end()) continue;
    // As in the file of the best series, so that readers of both find them by name.
    std::string name = columnName(context.measures[observed.measure].name);
    if (std::ranges::find(names, name) != names.end()) name += fmt::format(" (measure {})", observed.measure + 1);
    names.push_back(name);
    SeriesOfFront& series = all.emplace_back();
    series.measure = std::move(name);
    series.first = begin;
    const std::int64_t origin = secondNumber(observed.start);
    for (const double days : observed.days) series.times.push_back(isoTime(secondAfter(origin, days)));
  }
  return all;
}

void appendSeries(std::string& text, int number, const SeriesOfFront& series, std::span<const double> values) {
  for (std::size_t i = 0; i < series.times.size(); ++i) {
    fmt::format_to(std::back_inserter(text), "{}\t{}\t{}\t", number, series.measure, series.times[i]);
    if (std::isfinite(values[i])) {
      fmt::format_to(std::back_inserter(text), "{}\n", static_cast<float>(values[i]));
    } else {
      text += "NaN\n";
    }
  }
}

/// Three digits, and whole numbers in place of powers of ten: the best of many sets may be very near to 0.
std::string percentText(double percent) {
  return percent < 100.0 ? fmt::format("{:.3g} %", percent) : fmt::format("{:.0f} %", percent);
}

}  // namespace

bool hasSeriesOfFront(std::span<const OutputMeasure> measures) {
  return !measuresOfDistinctPairs(measures).empty();
}

void requireObjectives(const SetupSection& section, std::string_view keyword, const SetupSection& control,
                       std::span<const ObjectiveFunction> objectives, std::string_view search,
                       const ParetoSettings& settings) {
  if (objectives.size() < 2) {
    section.refuse(fmt::format("Error: One objective function for {} algorithm", search), keyword,
                   fmt::format("expected two or more objective functions, as {} finds what one costs another: with one "
                               "there is no trade-off, and any other search minimises it with fewer model runs",
                               search));
  }
  const std::vector<double>& reference = settings.referencePoint;
  if (reference.empty()) return;
  const std::string refusal = fmt::format("Error: Reference point in {} algorithm invalid", search);
  if (reference.size() != objectives.size()) {
    control.refuse(refusal, kReferencePointKeyword,
                   fmt::format("expected {} values, one for each objective function, found {}", objectives.size(),
                               reference.size()));
  }
  for (const double value : reference) {
    if (std::abs(value) <= kFarthestReference) continue;
    control.refuse(refusal, kReferencePointKeyword,
                   fmt::format("expected {:g} to {:g}, found {:g}: the hypervolume would be no number",
                               -kFarthestReference, kFarthestReference, value));
  }
}

const FrontMember* FrontFinding::suggested() const {
  const std::vector<FrontMember>& members = problem_.archive.members();
  const auto nearest = nearestToIdeal(members);
  return nearest ? &members[*nearest] : nullptr;
}

std::vector<std::string> FrontFinding::courseLines(bool isBudgetUsed) const {
  return frontCourseLines(problem_.archive, settings_.referencePoint, isBudgetUsed);
}

DataTable FrontFinding::frontTable(const TaskContext& context) const {
  DataTable table;
  table.file = run_files::kPareto;
  table.headLines = {
      problem_.population.empty()
          ? "Sets that no other set of the search dominates (rank 1)"
          : "Sets that no other set of the search dominates (rank 1), and those of the last population behind them",
      fmt::format(
          "Objective functions: {}, from the seventh column on, as in the table of evaluations. Behind them the "
          "parameters on the model scale",
          context.objectives.size()),
      "Suggested: the set of the front nearest to the ideal point, each objective function scaled to 0 to 1 over the "
      "front. It is a suggestion"};
  table.columns = {"Evaluation", "Rank", "Crowding", "Violation", "Suggested", "Distance"};
  for (const ObjectiveFunction& objective : context.objectives) {
    table.columns.push_back(columnHeading(objective.name, table.columns));
  }
  for (const std::string& name : context.space.names) table.columns.push_back(columnHeading(name, table.columns));
  const FrontScale scale(problem_.archive.points());
  const FrontMember* const chosen = suggested();
  for (const FrontRow& row : rowsOf(problem_)) {
    const ObjectivePoint& objectives = row.point.objectives;
    const bool isKnown = objectives.violation == 0.0;
    std::vector<DataTable::Cell>& cells = table.rows.emplace_back();
    cells = {std::int64_t{row.point.number},
             std::int64_t{row.rank},
             isKnown ? row.crowding : std::numeric_limits<double>::quiet_NaN(),
             objectives.violation,
             std::int64_t{row.point.number == chosen->number ? 1 : 0},
             isKnown ? scale.distance(objectives.values) : std::numeric_limits<double>::quiet_NaN()};
    for (std::size_t i = 0; i < context.objectives.size(); ++i) {
      cells.emplace_back(isKnown ? objectives.values[i] : std::numeric_limits<double>::quiet_NaN());
    }
    for (const double value : ToModelScale(context.space, row.point.set)) cells.emplace_back(value);
  }
  return table;
}

DataTable FrontFinding::courseTable() const {
  DataTable table;
  table.file = run_files::kParetoCourse;
  table.headLines = {
      "The front after so many evaluations: its sets, and its hypervolume as a share of the box between the ideal "
      "point of the last front and the reference point"};
  table.columns = {"Evaluations", "Front_Size", "Hypervolume"};
  for (const FrontStage& stage : frontCourse(problem_.archive, settings_.referencePoint, kMostStages)) {
    table.rows.push_back(
        {std::int64_t{stage.evaluations}, static_cast<std::int64_t>(stage.frontSize), stage.hypervolume});
  }
  return table;
}

void FrontFinding::addSeries(const TaskContext& context, TaskOutcome& outcome) const {
  if (settings_.series == FrontSeries::none || !context.simulatedColumns) return;
  const std::vector<SeriesOfFront> all = seriesOfFront(context);
  std::size_t rowCount = 0;
  for (const SeriesOfFront& series : all) rowCount += series.times.size();
  if (rowCount == 0) return;
  const std::vector<std::vector<double>> front = problem_.archive.front();
  const std::size_t most = std::clamp<std::size_t>(kMostSeriesRows / rowCount, 1, kMostSeries);
  std::vector<std::size_t> members = spreadOver(front, most);
  const std::size_t nearest = *nearestToIdeal(problem_.archive.members());
  includeInSpread(members, nearest, front);
  TaskFile file{runFilePath(context.filePrefix, run_files::kParetoSeries), {}};
  file.content = fmt::format("# Mirevo {}\n# Simulated series of {} of the {} sets of the front\n", programVersion(),
                             members.size(), front.size());
  file.content += "Evaluation\tMeasure\tTime\tSimulated\n";
  for (const std::size_t i : members) {
    const int number = problem_.archive.members()[i].number;
    for (const SeriesOfFront& series : all) {
      const std::vector<double> values = context.simulatedColumns({&number, 1}, series.first, series.times.size());
      appendSeries(file.content, number, series, values);
    }
    file.content += fmt::format("# endOfEvaluation\t{}\n", number);
  }
  outcome.report.push_back(
      fmt::format("Simulated series of {} of its sets: {}", members.size(), fileNameOf(file.path)));
  outcome.files.push_back(std::move(file));
}

void FrontFinding::addFront(const TaskContext& context, int best, TaskOutcome& outcome) const {
  std::vector<std::string>& lines = outcome.report;
  if (!hasFront()) {
    lines.emplace_back("There is no front: no evaluation has succeeded");
    return;
  }
  const std::vector<FrontMember>& members = problem_.archive.members();
  const FrontMember& chosen = *suggested();
  lines.push_back(fmt::format("Front: {} that no other set dominates, of {}; {}", countText(members.size(), "set"),
                              countText(static_cast<std::size_t>(evaluationCount()), "evaluation"),
                              fileNameOf(runFilePath(context.filePrefix, run_files::kPareto))));
  for (std::size_t i = 0; i < context.objectives.size(); ++i) {
    const auto value = [i](const FrontMember& member) { return member.values[i]; };
    const FrontMember& least = *std::ranges::min_element(members, {}, value);
    const FrontMember& most = *std::ranges::max_element(members, {}, value);
    lines.push_back(fmt::format("   {}: {} (evaluation {}) to {} (evaluation {})", context.objectives[i].name,
                                formatReal(least.values[i]), least.number, formatReal(most.values[i]), most.number));
  }
  lines.push_back(fmt::format(
      "Suggested compromise: evaluation {}, the set of the front nearest to the ideal point, each objective function "
      "scaled to 0 to 1 over the front. It is a suggestion: what one objective is worth in terms of another is not "
      "known here",
      chosen.number));
  for (std::size_t i = 0; i < context.objectives.size(); ++i) {
    const auto value = [i](const FrontMember& member) { return member.values[i]; };
    const double least = std::ranges::min_element(members, {}, value)->values[i];
    std::string more;
    if (least > 0.0)
      more = fmt::format(", {} above the least", percentText(100.0 * (chosen.values[i] - least) / least));
    lines.push_back(fmt::format("   {} = {}{}", context.objectives[i].name, formatReal(chosen.values[i]), more));
  }
  if (best != 0) {
    lines.push_back(
        fmt::format("The best evaluation, {}, is that of the least aggregate{}", best,
                    best == chosen.number ? ", and the suggested one" : ", another point of the trade-off"));
  }
  if (!settings_.referencePoint.empty() &&
      !FrontScale(problem_.archive.points(), settings_.referencePoint).isBelowReference(problem_.archive.front())) {
    lines.push_back(fmt::format("Warning: No hypervolume: the front is nowhere below {}", kReferencePointKeyword));
  }
  outcome.tables.push_back(frontTable(context));
  outcome.tables.push_back(courseTable());
  addSeries(context, outcome);
}

}  // namespace mirevo

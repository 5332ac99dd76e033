// What a report takes from the tables that a search leaves beside its results, whole and damaged.
#include <cmath>
#include <filesystem>
#include <limits>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "common/run_files.h"
#include "report/report_front.h"
#include "report/report_repetitions.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr double kInfinity = std::numeric_limits<double>::infinity();

/// Three sets on the front, the second of them suggested, and one behind it.
DataTable frontTable() {
  DataTable table{run_files::kPareto, {"Front"}, {}, {}};
  table.columns = {"Evaluation",        "Rank",         "Crowding", "Violation", "Suggested", "Distance",
                   "upper # \"gauge\"", "lower\tgauge", "k",        "b",         "c"};
  const auto add = [&table](std::int64_t number, std::int64_t rank, double crowding, std::int64_t suggested,
                            double distance, double upper, double lower) {
    table.rows.push_back({number, rank, crowding, 0.0, suggested, distance, upper, lower, 1.0 / 3.0, 2.0, 3.0});
  };
  add(12, 1, kInfinity, 0, 1.0, 0.5, 2.5);
  add(7, 1, 1.5, 1, 0.6, 0.7, 1.0);
  add(31, 1, kInfinity, 0, 1.0, 1.5, 0.25);
  add(30, 2, kInfinity, 0, 1.4, 1.6, 2.0);
  return table;
}

DataTable courseTable() {
  return {run_files::kParetoCourse,
          {},
          {"Evaluations", "Front_Size", "Hypervolume"},
          {{std::int64_t{20}, std::int64_t{2}, 0.5}, {std::int64_t{40}, std::int64_t{3}, 0.75}}};
}

const std::string kSeriesText =
    "# Series\nEvaluation\tMeasure\tTime\tSimulated\n"
    "7\tflow\t2001-01-01T00:00:00\t1.5\n7\tflow\t2001-01-02T00:00:00\tNaN\n7\tflow\t2001-01-03T00:00:00\t2\n"
    "# endOfEvaluation\t7\n99\tflow\t2001-01-01T00:00:00\t9\n# endOfEvaluation\t99\n"
    "12\tflow\t2001-01-01T00:00:00\t1.5\n";

class SearchTables : public ::testing::Test {
 protected:
  void write(const RunFile& file, const std::string& text) { folder_.write(runFilePath("basin", file), text); }

  std::optional<ReportedFront> front(std::size_t objectives = 2, std::size_t parameters = 3) {
    faults_.clear();
    return reportedFront(folder_ / "basin", objectives, parameters, faults_);
  }
  std::optional<ReportedRepetitions> repetitions(const std::vector<std::string>& parameters = {"a", "b # c"}) {
    faults_.clear();
    return reportedRepetitions(folder_ / "basin", parameters, faults_);
  }

  TemporaryFolder folder_;
  std::vector<std::string> faults_;
};

TEST_F(SearchTables, AFrontHasItsSetsItsCourseAndTheSeriesThatAreWhole) {
  write(run_files::kPareto, dataTableText(frontTable()));
  write(run_files::kParetoCourse, dataTableText(courseTable()));
  write(run_files::kParetoSeries, kSeriesText);
  auto found = front();
  ASSERT_TRUE(found);
  EXPECT_THAT(faults_, IsEmpty());
  EXPECT_THAT(found->objectives, ElementsAre("upper # \"gauge\"", "lower\tgauge"));
  EXPECT_THAT(found->parameters, ElementsAre("k", "b", "c"));
  EXPECT_THAT(found->numbers, ElementsAre(12, 7, 31, 30));
  EXPECT_THAT(found->ranks, ElementsAre(1, 1, 1, 2));
  EXPECT_EQ(found->suggested, 1U);
  EXPECT_THAT(found->values, ElementsAre(ElementsAre(0.5, 0.7, 1.5, 1.6), ElementsAre(2.5, 1.0, 0.25, 2.0)));
  EXPECT_EQ(found->parameterValues[0][2], 1.0 / 3.0) << "to the last bit";
  ASSERT_TRUE(found->course);
  EXPECT_THAT(found->course->hypervolumes, ElementsAre(0.5, 0.75));

  std::string fault;
  found->series = reportedFrontSeries(folder_ / "basin", *found, {"flow"}, {"flow, flow of snow"}, fault);
  EXPECT_EQ(fault, "");
  ASSERT_EQ(found->series.size(), 1U) << "99 is no set of the front, and 12 is cut off";
  EXPECT_EQ(found->series[0].measure, "flow, flow of snow");
  JsonWriter json;
  json.beginObject();
  writeFront(json, *found);
  EXPECT_THAT(json.endObject().take(),
              AllOf(HasSubstr(R"("numbers":[12,7,31,30],"ranks":[1,1,1,2],)"), HasSubstr(R"("suggested":1,)"),
                    HasSubstr(R"("number":7,"thinned":false,"count":3,"start":"2001-01-01T00:00:00","step":86400000,)"
                              R"("values":[1.5,null,2])")));
}

TEST_F(SearchTables, OfADamagedFrontWhatIsWholeIsShownAndTheRestSaid) {
  const std::string whole = dataTableText(frontTable());
  const std::size_t second = whole.find("\n7\t") + 1;
  struct Case {
    std::string text;
    std::size_t sets;  // 0: there is no front
    std::string fault;
  };
  const std::string_view other = "is damaged, or of other objective functions or parameters than the setup";
  const Case cases[] = {
      {"", 0, fmt::format("basin_Pareto.dat {}", other)},
      {"\n\t\t\n\x01", 0, std::string(other)},
      {whole.substr(0, whole.find("\n12\t") + 1), 0, "basin_Pareto.dat has no set on it"},
      {whole.substr(0, second + 5), 1, ""},  // a line without its end
      {std::string(whole).replace(second, 1, "x"), 3, "1 row of basin_Pareto.dat cannot be read and is left out"},
      {std::string(whole).replace(whole.find("0.25"), 4, "NaN"), 3, "1 row of basin_Pareto.dat"},
      {std::string(whole).replace(second + 2, 1, "0"), 3, "1 row of"},
      {std::string(whole).replace(whole.rfind("\t1.6") + 1, whole.rfind("\t2\t0.") - whole.rfind("\t1.6") - 1, "NaN"),
       4, ""},  // a set that was not run
      {std::string(whole).replace(whole.find("Rank"), 4, "Rang"), 0, std::string(other)},
  };
  write(run_files::kParetoCourse, dataTableText(courseTable()));
  for (const Case& each : cases) {
    write(run_files::kPareto, each.text);
    const auto found = front();
    EXPECT_EQ(found ? found->numbers.size() : 0, each.sets) << each.text;
    EXPECT_THAT(fmt::format("{}", fmt::join(faults_, ";")), HasSubstr(each.fault));
    EXPECT_EQ(faults_.empty(), each.fault.empty()) << each.text;
  }
  write(run_files::kPareto, whole);
  EXPECT_FALSE(front(2, 2)) << "the setup has lost a parameter";
  for (const char* const text : {"", "Evaluations\tFront_Size\n1\t2\n"}) {
    write(run_files::kParetoCourse, text);
    ASSERT_TRUE(front());
    EXPECT_THAT(faults_, ElementsAre("How the front grew is not shown: basin_ParetoCourse.dat is damaged"));
  }
  std::filesystem::remove(folder_ / "basin_ParetoCourse.dat");
  const auto found = front();
  ASSERT_TRUE(found);
  EXPECT_THAT(faults_, ElementsAre(HasSubstr("basin_ParetoCourse.dat: No such file or directory")));
  std::string fault;
  EXPECT_THAT(reportedFrontSeries(folder_ / "basin", *found, {"flow"}, {"flow"}, fault), IsEmpty());
  EXPECT_EQ(fault, "") << "the search kept none";
  write(run_files::kParetoSeries, kSeriesText.substr(0, kSeriesText.find("# endOf")));
  EXPECT_THAT(reportedFrontSeries(folder_ / "basin", *found, {"flow"}, {"flow"}, fault), IsEmpty());
  EXPECT_THAT(fault, HasSubstr("basin_ParetoSeries.dat has none of its sets"));
  std::filesystem::remove(folder_ / "basin_Pareto.dat");
  EXPECT_FALSE(front());
  EXPECT_THAT(faults_, ElementsAre("The front is not shown: basin_Pareto.dat: No such file or directory"));
}

TEST_F(SearchTables, RepetitionsAreThoseOfTheTableWithTheEvaluationsOfEach) {
  EXPECT_FALSE(repetitions());
  EXPECT_THAT(faults_, IsEmpty()) << "a search has none as a rule";
  using Row = std::vector<DataTable::Cell>;
  const auto row = [](std::int64_t number, double aggregate) {
    return Row{number,
               number + 4,
               std::int64_t{60},
               3 * number,
               aggregate,
               std::int64_t{7},
               9.5,
               0.1,
               1.0 / 3.0,
               std::string("the budget\tis used up")};
  };
  DataTable table{run_files::kRepetitions,
                  {},
                  {"Repetition", "Seed", "Evaluations", "Best_Evaluation", "Aggregate", "Loops", "Start_Aggregate", "a",
                   "b _ c", "Termination"},
                  {row(1, 0.5), row(2, std::nan(""))}};
  const std::string whole = dataTableText(table);
  write(run_files::kRepetitions, whole);
  const auto alone = repetitions();
  ASSERT_TRUE(alone);
  EXPECT_THAT(alone->stretches, IsEmpty());
  EXPECT_THAT(faults_, ElementsAre(HasSubstr("The course of each repetition is not shown: "
                                             "basin_Optimisation_RepetitionRows.dat: No such file or directory")));
  write(run_files::kRepetitionRows,
        "Repetition\tFirst_Evaluation\tLast_Evaluation\n1\t1\t10\n2\t11\t20\n1\t30\t21\nx\t1\t2\n2\t21\t30");
  const auto found = repetitions();
  ASSERT_TRUE(found);
  EXPECT_THAT(faults_, IsEmpty());
  EXPECT_THAT(found->parameters, ElementsAre("a", "b # c"));
  ASSERT_EQ(found->all.size(), 2U);
  EXPECT_EQ(found->all[1].parameters[1], 1.0 / 3.0);
  ASSERT_EQ(found->stretches.size(), 2U) << "what goes backwards, is no number or is cut off is left out";
  EXPECT_EQ(found->stretches[1].last, 20);
  JsonWriter json;
  json.beginObject();
  writeRepetitions(json, *found);
  EXPECT_THAT(json.endObject().take(),
              AllOf(HasSubstr(R"("number":2,"seed":6,"evaluations":60,"best":6,"aggregate":null,"loops":7,"start":9.5,)"
                              R"("parameters":[0.1,0.3333333333],"termination":"the budget\u0009is used up")"),
                    HasSubstr(R"("tolerance":0.005,"within":"1 % of the least","atStart":0,)"),
                    HasSubstr(R"("stretches":[[1,1,10],[2,11,20]])"), Not(HasSubstr("hypervolume"))));

  write(run_files::kRepetitionRows, "Repetition\tFirst\n1\t1\n");
  EXPECT_TRUE(repetitions());
  EXPECT_THAT(faults_, ElementsAre(HasSubstr("basin_Optimisation_RepetitionRows.dat is damaged")));
  EXPECT_FALSE(repetitions({"a", "b # c", "d"}));
  EXPECT_THAT(faults_, ElementsAre(HasSubstr("is damaged, or of other parameters than the setup")));
  for (const std::vector<std::string>& others :
       {std::vector<std::string>{"a"}, {"b # c"}, {"a", "d"}, {"b # c", "a"}, {"d", "a", "b # c"}}) {
    EXPECT_FALSE(repetitions(others)) << others.front() << others.size();
  }
  write(run_files::kRepetitions, std::string(whole).replace(whole.find("\n2\t") + 1, 1, "x"));
  const auto first = repetitions();
  ASSERT_TRUE(first);
  EXPECT_EQ(first->all.size(), 1U);
  EXPECT_THAT(faults_.front(), HasSubstr("1 row of basin_Optimisation_Repetitions.dat cannot be read"));
  write(run_files::kRepetitions, whole.substr(0, whole.find("\n1\t") + 4));
  EXPECT_FALSE(repetitions());

  table.columns.insert(table.columns.begin() + 7, "Hypervolume");
  for (Row& cells : table.rows) cells.insert(cells.begin() + 7, 0.75);
  write(run_files::kRepetitions, dataTableText(table));
  const auto ofFronts = repetitions();
  ASSERT_TRUE(ofFronts);
  EXPECT_EQ(ofFronts->all[1].hypervolume, 0.75);
  EXPECT_THAT(ofFronts->parameters, ElementsAre("a", "b # c"));
  EXPECT_FALSE(repetitions({"d", "a", "b # c"})) << "one parameter fewer than the setup has";
  EXPECT_EQ(ofFronts->all[1].parameters[1], 1.0 / 3.0);

  // The same search as an earlier one, of parameters with names of columns.
  DataTable same = table;
  same.columns = {"Repetition",      "Seed",    "Evaluations", "Best_Evaluation", "Aggregate",  "Loops",
                  "Start_Aggregate", "Same_As", "Seed (2)",    "Termination (2)", "Termination"};
  same.rows[0][7] = std::int64_t{0};
  same.rows[1][7] = std::int64_t{1};
  write(run_files::kRepetitions, dataTableText(same));
  const auto twice = repetitions({"Seed", "Termination"});
  ASSERT_TRUE(twice);
  EXPECT_THAT(twice->parameters, ElementsAre("Seed", "Termination"));
  EXPECT_EQ(twice->all[0].seed, 5);
  EXPECT_EQ(twice->all[0].parameters[1], 1.0 / 3.0);
  JsonWriter ofSame;
  ofSame.beginObject();
  writeRepetitions(ofSame, *twice);
  EXPECT_THAT(ofSame.endObject().take(), AllOf(HasSubstr(R"("start":9.5,"sameAs":1,)"), Not(HasSubstr("sameAs\":0"))));

  // One of an unfinished run that has not ended, with the least value, is not what others are judged by.
  table.rows.push_back(row(3, 0.01));
  table.rows.back().insert(table.rows.back().begin() + 7, 0.0);
  table.rows.back().back() = std::string();
  write(run_files::kRepetitions, dataTableText(table));
  EXPECT_EQ(repetitions().value().nearly.tolerance, 0.005);
  // Without the columns that there may be, also where a parameter has the name of one.
  table.columns.erase(table.columns.begin() + 6, table.columns.begin() + 8);
  table.columns[7] = "Hypervolume";
  for (Row& cells : table.rows) cells.erase(cells.begin() + 6, cells.begin() + 8);
  write(run_files::kRepetitions, dataTableText(table));
  const auto bare = repetitions({"a", "Hypervolume"});
  ASSERT_TRUE(bare);
  EXPECT_THAT(bare->parameters, ElementsAre("a", "Hypervolume"));
  EXPECT_EQ(bare->all[0].parameters[0], 0.1);
  EXPECT_TRUE(std::isnan(bare->all[0].start));
  EXPECT_TRUE(std::isnan(bare->all[0].hypervolume));
  EXPECT_EQ(bare->nearly.tolerance, 0.005);
}

/// What the program writes, of parameters with the names of its columns.
TEST_F(SearchTables, RepetitionsOfParametersWithTheNamesOfColumnsAreRead) {
  SearchSpace space;
  space.lower = {0.0, 0.0};
  space.upper = {1.0, 1.0};
  space.transformation = {TransformationType::none, TransformationType::none};
  std::vector<Repetition> all(1);
  all[0] = {.seed = 1, .evaluations = 5, .bestEvaluation = 2, .aggregate = 3.0, .best = {0.25, 0.5}};
  for (const bool hasFronts : {false, true}) {
    if (hasFronts) all[0].front.emplace().hypervolume = 0.5;
    all[0].sumOfSquares = hasFronts ? std::nan("") : 0.75;
    all[0].startSum = 0.875;
    for (const std::vector<std::string>& names :
         {std::vector<std::string>{"Start_Aggregate", "b"}, {"Hypervolume", "Same_As"}, {"Seed", "Sum_of_Squares"}}) {
      space.names = names;
      write(run_files::kRepetitions, dataTableText(repetitionTable(all, space)));
      const auto found = repetitions(names);
      ASSERT_TRUE(found) << names[0];
      EXPECT_EQ(found->parameters, names);
      EXPECT_THAT(found->all[0].parameters, ElementsAre(0.25, 0.5));
      EXPECT_EQ(std::isfinite(found->all[0].hypervolume), hasFronts);
      if (hasFronts) continue;
      EXPECT_EQ(found->all[0].sumOfSquares, 0.75);
      EXPECT_EQ(found->all[0].startSum, 0.875);
    }
  }
}

TEST_F(SearchTables, FrontsOfRepetitionsAreComparedWithThatOfAllOfThem) {
  const auto repetition = [](int number, double hypervolume, const char* termination) {
    ReportedRepetition one;
    one.number = one.best = number;
    one.hypervolume = hypervolume;
    one.termination = termination;
    one.loops = 4;
    return one;
  };
  ReportedRepetitions all;
  all.all = {repetition(1, 0.34, "ended"), repetition(2, 0.995, "ended"), repetition(3, 0.9, "")};
  ReportedFront front;
  front.ranks = {1, 2};
  front.course.emplace().hypervolumes = {0.1, 1.0, std::nan("")};
  const auto json = [&] {
    compareFronts(all, front);
    JsonWriter writer;
    writer.beginObject();
    writeRepetitions(writer, all);
    return writer.endObject().take();
  };
  EXPECT_THAT(json(), HasSubstr(R"("fronts":{"ofAll":1,"near":1,"verdict":"differ"})"));
  all.all[0].hypervolume = 1.0;
  EXPECT_THAT(json(), HasSubstr(R"("fronts":{"ofAll":1,"near":2,"verdict":"one set"})"));
  front.ranks = {1, 1};
  EXPECT_THAT(json(), HasSubstr(R"("verdict":"agree")"));
  for (ReportedRepetition& one : all.all) one.loops = 0;
  EXPECT_THAT(json(), HasSubstr(R"("verdict":"no search")"));
}

}  // namespace
}  // namespace mirevo

#include <algorithm>
#include <cmath>
#include <map>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The test model with two series of observations, made with a = 5, b = 2 and with a = 7, b = 1: what is gained at one
/// is lost at the other. The model is linear, so that the front is the line between the two sets, and the errors of a
/// set on it add up to the distance of the two series.
class Pareto : public ::testing::Test {
 protected:
  Pareto() { makeObservations("other.csv", 7, 1); }

  void makeObservations(const std::string& file, double a, double b) {
    folder_.write("model/parameters.txt", fmt::format("a = {}\nb = {}\nc = 1\n", a, b));
    const std::string command =
        fmt::format("cd '{}/model' && ./run.sh && cp simulated.csv '../{}'", folder_.path(), file);
    EXPECT_EQ(std::system(command.c_str()), 0);
  }

  void writeSetup(const RunSettings& settings, const std::string& keywords = "", bool hasSecond = true) {
    setup_ = folder_.writeSetup(settings);
    std::string search = settings.search;
    std::erase(search, '-');
    folder_.editSetup("    [SCE_CONTROL_PARAMETERS]",
                      fmt::format("    [{0}_CONTROL_PARAMETERS]\n{1}\n    [/{0}_CONTROL_PARAMETERS]\n"
                                  "    [SCE_CONTROL_PARAMETERS]",
                                  search, keywords));
    if (!hasSecond) return;
    folder_.addMeasure("flow of another", "");
    std::string text = folder_.read("basin.kdx");
    const auto second = text.find("[MEASURE_2]");
    text.replace(text.find("'fit'", second), 5, "'other'");
    text.replace(text.find("observed.csv", second), 12, "other.csv");
    folder_.write("basin.kdx", text);
    folder_.editSetup("[OBJECTIVE_FUNCTIONS]\n      TqSEKdxListItemCount = 1",
                      "[OBJECTIVE_FUNCTIONS]\n      TqSEKdxListItemCount = 2\n      [OBJECTIVE_2]\n"
                      "        Name = 'other'\n        Function_Type = 0\n        Weight = 1.0\n      [/OBJECTIVE_2]");
  }
  /// A third series of observations, made with a = 3 and b = 4, and its objective function.
  void addThird() {
    makeObservations("third.csv", 3, 4);
    std::string text = folder_.read("basin.kdx");
    const auto begin = text.find("[MEASURE_2]");
    const std::string end = "[/MEASURE_2]\n";
    std::string third = text.substr(begin, text.find(end) + end.size() - begin);
    for (const auto& [from, to] : {std::pair("[MEASURE_2]", "[MEASURE_3]"),
                                   {"[/MEASURE_2]", "[/MEASURE_3]"},
                                   {"'flow of another'", "'a third'"},
                                   {"'other'", "'third'"},
                                   {"other.csv", "third.csv"}}) {
      const auto at = third.find(from);
      ASSERT_NE(at, std::string::npos) << from;
      third.replace(at, std::string_view(from).size(), to);
    }
    text.insert(text.find(end) + end.size(), third);
    folder_.write("basin.kdx", text);
    folder_.editSetup("[OUTPUT_MEASURES]\n      TqSEKdxListItemCount = 2",
                      "[OUTPUT_MEASURES]\n      TqSEKdxListItemCount = 3");
    folder_.editSetup("[OBJECTIVE_FUNCTIONS]\n      TqSEKdxListItemCount = 2\n",
                      "[OBJECTIVE_FUNCTIONS]\n      TqSEKdxListItemCount = 3\n      [OBJECTIVE_3]\n"
                      "        Name = 'third'\n        Function_Type = 0\n      [/OBJECTIVE_3]\n");
  }
  void run() {
    const ProgramResult result = runProgram({setup_});
    ASSERT_EQ(result.exitCode, 0) << result.error << log();
  }
  std::string log() const { return folder_.read("basin.log"); }
  ReadTable front() const { return readDataTable(folder_.read("basin_Pareto.dat")); }
  std::string results() const {
    std::string all = withoutDates(folder_.read("basin_Optimisation.dat"));
    for (const char* name : {"basin_Pareto.dat", "basin_ParetoCourse.dat", "basin_ParetoSeries.dat"}) {
      all += folder_.read(name);
    }
    return all;
  }
  void removeResults() const {
    for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
      const std::string name = entry.path().filename().string();
      if (name.starts_with("basin_") || name == "basin.log") std::filesystem::remove_all(entry.path());
    }
  }

  ModelFolder folder_;
  std::string setup_;
};

double numberInRow(const ReadTable& table, const std::vector<std::string>& row, const std::string& column) {
  return realCell(row.at(table.column(column).value())).value();
}

/// The numbers of the evaluations of rank 1, ascending.
std::set<std::string> numbersOnFront(const ReadTable& front) {
  std::set<std::string> numbers;
  for (const auto& row : front.rows) {
    if (numberInRow(front, row, "Rank") == 1.0) numbers.insert(row[0]);
  }
  return numbers;
}

/// Those of the rows of the result file that no other one dominates, by comparing each with each.
std::set<std::string> numbersByComparison(const ReadTable& results, const std::vector<std::string>& objectives) {
  const auto isAtMost = [&](const auto& a, const auto& b) {
    return std::ranges::all_of(objectives, [&](const std::string& name) {
      return numberInRow(results, a, name) <= numberInRow(results, b, name);
    });
  };
  std::set<std::string> numbers;
  for (auto row = results.rows.begin(); row != results.rows.end(); ++row) {
    const bool isBehind = std::any_of(results.rows.begin(), results.rows.end(), [&](const auto& other) {
      return &other != &*row && isAtMost(other, *row) && (&other < &*row || !isAtMost(*row, other));
    });
    if ((*row)[1] == "OK" && !isBehind) numbers.insert((*row)[0]);
  }
  return numbers;
}

TEST_F(Pareto, TheFrontIsTheLineBetweenTheTwoSetsAndItsSeriesAreThoseOfItsSets) {
  for (const auto& [search, keywords] : {std::pair("NSGA-II", "Population_Size = 20"), {"PADDS", "Candidates = 2"}}) {
    SCOPED_TRACE(search);
    writeSetup({.search = search, .maxEvaluations = 300, .slots = 2}, keywords);
    run();
    const double distance = std::sqrt([] {
      double sum = 0.0;
      for (int t = 0; t < 365; ++t) sum += std::pow(2.0 - std::sin(t / 58.0), 2.0);
      return sum / 365.0;
    }());
    const ReadTable table = front();
    ASSERT_GT(table.rows.size(), 15U);
    int suggested = 0;
    double before = -1.0;
    for (const auto& row : table.rows) {
      const double fit = numberInRow(table, row, "fit");
      const double other = numberInRow(table, row, "other");
      if (numberInRow(table, row, "Rank") > 1.0) continue;
      EXPECT_GE(fit + other, distance - 1e-5);
      EXPECT_LT(fit + other, 1.35 * distance);
      EXPECT_GT(fit, before) << "sorted";
      before = fit;
      EXPECT_EQ(numberInRow(table, row, "Violation"), 0.0);
      if (numberInRow(table, row, "Suggested") == 0.0) continue;
      ++suggested;
      // The final model run is that of the suggested set.
      const std::string parameters = folder_.read("basin_Process1/parameters.txt");
      EXPECT_NEAR(std::strtod(parameters.c_str() + parameters.find("a = ") + 4, nullptr), numberInRow(table, row, "a"),
                  1e-6);
    }
    EXPECT_EQ(suggested, 1);
    EXPECT_THAT(log(), HasSubstr("\nSuggested compromise: evaluation "));
    EXPECT_THAT(log(), HasSubstr("It is a suggestion"));
    EXPECT_THAT(log(), HasSubstr("\nFinal model run with the suggested compromise, evaluation "));
    EXPECT_THAT(log(), HasSubstr("\nCourse: in the second half of the evaluations the hypervolume "));
    EXPECT_THAT(log(), Not(HasSubstr("The final model run has other results")));

    const ReadTable series = readDataTable(folder_.read("basin_ParetoSeries.dat"));
    std::map<std::string, int> steps;
    for (const auto& row : series.rows) {
      const int day = steps[row[0] + row[1]]++;
      const auto of = std::ranges::find_if(table.rows, [&](const auto& each) { return each[0] == row[0]; });
      ASSERT_NE(of, table.rows.end()) << row[0];
      const double expected =
          numberInRow(table, *of, "a") + numberInRow(table, *of, "b") * std::sin(day / 58.0) + day / 365.0;
      ASSERT_NEAR(realCell(row[3]).value(), expected, 1e-4) << row[0] << " " << row[2];
    }
    ASSERT_FALSE(steps.empty());
    for (const auto& [key, count] : steps) EXPECT_EQ(count, 365) << key;
    const ReadTable course = readDataTable(folder_.read("basin_ParetoCourse.dat"));
    EXPECT_EQ(course.rows.back()[0], "300");
    EXPECT_GT(realCell(course.rows.back()[2]).value(), 0.4);
    removeResults();
  }
}

TEST_F(Pareto, ResultsAreTheSameOnAnyNumberOfSlotsAfterAnInterruptionAndWithARaisedBudget) {
  for (const auto& [search, keywords] : {std::pair("NSGA-II", "Population_Size = 12"), {"PADDS", "Candidates = 3"}}) {
    SCOPED_TRACE(search);
    const std::string failing = "--fail-above 9";
    folder_.useScript(kSleepByParameters);
    writeSetup({.search = search, .maxEvaluations = 60, .restart = 1, .modelArguments = failing}, keywords);
    run();
    const std::string expected = results();
    removeResults();
    writeSetup({.search = search, .maxEvaluations = 60, .slots = 3, .restart = 1, .modelArguments = failing}, keywords);
    run();
    EXPECT_EQ(results(), expected) << "three slots";
    removeResults();

    // The first 31 runs end and the others wait until the run is ended.
    folder_.useScript(
        std::string(kSleepByParameters) +
        "\ntest -e ../wait && { echo >>../calls; while test -e ../wait && test $(wc -l <../calls) -gt 31; "
        "do sleep 0.05; done; }");
    folder_.write("wait", "");
    folder_.write("calls", "");
    writeSetup({.search = search, .maxEvaluations = 60, .restart = 1, .modelArguments = failing}, keywords);
    {
      RunningProgram interrupted({setup_});
      ASSERT_TRUE(waitUntil([&] { return occurrences(folder_.read("calls"), "\n") > 31; }));
      folder_.write("basin._kill_", "");
      EXPECT_EQ(interrupted.wait().exitCode, 1);
    }
    EXPECT_THAT(folder_.read("basin_Pareto.dat"), HasSubstr("# Unfinished run: statistics of "));
    EXPECT_THAT(folder_.read("basin_Optimisation.dat"), HasSubstr("# Front: "));
    std::filesystem::remove(folder_ / "wait");
    run();
    EXPECT_EQ(results(), expected) << "after an interruption";

    folder_.editSetup("Max_No_Evaluations = 60", "Max_No_Evaluations = 90");
    run();
    EXPECT_THAT(log(), HasSubstr("Max_No_Evaluations was raised from 60 to 90"));
    const ReadTable course = readDataTable(folder_.read("basin_ParetoCourse.dat"));
    EXPECT_EQ(course.rows.back()[0], "90");
    removeResults();
    std::filesystem::remove(folder_ / "calls");
  }
}

TEST_F(Pareto, ARunThatIsEndedInItsFirstBatchHasTheFrontOfItsRowsAndOneThatASignalEndsSaysWhereItIs) {
  folder_.useScript("echo >>../calls; while test -e ../wait && test $(wc -l <../calls) -gt 5; do sleep 0.05; done");
  const auto endAfterFive = [&](const auto& end, int exitCode) {
    folder_.write("wait", "");
    folder_.write("calls", "");
    writeSetup({.search = "NSGA-II", .maxEvaluations = 12, .restart = 1}, "Population_Size = 12");
    RunningProgram interrupted({setup_});
    ASSERT_TRUE(waitUntil([&] { return occurrences(folder_.read("calls"), "\n") > 5; }));
    end(interrupted);
    EXPECT_EQ(interrupted.wait().exitCode, exitCode);
    std::filesystem::remove(folder_ / "wait");
  };
  const std::vector<std::string> objectives{"fit", "other"};
  endAfterFive([this](const RunningProgram&) { folder_.write("basin._kill_", ""); }, 1);
  const ReadTable rows = readDataTable(folder_.read("basin_Optimisation.dat"));
  EXPECT_EQ(rows.rows.size(), 5U);
  EXPECT_THAT(front().headLines, Contains("Unfinished run: statistics of 5 of 12 evaluations"));
  EXPECT_EQ(numbersOnFront(front()), numbersByComparison(rows, objectives));

  removeResults();
  endAfterFive([](const RunningProgram& run) { run.send(SIGTERM); }, 128 + SIGTERM);
  EXPECT_FALSE(folder_.exists("basin_Pareto.dat"));
  const auto report = [&] {
    EXPECT_EQ(RunningProgram({setup_}, {}, MIREVO_REPORT).wait().exitCode, 0);
    return folder_.read("basin_Report.html");
  };
  const std::string note = "No front was written, as the run was not finished. Started again";
  EXPECT_THAT(report(), HasSubstr(note));
  run();
  EXPECT_EQ(front().rows.size(), 12U);
  EXPECT_THAT(report(), Not(HasSubstr(note)));
}

TEST_F(Pareto, ASearchThatItsHypervolumeHasEndedLeavesNothingOpenAndGoesOnWithARaisedBudget) {
  const std::pair<const char*, const char*> cases[] = {
      {"NSGA-II", "Population_Size = 12\nHypervolume_Evaluations = 24\nHypervolume_Change = 0.3"},
      {"PADDS", "Candidates = 4\nHypervolume_Evaluations = 40\nHypervolume_Change = 0.1"}};
  for (const auto& [search, keywords] : cases) {
    SCOPED_TRACE(search);
    folder_.useScript("true");
    const auto evaluations = [&] {
      const ReadTable course = readDataTable(folder_.read("basin_ParetoCourse.dat"));
      return static_cast<int>(realCell(course.rows.back()[0]).value());
    };
    const auto rows = [&] {
      std::vector<std::string> found;
      const std::string text = folder_.read("basin_Optimisation.dat");
      for (const std::string_view line : splitLines(text)) {
        if (!line.empty() && line.front() >= '0' && line.front() <= '9') found.emplace_back(line);
      }
      return found;
    };
    const auto runAndCheck = [&] {
      run();
      EXPECT_THAT(log(), HasSubstr("Hypervolume convergence criterion met"));
      EXPECT_THAT(log(), Not(HasSubstr("The final model run has other results")));
      EXPECT_EQ(std::ssize(rows()), evaluations() + 1) << "one final run";
    };
    writeSetup({.search = search, .maxEvaluations = 400}, keywords);
    runAndCheck();
    const int ended = evaluations();
    EXPECT_LT(ended, 200);
    const std::string expected = results();
    const std::vector<std::string> firstRows = rows();
    removeResults();
    folder_.useScript(kSleepByParameters);
    writeSetup({.search = search, .maxEvaluations = 400, .slots = 3}, keywords);
    runAndCheck();
    EXPECT_EQ(results(), expected) << "three slots";
    writeSetup({.search = search, .maxEvaluations = 400, .slots = 3, .restart = 1}, keywords);
    runAndCheck();
    EXPECT_EQ(results(), expected) << "a restart of a search that has ended";

    writeSetup({.search = search, .maxEvaluations = 410, .slots = 3, .restart = 1}, keywords);
    runAndCheck();
    EXPECT_THAT(log(), HasSubstr(fmt::format("the first {} evaluations, which are kept; the hypervolume is tested anew",
                                             ended)));
    EXPECT_GT(evaluations(), ended + 24);
    const std::vector<std::string> secondRows = rows();
    EXPECT_TRUE(std::equal(firstRows.begin(), firstRows.begin() + ended, secondRows.begin()));
    const std::string raised = results();
    run();
    EXPECT_EQ(results(), raised) << "a restart of a search that was continued";
    removeResults();
  }
}

TEST_F(Pareto, EveryRowMeetsScalesAndConstraintsAndTheFrontIsWhatNoRowDominates) {
  for (const auto& [search, keywords] : {std::pair("NSGA-II", "Population_Size = 20"), {"PADDS", "Candidates = 2"}}) {
    SCOPED_TRACE(search);
    writeSetup({.search = search, .includesInitial = false, .maxEvaluations = 100, .slots = 2}, keywords);
    folder_.editSetup("Upper_Bound = 10.0\n      Transformation_Type = 0",
                      "Upper_Bound = 10.0\n      Transformation_Type = 2");
    folder_.editSetup("Lower_Bound = 0.0\n      Upper_Bound = 5.0\n      Transformation_Type = 0",
                      "Lower_Bound = 0.01\n      Upper_Bound = 5.0\n      Transformation_Type = 1");
    // For both sets with which the observations are made it is 9.
    folder_.editSetup("TqSEKdxListItemCount = 0\n    [/INTERNAL_CONSTRAINTS]",
                      "TqSEKdxListItemCount = 1\n[CONSTRAINT_1]\nLeft_Equation = 'a + 2 * b'\nRight_Equation = '8.5'\n"
                      "Logical_Operator = 1\n[/CONSTRAINT_1]\n[/INTERNAL_CONSTRAINTS]");
    run();
    const ReadTable rows = readDataTable(folder_.read("basin_Optimisation.dat"));
    std::set<double> whole;
    int small = 0;
    for (const auto& row : rows.rows) {
      EXPECT_EQ(row[1], "OK") << row[0];
      const double a = numberInRow(rows, row, "a");
      const double b = numberInRow(rows, row, "b");
      EXPECT_EQ(a, std::round(a)) << row[0];
      EXPECT_LE(a + 2.0 * b, 8.5) << row[0];
      EXPECT_TRUE(a >= 0.0 && a <= 10.0 && b >= 0.01 && b <= 5.0) << row[0];
      whole.insert(a);
      if (b < 0.1) ++small;
    }
    EXPECT_GE(whole.size(), 3U);
    EXPECT_GE(small, 3) << "a tenth of the values has a good third of a logarithmic scale";
    EXPECT_EQ(numbersOnFront(front()), numbersByComparison(rows, {"fit", "other"}));
    removeResults();
  }
}

TEST_F(Pareto, ThreeObjectivesHaveTheFrontThatNoRowDominates) {
  for (const auto& [search, keywords] : {std::pair("NSGA-II", "Population_Size = 20"), {"PADDS", "Candidates = 2"}}) {
    SCOPED_TRACE(search);
    writeSetup({.search = search, .maxEvaluations = 160, .slots = 2, .modelArguments = "--fail-above 9"}, keywords);
    addThird();
    run();
    const ReadTable table = front();
    EXPECT_THAT(table.columns, ::testing::ElementsAre("Evaluation", "Rank", "Crowding", "Violation", "Suggested",
                                                      "Distance", "fit", "other", "third", "a", "b"));
    const std::set<std::string> numbers = numbersOnFront(table);
    EXPECT_GT(numbers.size(), 20U);
    EXPECT_EQ(numbers,
              numbersByComparison(readDataTable(folder_.read("basin_Optimisation.dat")), {"fit", "other", "third"}));
    EXPECT_THAT(log(), HasSubstr("\n   third: "));
    const ReadTable course = readDataTable(folder_.read("basin_ParetoCourse.dat"));
    EXPECT_EQ(course.rows.back()[1], std::to_string(numbers.size()));
    removeResults();
  }
}

TEST_F(Pareto, SeriesAreThoseOfTheObservationsOrOfEveryStepOrNone) {
  // Every fifth day is observed.
  for (const char* file : {"observed.csv", "other.csv"}) {
    std::string fifth;
    int place = 0;
    const std::string text = folder_.read(file);
    for (const std::string_view line : splitLines(text)) {
      const bool isDay = !line.empty() && line.front() >= '0' && line.front() <= '9';
      if (!isDay || place++ % 5 == 0) fifth += std::string(line) + "\n";
    }
    ASSERT_EQ(place, 365);
    folder_.write(file, fifth);
  }
  for (const auto& [kept, steps] : {std::pair("observations", 73), {"steps", 365}, {"none", 0}}) {
    SCOPED_TRACE(kept);
    writeSetup({.search = "NSGA-II", .maxEvaluations = 36},
               fmt::format("Population_Size = 12\nFront_Series = '{}'", kept));
    run();
    EXPECT_EQ(folder_.exists("basin_ParetoSeries.dat"), steps > 0);
    if (steps == 0) continue;
    std::map<std::string, int> counts;
    const ReadTable table = front();
    for (const auto& row : readDataTable(folder_.read("basin_ParetoSeries.dat")).rows) {
      const int day = counts[row[0] + row[1]]++ * 365 / steps;
      const auto of = std::ranges::find_if(table.rows, [&](const auto& each) { return each[0] == row[0]; });
      ASSERT_NE(of, table.rows.end()) << row[0];
      const double expected =
          numberInRow(table, *of, "a") + numberInRow(table, *of, "b") * std::sin(day / 58.0) + day / 365.0;
      ASSERT_NEAR(realCell(row[3]).value(), expected, 1e-4) << row[0] << " " << row[2];
    }
    EXPECT_EQ(counts.size(), 2 * numbersOnFront(table).size());
    for (const auto& [key, count] : counts) EXPECT_EQ(count, steps) << key;
    removeResults();
  }
}

TEST_F(Pareto, AJobHasTheRowsAndTheFrontOfOneProcess) {
  if (!mpirunIsInstalled()) GTEST_SKIP() << "mpirun is not installed";
  const auto rows = [this] {
    std::string found;
    const std::string text = results();
    for (const std::string_view line : splitLines(text)) {
      if (!line.starts_with('#')) found += std::string(line) + "\n";
    }
    return found;
  };
  folder_.useScript(kSleepByParameters);
  for (const auto& [search, keywords] : {std::pair("NSGA-II", "Population_Size = 12"), {"PADDS", "Candidates = 3"}}) {
    SCOPED_TRACE(search);
    writeSetup({.search = search, .maxEvaluations = 40, .modelArguments = "--fail-above 9"}, keywords);
    run();
    const std::string expected = rows();
    EXPECT_GT(occurrences(expected, "\n"), 365);
    removeResults();
    const ProgramResult job = startJob(4, {setup_}).wait();
    ASSERT_EQ(job.exitCode, 0) << job.error << log();
    EXPECT_EQ(rows(), expected);
    removeResults();
  }
}

TEST_F(Pareto, OneObjectiveFunctionAndAReferencePointThatDoesNotFitAreRefused) {
  writeSetup({.search = "NSGA-II"}, "", false);
  ProgramResult run = runProgram({setup_});
  EXPECT_EQ(run.exitCode, 1);
  EXPECT_THAT(run.error, HasSubstr("Error: One objective function for NSGA-II algorithm"));
  EXPECT_THAT(run.error, HasSubstr("there is no trade-off"));
  writeSetup({.search = "PADDS"}, "Reference_Point = 1, 2, 3");
  run = runProgram({setup_});
  EXPECT_EQ(run.exitCode, 1);
  EXPECT_THAT(run.error, HasSubstr("Error: Reference point in PADDS algorithm invalid"));
  EXPECT_THAT(run.error, HasSubstr("expected 2 values, one for each objective function, found 3"));
}

}  // namespace
}  // namespace mirevo::testing

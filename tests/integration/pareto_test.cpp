#include <algorithm>
#include <cmath>
#include <map>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The test model with two series of observations, made with a = 5, b = 2 and with a = 7, b = 1: what is gained at one
/// is lost at the other. The model is linear, so that the front is the line between the two sets, and the errors of a
/// set on it add up to the distance of the two series.
class Pareto : public ::testing::Test {
 protected:
  Pareto() {
    folder_.write("model/parameters.txt", "a = 7\nb = 1\nc = 1\n");
    const std::string command =
        fmt::format("cd '{}/model' && ./run.sh && cp simulated.csv ../other.csv", folder_.path());
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

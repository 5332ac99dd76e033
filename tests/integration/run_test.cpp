#include <algorithm>
#include <cstdlib>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

TEST(Optimisation, ACalibrationEndsWithItsBestSetInLogResultsAndModelFolder) {
  const ModelFolder folder;
  const ProgramResult result = runProgram({folder.writeSetup({.maxEvaluations = 200})});
  ASSERT_EQ(result.exitCode, 0) << result.error;
  EXPECT_EQ(result.output + result.error, "");

  const std::string results = folder.read("basin_Optimisation.dat");
  const ReadTable table = readDataTable(results);
  ASSERT_EQ(table.rows.size(), 201U);  // the search's evaluations, the final model run
  EXPECT_THAT(table.columns, ElementsAre("Evaluation", "Status", "a", "b", "flow", "fit", "Aggregate"));
  double best = 1e30;
  for (std::size_t i = 0; i < table.rows.size(); ++i) {
    EXPECT_EQ(table.rows[i][0], std::to_string(i + 1));
    EXPECT_EQ(table.rows[i][1], "OK");
    best = std::min(best, std::stod(table.rows[i][6]));
  }
  EXPECT_LT(best, 0.1);
  EXPECT_EQ(std::stod(table.rows.back()[6]), best);
  const std::string reason = "Optimisation terminated: Maximum number of model evaluations reached\n";
  EXPECT_THAT(results,
              AllOf(StartsWith("# Small test basin\n"), HasSubstr("\n# " + reason), HasSubstr("\n# Best evaluation: "),
                    HasSubstr("\n# Best a = " + table.rows.back()[2] + "\n")));
  const std::string log = folder.read("basin.log");
  EXPECT_THAT(log, HasSubstr(reason));
  EXPECT_THAT(log, HasSubstr("   a = " + table.rows.back()[2] + "\n"));
  EXPECT_THAT(log, EndsWith("\n\nNormal termination\n"));
  EXPECT_THAT(folder.read("basin._spi_"), EndsWith("PROGRE100.0\n"));
  EXPECT_THAT(folder.read("basin._spi_"), HasSubstr("\nMESLBL of 201\n"));
  EXPECT_EQ(folder.read("basin_Termination.log"), "Successful completion\n");
  EXPECT_FALSE(folder.exists("calSimErr.dat"));
  EXPECT_EQ(folder.read("model/parameters.txt"), "a = 5\nb = 2\nc = 1\n") << "the model's own folder is never written";
  EXPECT_NEAR(std::stod(folder.read("basin_Process1/parameters.txt").substr(4)), std::stod(table.rows.back()[2]), 1e-6);
}

TEST(Optimisation, OfEqualSetsTheResultsNameTheOneThatTheSearchTookAndUnusedParametersAreWarnedOf) {
  const ModelFolder folder;
  folder.write("model/parameters.tpl", "!\na = 4\nc = !c!\n# 1!c!\n");
  const ProgramResult run = runProgram({folder.writeSetup({.maxEvaluations = 10})});
  ASSERT_EQ(run.exitCode, 0);
  const std::string results = folder.read("basin_Optimisation.dat");
  const auto rows = readDataTable(results).rows;
  ASSERT_EQ(rows.size(), 11U);
  EXPECT_THAT(results, HasSubstr("\n# Best evaluation: 10\n"));
  EXPECT_THAT(results, HasSubstr("\n# Best a = " + rows[9][2] + "\n"));
  EXPECT_EQ(rows[10][2], rows[9][2]);
  const std::string log = folder.read("basin.log");
  for (const char* name : {"a", "b"}) {
    EXPECT_THAT(log, HasSubstr(fmt::format("Warning: the variable parameter \"{}\" is in no template", name)));
  }
  EXPECT_THAT(log, Not(HasSubstr("parameter \"c\" is in no template"))) << "a fixed one";
  EXPECT_THAT(log, HasSubstr("parameters.tpl:4: the placeholder of parameter \"c\""));
  // Whoever does not read the log is told, too.
  const std::string first = "the variable parameter \"a\" is in no template: its value does not reach the model";
  const std::string report = folder.read("basin_Report.html");
  EXPECT_THAT(run.error,
              AllOf(StartsWith("Mirevo: All 11 successful model runs so far have the same output measures"),
                    EndsWith(fmt::format("\nMirevo: 4 warnings in {}; the first: {}\n", folder / "basin.log", first))));
  EXPECT_THAT(folder.read("basin._spi_"), HasSubstr("\nMESSAGWarning: " + first + "\n"));
  EXPECT_THAT(report, HasSubstr("Warning: the variable parameter \\\"a\\\" is in no template"));
  EXPECT_THAT(log, HasSubstr("\n4 warnings: the lines above that begin with"));
}

TEST(Scenarios, ASetupThatSelectsNothingSaysSo) {
  const ModelFolder folder;
  for (const auto& [from, to] :
       {std::pair{"Option = 2", "Option = 5"}, {"Use_Surrogate_Model = 0", "Use_Surrogate_Model = 2"}}) {
    const std::string setup = folder.writeSetup({});
    folder.editSetup(from, to);
    const ProgramResult run = runProgram({setup});
    EXPECT_EQ(run.exitCode, 0);
    EXPECT_THAT(run.error, StartsWith("Mirevo: Nothing was run: the setup selects no task or no search\n"));
    EXPECT_THAT(folder.read("basin.log"), EndsWith("\n\nNormal termination\n"));
  }
}

TEST(Optimisation, ResultsAreTheSameBitsWhateverOrderTheModelRunsEndIn) {
  const ModelFolder folder;
  folder.useScript(kSleepByParameters);
  for (RunSettings settings :
       {RunSettings{.algorithm = 1, .maxEvaluations = 50}, RunSettings{.search = "OPSE", .maxEvaluations = 50},
        RunSettings{.search = "CMA-ES", .maxEvaluations = 50},
        RunSettings{.search = "CMA-ES", .usesSurrogate = true, .maxEvaluations = 50},
        RunSettings{.search = "GLM", .maxEvaluations = 30}, RunSettings{.option = 3, .maxEvaluations = 40}}) {
    std::string ofOneSlot;
    for (const int slots : {1, 3, 8}) {
      settings.slots = slots;
      ASSERT_EQ(runProgram({folder.writeSetup(settings)}).exitCode, 0);
      const std::string results = withoutDates(folder.read(settings.resultFile())) + folder.read("basin_Series.dat");
      if (slots == 1) ofOneSlot = results;
      EXPECT_EQ(results, ofOneSlot) << slots << " slots";
      std::vector<int> ended;
      std::istringstream log(folder.read("basin.log"));
      for (std::string line; std::getline(log, line);) {
        const auto at = line.find(" completed: OK");
        if (at != std::string::npos) ended.push_back(std::atoi(line.c_str() + line.rfind(' ', at - 1)));
      }
      ASSERT_EQ(std::ssize(ended), settings.maxEvaluations + (settings.option == 3 ? 0 : 1));
      EXPECT_EQ(std::is_sorted(ended.begin(), ended.end()), slots == 1);
    }
  }
}

TEST(Optimisation, SlotsDoNotShareWhatALinkInTheModelsFolderLeadsTo) {
  const ModelFolder folder;
  folder.useScript("cd out && cp ../parameters.txt . && date >../work/$$ && " + std::string(kSleepByParameters));
  folder.write("model/out/simulated.csv", folder.read("observed.csv"));
  std::filesystem::create_directory(folder / "work");
  std::filesystem::create_directory_symlink("../work", folder / "model/work");
  folder.writeSetup({.algorithm = 1, .maxEvaluations = 40, .slots = 4});
  folder.editSetup("model/simulated.csv", "model/out/simulated.csv");
  const auto run = [&folder] {
    const ProgramResult result = runProgram({folder / "basin.kdx"});
    EXPECT_EQ(result.exitCode, 0) << result.error;
    return withoutDates(folder.read("basin_Optimisation.dat"));
  };
  const std::string wanted = run();
  std::filesystem::rename(folder / "model/out", folder / "scratch");
  std::filesystem::create_directory_symlink(folder / "scratch", folder / "model/out");
  EXPECT_EQ(run(), wanted);
  EXPECT_EQ(folder.read("scratch/simulated.csv"), folder.read("observed.csv"));
  EXPECT_FALSE(folder.exists("scratch/parameters.txt"));
  EXPECT_THAT(folder.read("basin.log"), AllOf(HasSubstr("\nWarning: The link " + (folder / "model/out") + " leads to "),
                                              HasSubstr(": " + (folder / "work") + " was changed during the first")));
}

TEST(Scenarios, ASingleRunEvaluatesTheInitialSet) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 0});
  EXPECT_THAT(runProgram({setup}, {{"VOLK_PROGRESS", "STDOUT"}}).output, HasSubstr("No. 1 completed: OK\n"));
  EXPECT_FALSE(folder.exists("basin._spi_"));
  const std::string results = folder.read("basin.dat");
  EXPECT_THAT(results, Not(HasSubstr("# Random seed")));  // nothing is drawn
  const auto rows = readDataTable(results).rows;
  ASSERT_EQ(rows.size(), 1U);
  EXPECT_THAT(std::vector(rows[0].begin(), rows[0].begin() + 4), ElementsAre("1", "OK", "4", "1"));
  // Simulated minus observed is -1 - sin(t / 58) over t = 0 ... 364.
  EXPECT_NEAR(std::stod(rows[0][4]), 1.224418, 1e-5);
}

/// What it writes to its standard outputs must not get into the files that it opens.
TEST(Scenarios, AnEndWithoutATimeOfDaySaysWhatItLeavesOut) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 0});
  folder.write("observed.csv", folder.read("observed.csv") + "2001-12-31 06:00,1\n");
  for (const auto& [end, isWarned] :
       {std::pair("2001-12-31", true), {"2001-12-30", false}, {"'2001-12-31 06:00'", false}}) {
    folder.writeSetup({.option = 0});
    folder.editSetup("End_Date = 2001-12-31", std::string("End_Date = ") + end);
    ASSERT_EQ(runProgram({setup}).exitCode, 0);
    const char* const warning =
        "Warning: End_Date = 2001-12-31 00:00 is the beginning of its day: the later observations of that day are left "
        "out (output measure \"flow\", 2001-12-31 06:00 ...). With a time of day, such as 23:59, they count\n";
    EXPECT_EQ(folder.read("basin.log").find(warning) != std::string::npos, isWarned) << end;
  }
}

TEST(FailedRuns, ARunWithItsStandardOutputsClosedLeavesTheSameResults) {
  const ModelFolder folder;
  std::filesystem::create_directory(folder / "basin_Report.html.tmp");  // in the way of the report
  const ProgramResult run = runProgram({folder.writeSetup({.option = 0, .modelArguments = "--fail-above 3"})});
  EXPECT_EQ(run.exitCode, 1);
  EXPECT_THAT(run.error, AllOf(StartsWith("Mirevo: Error: Unable to continue. No of failed"),
                               HasSubstr("Mirevo: Warning: The report cannot be written")));
  EXPECT_THAT(folder.read("basin.log"),
              EndsWith("\n\nError: Unable to continue. No of failed simulations too high.\n"));
  const std::string results = withoutDates(folder.read("basin.dat"));
  EXPECT_THAT(results, HasSubstr("\n1\tFAILED\t4\t1\t1e+30\t1e+30\t1e+30\n# Error: Unable to continue. No of"));
  EXPECT_THAT(folder.read("calSimErr.dat"), HasSubstr("a = 4 is too large"));
  EXPECT_NE(std::system(fmt::format("'{}' '{}' <&- >&- 2>&-", MIREVO_PROGRAM, folder / "basin.kdx").c_str()), 0);
  EXPECT_EQ(withoutDates(folder.read("basin.dat")), results);
}

TEST(FailedRuns, OfTwoSetupsInAFolderAtOnceEachAreDescribed) {
  const ModelFolder folder;
  folder.useScript(
      fmt::format("case $PWD in */basin_Process1) while grep -q '^a = *2$' parameters.txt && ! test -e '{}'; "
                  "do sleep 0.01; done;; esac",
                  folder / "go"));
  RunSettings settings{.option = 0, .modelArguments = "--fail-above 8"};
  settings.scenarios = scenarios(10);
  std::swap(settings.scenarios.front(), settings.scenarios.back());  // the one that fails
  settings.scenarios[1] = "2, 1, 1";
  folder.writeSetup(settings);
  const std::string other = folder.write("other.kdx", folder.read("basin.kdx"));
  folder.write("calSimErr.dat", "# Failed evaluations of another\n");
  RunningProgram first({folder / "basin.kdx"});
  ASSERT_TRUE(waitUntil([&] { return folder.read("calSimErr.dat").ends_with("is too large\n"); }));
  const std::string failures = folder.read("calSimErr.dat");
  EXPECT_EQ(runProgram({other}).exitCode, 0);
  EXPECT_EQ(folder.read("calSimErr.dat"), failures);
  EXPECT_EQ(folder.read("calSimErr.1.dat"), "# Failed evaluations of another\n");
  EXPECT_THAT(folder.read("other_calSimErr.dat"), StartsWith("# Failed evaluations of other\n\nEvaluation No. 1 "));
  EXPECT_THAT(folder.read("other.log"), HasSubstr("of this one are described in other_calSimErr.dat\n"));
  folder.write("go", "");
  EXPECT_EQ(first.wait().exitCode, 0);
  EXPECT_EQ(runProgram({other}).exitCode, 0);
  EXPECT_THAT(folder.read("calSimErr.dat"), StartsWith("# Failed evaluations of other\n"));
  EXPECT_TRUE(folder.exists("other_calSimErr.1.dat")) << "or it would be taken for the run's";
  EXPECT_FALSE(folder.exists("calSimErr._lock_"));
}

TEST(Scenarios, HaveNamesAndTheirSeriesInTheReport) {
  const ModelFolder folder;
  folder.writeSetup({.option = 0, .scenarios = scenarios(3)});
  folder.editSetup("[SCENARIO_2]\n", "[SCENARIO_2]\n Name = 'dry'\n");
  folder.editSetup("Name = 'flow'\n", "Name = 'flow'\n Unit = 'm3/s'\n Display_Name = 'Discharge'\n");
  EXPECT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.dat"), HasSubstr("# Scenario 2: dry\n"));
  const std::string report = folder.read("basin_Report.html");
  EXPECT_THAT(report, HasSubstr(R"("runNames":["","dry",""])"));
  EXPECT_THAT(report, HasSubstr(R"("quantity":"Discharge","unit":"m3/s")"));
  for (int number = 1; number <= 3; ++number) {
    EXPECT_THAT(report, HasSubstr(fmt::format(R"({{"number":{},"thinned":false,"count":)", number)));
  }
}

}  // namespace
}  // namespace mirevo::testing

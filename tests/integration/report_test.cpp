#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The data in a report's page.
std::string reportData(const ModelFolder& folder) {
  const std::string page = folder.read("basin_Report.html");
  const std::string mark = "id=\"report-data\">";
  const auto start = page.find(mark);
  if (start == std::string::npos) return page;
  return page.substr(start + mark.size(), page.find("</script>", start) - start - mark.size());
}

ProgramResult makeReport(const ModelFolder& folder, const std::string& setup = "basin.kdx") {
  return RunningProgram({folder / setup}, {}, MIREVO_REPORT).wait();
}

TEST(Report, OfItemsByTheirNamesIsMadeWhetherTheirFilesAreThere) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 0});
  folder.addMeasure("again", "");
  folder.editSetup("'model/simulated.csv'\n          Item_No = 1", "'model/simulated.csv'\nItem_Name = 'simulated'");
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const std::string ofRun = reportData(folder);
  EXPECT_THAT(ofRun, HasSubstr(R"("measure":"flow, again")"));
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder), HasSubstr(R"("measure":"flow, again")"));
  std::filesystem::remove(folder / "model/simulated.csv");
  const ProgramResult later = makeReport(folder);
  EXPECT_EQ(later.exitCode, 0) << later.error;
  EXPECT_THAT(reportData(folder), HasSubstr(R"("measure":"flow")"));
}

TEST(Report, StandsBesideTheResultsHoweverARunEnds) {
  const std::tuple<RunSettings, int, std::vector<const char*>> cases[] = {
      {{.maxEvaluations = 30},
       0,
       {R"("state":"finished","message":"Optimisation terminated: Maximum number of)",
        R"("evaluations":31,"planned":31)", R"({"name":"b","kind":"variable")", R"("start":1,"best":)",
        R"("series":[{"measure":"flow")", R"("step":86400000)", R"("initial":[4,)",
        R"("figures":{"initial":{"n":365,"nse":)", R"("initialNumber":1,"initialLabel":"initial parameters")",
        R"([{"measure":"flow","evaluation":31,"simulatedItem":"simulated.csv, item No. 1 (simul)",
        R"("simulatedFirst":[3.736166477,)"}},
      {{.option = 0, .scenarios = {"5, 2, 1", "1, 2, 1"}, .modelArguments = "--fail-above 4.5"},
       1,
       {R"("state":"failed","message":"Error: Unable to continue. No of failed)", R"("failed":1)",
        R"("failures":[{"reason":"run.sh exited with code 3","count":1,"example":"Evaluation 1: run.sh)",
        R"("series":[])"}},
      {{.option = 1},
       0,
       {R"("task":"sensitivity")", R"("derivatives":[[)", R"("covariance":{"names":["a","b"],"estimate":[4,1])"}},
      {{.option = 3, .maxEvaluations = 20},
       0,
       {R"("band":[{"measure":"flow","quantity":"simulated","unit":null,"count":365,"start":"2001-01-01T00:00:00")",
        R"("step":86400000,"observed":[5,)", R"("initialLabel":"first evaluation")"}},
  };
  for (const auto& [settings, exitCode, parts] : cases) {
    const ModelFolder folder;
    EXPECT_EQ(runProgram({folder.writeSetup(settings)}).exitCode, exitCode);
    const std::string data = reportData(folder);
    for (const char* part : parts) EXPECT_THAT(data, HasSubstr(part));
    // From the files alone the same comes out, but for the time of the report, whenever they were copied.
    std::filesystem::last_write_time(folder / settings.resultFile(), {});
    const std::string results = folder.read(settings.resultFile());
    const std::string ended = results.substr(results.find("\n# Ended: ") + 10, 19);
    EXPECT_EQ(makeReport(folder).exitCode, 0);
    const std::string again = reportData(folder);
    EXPECT_THAT(again, HasSubstr(fmt::format(R"("ended":"{}")", ended)));
    EXPECT_EQ(again.substr(again.find("\"parameters\":")), data.substr(data.find("\"parameters\":")));
    const auto stateOf = [](const std::string& text) { return text.substr(text.find("\"state\""), 20); };
    EXPECT_EQ(stateOf(again), stateOf(data));
  }
}

TEST(Report, OfARunThatGoesOnOrWasCutOffSaysSoAndLeavesItsFilesAlone) {
  const ModelFolder folder;
  folder.useScript("test -e first && set -- --sleep-ms 3600000; touch first");
  folder.writeSetup({.option = 0, .scenarios = {"1, 1, 1", "2, 2, 1"}});
  EXPECT_THAT(makeReport(folder).error, HasSubstr("basin.dat: No such file or directory"));
  const std::string earlier = R"(<meta content="default-src 'none'; script-src">of an earlier run)";
  folder.write("basin_Report.html", earlier);
  {
    RunningProgram run({folder / "basin.kdx"});
    ASSERT_TRUE(folder.reaches("basin.dat", "\n1\tOK\t"));
    const std::string log = folder.read("basin.log");
    const ProgramResult report = makeReport(folder);
    EXPECT_EQ(report.exitCode, 0) << report.error;
    EXPECT_EQ(report.output, folder / "basin_Report.html\n");
    EXPECT_THAT(reportData(folder),
                AllOf(HasSubstr(R"("ended":null)"), HasSubstr(R"("state":"running","message":null)"),
                      HasSubstr(R"("evaluations":1,"planned":2)")));
    EXPECT_THAT(folder.read("basin.log"), StartsWith(log));
    EXPECT_FALSE(folder.exists("basin.1.log"));
  }  // killed
  EXPECT_EQ(folder.read("basin_Report.1.html"), earlier);
  const std::string results = folder.read("basin.dat");
  folder.write("basin.dat", results + "2\tOK\t0.");
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder),
              AllOf(HasSubstr(R"("state":"cut off")"), HasSubstr("1 line of the result file is cut off"),
                    HasSubstr(R"("evaluations":1,)")));
  const std::string row = "\n1\tOK\t1\t";
  folder.write("basin.dat", std::string(results).replace(results.find(row), row.size(), "\n1\tOK\t1.5\t"));
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder),
              AllOf(::testing::ContainsRegex(
                        "1 row of the result file does not hold, but is shown: line [0-9]+ \\(evaluation No. "
                        "1\\): it is not as it was written"),
                    HasSubstr(R"("evaluations":1,)")));
}

TEST(Report, OfASensitivityAnalysisThatGoesOnSaysOfHowManyEvaluationsItsDerivativesAre) {
  const ModelFolder folder;
  folder.useScript("test -e second && set -- --sleep-ms 3600000; test -e first && touch second; touch first");
  RunningProgram run({folder.writeSetup({.option = 1})});
  ASSERT_TRUE(folder.reaches("basin_Sensitivity.dat", "\n2\tOK\t"));
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder),
              HasSubstr(R"("notes":["The statistics are those of an unfinished run: of 2 of 5 evaluations."])"));
}

TEST(Report, OfASensitivityAnalysisLeavesOutWhatIsOfOtherSetsThanThoseOfTheSetup) {
  const ModelFolder folder;
  folder.writeSetup({.option = 1});
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  const char* const ofRun = R"("derivatives":[[-0.8166733,-0.8166733],[-0.4077077,-0.4077077]])";
  EXPECT_THAT(reportData(folder),
              AllOf(HasSubstr(ofRun), HasSubstr(R"("hasBetterFit":true)"),
                    HasSubstr(R"("closingWarnings":["Warning: 2 evaluations fit better than the base)")));
  // Now there is no step of a upwards, and the sets of b have other numbers.
  folder.editSetup(
      "TqSEKdxListItemCount = 0\n    [/INTERNAL_CONSTRAINTS]",
      "TqSEKdxListItemCount = 1\n      [CONSTRAINT_1]\n        Left_Equation = 'a'\n        Right_Equation = '4.01'\n"
      "        Logical_Operator = 1\n      [/CONSTRAINT_1]\n    [/INTERNAL_CONSTRAINTS]");
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder), AllOf(HasSubstr(ofRun), Not(HasSubstr("Evaluations of other parameter sets than"))));
  std::filesystem::remove(folder / "basin_Sensitivities.dat");  // those of an unfinished run come from its rows
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder), AllOf(HasSubstr(R"("derivatives":[[-0.8194029,-0.8194029],[null,null]])"),
                                        HasSubstr("Evaluations of other parameter sets than"),
                                        HasSubstr(R"(the derivatives that need them: No. 3, 4.",)")));
  std::string results = folder.read("basin_Sensitivity.dat");
  const auto best = results.find("\n3\tOK\t");
  folder.write("basin_Sensitivity.dat", results.erase(best, results.find("\n4\t") - best));
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder),
              AllOf(HasSubstr("\"peaks\""), HasSubstr("best are those of evaluation 3, which the result "
                                                      "file does not hold; the ")));
  folder.editSetup("Statistic_Type", "Months = 1, 2\n        Statistic_Type");
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder),
              AllOf(Not(HasSubstr("\"peaks\"")), HasSubstr(R"("counted":"Observations: Months = 1, 2.")")));
}

// Results without the files that this version adds: the report has all that the others hold.
TEST(Report, SaysWhyTheRankingOfASensitivityAnalysisIsAnother) {
  const ModelFolder folder;
  ASSERT_EQ(runProgram({folder.writeSetup({.option = 1})}).exitCode, 0);
  const std::string table = folder.read("basin_Sensitivities.dat");
  const auto rankingNote = [&folder] {
    EXPECT_EQ(makeReport(folder).exitCode, 0);
    return reportData(folder);
  };
  EXPECT_THAT(rankingNote(), Not(HasSubstr("computed again")));
  folder.write("basin_Sensitivities.dat", table.substr(0, table.rfind('\n', table.size() - 2) + 1));
  EXPECT_THAT(rankingNote(), HasSubstr("result file: basin_Sensitivities.dat is cut off or damaged, "));
  std::filesystem::remove(folder / "basin_Sensitivities.dat");
  EXPECT_THAT(
      rankingNote(),
      HasSubstr("result file: basin_Sensitivities.dat cannot be read, and what it has is not shown: No such file"));
}

TEST(Report, OfResultsOfAnEarlierVersion) {
  const ModelFolder folder;
  std::vector<std::string> scenarios{"9, 1, 1"};
  for (int i = 0; i < 30; ++i) scenarios.push_back(fmt::format("{}, 1, 1", 0.1 * i));
  folder.writeSetup({.option = 0, .scenarios = scenarios, .modelArguments = "--fail-above 8"});
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  const std::string data = reportData(folder);
  ASSERT_THAT(data, Not(HasSubstr(R"("failures":[])")));
  for (const char* file : {"basin_Run.dat", "basin_Failures.dat"}) std::filesystem::remove(folder / file);
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  const std::string again = reportData(folder);
  EXPECT_THAT(again, AllOf(HasSubstr(R"("failures":[])"), HasSubstr("Why evaluations failed is not shown: basin_Fail"),
                           HasSubstr("results alone: basin_Run.dat: it is not there.")));
  for (const auto& [from, to] : {std::pair{"\"started\":", ",\"reportMade\""},
                                 {"\"state\"", "\"notes\""},
                                 {"\"parameters\"", "\"comparisons\""},
                                 {"\"pairs\":365,", "\"failures\""},
                                 {"\"evaluations\":{", nullptr}}) {
    const auto part = [from = from, to = to](const std::string& text) {
      const auto begin = text.find(from);
      return text.substr(begin, to == nullptr ? text.npos : text.find(to, begin) - begin);
    };
    EXPECT_EQ(part(again), part(data));
  }
}

/// The record of a run is one per setup, result files are one per task.
TEST(Report, OfATaskThatWasNotTheLastOneOfItsSetup) {
  const ModelFolder folder;
  folder.writeSetup({.maxEvaluations = 30});
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  const std::string data = reportData(folder);
  folder.writeSetup({.option = 1});
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  folder.writeSetup({.maxEvaluations = 30});
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  const std::string again = reportData(folder);
  for (const char* name : {"\"started\":", "\"state\":", "\"message\":", "\"best\":"}) {
    const auto member = [name](const std::string& text) { return text.substr(text.find(name), 60); };
    EXPECT_EQ(member(again), member(data));
  }
  for (const int option : {1, 2, 2}) {  // each goes on: only the report of its own task may go
    folder.writeSetup({.option = option, .maxEvaluations = 30, .restart = 1});
    ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  }
  EXPECT_THAT(reportData(folder), HasSubstr(R"("task":"optimisation")"));
  EXPECT_THAT(folder.read("basin_Report.1.html"), HasSubstr(R"("task":"optimisation")"));
  EXPECT_THAT(folder.read("basin_Report.2.html"), HasSubstr(R"("task":"optimisation")"));
  EXPECT_THAT(folder.read("basin_Report.3.html"), HasSubstr(R"("task":"sensitivity")"));
  EXPECT_FALSE(folder.exists("basin_Report.4.html"));
}

TEST(Report, SaysWhatIsMissingInItsFilesAndIsNotMadeOfWhatIsNotThere) {
  const ModelFolder folder;
  folder.writeSetup({.option = 3, .maxEvaluations = 5});
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  const auto cutTo = [&folder](const char* file, std::size_t length) {
    folder.write(file, folder.read(file).substr(0, length));
  };
  cutTo("basin_Series.dat", folder.read("basin_Series.dat").find("2001-02-01"));
  cutTo("basin_Band_1.csv", folder.read("basin_Band_1.csv").size() - 1);
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder),
              HasSubstr(R"("notes":["basin_Series.dat is cut off or damaged: 31 of its 365 rows can be read.",)"
                        R"("basin_Band_1.csv is cut off or damaged: 366 of its 367 lines are whole."])"));
  folder.editSetup("Restart = 0", "Restart = 1");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(reportData(folder), HasSubstr("is cut off or damaged: 31 of its 365 rows can be read; the series"));
  // What the setup says now is not what the results depend on.
  cutTo("basin_Series.dat", 0);
  std::filesystem::remove(folder / "basin_Band_1.csv");
  folder.editSetup("Sample_Size = 5", "Sample_Size = 6");
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(
      reportData(folder),
      AllOf(HasSubstr("The setup was changed since: Sample_Size of UNCERTAINTY_ESTIMATION: 5 then, 6 now. The "),
            HasSubstr("basin_Series.dat is cut off or damaged: it ends above its rows."),
            HasSubstr("basin_Band_1.csv is not there, and its band is not shown.")));
  cutTo("basin_Pairs.dat", 60);
  cutTo("basin_Restart.dat", 200);
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder), AllOf(HasSubstr("since is not known: basin_Restart.dat: it is cut off or damaged."),
                                        HasSubstr("run is not known: basin_Pairs.dat: it is cut off or damaged.")));
  std::filesystem::remove(folder / "basin_Restart.dat");
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder), HasSubstr("since is not known: basin_Restart.dat: No such file or directory."));
  folder.editSetup("Sample_Size = 6", "Sample_Size = 5");
  folder.editSetup("Option = 3", "Option = 0");
  EXPECT_THAT(
      makeReport(folder).error,
      HasSubstr("basin.dat: these are results of another task (uncertainty analysis), and the setup now selects "
                "scenario runs. For their report, set Option = 3 again"));
  const std::string results = folder.read("basin.dat");
  folder.write("basin.dat", std::string(results).replace(results.find("basin.kdx"), 5, "other"));
  EXPECT_THAT(makeReport(folder).error, HasSubstr("basin.dat: it is of another setup, " + folder / "other.kdx"));
  folder.write("basin.dat", results);
  folder.editSetup("Option = 0", "Option = 3");
  cutTo("basin.dat", folder.read("basin.dat").find("\n1\tOK") + 1);
  const ProgramResult ofNone = makeReport(folder);
  EXPECT_EQ(ofNone.exitCode, 1);
  EXPECT_THAT(ofNone.error, HasSubstr("basin.dat: it holds no evaluation"));
}

TEST(Report, OfASearchHasTheTablesThatItLeftAndSaysWhichCannotBeRead) {
  const ModelFolder folder;
  folder.writeSetup({.search = "GLM", .maxEvaluations = 30});
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(reportData(folder), AllOf(HasSubstr(R"("estimate":{"names":["a","b"],"estimate":[)"),
                                        Not(HasSubstr("\"front\"")), Not(HasSubstr("\"repetitions\""))));
  const std::string head = "Evaluation\tRank\tCrowding\tViolation\tSuggested\tDistance\terror\ta\tb\n";
  folder.write("basin_Pareto.dat", head + "3\t1\tInf\t0\t1\t0\t0.5\t4\t2\n");
  folder.write("basin_ParetoSeries.dat",
               "Evaluation\tMeasure\tTime\tSimulated\n3\tflow\t2001-01-01T00:00:00\t1.5\n# endOfEvaluation\t3\n");
  folder.write("basin_Optimisation_Repetitions.dat", "Repetition\tSeed\n1\t2\n");
  std::filesystem::remove(folder / "basin_Optimisation_Correlation.dat");
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(
      reportData(folder),
      AllOf(Not(HasSubstr("\"estimate\":{")), HasSubstr(R"("front":{"objectives":["error"],"parameters":["a","b"],)"),
            HasSubstr(R"("series":[{"measure":"flow","number":3,)"),
            HasSubstr("limits of the parameters are not shown: basin_Optimisation_Correlation.dat cannot be read"),
            HasSubstr("How the front grew is not shown: basin_ParetoCourse.dat: No such file or directory."),
            HasSubstr("The repetitions are not shown: basin_Optimisation_Repetitions.dat is damaged, or of other "
                      "parameters than the setup.")));
  std::filesystem::remove(folder / "basin_Optimisation_ParameterLimits.dat");
  EXPECT_EQ(makeReport(folder).exitCode, 0);
  EXPECT_THAT(reportData(folder), HasSubstr("not shown: basin_Optimisation_ParameterLimits.dat is not there."));
}

TEST(Report, OfAScreeningShowsDistributionsThatTheSetupGivesAlone) {
  const ModelFolder folder;
  folder.writeSetup({.option = 1});
  folder.editSetup("Sensitivity_Type = 0", "Sensitivity_Type = 'Morris'");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(reportData(folder), HasSubstr(R"("distributions":[])"));
  // Of an uncertainty analysis with the same setup.
  folder.write("basin_SampleSensitivities.dat", "Kind\tOutput\tParameter\tRankCorrelation\tFirstOrder\tLower\tUpper\n");
  folder.editSetup(
      "Sensitivity_Type = 'Morris'",
      "Sensitivity_Type = 'Morris'\n[PARAMETER_2]\nDistribution = 'triangular'\nMode_Value = 2\n[/PARAMETER_2]");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(reportData(folder), AllOf(HasSubstr(R"("distributions":[{"text":"uniform)"),
                                        HasSubstr(R"({"text":"triangular)"), Not(HasSubstr("sampleSensitivity"))));
}

TEST(Report, IsLeftOutWhereTheSetupSaysSoAndNeverFailsTheRun) {
  const ModelFolder folder;
  folder.writeSetup({.option = 0});
  folder.editSetup("    Title = ", "    Report = 0\n    Title = ");
  folder.write("silent.kdx", folder.read("basin.kdx"));
  EXPECT_EQ(runProgram({folder / "silent.kdx"}).exitCode, 0);
  EXPECT_FALSE(folder.exists("silent_Report.html"));
  EXPECT_FALSE(folder.exists("silent_Series.dat"));
  EXPECT_FALSE(folder.exists("silent_ScenarioSeries.dat"));
  EXPECT_EQ(makeReport(folder, "silent.kdx").exitCode, 0);
  EXPECT_TRUE(folder.exists("silent_Report.html"));

  folder.editSetup("    Report = 0\n", "");
  std::filesystem::create_directories(folder / "basin_Report.html.tmp/in the way");
  EXPECT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"),
              AllOf(HasSubstr("basin_Report.html: Is a directory\n"), EndsWith("Normal termination\n")));
}

}  // namespace
}  // namespace mirevo::testing

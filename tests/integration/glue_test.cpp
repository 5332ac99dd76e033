#include <cmath>
#include <filesystem>
#include <string>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "common/text.h"
#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// GLUE of the model with `a` from 0 to 10 as its only variable parameter: its root mean square error is |a - 5|.
struct GlueFolder : ModelFolder {
  std::string writeGlue(const std::string& keywords, RunSettings settings = {}) const {
    settings.option = 3;
    const std::string setup = writeSetup(settings);
    editSetup("Upper_Bound = 5.0\n      Transformation_Type = 0\n      Parameter_Type = 0",
              "Upper_Bound = 5.0\n      Transformation_Type = 0\n      Parameter_Type = 1");
    editSetup("Initial_Value = 1.0", "Initial_Value = 2.0");  // of b
    const std::string text = read("basin.kdx");
    const auto distributions = text.find("    [PARAMETER_1]\n      Mean_Value");
    write("basin.kdx", text.substr(0, distributions) + text.substr(text.find("  [/UNCERTAINTY_ESTIMATION]")));
    editSetup("Uncertainty_Type = 1", "Uncertainty_Type = 'GLUE'\n    [GLUE]\n" + keywords + "\n    [/GLUE]");
    return setup;
  }
  /// The table without what it says of its run.
  std::string table(const std::string& name) const {
    const std::string text = read(name);
    std::string rows;
    for (const std::string_view line : splitLines(text)) {
      if (!line.starts_with('#')) rows += std::string(line) + "\n";
    }
    return rows;
  }
  std::string found() const {
    return table("basin_Glue.dat") + table("basin_Quantiles.dat") + table("basin_SampleSensitivities.dat") +
           table("basin_Band_1.csv");
  }
  double quantile(const std::string& kind, const std::string& name, const std::string& heading) const {
    const ReadTable quantiles = readDataTable(read("basin_Quantiles.dat"));
    for (const std::vector<std::string>& row : quantiles.rows) {
      if (row[0] == kind && row[1] == name) return realCell(row[quantiles.column(heading).value()]).value();
    }
    return std::nan("");
  }
};

TEST(Glue, HasTheQuantilesOfTheClosedFormInParametersAndBands) {
  // Between 3 and 7 the likelihood 2 - |a - 5| is a triangle: its quantile at 5 % is 3 + 2 sqrt(0.1); equal weights
  // are a uniform distribution, and both are met to the width of a stratum.
  const struct {
    const char* likelihood;
    double lower;
    double width;
  } cases[] = {{"'rescaled'", 3.0 + 2.0 * std::sqrt(0.1), 4.0 * (1.0 - std::sqrt(0.1))}, {"'equal'", 3.2, 3.6}};
  for (const auto& one : cases) {
    const GlueFolder folder;
    const std::string setup =
        folder.writeGlue(fmt::format("Judged_By = 'flow'\nBehavioural_Threshold = 2\nLikelihood = {}", one.likelihood),
                         {.maxEvaluations = 250, .modelArguments = "--fail-above 9.6"});
    const ProgramResult run = runProgram({setup});
    ASSERT_EQ(run.exitCode, 0) << run.error;
    EXPECT_NEAR(folder.quantile("parameter", "a", "5 %"), one.lower, 0.05);
    EXPECT_NEAR(folder.quantile("parameter", "a", "50 %"), 5.0, 0.05);
    EXPECT_NEAR(folder.quantile("parameter", "a", "95 %"), 10.0 - one.lower, 0.05);
    EXPECT_EQ(folder.quantile("parameter", "a", "Count"), 100.0);
    EXPECT_NEAR(folder.quantile("drawn", "a", "5 %"), 0.5, 0.02);
    // All sets, behavioural or not, say of what the error comes: of a alone, falling as much as rising.
    const ReadTable dependence = readDataTable(folder.read("basin_SampleSensitivities.dat"));
    ASSERT_EQ(dependence.rows.size(), 2U);
    for (const std::vector<std::string>& row : dependence.rows) {
      const auto value = [&](const char* heading) { return realCell(row[dependence.column(heading).value()]).value(); };
      EXPECT_EQ(value("Count"), 240.0);
      EXPECT_NEAR(value("FirstOrder"), 1.0, 0.02);
      EXPECT_NEAR(value("RankCorrelation"), 0.0, 0.2);
    }
    EXPECT_THAT(folder.read("basin_Report.html"), HasSubstr("\"sampleSensitivity\":{\"parameters\":[\"a\"]"));
    // The model adds the same to all values of a, and at t = 0 nothing.
    const ReadTable band = readDataTable(folder.read("basin_Band_1.csv"));
    EXPECT_THAT(folder.read("basin_Band_1.csv"), HasSubstr("\n2001-01-01 00:00,5,"));
    double values[3];
    const std::string text = folder.read("basin_Band_1.csv");
    ASSERT_EQ(std::sscanf(text.c_str() + text.find("\n2001-01-01"), "\n2001-01-01 00:00,5,%lf,%lf,%lf", values,
                          values + 1, values + 2),
              3);
    EXPECT_NEAR(values[0], folder.quantile("parameter", "a", "5 %"), 1e-6);
    EXPECT_NEAR(values[2], folder.quantile("parameter", "a", "95 %"), 1e-6);
    const std::string log = folder.read("basin.log");
    EXPECT_THAT(log, HasSubstr("GLUE: 250 evaluations, 10 failed and left out\n"));
    EXPECT_THAT(log, HasSubstr("\nBehavioural: 100 of 240 (41.7 %); the best of all is No. "));
    EXPECT_THAT(log,
                HasSubstr("\nBand of flow: 100.0 % of 365 observations lie between the 5 and the 95 % quantile\n"));
    const auto at = log.find("a mean width of ");
    ASSERT_NE(at, std::string::npos);
    EXPECT_NEAR(std::strtod(log.c_str() + at + 16, nullptr), one.width, 0.05);
  }
}

TEST(Glue, AnotherThresholdTakesAllResultsOverAndGivesWhatAFreshRunGives) {
  const GlueFolder fresh;
  ASSERT_EQ(runProgram({fresh.writeGlue("Behavioural_Share = 0.5\nLikelihood = 'equal'", {.slots = 3})}).exitCode, 0);
  const GlueFolder folder;
  folder.writeGlue("Behavioural_Threshold = 1e-9");
  const ProgramResult none = runProgram({folder / "basin.kdx"});
  EXPECT_EQ(none.exitCode, 0);
  EXPECT_THAT(none.error, HasSubstr("No set is behavioural: none of 40 evaluations has output measure flow (root mean "
                                    "square; small is good, best 0) of 1e-09 or less; the best is No. "));
  EXPECT_THAT(folder.read("basin_Band_1.csv"), HasSubstr("\n2001-12-31 00:00,5.9"));
  EXPECT_THAT(folder.read("basin_Band_1.csv"), HasSubstr(",NaN,NaN,NaN\n"));
  EXPECT_EQ(readDataTable(folder.read("basin.dat")).rows.size(), 40U) << "the results are kept";
  folder.writeGlue("Behavioural_Share = 0.5\nLikelihood = 'equal'", {.restart = 1});
  const ProgramResult run = runProgram({folder / "basin.kdx"});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\n40 of them were taken from the earlier run\n"));
  EXPECT_EQ(folder.found(), fresh.found());
  // How sets are drawn is no such matter.
  folder.writeGlue("Behavioural_Share = 0.5\nSampling = 'Sobol'", {.restart = 1});
  EXPECT_THAT(runProgram({folder / "basin.kdx"}).error, HasSubstr("Unable to continue the earlier run"));
}

TEST(Glue, ACancelledRunHasItsStatisticsAndGoesOnToTheSameBits) {
  const GlueFolder whole;
  ASSERT_EQ(runProgram({whole.writeGlue("Behavioural_Threshold = 2.5")}).exitCode, 0);
  const GlueFolder folder;
  folder.useScript("test -e '" + folder / "quick" + "' || sleep 0.1");
  RunningProgram program({folder.writeGlue("Behavioural_Threshold = 2.5", {.restart = 1})});
  EXPECT_TRUE(folder.reaches("basin.log", "No. 8 completed: OK"));
  folder.write("basin._kill_", "");
  EXPECT_EQ(program.wait().exitCode, 1);
  for (const char* file : {"basin.dat", "basin_Glue.dat", "basin_Band_1.csv"}) {
    EXPECT_THAT("\n" + folder.read(file), HasSubstr("# Unfinished run: statistics of ")) << file;
  }
  folder.write("quick", "");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(folder.read("basin_Glue.dat"), Not(HasSubstr("Unfinished")));
  EXPECT_EQ(folder.found(), whole.found());
}

/// Makes the files of the run those of another.
void renameResults(const GlueFolder& folder, const std::string& name) {
  for (const auto& entry : std::filesystem::directory_iterator(folder.path())) {
    const std::string file = entry.path().filename().string();
    if (!file.starts_with("basin") || file.ends_with(".kdx") || entry.is_directory()) continue;
    std::filesystem::rename(entry.path(), folder / (name + file.substr(5)));
  }
}

TEST(Glue, OfTheFilesOfAnEarlierRunNeedsNoModelRun) {
  const GlueFolder folder;
  const std::string keywords = "Behavioural_Threshold = 2\nLikelihood = 'rescaled'";
  ASSERT_EQ(runProgram({folder.writeGlue(keywords)}).exitCode, 0);
  const std::string found = folder.found();
  renameResults(folder, "first");
  const std::string keptResults = folder.read("first.dat");
  folder.writeGlue(
      "Behavioural_Share = 0.5\nLikelihood = 'equal'\nShape_Factor = 2\nSampling = 'Sobol'\n"
      "Earlier_Result_File = 'first.dat'\n[/GLUE]\nRedraw_Infeasible = 1\n[OTHER]");
  folder.editSetup("\n[OTHER]\n    [/GLUE]", "");
  const ProgramResult check = runProgram({"--check", folder / "basin.kdx"});
  EXPECT_EQ(check.exitCode, 0) << check.error;
  EXPECT_THAT(check.output, AllOf(HasSubstr("Shape_Factor: has no effect with Likelihood = 'equal'"),
                                  HasSubstr("Sampling: has no effect with Earlier_Result_File"),
                                  HasSubstr("Redraw_Infeasible: has no effect with Earlier_Result_File"),
                                  HasSubstr("\n40 evaluations are taken from ")));
  const std::string values = folder.read("first_Simulated.bin");
  folder.useScript("exit 1");
  folder.writeGlue(keywords + "\nEarlier_Result_File = 'first.dat'", {.slots = 4});
  const ProgramResult run = runProgram({folder / "basin.kdx"});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  EXPECT_EQ(folder.found(), found);
  EXPECT_THAT(run.error, Not(HasSubstr("Nothing was run")));
  EXPECT_THAT(folder.read("basin.log"), Not(HasSubstr("can be used by the evaluations"))) << "there are none";
  EXPECT_THAT(folder.read("basin.log"), AllOf(HasSubstr("\n40 evaluations are taken from "),
                                              HasSubstr("\n0 model evaluations, 0 of them failed\n")));
  EXPECT_EQ(folder.read("first.dat"), keptResults);
  EXPECT_EQ(folder.read("first_Simulated.bin"), values) << "they are only read";

  EXPECT_THAT(folder.read("basin.log"), Not(HasSubstr("The run that made ")));
  folder.editSetup("Lower_Bound = 0.0", "Lower_Bound = 1.0");
  const std::string record = folder.read("first_Run.dat");
  folder.write("first_Run.dat", record.substr(0, record.find("state\tfinished")) + "state\tcancelled\n");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  folder.useScript("");
  const std::string told = runProgram({"--check", folder / "basin.kdx"}).output;
  folder.useScript("exit 1");
  for (const std::string& text : {folder.read("basin.log"), folder.read("basin.dat"), told}) {
    EXPECT_THAT(text, AllOf(HasSubstr(" had other bounds: a from 0 to 10, in this setup from 1 to 10. 4 of its 40 "
                                      "sets lie outside the bounds of this setup"),
                            HasSubstr(" is not finished, it was cancelled: what is said is said of 40 evaluations")));
  }
  folder.write("first_Run.dat", record);
  folder.editSetup("Lower_Bound = 1.0", "Lower_Bound = 0.0");

  folder.write("first_Simulated.bin", values.substr(0, values.size() / 2));
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Warning: There are no bands: "));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("lacks the simulated values of 21 of 40 evaluations"));

  const auto refused = [&](const std::string& detail) {
    const ProgramResult again = runProgram({folder / "basin.kdx"});
    EXPECT_EQ(again.exitCode, 1);
    EXPECT_THAT(again.error, HasSubstr(detail));
    folder.useScript("");
    const ProgramResult checked = runProgram({"--check", folder / "basin.kdx"});
    EXPECT_EQ(checked.exitCode, 1);
    EXPECT_THAT(checked.error, HasSubstr(detail));
    folder.useScript("exit 1");
  };
  folder.editSetup("Statistic_Type = 1", "Statistic_Type = 'NSE'");
  folder.editSetup("Behavioural_Threshold = 2", "Behavioural_Threshold = 0.5");
  refused(
      "judged otherwise than this setup would judge them:\n   Statistic_Type of MEASURE_1 (flow): 1 then, 'NSE' now");
  folder.writeGlue(keywords + "\nEarlier_Result_File = 'first.dat'");
  folder.editSetup("Name = 'flow'", "Name = 'level'");
  refused("expected the variable parameters, output measures and objective functions of this setup, whose header row");
  folder.writeGlue(keywords + "\nEarlier_Result_File = 'first.dat'");
  std::string changed = keptResults;
  const auto cell = changed.find("\n7\tOK\t") + 6;
  changed[cell] = changed[cell] == '9' ? '8' : '9';
  folder.write("first.dat", changed);
  refused("it has rows that do not hold:\n   line ");
  refused(
      "Restore these lines from a copy, or delete them: their evaluations are then left out. If the rows are right");
  folder.write("first.dat", keptResults.substr(0, keptResults.find("\n21\tOK\t") + 1));
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Warning: 20 of 40 evaluations are missing in "));
  folder.write("first.dat", changed);
  folder.writeGlue(keywords + "\nEarlier_Result_File = 'basin.dat'");
  refused("Restart = 1 takes them over");
}

TEST(Glue, CountsASetOfAnEarlierSampleAsOftenAsItWasDrawn) {
  const GlueFolder folder;
  const std::string keywords = "Behavioural_Threshold = 20\nLikelihood = 'equal'";
  const auto write = [&](const std::string& more) {
    folder.writeGlue(keywords + more);
    folder.editSetup("[/GLUE]",
                     "[/GLUE]\n    [PARAMETER_1]\n      Distribution = 'discrete'\n      Values = 4, 4.5, 7\n"
                     "      Weights = 8, 1, 1\n    [/PARAMETER_1]");
  };
  write("");
  const ProgramResult first = runProgram({folder / "basin.kdx"});
  ASSERT_EQ(first.exitCode, 0) << first.error;
  const std::string found = folder.found();
  EXPECT_EQ(folder.quantile("parameter", "a", "50 %"), 4.0);
  renameResults(folder, "first");
  write("\nEarlier_Result_File = 'first.dat'");
  const ProgramResult again = runProgram({folder / "basin.kdx"});
  ASSERT_EQ(again.exitCode, 0) << again.error;
  EXPECT_EQ(folder.found(), found);
}

TEST(Glue, OfASearchSaysThatItsSetsAreNoSampleOfTheParameters) {
  const GlueFolder folder;
  folder.writeGlue("Behavioural_Share = 0.2");
  folder.editSetup("Option = 3", "Option = 2");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  folder.writeGlue("Behavioural_Share = 0.2\nEarlier_Result_File = 'basin_Optimisation.dat'");
  const ProgramResult run = runProgram({folder / "basin.kdx"});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const std::string log = folder.read("basin.log");
  EXPECT_THAT(log, HasSubstr("Warning: The sets in "));
  EXPECT_THAT(log, HasSubstr(" are those of a search, which went where the fit is better, and no sample"));
  EXPECT_FALSE(folder.exists("basin_SampleSensitivities.dat")) << "they say nothing of the distributions' outputs";
  EXPECT_THAT(log, HasSubstr("Warning: There are no bands: "));
  EXPECT_THAT(log, AllOf(HasSubstr("\n   Parameter, behavioural "), HasSubstr("\n   Parameter, all sets "),
                         Not(HasSubstr("drawn by this sample"))));
}

TEST(Glue, OfScenariosSaysThatTheirSetsAreNoSampleOfTheParameters) {
  const GlueFolder folder;
  folder.writeGlue("Behavioural_Share = 0.2", {.scenarios = {"4, 2, 1", "5, 2, 1", "5, 2, 1"}});
  folder.editSetup("Option = 3", "Option = 0");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
  renameResults(folder, "first");
  folder.writeGlue("Behavioural_Share = 1\nEarlier_Result_File = 'first.dat'");
  const ProgramResult run = runProgram({folder / "basin.kdx"});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  EXPECT_THAT(folder.read("basin.log"),
              AllOf(HasSubstr(" are those of a scenario run, which somebody chose, and no sample of a distribution"),
                    HasSubstr("\n3 evaluations are taken from ")));
  EXPECT_FALSE(folder.exists("basin_SampleSensitivities.dat"));
}

TEST(Glue, OfChainsSaysThatTheirProposalsAreNoSampleOfTheParameters) {
  const GlueFolder folder;
  folder.writeGlue("Behavioural_Share = 0.2");
  folder.editSetup("'GLUE'", "'DREAM'\n[DREAM]\nLikelihood = 'normal'\n[/DREAM]");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0) << folder.read("basin.log");
  for (const char* ending : {".dat", "_Restart.dat", "_Checksums.dat", "_Simulated.bin"}) {
    std::filesystem::rename(folder / ("basin" + std::string(ending)), folder / ("chains" + std::string(ending)));
  }
  const std::string band = folder.read("basin_Band_1.csv");
  folder.writeGlue("Behavioural_Share = 0.999\nLikelihood = 'equal'\nEarlier_Result_File = 'chains.dat'");
  ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0) << folder.read("basin.log");
  // The values of the chains' file are doubles with their units; those of the model run are single.
  EXPECT_THAT(folder.read("basin.log"), Not(HasSubstr("There are no bands")));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("of 365 observations lie between"));
  EXPECT_EQ(splitLines(folder.read("basin_Band_1.csv")).size(), splitLines(band).size());
  EXPECT_THAT(folder.read("basin.log"),
              HasSubstr(" are those of a DREAM run, the proposals of its chains with those that were rejected "));
  EXPECT_FALSE(folder.exists("basin_SampleSensitivities.dat"));
}

TEST(Glue, RefusesSetupsThatDoNotSayWhatIsAcceptable) {
  const GlueFolder folder;
  const std::pair<const char*, const char*> cases[] = {
      {"", "Error: Choice of behavioural sets invalid"},
      {"", "expected either Behavioural_Threshold or Behavioural_Share, found neither: which sets are acceptable"},
      {"Behavioural_Threshold = 1\nBehavioural_Share = 0.1", "found both"},
      {"Behavioural_Share = 0", "expected a share above 0 and up to 1, found 0"},
      {"Behavioural_Share = 10", "expected a share above 0 and up to 1, found 10"},
      {"Behavioural_Threshold = -1", "no set can be that good: expected 0 or more, as behaviour is judged by output"},
      {"Behavioural_Share = 0.1\nJudged_By = 'flaw'",
       "expected the name of an output measure or an objective function"},
      {"Behavioural_Share = 0.1\nLikelihood = 'efficiency'", "'efficiency' is for statistics whose best value is 1"},
      {"Behavioural_Share = 0.1\nShape_Factor = 0", "Shape_Factor: expected greater than 0, found 0"},
      {"Behavioural_Share = 0.1\nEarlier_Result_File = 'none.dat'", "none.dat"},
  };
  for (const auto& [keywords, text] : cases) {
    const ProgramResult run = runProgram({folder.writeGlue(keywords)});
    EXPECT_EQ(run.exitCode, 1) << keywords;
    EXPECT_THAT(run.error, HasSubstr(text)) << keywords;
  }
  folder.writeGlue("Behavioural_Share = 0.1");
  folder.editSetup("[GLUE]\nBehavioural_Share = 0.1\n    [/GLUE]", "");
  EXPECT_THAT(runProgram({folder / "basin.kdx"}).error,
              HasSubstr("in [UNCERTAINTY_ESTIMATION]:\n   [GLUE]\n     Behavioural_Share = ...\n   [/GLUE]\n"));
}

}  // namespace
}  // namespace mirevo::testing

#include <algorithm>
#include <cmath>
#include <sstream>

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "common/data_table.h"
#include "integration/dream_folder.h"

namespace mirevo::testing {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::Not;

/// The standard deviations of a and b of a + b sin(t / 58), t = 0 ... 364, for errors of standard deviation 1.
struct Expected {
  double a = 0.0;
  double b = 0.0;
  double correlation = 0.0;
};

Expected linearModel() {
  double one = 0.0;
  double sum = 0.0;
  double squares = 0.0;
  for (int t = 0; t < 365; ++t) {
    const double s = std::sin(t / 58.0);
    one += 1.0;
    sum += s;
    squares += s * s;
  }
  const double determinant = one * squares - sum * sum;
  return {std::sqrt(squares / determinant), std::sqrt(one / determinant), -sum / std::sqrt(one * squares)};
}

TEST(Dream, ThePosteriorOfALinearModelIsTheOneInClosedForm) {
  const ModelFolder folder;
  const std::string dream = "Likelihood = 'normal'\n Error_Deviation = 3.0\n Effective_Size = 200";
  const ProgramResult result = runProgram({writeDream(folder, {.maxEvaluations = 2800}, dream)});
  ASSERT_EQ(result.exitCode, 0) << result.error;
  const std::string chains = folder.read("basin_Chains.dat");
  const std::string posterior = folder.read("basin_Posterior.dat");
  const Expected expected = linearModel();
  for (const auto& [name, mean, deviation] :
       {std::tuple{"a", 5.0, 3.0 * expected.a}, std::tuple{"b", 2.0, 3.0 * expected.b}}) {
    const double error = 4.0 * deviation / std::sqrt(dreamCell(posterior, name, "Effective size"));
    EXPECT_NEAR(dreamCell(posterior, name, "Mean"), mean, error);
    EXPECT_NEAR(dreamCell(posterior, name, "Standard deviation"), deviation, error);
  }
  EXPECT_NEAR(dreamCell(folder.read("basin_SampleCorrelation.dat"), "a", "b"), expected.correlation, 0.4);
  // The rows of the chains: natural logarithm of the normal density of 365 errors, at the states' own evaluations.
  const ReadTable table = readDataTable(chains);
  const ReadTable results = readDataTable(folder.read("basin.dat"));
  const auto& row = table.rows.back();
  const auto number = static_cast<std::size_t>(realCell(row[*table.column("Evaluation")]).value());
  const double rmse = realCell(results.rows[number - 1][*results.column("flow")]).value();
  const double logLikelihood = -365.0 * (0.5 * rmse * rmse / 9.0 + std::log(3.0) + 0.5 * std::log(2.0 * M_PI));
  EXPECT_NEAR(realCell(row[*table.column("Log_Likelihood")]).value(), logLikelihood, 1e-3);
  EXPECT_EQ(row[*table.column("a")], results.rows[number - 1][*results.column("a")]);

  const std::string log = folder.read("basin.log");
  for (const char* const text : {"The chains have converged", "Burn-in: the first ",
                                 "Band of parameter uncertainty of flow: 100.0 % of 365 observations",
                                 "Band of total uncertainty of flow: 100.0 % of 365 observations"}) {
    EXPECT_NE(log.find(text), std::string::npos) << text;  // without the whole log
  }
  // The total band is 2 * 1.645 * 3 wide.
  std::istringstream band(folder.read("basin_TotalBand_1.csv"));
  double width = 0.0;
  for (std::string line; std::getline(band, line);) {
    double values[4];
    if (std::sscanf(line.c_str(), "%*[^,],%lf,%lf,%lf,%lf", values, values + 1, values + 2, values + 3) == 4) {
      width += (values[3] - values[1]) / 365.0;
    }
  }
  EXPECT_NEAR(width, 2.0 * 1.645 * 3.0, 0.8);
}

TEST(Dream, ThePriorIsTheDensityOfTheScaleOnWhichSetsAreSampled) {
  const ModelFolder folder;
  const std::string setup = writeDream(folder, {.maxEvaluations = 60}, "Likelihood = 'normal'\n Error_Deviation = 3.0");
  folder.editSetup("Lower_Bound = 0.0\n      Upper_Bound = 10.0\n      Transformation_Type = 0",
                   "Lower_Bound = 1.0\n      Upper_Bound = 9.0\n      Transformation_Type = 1");
  folder.editSetup("[/DREAM]",
                   "[/DREAM]\n[PARAMETER_1]\nDistribution = 'truncated normal'\nDistribution_Scale = 'model'\n"
                   "Mean_Value = 5.0\nStandard_Deviation = 2.0\n[/PARAMETER_1]");
  const ProgramResult run = runProgram({setup});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const ReadTable table = readDataTable(folder.read("basin_Chains.dat"));
  for (const auto& row : table.rows) {
    // Of ln a: the normal density between 1 and 9 times the derivative a; of b, from 0 to 5, uniform.
    const double a = realCell(row[*table.column("a")]).value();
    const double density = std::exp(-0.125 * (a - 5.0) * (a - 5.0)) / (2.0 * std::sqrt(2.0 * M_PI)) / std::erf(M_SQRT2);
    EXPECT_NEAR(realCell(row[*table.column("Log_Prior")]).value(), std::log(density * a / 5.0), 1e-5);
  }
  EXPECT_GE(table.rows.size(), 60U);
}

TEST(Dream, AnInterruptedRunHasThePosteriorOfItsGenerationsAndGoesOnToTheSameBitsInOtherSlots) {
  const ModelFolder folder;
  const std::string dream = "Likelihood = 'AR(1)'\n Error_Deviation = 0.5, 5.0";
  const RunSettings settings{.maxEvaluations = 200, .restart = 2};
  ASSERT_EQ(runProgram({writeDream(folder, settings, dream)}).exitCode, 0);
  const std::string posterior = folder.read("basin_Posterior.dat");
  const std::string chains = folder.read("basin_Chains.dat");
  const std::string bands = folder.read("basin_TotalBand_1.csv");

  const ModelFolder other;
  other.useScript("test -e '" + other / "sound" + "' || test ! -e '" + other / "stop" + "' || exit 3\n" +
                  "echo . >> '" + other / "count" + "'; test $(wc -l < '" + other / "count" + "') -lt 152 || touch '" +
                  other / "stop" + "'");
  RunSettings twoSlots = settings;
  twoSlots.slots = 2;
  const std::string setup = writeDream(other, twoSlots, dream);
  EXPECT_EQ(runProgram({setup}).exitCode, 1);
  EXPECT_THAT(other.read("basin_Posterior.dat"), HasSubstr("Unfinished run"));
  if (other.exists("basin_Report.html")) {  // not in a build without its page
    const std::string page = other.read("basin_Report.html");
    EXPECT_NE(page.find("The run was interrupted. Restart = 1 lets the chains go on from here"), std::string::npos);
    EXPECT_NE(page.find("\"logLikelihoods\":[["), std::string::npos);
  }
  other.write("sound", "");
  const ProgramResult goneOn = runProgram({setup});
  EXPECT_EQ(goneOn.exitCode, 0) << goneOn.error;
  EXPECT_EQ(readDataTable(other.read("basin_Chains.dat")).rows, readDataTable(chains).rows);
  EXPECT_EQ(readDataTable(other.read("basin_Posterior.dat")).rows, readDataTable(posterior).rows);
  EXPECT_EQ(other.read("basin_TotalBand_1.csv"), bands);
}

TEST(Dream, GoesOnWhereItsObjectiveFunctionIsNamedInsteadOfNumbered) {
  const ModelFolder folder;
  const auto start = [&](int restart, int runs, const char* objective) {
    return runProgram({writeDream(folder, {.maxEvaluations = runs, .restart = restart},
                                  fmt::format("Likelihood = 'objective'\n Objective_Function = {}", objective))});
  };
  ASSERT_EQ(start(0, 40, "1").exitCode, 0);
  const ReadTable first = readDataTable(folder.read("basin_Chains.dat"));
  const ProgramResult goneOn = start(1, 60, "'Fit'");
  ASSERT_EQ(goneOn.exitCode, 0) << goneOn.error;
  const ReadTable all = readDataTable(folder.read("basin_Chains.dat"));
  ASSERT_GT(all.rows.size(), first.rows.size());
  EXPECT_EQ(all.rows[first.rows.size() / 2], first.rows[first.rows.size() / 2]);
  const ProgramResult other = start(1, 60, "0");
  EXPECT_EQ(other.exitCode, 1);
  EXPECT_THAT(other.error, HasSubstr("Objective_Function of UNCERTAINTY_ESTIMATION/DREAM: 'Fit' then, 0 now"));
}

TEST(Dream, ItsBandsReachIntoAValidationPeriodThatBearsOnNoLikelihood) {
  const ModelFolder folder;
  std::string observed = folder.read("observed.csv");
  const std::string dream = "Likelihood = 'normal'\n Error_Deviation = 3.0";
  const auto write = [&] {
    const std::string setup = writeDream(folder, {.maxEvaluations = 200}, dream);
    folder.editSetup("End_Date = 2001-12-31",
                     "End_Date = 2001-09-30\n    [VALIDATION_PERIODS]\n      TqSEKdxListItemCount = 1\n"
                     "      [VALIDATION_1]\n        Name = 'autumn'\n        Start_Date = 2001-10-01\n"
                     "        End_Date = 2001-12-31\n      [/VALIDATION_1]\n    [/VALIDATION_PERIODS]");
    folder.editSetup("Uncertainty_Type = 'DREAM'",
                     "Uncertainty_Type = 'DREAM'\n Band_Times = 'steps'\n Band_End_Date = 2001-12-31");
    return setup;
  };
  ASSERT_EQ(runProgram({write()}).exitCode, 0) << folder.read("basin.log");
  const std::string chains = folder.read("basin_Chains.dat");
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\nThe likelihood is of all 273 observations of flow\n"));
  EXPECT_THAT(folder.read("basin.log"),
              HasSubstr("\nBand of total uncertainty of flow in autumn (validation): 100.0 % of 92 observations lie"));
  // A flood in autumn: the posterior is the same, and the band does not hold it.
  for (int day = 1; day <= 23; ++day) {
    const auto at = observed.find(fmt::format("2001-11-{:02}", day));
    ASSERT_NE(at, std::string::npos);
    const auto comma = observed.find(',', at);
    observed.replace(comma + 1, observed.find('\n', comma) - comma - 1, "1000");
  }
  folder.write("observed.csv", observed);
  ASSERT_EQ(runProgram({write()}).exitCode, 0) << folder.read("basin.log");
  EXPECT_EQ(readDataTable(folder.read("basin_Chains.dat")).rows, readDataTable(chains).rows);
  EXPECT_THAT(folder.read("basin.log"),
              HasSubstr("\nBand of total uncertainty of flow in autumn (validation): 75.0 % of 92 observations lie"));
}

TEST(Dream, AnObjectiveFunctionMayBeTheLikelihoodAndFailedRunsHaveNone) {
  const ModelFolder folder;
  // The root mean square error is 2.7 at most: its own posterior is wide.
  const std::string setup =
      writeDream(folder, {.maxEvaluations = 400, .modelArguments = "--fail-above 9.9"}, "Likelihood = 'objective'");
  const ProgramResult run = runProgram({setup});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const ReadTable table = readDataTable(folder.read("basin_Chains.dat"));
  const ReadTable results = readDataTable(folder.read("basin.dat"));
  for (const auto& row : table.rows) {
    const double logLikelihood = realCell(row[*table.column("Log_Likelihood")]).value();
    if (std::isinf(logLikelihood)) continue;
    const auto number = static_cast<std::size_t>(realCell(row[*table.column("Evaluation")]).value());
    EXPECT_NEAR(-logLikelihood, realCell(results.rows[number - 1][*results.column("flow")]).value(), 1e-5);
    EXPECT_LE(realCell(row[*table.column("a")]).value(), 9.9);
  }
  EXPECT_THAT(folder.read("basin.log"), HasSubstr(" without a likelihood, whose sets were rejected: "));
  EXPECT_FALSE(folder.exists("basin_TotalBand_1.csv"));
}

TEST(Dream, OfRunsWithoutALikelihoodHasNoPosteriorAndSaysWhy) {
  const struct {
    const char* dream;
    const char* rows;  ///< of the simulated file from the second on
    const char* reason;
  } cases[] = {
      {"Box_Cox_Lambda = 0.0", "2001-01-02 00:00,0", "have simulated values without a Box-Cox transformation"},
      {"Box_Cox_Lambda = 0.5", "2001-01-02 00:00,-1", "have simulated values without a Box-Cox transformation"},
      {"Error_Deviation = 1e-300", "2001-01-02 00:00,4", "have no finite errors, or errors too large"},
      {"Error_Bias = 1e308", "2001-01-02 00:00,4", "have no finite errors, or errors too large"},
  };
  for (const auto& [dream, rows, reason] : cases) {
    SCOPED_TRACE(dream);
    const ModelFolder folder;
    const std::string setup =
        writeDream(folder, {.maxEvaluations = 60}, fmt::format("Likelihood = 'normal'\n {}", dream));
    folder.useScript(fmt::format("printf 'time,simulated\\n2001-01-01 00:00,3\\n{}\\n' > simulated.csv; exit 0", rows));
    const ProgramResult run = runProgram({setup});
    EXPECT_EQ(run.exitCode, 0);
    EXPECT_THAT(run.error, AllOf(HasSubstr("No posterior: none of the "), HasSubstr(reason)));
    const std::string log = folder.read("basin.log");
    EXPECT_THAT(log,
                AllOf(HasSubstr("Warning: No posterior: none of the "), HasSubstr(reason), Not(HasSubstr("R-hat i"))));
    EXPECT_EQ(log.find("No posterior"), log.rfind("No posterior")) << "told once";
    EXPECT_TRUE(folder.exists("basin_Chains.dat"));
    for (const char* const file : {"basin_Posterior.dat", "basin_Convergence.dat", "basin_Marginals.dat",
                                   "basin_SampleCorrelation.dat", "basin_Band_1.csv", "basin_TotalBand_1.csv"}) {
      EXPECT_FALSE(folder.exists(file)) << file;
    }
  }
}

TEST(Dream, WhatDoesNotFitIsRefusedBeforeTheFirstModelRun) {
  struct Case {
    std::string dream;
    std::string message;
  };
  const std::vector<Case> cases{
      {"Likelihood = 'normal'\n Error_Deviation = 2.0, 1.0",
       "expected a lower bound below the upper one, found 2 and 1"},
      {"Likelihood = 'normal'\n Error_Deviation = 1.0, 2.0, 3.0",
       "one number (a fixed value) or two (bounds), found 3"},
      {"Likelihood = 'normal'\n Error_Deviation = 0.0", "Error_Deviation: expected greater than 0, found 0"},
      {"Likelihood = 'heteroscedastic'\n Error_Share = -1.0, 1.0", "Error_Share: expected 0 or more, found -1"},
      {"Likelihood = 'AR(1)'\n Error_Correlation = 0.5, 1.0", "expected 0 to 0.9999, found 1"},
      {"Likelihood = 'objective'\n Objective_Function = 2", "Objective_Function: expected 0 to 1, found 2"},
      {"Likelihood = 'objective'\n Objective_Function = 'fitt'",
       "Objective_Function: expected 0 to 1 or the name of an objective function, \"fit\"; found \"fitt\""},
      {"Likelihood = 'objective'\n [ERROR_MODEL_1]\n [/ERROR_MODEL_1]", "remove the section ERROR_MODEL_1"},
      {"Likelihood = 'normal'\n [ERROR_MODEL_1]\n Likelihood = 'objective'\n [/ERROR_MODEL_1]",
       "can only be the whole likelihood, that of DREAM"},
      {"Likelihood = 'normal'\n [ERROR_MODEL_2]\n Likelihood = 'Student'\n [/ERROR_MODEL_2]",
       "ERROR_MODEL_2: expected the number of an output measure"},
      {"Likelihood = 'Box-Cox'\n Box_Cox_Shift = -6.0", "expected a Box_Cox_Shift with which all observations"},
      {"Likelihood = 'Student'\n Student_Freedom = 1000001.0", "expected 0.5 to 1000000, found 1000001"},
      {"Likelihood = 'normal'\n Box_Cox_Lambda = 0.0\n Box_Cox_Shift = 1e300",
       "do not vary after the Box-Cox transformation"},
      {"Likelihood = 'normal'\n Effective_Size = 161.0", "expected at most 160, the part of Sample_Size"},
      // What no error model depends on would have its prior for a posterior.
      {"Likelihood = 'normal'\n Student_Freedom = 2.0, 50.0", "expected 'Student', or no Student_Freedom"},
      {"Likelihood = 'Student'\n Error_Kurtosis = 0.5", "expected 'generalised', or no Error_Kurtosis"},
      {"Likelihood = 'AR(1)'\n Error_Skewness = 0.5, 2.0", "expected 'generalised', or no Error_Skewness"},
      {"Likelihood = 'objective'\n Error_Deviation = 1.0, 2.0", "expected the likelihood of a series, or no Error_D"},
      {"Likelihood = 'normal'\n Box_Cox_Shift = 1.0", "expected 'Box-Cox', or a Box_Cox_Lambda other than 1, or no"},
      {"Likelihood = 'normal'\n Objective_Function = 1", "expected 'objective', or no Objective_Function"},
      {"Likelihood = 'Student'\n [ERROR_MODEL_1]\n Likelihood = 'normal'\n Student_Freedom = 5.0\n [/ERROR_MODEL_1]",
       "expected 'Student', or no Student_Freedom"},
  };
  const ModelFolder folder;
  for (const Case& own : cases) {
    SCOPED_TRACE(own.dream);
    const std::string setup = writeDream(folder, {.maxEvaluations = 200}, own.dream);
    const ProgramResult check = runProgram({"--check", setup});
    EXPECT_EQ(check.exitCode, 1);
    EXPECT_THAT(check.error, AllOf(HasSubstr(own.message), HasSubstr("basin.kdx:")));
    EXPECT_THAT(check.output, Not(HasSubstr("The model is run")));
    const ProgramResult run = runProgram({setup});
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_THAT(run.error, HasSubstr(own.message));
    EXPECT_THAT(run.error, HasSubstr("basin.kdx:"));
    EXPECT_THAT(folder.read("basin.log"), Not(HasSubstr("No. 1 initiated")));
  }
  const ProgramResult small = runProgram({writeDream(folder, {.maxEvaluations = 39}, "Likelihood = 'normal'")});
  EXPECT_THAT(small.error, HasSubstr("expected 10 evaluations for each of the 4 chains or more, found 39"));
}

TEST(Dream, PriorsThatHaveNothingWithinTheBoundsAreRefusedAndOthersAreCutThere) {
  const ModelFolder folder;
  const std::string dream = "Likelihood = 'normal'\n Error_Deviation = 3.0";
  const auto withPrior = [&](const std::string& mean, const std::string& deviation) {
    std::string text = folder.read(writeDream(folder, {.maxEvaluations = 200}, dream).substr(folder.path().size() + 1));
    text.insert(text.find("[DREAM]"), "[PARAMETER_1]\n Mean_Value = " + mean + "\n Standard_Deviation = " + deviation +
                                          "\n [/PARAMETER_1]\n");
    return folder.write("basin.kdx", text);
  };
  const ProgramResult outside = runProgram({withPrior("50.0", "1.0")});
  EXPECT_EQ(outside.exitCode, 1);
  EXPECT_THAT(outside.error, HasSubstr("the prior of a has a probability of 0 between the bounds 0 and 10"));
  EXPECT_THAT(outside.error, HasSubstr("basin.kdx:"));

  const ProgramResult cut = runProgram({withPrior("5.0", "100.0")});
  ASSERT_EQ(cut.exitCode, 0) << cut.error;
  const std::string posterior = folder.read("basin_Posterior.dat");
  EXPECT_NEAR(dreamCell(posterior, "a", "Prior 5 %"), 0.5, 0.1);  // of one that is nearly flat from 0 to 10
  EXPECT_NEAR(dreamCell(posterior, "a", "Prior 95 %"), 9.5, 0.1);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("PARAMETER_1: a, mean 5, standard deviation 100"));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("% of the values drawn are outside"));

  // Single values are refused where they are written.
  const std::string uniform = withPrior("5.0", "1.0");
  folder.editSetup(" Mean_Value = 5.0\n Standard_Deviation = 1.0", "Distribution = 'discrete'\nValues = 1.0, 2.0");
  const ProgramResult single = runProgram({"--check", uniform});
  EXPECT_THAT(single.error, HasSubstr("Distribution: the distribution of a has single values"));
  const std::string setupText = folder.read("basin.kdx");
  const auto line = 1 + std::ranges::count(setupText.substr(0, setupText.find("Distribution = ")), '\n');
  EXPECT_THAT(single.error, HasSubstr(fmt::format("basin.kdx:{}:", line)));

  // On a range that does not begin at 0, numbers are too coarse for a peak without end.
  const struct {
    const char* alpha;
    const char* beta;
    const char* told;
  } peaks[] = {{"0.1", "1.0", "at its lower end, 2 (search scale)"},
               {"1.0", "0.1", "at its upper end, 10 (search scale)"},
               {"0.5", "0.5", nullptr}};
  for (const auto& [alpha, beta, told] : peaks) {
    withPrior("5.0", "1.0");
    folder.editSetup("Lower_Bound = 0.0", "Lower_Bound = 2.0");
    folder.editSetup(" Mean_Value = 5.0\n Standard_Deviation = 1.0",
                     fmt::format("Distribution = 'beta'\nAlpha = {}\nBeta = {}", alpha, beta));
    folder.editSetup("[DREAM]", "Redraw_Infeasible = 1\n[DREAM]");
    const ProgramResult peaked = runProgram({"--check", folder / "basin.kdx"});
    EXPECT_EQ(peaked.exitCode, 0) << peaked.error;
    EXPECT_THAT(peaked.output, HasSubstr("Redraw_Infeasible: has no effect with Uncertainty_Type = 'DREAM'"));
    if (told == nullptr) {
      EXPECT_THAT(peaked.output, Not(HasSubstr("rounding of numbers")));
    } else {
      EXPECT_THAT(peaked.output, HasSubstr(std::string("of a lies within the rounding of numbers ") + told));
    }
  }

  writeDream(folder, {.maxEvaluations = 200}, dream);
  folder.editSetup("Lower_Bound = 0.0", "Lower_Bound = 4.0");
  folder.editSetup("Upper_Bound = 10.0", "Upper_Bound = 4.0");
  const ProgramResult equal = runProgram({folder / "basin.kdx"});
  EXPECT_THAT(equal.error, HasSubstr("Lower bound equal to upper bound for parameter a"));
  EXPECT_THAT(equal.error, HasSubstr("Upper_Bound: expected more than 4 for a parameter with a density"));
}

TEST(Dream, ConstraintsThatNoSetMeetsAreFoundByCheck) {
  const ModelFolder folder;
  const std::string setup = writeDream(folder, {.maxEvaluations = 200}, "Likelihood = 'normal'");
  folder.editSetup(
      "TqSEKdxListItemCount = 0\n    [/INTERNAL_CONSTRAINTS]",
      "TqSEKdxListItemCount = 1\n      [CONSTRAINT_1]\n        Left_Equation = 'a + b'\n        "
      "Right_Equation = '-1.0'\n        Logical_Operator = 1\n      [/CONSTRAINT_1]\n    [/INTERNAL_CONSTRAINTS]");
  const ProgramResult check = runProgram({"--check", setup});
  EXPECT_EQ(check.exitCode, 1);
  EXPECT_THAT(check.error, AllOf(HasSubstr("No parameter set found that satisfies the constraints"),
                                 HasSubstr("basin.kdx:"), HasSubstr("drawn from the prior of DREAM")));
}

TEST(Dream, TheMostCompleteOfTheFirstRunsTellsWhichObservationsCount) {
  struct Case {
    const char* condition;  ///< of the model runs whose series is cut off
    const char* told;
    bool firstCounts = false;
  };
  const Case cases[] = {
      {"test $(wc -l < '{}') -eq 1", "The likelihood is of all 365 observations of flow", false},
      {"test -e '{}'", "The likelihood is of 20 of the 365 observations of flow", true},
  };
  for (const Case& own : cases) {
    const ModelFolder folder;
    const std::string count = folder / "count";
    folder.write(
        "model/run.sh",
        fmt::format("#!/bin/sh\necho . >> '{}'\n{} \"$@\" || exit 1\nif {}; then sed -n 1,21p simulated.csv > s "
                    "&& mv s simulated.csv; fi\n",
                    count, MIREVO_TEST_MODEL, fmt::format(fmt::runtime(own.condition), count)),
        0755);
    const std::string dream = "Likelihood = 'normal'\n Error_Deviation = 3.0\n Burn_In_Share = 0.0";
    const ProgramResult run = runProgram({writeDream(folder, {.maxEvaluations = 40}, dream)});
    ASSERT_EQ(run.exitCode, 0) << run.error;
    EXPECT_THAT(folder.read("basin.log"), HasSubstr(own.told));
    const ReadTable table = readDataTable(folder.read("basin_Chains.dat"));
    const double first = realCell(table.rows[0][*table.column("Log_Likelihood")]).value();
    EXPECT_EQ(std::isfinite(first), own.firstCounts) << own.told;
  }
}

TEST(Dream, MoreRunsAndOtherLimitsGoOnWithTheSameChains) {
  const ModelFolder folder;
  const std::string count = folder / "count";
  folder.useScript("echo . >> '" + count + "'");
  const auto linesOfCount = [&] { return std::ranges::count(folder.read("count"), '\n'); };
  const auto rowsOf = [&] { return readDataTable(folder.read("basin_Chains.dat")).rows; };
  const std::string dream = "Likelihood = 'AR(1)'\n Error_Deviation = 0.5, 5.0";
  ASSERT_EQ(runProgram({writeDream(folder, {.maxEvaluations = 200, .restart = 1}, dream)}).exitCode, 0);
  const auto before = rowsOf();
  const RunSettings raised{.maxEvaluations = 400, .restart = 1};
  const ProgramResult more = runProgram({writeDream(folder, raised, dream + "\n R_Hat_Limit = 1.01")});
  ASSERT_EQ(more.exitCode, 0) << more.error;
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Sample_Size was raised from 200 to 400"));
  const auto after = rowsOf();
  ASSERT_GT(after.size(), before.size());
  EXPECT_TRUE(std::equal(before.begin(), before.end(), after.begin()));
  EXPECT_LE(linesOfCount(), 400);
  // Limits that the chains had met long before leave what was computed in the posterior.
  const ProgramResult looser =
      runProgram({writeDream(folder, raised, dream + "\n R_Hat_Limit = 100.0\n Effective_Size = 1.0")});
  ASSERT_EQ(looser.exitCode, 0) << looser.error;
  EXPECT_EQ(rowsOf(), after);
  EXPECT_EQ(runProgram({writeDream(folder, {.maxEvaluations = 200, .restart = 1}, dream)}).exitCode, 1);
}

TEST(Dream, ARunThatFailsTooOftenTellsWhatHelpsAndGoesOnWithALargerLimit) {
  const ModelFolder folder;
  const std::string dream = "Likelihood = 'normal'\n Error_Deviation = 3.0";
  RunSettings settings{.maxEvaluations = 80, .restart = 1};
  folder.useScript("echo . >> '" + folder / "count" + "'; test $(wc -l < '" + folder / "count" + "') -gt 9 || exit 3");
  const ProgramResult run = runProgram({writeDream(folder, settings, dream)});
  EXPECT_EQ(run.exitCode, 1);
  EXPECT_THAT(run.error, HasSubstr("whose violation needs no model run and is no failure here"));
  settings.maxEvaluations = 120;
  const ProgramResult more = runProgram({writeDream(folder, settings, dream)});
  EXPECT_EQ(more.exitCode, 0) << more.error;
  EXPECT_THAT(folder.read("basin.log"),
              HasSubstr("9 evaluations without a likelihood, whose sets were rejected: 9 failed\n"));
}

}  // namespace
}  // namespace mirevo::testing

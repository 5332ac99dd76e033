#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The test model with a constraint that cuts off the best set, a = 5 and b = 2; the initial values meet it. Runs it.
ProgramResult runConstrained(const ModelFolder& folder, const RunSettings& settings, bool redraws = false) {
  const std::string setup = folder.writeSetup(settings);
  folder.editSetup(
      "TqSEKdxListItemCount = 0\n    [/INTERNAL_CONSTRAINTS]",
      "TqSEKdxListItemCount = 1\n      [CONSTRAINT_1]\n        Left_Equation = 'a + b'\n        "
      "Right_Equation = '6.9'\n        Logical_Operator = 1\n      [/CONSTRAINT_1]\n    [/INTERNAL_CONSTRAINTS]");
  if (redraws)
    folder.editSetup("    Uncertainty_Type = 1\n", "    Uncertainty_Type = 1\n    Redraw_Infeasible = 'yes'\n");
  return runProgram({setup});
}

TEST(Constraints, NearTheOptimumCostASearchNoEvaluation) {
  const ModelFolder folder;
  for (const int algorithm : {0, 1, 2}) {
    const RunSettings settings{.algorithm = algorithm,
                               .usesSurrogate = algorithm == 0,
                               .includesInitial = algorithm != 2,
                               .maxEvaluations = 150};
    const ProgramResult run = runConstrained(folder, settings);
    ASSERT_EQ(run.exitCode, 0) << run.error;
    const std::string log = folder.read("basin.log");
    EXPECT_THAT(log, AllOf(HasSubstr(" model evaluations, 0 of them failed\n"),
                           HasSubstr("\nProposed points that cannot be run (a constraint is violated, or an equation "
                                     "has no finite value) and "
                                     "were replaced")));
    double best = 1e30;
    for (const auto& row : readDataTable(folder.read("basin_Optimisation.dat")).rows) {
      EXPECT_LE(std::stod(row[2]) + std::stod(row[3]), 6.9);
      best = std::min(best, std::stod(row[6]));
    }
    EXPECT_LT(best, 0.2) << algorithm;
    EXPECT_THAT(log, Not(HasSubstr("leave any width")));
    // The initial set, a = 4 and b = 1, meets it.
    folder.editSetup("'a + b'", "'abs(a - 4 * b)'");
    folder.editSetup("'6.9'", "'0'");
    ASSERT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 0);
    EXPECT_THAT(folder.read("basin.log"),
                HasSubstr("set already evaluated: do constraints and equations leave any width?"));
  }
}

TEST(Constraints, AreTestedBeforeTheFirstRunOfASensitivityAnalysisAndOfScenarios) {
  const ModelFolder folder;
  const std::string none =
      "\n   None of the scenarios can be run: check the constraints, the equations and the values\n";
  for (const auto& [settings, equation, said] :
       {std::tuple{RunSettings{.option = 1}, "'a + b + 2.5'",
                   std::string("5 of 5 sets of the analysis are not run and fail, as they violate a constraint or an "
                               "equation has no finite value: No. 1, 2")},
        {{.option = 1}, "'6.9 + abs(b - 1)'", "2 of 5 sets of the analysis are not run and fail"},
        {{.option = 0, .scenarios = {"4, 1, 1", "5, 2, 1"}}, "'a + b + 2.5'", none}}) {
    runConstrained(folder, settings);
    folder.editSetup("'a + b'", equation);
    EXPECT_THAT(runProgram({"--check", folder / "basin.kdx"}).output, HasSubstr(said));
    const ProgramResult run = runProgram({folder / "basin.kdx"});
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_THAT(run.error, HasSubstr(said));
    EXPECT_LT(folder.read("basin.log").find("are not run and fail, as they violate"),
              folder.read("basin.log").find("Evaluation of parameter set No. 1 "));
  }
}

TEST(Constraints, ThatNoSetSatisfiesAreToldBeforeAnyFileIsTouched) {
  for (const auto& [option, results] : {std::pair{2, "basin_Optimisation.dat"}, {3, "basin.dat"}}) {
    const ModelFolder folder;
    runConstrained(folder, {.option = option, .maxEvaluations = 12}, option == 3);
    const std::string expected = folder.read(results);
    folder.editSetup("'6.9'", "'-1'");
    for (int start = 1; start <= 2; ++start) {
      const ProgramResult run = runProgram({folder / "basin.kdx"});
      EXPECT_THAT(run.error, HasSubstr("Error: No parameter set found that satisfies the constraints\n"));
      EXPECT_THAT(folder.read("basin.log"), HasSubstr("\nThe run did not begin: no model was run"));
      EXPECT_EQ(folder.read(results), expected);
      EXPECT_FALSE(folder.exists("basin.2.log")) << "that of the first refusal";
    }
  }
}

TEST(Constraints, TellOfASampleOfWhichTooManySetsViolateThemBeforeTheFirstRunAndAreMetByOneDrawnAgain) {
  const ModelFolder folder;
  const RunSettings settings{.option = 3, .maxEvaluations = 60};  // of a + b about 7
  ProgramResult run = runConstrained(folder, settings);
  EXPECT_EQ(run.exitCode, 1);
  EXPECT_THAT(run.error, AllOf(HasSubstr(" of 60 sets of the sample are not run and fail, as they violate a "),
                               HasSubstr("With Redraw_Infeasible = 1 in UNCERTAINTY_ESTIMATION")));
  std::string log = folder.read("basin.log");
  EXPECT_LT(log.find("sets of the sample are not run and fail, as they violate a "),
            log.find("Evaluation of parameter set No. 1 "));
  EXPECT_THAT(log, AllOf(HasSubstr("\nfailed evaluations: 7, 7 of them not run as they violate a constraint or "
                                   "an equation has no finite value; at most"),
                         HasSubstr("\n1 warning: the lines above that begin with \"Warning: \"\n"),
                         Not(HasSubstr("model run error")), Not(HasSubstr("failed model run"))));
  EXPECT_THAT(folder.read("calSimErr.dat"), HasSubstr(" (parameter constraints violated)\n"));

  // Hardly any set, and none.
  for (const auto& [limit, redraws, said] : {std::tuple{"'5.5'", true, " drawn, an acceptance rate of 0."},
                                             {"'-1'", false, "None of the sets of the sample "}}) {
    runConstrained(folder, settings, redraws);
    folder.editSetup("'6.9'", limit);
    run = runProgram({folder / "basin.kdx"});
    EXPECT_EQ(run.exitCode, redraws ? 0 : 1);
    EXPECT_THAT(folder.read("basin.log"), HasSubstr(said));
    EXPECT_THAT(run.error, HasSubstr(redraws ? "Less than 1 % of the sets drawn can be run" : said));
    EXPECT_THAT(run.error, Not(HasSubstr("With Redraw_Infeasible = 1 in")));
  }

  run = runConstrained(folder, settings, true);
  EXPECT_EQ(run.exitCode, 0);
  EXPECT_EQ(run.error, "");
  const std::string results = folder.read("basin.dat");
  for (const auto& row : readDataTable(results).rows) EXPECT_LE(std::stod(row[2]) + std::stod(row[3]), 6.9);
  const std::string acceptance = "Redraw_Infeasible: 60 sets that can be run out of ";
  EXPECT_THAT(results, HasSubstr("\n# " + acceptance));
  log = folder.read("basin.log");
  EXPECT_LT(log.find(acceptance), log.find("Evaluation of parameter set No. 1 "));
}

}  // namespace
}  // namespace mirevo::testing

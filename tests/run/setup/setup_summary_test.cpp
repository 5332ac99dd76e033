#include "run/setup/setup_summary.h"

#include <gtest/gtest.h>

#include "run/setup_fixture.h"

namespace mirevo {
namespace {

using SetupSummaryTest = SetupFixture;

TEST_F(SetupSummaryTest, SaysWhatTheRunIsAboutToDo) {
  RunConfig config = read("Weight = 0.75 => Weight = 0.75\nStandard_Deviation = 2.5");
  config.baseFolder = "/base";
  const SearchSpace space{.names = {"Depth", "Rate"}, .lower = {4.605170185988092, 0.0}, .upper = {6.75, 1.0}};
  const int order[] = {1, 3, 2};
  EXPECT_EQ(
      setupSummary(config, space, order),
      "Title: Upper catchment\n"
      "Task: Parameter optimisation: Population Simplex Evolution with surrogate model\n"
      "Base folder: /base\n"
      "Batch items: 1, parameter files: 1, saved output files: 1\n"
      "Model parameters: 3, of which variable: 2\n"
      "  Depth: variable, initial value 412.5, bounds 100 to 900, transformation logarithmic, search from 4.60517 "
      "to 6.75\n"
      "  Rate: variable, initial value 0.31, bounds 0 to 1, transformation none, search from 0 to 1\n"
      "  Sum: dependent, Depth + Rate\n"
      "  order of evaluation: 1, 3, 2\n"
      "  constraint: Rate <= Depth\n"
      "Evaluation period: 2001-01-31 00:00 to 2003-12-31 24:00\n"
      "Output measures: 2\n"
      "  Flow error: root mean square, weight 1.25 (above 2.5), objective function Flow\n"
      "  Written: written by the model, weight 1 (above 1), objective function none\n"
      "Objective functions: 1\n"
      "  Flow: sum of squares of 1 output measure, weight 0.75, standard deviation 2.5\n"
      "Aggregation: No transformation\n"
      "Random seed: -77\n"
      "Model evaluations planned: 500 and a final model run\n"
      "Surrogate model: quadratic polynomial fitted to the 60 nearest sets, chooses one of 4 proposals; loops without "
      "it: 2\n"
      "Reuse of results: none, as output files are kept of every model run\n"
      "Simultaneous simulations: 4");
}

TEST_F(SetupSummaryTest, TheTaskSaysWhatIsRunAndHowOften) {
  const std::tuple<const char*, int, const char*> cases[] = {
      {"Option = 2 => 0 & Scenario_Type = 1 => 0", 1, "Scenario runs: Single run using initial parameter set"},
      {"Option = 2 => 0", 1, "Scenario runs: Multiple runs"},
      {"Option = 2 => 1 & Differencing = 1 => 0", 3,
       "Sensitivity analysis: Local sensitivity analysis, forward differences"},
      {"Option = 2 => 1", 5, "Sensitivity analysis: Local sensitivity analysis, central differences"},
      // A choice; a value at its bound; a constraint that leaves one side of both.
      {"Option = 2 => 1 & Transformation_Type = 1 => 2 & Initial_Value = 412.5 => 101 & Upper_Bound = 900 => 103", 3,
       "Sensitivity analysis: Local sensitivity analysis, central differences"},
      {"Option = 2 => 1 & Initial_Value = 0.31D0 => 1", 4,
       "Sensitivity analysis: Local sensitivity analysis, central differences"},
      {"Option = 2 => 1 & Left_Equation = 'Rate' => 'Rate + 412.185'", 3,
       "Sensitivity analysis: Local sensitivity analysis, central differences"},
      {"Option = 2 => 3 & Uncertainty_Type = 1 => 0", 200, "Uncertainty analysis: simple random sampling"},
      {"Option = 2 => 3", 200, "Uncertainty analysis: Latin hypercube sampling"},
      {"Option = 2 => 4", 0, "none"},
  };
  for (const auto& [edits, planned, description] : cases) {
    EXPECT_EQ(read(edits).plannedEvaluations(), planned) << edits;
    EXPECT_EQ(read(edits).taskDescription(), description);
  }
}

}  // namespace
}  // namespace mirevo

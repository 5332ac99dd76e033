#include "run/validation.h"

#include <gmock/gmock.h>

#include "run/setup_fixture.h"

namespace mirevo {
namespace {

using testing::HasSubstr;
using testing::StartsWith;
using ValidationTest = SetupFixture;

struct Refused {
  std::vector<Edit> edits;
  std::string message;  ///< the first line, whole
  std::string detail;   ///< what the lines below it hold
};

const Edit kScenario{"Option = 2", "Option = 0"};
const Edit kSensitivity{"Option = 2", "Option = 1"};
const Edit kUncertainty{"Option = 2", "Option = 3"};
const Edit kSce{"Algorithm_Type = 1", "Algorithm_Type = 0"};
const Edit kDds{"Algorithm_Type = 1", "Algorithm_Type = 2"};
const Edit kOneSlot{"NoSimultaneousSim = 4", "NoSimultaneousSim = 1"};

const std::vector<Refused>& refusedValues() {
  static const std::vector<Refused> cases = {
      // The model and its files
      {{{"TqSEKdxListItemCount = 1\n      [SIMBATCHITEM_1]", "TqSEKdxListItemCount = 0\n      [SIMBATCHITEM_1]"}},
       "Error: No model simulation sequence defined",
       "setup.kdx:6:30: TqSEKdxListItemCount: expected 1 or more, found 0"},
      {{{"'model\\run.sh'", "' '"}}, "Error: No model simulation sequence defined", "setup.kdx:8:25: BatchFileName"},
      {{{"'model\\run.sh'", "'model\\walk.sh'"}},
       "Error: The file model\\walk.sh does not exist",
       "setup.kdx:8:25: BatchFileName: model/walk.sh: No such file or directory"},
      {{{"'model\\run.sh'", "'model'"}}, "Error: The file model does not exist", "Is a directory"},
      {{{"TqSEKdxListItemCount = 1 // files", "TqSEKdxListItemCount = 0"}},
       "Error: No model parameter files defined",
       "setup.kdx:12:30"},
      {{{"'model/soil.par'", "'soil.par'"}},
       "Error: The file soil.par is not located in the base folder ",
       "setup.kdx:14:25: ParamFileName"},
      {{{"'model/soil.par'", "'model/../modelling/soil.par'"}},
       "Error: The file model/../modelling/soil.par is not located in the base folder ",
       "found modelling/soil.par"},
      {{{"'model/soil.par'", "'model/none.par'"}}, "Error: Unable to open model/none.par", "No such file"},
      {{{"'model/soil.tpl'", "'model/none.tpl'"}},
       "Error: Unable to open template file model/none.tpl",
       "setup.kdx:15:28: TemplateFileName"},
      {{{"'model/soil.tpl'", "'model/blank.tpl'"}},
       "Error: Delimiter not defined in template file model/blank.tpl",
       "model/blank.tpl:1:1: expected"},
      {{{"'model/soil.tpl'", "'model/soil.par'"}},
       "Error: The template file model/soil.par is a model parameter file, too",
       "overwrites"},
      // Parameters
      {{{"TqSEKdxListItemCount = 3", "TqSEKdxListItemCount = 0"}},
       "Error: No model parameters defined",
       "setup.kdx:20:28"},
      {{{"Lower_Bound = 100", "Lower_Bound = 412.6"}},
       "Error: Initial parameter value smaller than lower bound for parameter Depth",
       "setup.kdx:26:23: Initial_Value: expected 412.6 or more, found 412.5"},
      {{{"Upper_Bound = 900", "Upper_Bound = 412"}},
       "Error: Initial parameter value larger than upper bound for parameter Depth",
       "expected 412 or less, found 412.5"},
      {{{"Lower_Bound = 6.5", "Lower_Bound = 8.0"}},
       "Error: Lower bound larger than upper bound for parameter Sum",
       "setup.kdx:41:21"},
      {{{"Transformation_Type = 1", "Transformation_Type = 3"}},
       "Error: Transformation type invalid for parameter Depth",
       "setup.kdx:29:29: Transformation_Type: expected 0 to 2, found 3"},
      {{{"Parameter_Type = 0", "Parameter_Type = -1"}},
       "Error: Parameter type invalid for parameter Depth",
       "found -1"},
      {{{"'Rate'\n    [/P", "'Depth  '\n    [/P"}},
       "Error: Invalid parameter name Depth. Name used more than once.",
       "setup.kdx:37:24"},
      {{{"Lower_Bound = 100", "Lower_Bound = 0"}},
       "Error: Invalid parameter transformation for parameter Depth",
       "greater than 0 for a logarithmic parameter, found 0"},
      {{{"Parameter_Type = 0", "Parameter_Type = 1"}, {"Upper_Bound = 1.0", "Upper_Bound = 1.0\nParameter_Type = 1"}},
       "Error: No variable model parameters defined",
       "Parameter_Type = 0"},
      {{{"Logical_Operator = 1", "Logical_Operator = 4"}},
       "Error: Invalid logical operator in CONSTRAINT_1",
       "expected 0 to 3, found 4"},
      {{{"Right_Equation = 'Depth'", "Right_Equation = ''"}},
       "Error: Invalid equation for internal constraints",
       "Right_Equation"},
      // Measures and objective functions
      {{{"2001-01-31", "2001-02-29"}}, "Error: Invalid date 2001 2 29 0 0", "setup.kdx:58:18: Start_Date"},
      {{{"'2003-12-31 24:00'", "2003-12-31 24:01"}}, "Error: Invalid date 2003 12 31 24 1", "End_Date"},
      {{{"'2003-12-31 24:00'", "2001-01-30"}},
       "Error: End date of the evaluation period before its start date",
       "expected 2001-01-31 00:00 or later, found 2001-01-30 00:00"},
      {{{"Aggregation_Method = 0", "Aggregation_Method = 4"}},
       "Error: Objective function aggregation method invalid",
       "found 4"},
      {{{"Interface_Type = 0", "Interface_Type = 2"}},
       "Error: Interface type invalid for output measure Flow error",
       "Interface_Type"},
      {{{"Statistic_Type = 1", "Statistic_Type = 5"}},
       "Error: Statistic type invalid for output measure Flow error",
       "Statistic_Type"},
      {{{"Weight = 1.25", "Weight = -1.0E-9"}},
       "Error: Weight invalid for output measure Flow error",
       "Weight: expected 0 or more, found -1e-09"},
      {{{"Weight_Above = 2.5", "Weight_Above = -2.5"}},
       "Error: Weight invalid for output measure Flow error",
       "Weight_Above: expected"},
      {{{"MeasurementNo = 3", "MeasurementNo = 0"}},
       "Error: Measurement No. invalid for output measure Written",
       "expected 1 or more"},
      {{{"'model/flow.csv'", "''"}}, "Error: No output file defined for output measure No. 1", "setup.kdx:71:23"},
      {{{"'gauge.csv'", "''"}}, "Error: No observation file defined for output measure No. 1", "File_Name"},
      {{{"'model/flow.csv'", "'flow.csv'"}},
       "Error: The file flow.csv is not located in the base folder ",
       "File_Name"},
      {{{"Function_Name = 'Flow'", "Function_Name = 'Flwo'"}},
       "Error: Invalid function name for output measure Flow error",
       "Function_Name: no objective function is called \"Flwo\""},
      {{{"Function_Type = 2", "Function_Type = 3"}},
       "Error: Function type invalid for objective function Flow",
       "found 3"},
      {{{"Weight = 0.75", "Weight = -0.75"}}, "Error: Weight invalid for objective function Flow", "found -0.75"},
      {{{"Weight = 0.75", "Standard_Deviation = 0.0"}},
       "Error: Standard deviation invalid for objective function Flow",
       "greater than 0"},
      {{{"TqSEKdxListItemCount = 1\n      [OBJECTIVE_1]", "TqSEKdxListItemCount = 2\n      [OBJECTIVE_1]"},
        {"[/OBJECTIVE_1]", "[/OBJECTIVE_1][OBJECTIVE_2]\nName = 'Flow'\n[/OBJECTIVE_2]"}},
       "Error: Invalid objective function name Flow. Name used more than once.",
       "setup.kdx:95:8"},
      {{{"TqSEKdxListItemCount = 1\n      [OBJECTIVE_1]", "TqSEKdxListItemCount = 0\n      [OBJECTIVE_1]"}},
       "Error: No objective functions defined",
       "found 0"},
      {{{"TqSEKdxListItemCount = 2", "TqSEKdxListItemCount = 0"}}, "Error: No output measures defined", "found 0"},
      {{{"'model/out/flow.csv'", "''"}}, "Error: No output file defined to be saved", "File_name"},
      {{{"'model/out/flow.csv'", "'../flow.csv'"}},
       "Error: The file ../flow.csv is not located in the base folder ",
       ""},
      {{{"'model/measures.txt'", "''"}}, "Error: File containing output measures not defined", "Interface_Type = 1"},
      {{{"'model/measures.txt'", "'/tmp/measures.txt'"}},
       "Error: The file /tmp/measures.txt is not located in the base folder ",
       ""},
      // Tasks
      {{kScenario, {"Scenario_Type = 1", "Scenario_Type = 2"}}, "Error: Invalid scenario type selection", "found 2"},
      {{kScenario, {"TqSEKdxListItemCount = 1\n      [SCENARIO_1]", "TqSEKdxListItemCount = 0\n      [SCENARIO_1]"}},
       "Error: No scenario runs defined",
       ""},
      {{kScenario, {"412.5, 1, 99", "412.5, 1"}},
       "Error: Invalid number of parameter values in SCENARIO_1",
       "each of the 3 parameters, found 2"},
      {{kScenario, {"412.5, 1, 99", "412.5, 1.01, 99"}},
       "Error: Value for parameter Rate in SCENARIO_1 out of bounds",
       "value 2: expected 0 to 1, found 1.01"},
      {{kSensitivity, {"Sensitivity_Type = 0", "Sensitivity_Type = 1"}},
       "Error: Invalid sensitivity type selection",
       "expected 0, found 1"},
      {{kSensitivity, {"Differencing = 1", "Differencing = 2"}},
       "Error: Differencing option in local sensitivity analysis invalid",
       ""},
      {{kSensitivity, {"Perturbation_Option = 0", "Perturbation_Option = 2"}},
       "Error: Perturbation option in local sensitivity analysis invalid",
       ""},
      {{kSensitivity, {"Perturbation_Fraction = 0.02", "Perturbation_Fraction = 0"}},
       "Error: Perturbation fraction in local sensitivity analysis invalid",
       "expected greater than 0 and at most 1, found 0"},
      {{kSensitivity, {"Perturbation_Fraction = 0.02", "Perturbation_Fraction = 0.75"}},
       "Error: Perturbed value for parameter Depth in local sensitivity analysis out of bounds",
       "0.75 of the range, from 412.5, leaves the bounds 100 to 900 both ways (logarithms)"},
      {{{"Algorithm_Type = 1", "Algorithm_Type = 3"}}, "Error: Invalid optimisation algorithm type selection", ""},
      {{{"Upper_Bound = 1.0", "Upper_Bound = 0.31"}, {"Lower_Bound = 0.0", "Lower_Bound = 0.31"}},
       "Error: Lower bound equal to upper bound for parameter Rate",
       "Parameter_Type = 1 fixes a parameter"},
      {{kSce, {"No_Complexes = 4", "No_Complexes = 0"}}, "Error: No. of complexes in SCE algorithm invalid", ""},
      {{kSce, {"No_Points_Complex = 7", "No_Points_Complex = 1"}},
       "Error: No. of points in a complex in SCE algorithm invalid",
       ""},
      {{kSce, {"No_Points_Subcomplex = 6", "No_Points_Subcomplex = 8"}},
       "Error: No. of points in a subcomplex in SCE algorithm invalid",
       "at most the 7 points of a complex, found 8"},
      {{kSce, {"No_Points_Subcomplex = 6", "No_Points_Subcomplex = 1"}},
       "Error: No. of points in a subcomplex in SCE algorithm invalid",
       "2 or more"},
      {{kSce, {"No_Evaluation_Steps = 8", "No_Evaluation_Steps = 0"}},
       "Error: No. of evaluation steps in SCE algorithm invalid",
       ""},
      {{{"Population_Size = 20", "Population_Size = 0"}}, "Error: Population size in PSE algorithm invalid", ""},
      {{{"No_Points_Simplex = 5", "No_Points_Simplex = 21"}},
       "Error: No. of points in a simplex in PSE algorithm invalid",
       "at most the 20 points"},
      {{{"Prob_Reflection = 0.6", "Prob_Reflection = 1.1"}},
       "Error: Probability for reflection step in PSE algorithm invalid",
       "expected 0 to 1, found 1.1"},
      {{{"Prob_Contraction = 0.4", "Prob_Contraction = -0.1"}},
       "Error: Probability for contraction step in PSE algorithm invalid",
       ""},
      {{{"Prob_Contraction = 0.4", "Prob_Contraction = 0.5"}},
       "Error: Sum of probabilities for reflection and contraction in PSE algorithm larger than 1",
       "found 0.6 + 0.5"},
      {{kDds, kOneSlot, {"Perturbation_Parameter = 0.25", "Perturbation_Parameter = 1.01"}},
       "Error: Perturbation parameter in DDS algorithm invalid",
       ""},
      {{kDds, kOneSlot, {"Max_No_Evaluations = 500", "Max_No_Evaluations = 0"}},
       "Error: Maximum No. of model evaluations in DDS algorithm invalid",
       ""},
      {{{"Initial_Sample_Generation = 4", "Initial_Sample_Generation = 5"}},
       "Error: Initial sample generation method invalid",
       ""},
      {{{"'sample.txt'", "'/dev/zero'"}}, "Error: Unable to open /dev/zero", "Not a regular file"},
      {{{"'sample.txt'", "''"}}, "Error: Unable to open ", "expected the name of a file, found a blank text"},
      {{{"'sample.txt'", "'none.txt'"}}, "Error: Unable to open none.txt", "No such file"},
      {{{"Max_No_Evaluations = 500", "Max_No_Evaluations = 0"}}, "Error: Maximum No. of model evaluations invalid", ""},
      {{{"No_Loops_Convergence = 12", "No_Loops_Convergence = 0"}},
       "Error: No. of loops for evaluation of convergence criterion invalid",
       ""},
      {{{"Min_Change = 0.005", "Min_Change = -0.005"}}, "Error: Minimum change convergence criterion invalid", ""},
      {{{"Model_Type = 0", "Model_Type = 2"}}, "Error: Invalid model type for surrogate modelling optimisation", ""},
      {{{"Neighbourhood_Size = 60", "Neighbourhood_Size = 5"}},
       "Error: Invalid neighbourhood size for surrogate modelling optimisation",
       "at least the 6 coefficients of a quadratic polynomial in 2 parameters"},
      {{{"Sampling_rate = 30", "Sampling_rate = 101"}},
       "Error: Invalid sampling rate for surrogate modelling optimisation",
       "expected 1 to 100"},
      {{{"No_Initial_Generations = 2", "No_Initial_Generations = 0"}},
       "Error: Invalid no of initial generations for surrogate modelling optimisation",
       ""},
      {{{"Neighbourhood_Size = 60", "Neighbourhood_Size = 61"}},
       "Error: Population size and/or initial No. of generations too small for surrogate modelling optimisation",
       "Neighbourhood_Size = 61 evaluated sets before the surrogate is fitted, found 60"},
      {{kUncertainty, {"Uncertainty_Type = 1", "Uncertainty_Type = 2"}},
       "Error: Invalid uncertainty estimation type selection",
       ""},
      {{kUncertainty, {"Sample_Size = 200", "Sample_Size = 1"}},
       "Error: Sample size in uncertainty estimation invalid",
       ""},
      {{kUncertainty, {"Standard_Deviation = 0.3", "Standard_Deviation = 0.0"}},
       "Error: Standard deviation in uncertainty estimation invalid",
       ""},
      {{{"NoSimultaneousSim = 4", "NoSimultaneousSim = 0"}}, "Error: Invalid No. of processes", ""},
      {{kDds}, "Error: Use Population Simplex Evolution algorithm for application with multiple processors", "found 4"},
      {{kSce}, "Error: Use Population Simplex Evolution algorithm for application with multiple processors", ""},
      // Scale and location that nothing can give
      {{kUncertainty, {"Aggregation_Method = 0", "Aggregation_Method = 1"}},
       "Error: Standard deviation and location not defined for objective function Flow",
       "Standard_Deviation: expected the keyword, which aggregation method 1 needs"},
      {{kDds, {"Aggregation_Method = 0", "Aggregation_Method = 2"}, {"Weight = 0.75", "Standard_Deviation = 2.5"}},
       "Error: Standard deviation and location not defined for objective function Flow",
       "Location: expected"},
  };
  return cases;
}

TEST_F(ValidationTest, RefusesEachInvalidValueWithItsTextAndPlace) {
  for (const Refused& row : refusedValues()) {
    const std::string error = failure(row.edits);
    const std::string message = error.substr(0, error.find('\n'));
    SCOPED_TRACE(row.edits.back().to);
    // The base folder at the end of a message is this machine's.
    if (row.message.ends_with(' ')) {
      EXPECT_THAT(message, StartsWith(row.message));
    } else {
      EXPECT_EQ(message, row.message);
    }
    EXPECT_THAT(error.substr(std::min(error.size(), message.size() + 1)), HasSubstr(row.detail));
    EXPECT_THAT(error, HasSubstr("\nsetup.kdx:")) << "every refusal names its place";
  }
}

TEST_F(ValidationTest, AcceptsTheValuesAtTheEdgeOfWhatIsValid) {
  const std::vector<std::vector<Edit>> cases = {
      {{"No_Points_Simplex = 5", "No_Points_Simplex = 20"}},
      {kSce, kOneSlot, {"No_Points_Subcomplex = 6", "No_Points_Subcomplex = 7"}},
      {kDds, kOneSlot, {"Perturbation_Parameter = 0.25", "Perturbation_Parameter = 0"}},
      {kDds, kOneSlot, {"Perturbation_Parameter = 0.25", "Perturbation_Parameter = 1"}},
      {kDds, kOneSlot, {"Upper_Bound = 1.0", "Upper_Bound = 0.31"}, {"Lower_Bound = 0.0", "Lower_Bound = 0.31"}},
      {{"Upper_Bound = 1.0", "Upper_Bound = 0.31\nTransformation_Type = 2"},
       {"Lower_Bound = 0.0", "Lower_Bound = 0.31"}},
      {{"Min_Change = 0.005", "Min_Change = 0"}},
      {{"Weight = 1.25", "Weight = 0"}, {"Weight_Above = 2.5", "Weight_Above = 0"}, {"Weight = 0.75", "Weight = 0"}},
      {{"Sampling_rate = 30", "Sampling_rate = 100"}},
      {{"Neighbourhood_Size = 60", "Neighbourhood_Size = 6"}},
      {{"Lower_Bound = 100", "Lower_Bound = 412.5"}},
      {{"Upper_Bound = 900", "Upper_Bound = 412.5"}, {"Lower_Bound = 100", "Lower_Bound = 100"}},
      {{"'2003-12-31 24:00'", "2001-01-31T00:00"}},
      {{"'2003-12-31 24:00'", "2003-12-31 23:60"}},
      {{"'model/soil.tpl'", "'model/blank.tpl'\nFileType = 1"}},
      {{"TqSEKdxListItemCount = 1\n    [OUTPUT_FILE_1]", "TqSEKdxListItemCount = 0\n    [OUTPUT_FILE_1]"}},
      {{"Function_Name = 'Flow'", "Function_Name = ''"}},
      {{"Aggregation_Method = 0", "Aggregation_Method = 2"}},
      {{"Aggregation_Method = 0", "Aggregation_Method = 3"}, kScenario},
      {kScenario,
       {"Aggregation_Method = 0", "Aggregation_Method = 1"},
       {"Weight = 0.75", "Standard_Deviation = 1.0\nLocation = -2"}},
      {kScenario, {"412.5, 1, 99", "100, 1, -99"}},
      {kScenario, {"Scenario_Type = 1", "Scenario_Type = 0"}, {"412.5, 1, 99", "1"}},
      {kSensitivity, {"Perturbation_Fraction = 0.02", "Perturbation_Fraction = 0.6"}},
      {kUncertainty},
      {kUncertainty, {"Sample_Size = 200", "Sample_Size = 2"}},
  };
  for (const auto& edits : cases) EXPECT_EQ(failure(edits), "") << edits.back().to;
}

TEST_F(ValidationTest, RefusesAModelFileThatBearsTheNameOfTheSetup) {
  write("Setup.SH", "#!/bin/sh\n");
  EXPECT_THAT(failure({{"'model\\run.sh'", "'Setup.SH'"}}),
              StartsWith("Error: Model simulation file and mirevo file are located in the same directory with an "
                         "identical name\nsetup.kdx:8:25: BatchFileName: "));
  write("setup.txt", "#!/bin/sh\n");
  EXPECT_THAT(failure({{"'model\\run.sh'", "'setup.txt'"}}), "") << "an ending that no model setup has";
}

}  // namespace
}  // namespace mirevo

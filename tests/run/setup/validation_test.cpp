#include "run/setup/validation.h"

#include <cctype>
#include <cmath>
#include <tuple>
#include <utility>

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "matchers.h"
#include "run/setup/run_keywords.h"
#include "run/setup_fixture.h"

namespace mirevo {
namespace {

using ValidationTest = SetupFixture;

TEST_F(ValidationTest, RefusesEachInvalidValueWithItsTextAndPlace) {
  folder_.write("Setup.SH", "#!/bin/sh\n");
  folder_.write("model/mistyped.tpl", "!\n!Depht!\n");
  folder_.write("two.ins", "pif ~\nl1 !head_1! !head_2!\n");
  folder_.write("no.ins", "pif ~\nl1 !head_1!\nx !head_2!\n");
  const std::string instructed = "'model/measures.txt' => 'model/measures.txt'\nInstruction_File = 'two.ins'";
  const std::string listed = "'model/flow.csv' => 'model/flow.csv'\nInstruction_File = ";
  const std::string earlier =
      "'sample.txt' => '' & Initial_Sample_Generation = 4 => Initial_Sample_Generation = 1\n"
      "Earlier_Result_File = ";
  folder_.write("earlier.dat", "Evaluation\tStatus\tDepth\tRate\tAggregate\n1\tOK\t99\t0.5\t1\n");
  folder_.write("other.dat", "Evaluation\tStatus\tDepth\tRise\tAggregate\n1\tOK\t99\t0.5\t1\n");
  folder_.write("setup_Optimisation.dat", "Evaluation\tStatus\tDepth\tRate\tAggregate\n1\tOK\t200\t0.5\t1\n");
  // The first line behind "Error: ", whole, and what the lines below it hold.
  const std::tuple<std::string, std::string, const char*> cases[] = {
      // The model and its files
      {"TqSEKdxListItemCount = 1\n      [SIMBATCHITEM_1] => 0\n      [SIMBATCHITEM_1]",
       "No model simulation sequence defined", "setup.kdx:6:30: TqSEKdxListItemCount: expected 1 or more, found 0"},
      {"'model\\run.sh' => ' '", "No model simulation sequence defined", "setup.kdx:8:25: BatchFileName"},
      {"'model\\run.sh' => 'model\\walk.sh'", "The file model\\walk.sh does not exist",
       "setup.kdx:8:25: BatchFileName: model/walk.sh: No such file or directory; expected the name of a file that is "
       "there"},
      {"'model\\run.sh' => 'model'", "The file model does not exist", "Is a directory"},
      {"'model\\run.sh' => 'Setup.SH'",
       "Model simulation file and mirevo file are located in the same directory with an identical name",
       "setup.kdx:8:25: BatchFileName: "},
      {"'model\\run.sh' => 'model\\run.sh'\nArguments='-x \"a b'", "Unable to initialise MirevoSimpleLaunch",
       "setup.kdx:9:11: Arguments: expected a closing \" for the one at character 4, found"},
      {"TqSEKdxListItemCount = 1 // files => 0", "No model parameter files defined", "setup.kdx:12:30"},
      {"'model/soil.par' => 'soil.par'", "The file soil.par is not located in the base folder ",
       "setup.kdx:14:25: ParamFileName"},
      {"'model/soil.par' => 'model/../modelling/soil.par'",
       "The file model/../modelling/soil.par is not located in the base folder ", "found modelling/soil.par"},
      {"'model/soil.par' => 'model/none.par'", "Unable to open model/none.par", "No such file"},
      {"'model/soil.tpl' => 'model/none.tpl'", "Unable to open template file model/none.tpl",
       "setup.kdx:15:28: TemplateFileName"},
      {"'model/soil.tpl' => 'model/blank.tpl'", "Delimiter not defined in template file model/blank.tpl",
       "model/blank.tpl:1:1: expected"},
      {"'model/soil.tpl' => 'model/soil.par'", "The template file model/soil.par is a model parameter file, too",
       "overwrites"},
      {"ParamFileName = 'model/soil.par' => 'model/run.sh'",
       "The model parameter file model/run.sh is a batch file, too",
       "setup.kdx:14:25: ParamFileName: expected another file, since each model run writes this one before its batch "
       "starts; the other is setup.kdx:8:25: BatchFileName"},
      {"File_Name = 'model/flow.csv' => 'model/soil.par'",
       "The model parameter file model/soil.par is the file of a simulated series, too", "File_Name"},
      // Parameters
      {"TqSEKdxListItemCount = 3 => 0", "No model parameters defined", "setup.kdx:20:28"},
      {"Lower_Bound = 100 => 412.6", "Initial parameter value smaller than lower bound for parameter Depth",
       "setup.kdx:26:23: Initial_Value: expected 412.6 or more, found 412.5"},
      {"Upper_Bound = 900 => 412", "Initial parameter value larger than upper bound for parameter Depth",
       "expected 412 or less, found 412.5"},
      {"Lower_Bound = 6.5 => 8.0", "Initial parameter value smaller than lower bound for parameter Sum",
       "setup.kdx:40:23: Initial_Value: Lower_Bound 8 is above Upper_Bound 7.5: are they swapped? The initial value"},
      {"Upper_Bound = 900 => 99", "Initial parameter value larger than upper bound for parameter Depth",
       "Lower_Bound 100 is above Upper_Bound 99"},
      {"'Depth + Rate' => 'Depth + Rat'", "Unable to create the expression Depth + Rat in equation parser",
       "setup.kdx:46:28: Parameter_Equation: column 9: "},
      {"'model/soil.tpl' => 'model/mistyped.tpl'", "Parameter name Depht in template file Depht invalid",
       "setup.kdx:15:28: TemplateFileName: model/mistyped.tpl:2:1: "},
      {"Left_Equation = 'Rate' => 'Rate +'", "Invalid equation for internal constraints",
       "setup.kdx:51:25: Left_Equation: Error: Unable to create the expression Rate + in equation parser"},
      {"'Rate'\n    [/P => 'Depth  '\n    [/P", "Invalid parameter name Depth. Name used more than once.",
       "setup.kdx:37:24"},
      {"Lower_Bound = 100 => 0", "Invalid parameter transformation for parameter Depth",
       "greater than 0 for a logarithmic parameter, found 0"},
      {"Lower_Bound = 100 => -1e308 & Upper_Bound = 900 => 1e308", "Bounds too far apart for parameter Depth",
       "setup.kdx:28:21: Upper_Bound: expected a difference from Lower_Bound = -1e+308"},
      {"Parameter_Type = 0 => 1 & Upper_Bound = 1.0 => Upper_Bound = 1.0\nParameter_Type = 1",
       "No variable model parameters defined", "Parameter_Type = 0"},
      {"Right_Equation = 'Depth' => ''", "Invalid equation for internal constraints", "Right_Equation"},
      // Measures and objective functions
      {"2001-01-31 => 2001-02-29", "Invalid date 2001 2 29 0 0", "setup.kdx:58:18: Start_Date"},
      {"'2003-12-31 24:00' => 2003-12-31 24:01", "Invalid date 2003 12 31 24 1", "End_Date"},
      {"'2003-12-31 24:00' => 2001-01-30", "End date of the evaluation period before its start date",
       "expected 2001-01-31 00:00 or later, found 2001-01-30 00:00"},
      {"'gauge.csv' => 'gauge.csv'\nWeight_Item_No = 2\nError_Item_No = 3",
       "Weights of observations invalid for output measure Flow error", "expected Weight_Item_No or Error_Item_No"},
      {"'gauge.csv' => 'gauge.csv'\nQuality_Left_Out = 1",
       "Weights of observations invalid for output measure Flow error",
       "Quality_Left_Out: expected Quality_Item_No beside it"},
      {"'gauge.csv' => 'gauge.csv'\nQuality_Item_No = 9",
       "Weights of observations invalid for output measure Flow error",
       "Quality_Item_No: expected Quality_Left_Out or"},
      {"'gauge.csv' => 'gauge.csv'\nQuality_Item_No = 9\nQuality_Left_Out = 1, 2\nQuality_Down_Weighted = 2",
       "Weights of observations invalid for output measure Flow error", "found 2 in Quality_Left_Out, too"},
      {"'gauge.csv' => 'gauge.csv'\nQuality_Item_No = 9\nQuality_Down_Weighted = 2\nQuality_Weight = 1",
       "Weights of observations invalid for output measure Flow error", "found 1, with which the codes change nothing"},
      {"'gauge.csv' => 'gauge.csv'\nWeight_Item_Name = 'w'\nError_Item_No = 3",
       "Weights of observations invalid for output measure Flow error", "expected Weight_Item_Name or Error_Item_No"},
      {"'gauge.csv' => 'gauge.csv'\nQuality_Item_Name = 'code'",
       "Weights of observations invalid for output measure Flow error", "Quality_Item_Name: expected Quality_Left_Out"},
      {"'gauge.csv' => 'gauge.csv'\nTime_Format = 'DD.MM.YY'", "Form of a text file invalid",
       "Time_Format: expected YYYY, MM"},
      {"'gauge.csv' => 'gauge.csv'\nHeader_Rows = -1", "Form of a text file invalid", "expected 0 to 100, found -1"},
      {"'gauge.csv' => 'gauge.csv'\nTime_Unit = 'weeks'",
       "Unable to read keyword in section OBSERVATION_FILE in KDX file",
       "Time_Unit: expected one of the names 'seconds'"},
      {"Statistic_Type = 1 => 'KGE-NP' & 'gauge.csv' => 'gauge.csv'\nError_Item_No = 9",
       "Weights of observations invalid for output measure Flow error",
       "Error_Item_No: the statistic 'KGE-NP' has no weighted form"},
      {"Statistic_Type = 1 => Statistic_Type = 1\nTransformation = 'rank' & 'gauge.csv' => "
       "'gauge.csv'\nQuality_Item_No = 9\nQuality_Down_Weighted = 2",
       "Weights of observations invalid for output measure Flow error",
       "Quality_Down_Weighted: the transformation 'rank' has no weighted form"},
      {"Aggregation_Method = 0 => Warm_Up_Days = 1065", "Warm-up as long as the evaluation period",
       "expected less than 1065, the days from 2001-01-31 00:00 to 2003-12-31 24:00, found 1065"},
      {"Weight = 1.25 => Start_Date = 2001-01-30", "Period invalid for output measure Flow error",
       "Start_Date: expected a time in the evaluation period, 2001-01-31 00:00 to 2003-12-31 24:00, found 2001-01-30"},
      {"Weight = 1.25 => End_Date = 2004-01-02", "Period invalid for output measure Flow error",
       "End_Date: expected a"},
      {"Weight = 1.25 => End_Date = 2001-02-31", "Invalid date 2001 2 31 0 0", "End_Date"},
      {"Weight = 1.25 => End_Date = 2001-02-02\nStart_Date = 2001-02-03",
       "Period invalid for output measure Flow error",
       "End_Date: expected 2001-02-03 00:00 or later, the measure's Start_Date, found 2001-02-02 00:00"},
      {"Aggregation_Method = 0 => Warm_Up_Days = 5 & Weight = 1.25 => End_Date = 2001-02-02",
       "Period invalid for output measure Flow error", "expected 2001-02-05 00:00 or later, the end of the warm-up"},
      {"Weight = 1.25 => Months = 11, 0", "Months invalid for output measure Flow error",
       "expected whole numbers 1 to 12, found 0"},
      {"Weight = 1.25 => Lowest_Observed = 2\nHighest_Observed = 1",
       "Limits of the observed values invalid for output measure Flow error", "expected Lowest_Observed = 2 or more"},
      {"Aggregation_Method = 0 => Aggregation_Method = 0\n[VALIDATION_PERIODS]\nTqSEKdxListItemCount = 1\n"
       "[VALIDATION_1]\nStart_Date = 2005-02-01\nEnd_Date = 2005-01-31\n[/VALIDATION_1]\n"
       "[/VALIDATION_PERIODS]",
       "End date of the validation period before its start date",
       "expected 2005-02-01 00:00 or later, found 2005-01-31 00:00"},
      {"Aggregation_Method = 0 => Aggregation_Method = 0\n[VALIDATION_PERIODS]\nTqSEKdxListItemCount = 2\n"
       "[VALIDATION_1]\nStart_Date = 2005-02-01\nEnd_Date = 2005-03-01\n[/VALIDATION_1]\n[VALIDATION_2]\n"
       "Name = '2005-02-01 to 2005-03-01'\nStart_Date = 2006-01-01\nEnd_Date = 2007-01-01\n[/VALIDATION_2]\n"
       "[/VALIDATION_PERIODS]",
       "Invalid name of the validation period 2005-02-01 to 2005-03-01. Name used more than once.", "Name: expected"},
      {"MeasurementNo = 3 => 0", "Measurement No. invalid for output measure Written", "expected 1 or more"},
      {"'model/flow.csv' => ''", "No output file defined for output measure No. 1", "setup.kdx:71:23"},
      {"'gauge.csv' => ''", "No observation file defined for output measure No. 1", "File_Name"},
      {"'model/flow.csv' => 'flow.csv'", "The file flow.csv is not located in the base folder ", "File_Name"},
      {"Function_Name = 'Flow' => 'Flwo'", "Invalid function name for output measure Flow error",
       "Function_Name: no objective function is called \"Flwo\""},
      {"TqSEKdxListItemCount = 1\n      [OBJECTIVE_1] => 2\n      [OBJECTIVE_1] & [/OBJECTIVE_1] => "
       "[/OBJECTIVE_1][OBJECTIVE_2]\nName = 'Flow'\nStandard_Deviation = 0.0\n[/OBJECTIVE_2]",
       "Invalid objective function name Flow. Name used more than once.", "setup.kdx:95:8"},
      {"TqSEKdxListItemCount = 1\n      [OBJECTIVE_1] => 0\n      [OBJECTIVE_1]", "No objective functions defined",
       "found 0"},
      {"TqSEKdxListItemCount = 2 => 0", "No output measures defined", "found 0"},
      {"'model/out/flow.csv' => ''", "No output file defined to be saved", "File_name"},
      {"'model/out/flow.csv' => '../flow.csv'", "The file ../flow.csv is not located in the base folder ", ""},
      {"'model/measures.txt' => ''", "File containing output measures not defined", "Interface_Type = 1"},
      {"'model/measures.txt' => '/tmp/measures.txt'", "The file /tmp/measures.txt is not located in the base folder ",
       ""},
      {"'model/measures.txt' => 'model/measures.txt'\nInstruction_File = 'none.ins'", "Unable to open instruction file",
       "none.ins: No such file"},
      {"'model/measures.txt' => 'model/measures.txt'\nInstruction_File = 'no.ins'", "Invalid instruction file",
       "no.ins:3:1: expected a line to begin with a marker"},
      {instructed, "Measurement No. invalid for output measure Written", "two.ins, found 3"},
      {instructed + " & MeasurementNo = 3 => Measurement_Name = 'Head_3'",
       "Measurement No. invalid for output measure Written", "two.ins, found \"Head_3\", did you mean head_1?"},
      {instructed + " & MeasurementNo = 3 => Measurement_Name = 'head_2'\nMeasurementNo = 2",
       "Measurement No. invalid for output measure Written", "expected this or MeasurementNo, found both"},
      {instructed + " & [OUTPUT_MEASURE_FILE] => [FURTHER_FILES]\nTqSEKdxListItemCount = 1\n[FURTHER_FILE_1]\n"
                    "File_Name = 'model/b.txt'\nInstruction_File = 'two.ins'\n[/FURTHER_FILE_1]\n[/FURTHER_FILES]\n"
                    "[OUTPUT_MEASURE_FILE]",
       "Invalid instruction file", "two.ins, found \"head_1\""},
      {"[OUTPUT_MEASURE_FILE] => [FURTHER_FILES]\nTqSEKdxListItemCount = 1\n[FURTHER_FILE_1]\n"
       "File_Name = 'model/b.txt'\nInstruction_File = 'two.ins'\n[/FURTHER_FILE_1]\n[/FURTHER_FILES]\n"
       "[OUTPUT_MEASURE_FILE]",
       "Instruction file of the output-measure file not defined", "since there are FURTHER_FILES"},
      {"MeasurementNo = 3 => Measurement_Name = 'head_2'", "Measurement No. invalid for output measure Written",
       "or Instruction_File in OUTPUT_MEASURE_FILE"},
      {listed + "'none.ins'\nInstruction_Dates = 'YYYYMM'", "Invalid instruction file",
       "Instruction_File: none.ins: No such file"},
      {listed + "'no.ins'\nInstruction_Dates = 'YYYYMM'", "Invalid instruction file",
       "Instruction_File: no.ins:3:1: expected a line to begin with"},
      {listed + "'two.ins'", "Invalid instruction file",
       "setup.kdx:72:20: Instruction_File: expected one way of telling the times of its numbers beside it"},
      {listed + "'two.ins'\nInstruction_Times = 'none.csv'", "Invalid times of the numbers in a listing",
       "setup.kdx:73:21: Instruction_Times: none.csv: No such file"},
      {listed + "'two.ins'\nInstruction_Dates = 'YYYY'", "Invalid times of the numbers in a listing",
       "Instruction_Dates: expected MM in the form of dates, found \"YYYY\""},
      {listed + "'two.ins'\nInstruction_Start = 2001-01-01\nInstruction_Step = 0.0",
       "Step of the numbers in a listing invalid for output measure Flow error",
       "expected greater than 0 and at most 1000000, found 0"},
      // Tasks
      {"Option = 2 => 0 & TqSEKdxListItemCount = 1\n      [SCENARIO_1] => 0\n      [SCENARIO_1]",
       "No scenario runs defined", ""},
      {"Option = 2 => 0 & 412.5, 1, 99 => 412.5, 1", "Invalid number of parameter values in SCENARIO_1",
       "each of the 3 parameters, found 2"},
      {"Option = 2 => 0 & 412.5, 1, 99 => 412.5, 1, 99, 7", "Invalid number of parameter values in SCENARIO_1",
       "each of the 3 parameters, found 4"},
      {"Option = 2 => 0 & 412.5, 1, 99 => 412.5, 1.01, 99", "Value for parameter Rate in SCENARIO_1 out of bounds",
       "value 2: expected 0 to 1, found 1.01"},
      {"Option = 2 => 1 & Perturbation_Fraction = 0.02 => 0.75",
       "Perturbed value for parameter Depth in local sensitivity analysis out of bounds",
       "0.75 of the range, from 412.5, leaves the bounds 100 to 900 both ways (logarithms)"},
      {"Upper_Bound = 1.0 => 0.31 & Lower_Bound = 0.0 => 0.31", "Lower bound equal to upper bound for parameter Rate",
       "expected more than 0.31 for a search by SCE, PSE, OPSE, CMA-ES, GLM or NSGA-II; Parameter_Type = 1 fixes a "
       "parameter"},
      {"Algorithm_Type = 1 => 'GLM' & Transformation_Type = 1 => 2",
       "Integer parameter Depth in a search by derivatives",
       "expected 0 or 1 for GLM, found an integer parameter, by which there are no derivatives; Parameter_Type = 1"},
      {"Algorithm_Type = 1 => 0 & No_Points_Subcomplex = 6 => 8",
       "No. of points in a subcomplex in SCE algorithm invalid", "at most the 7 points of a complex, found 8"},
      {"No_Points_Simplex = 5 => 21", "No. of points in a simplex in PSE algorithm invalid", "at most the 20 points"},
      {"Prob_Contraction = 0.4 => 0.5",
       "Sum of probabilities for reflection and contraction in PSE algorithm larger than 1", "found 0.6 + 0.5"},
      {"Algorithm_Type = 1 => 'OPSE' & No_Points_Simplex = 3 => 13",
       "No. of points in a simplex in OPSE algorithm invalid", "at most the 12 points"},
      {"Algorithm_Type = 1 => 2 & NoSimultaneousSim = 4 => 1 & Max_No_Evaluations = 500 => 0",
       "Maximum No. of model evaluations in DDS algorithm invalid", ""},
      {"'sample.txt' => '/dev/zero'", "Unable to open /dev/zero", "Not a regular file"},
      {earlier + "'none.dat'", "Unable to open none.dat", "Earlier_Result_File: "},
      {earlier + "'setup_Optimisation.dat'", "Earlier result file invalid",
       "expected another file than the one that this run writes: copy it"},
      {earlier + "'other.dat'", "Earlier result file invalid",
       "other.dat:1: expected the variable parameters of this setup, found no \"Rate\" and in their place \"Rise\""},
      {earlier + "'earlier.dat'", "Earlier result file invalid",
       "earlier.dat: no set lies within the bounds; the first: earlier.dat:2: Depth = 99"},
      {earlier + "'setup_Optimisation.dat'\nEarlier_Result_Sets = 0", "No. of sets of the earlier result file invalid",
       "expected 1 or more, found 0"},
      {"Initial_Sample_Generation = 4 => Initial_Sample_Generation = 4\nEarlier_Result_File = 'other.dat'",
       "Earlier result file invalid",
       "expected this or Initial_Sample_Generation = 4, found both. Leave out the latter"},
      {"'sample.txt' => '' & Initial_Sample_Generation = 4 => Initial_Sample_Generation = 4\nEarlier_Result_File = "
       "'other.dat'",
       "Earlier result file invalid",
       "setup.kdx:143:23: Earlier_Result_File: expected this or Initial_Sample_Generation = 4"},
      {"Algorithm_Type = 1 => 'PDDS' & [SURROGATE_MODEL_PARAMETERS] => [X] & [/SURROGATE_MODEL_PARAMETERS] => [/X]",
       "Unable to open section SURROGATE_MODEL_PARAMETERS in KDX file",
       "Use_Surrogate_Model: Parallel Dynamically Dimensioned Search uses no surrogate model: expected 0"},
      {"Algorithm_Type = 1 => 3", "Invalid optimisation algorithm type selection",
       "expected 0 to 2 or one of the names 'SCE', 'PSE', 'DDS', 'PDDS', 'OPSE', 'CMA-ES', 'GLM', 'NSGA-II', 'PADDS', "
       "found 3"},
      {"'sample.txt' => ''", "Unable to open ", "expected the name of a file, found a blank text"},
      {"'sample.txt' => 'none.txt'", "Unable to open none.txt", "No such file"},
      {"Neighbourhood_Size = 60 => 5 & Sampling_rate = 30 => 0",
       "Invalid neighbourhood size for surrogate modelling optimisation",
       "at least the 6 coefficients of a quadratic polynomial in 2 parameters, or 0"},
      {"Neighbourhood_Size = 60 => 61",
       "Population size and/or initial No. of generations too small for surrogate modelling optimisation",
       "Neighbourhood_Size = 61 evaluated sets before the surrogate is fitted, found 60"},
      {"Algorithm_Type = 1 => 2", "Use Population Simplex Evolution algorithm for application with multiple processors",
       "expected 1 with this Algorithm_Type, found 4; several model runs at a time: Algorithm_Type = 'PSE', "
       "'PDDS', 'OPSE', 'CMA-ES', 'GLM', 'NSGA-II' or 'PADDS', or a job of several processes (MPI), in which SCE runs "
       "one proposal of each "
       "complex at once"},
      {"Algorithm_Type = 1 => 0", "Use Population Simplex Evolution algorithm for application with multiple processors",
       "found 4; several model runs at a time: Algorithm_Type = 'PSE', 'PDDS', 'OPSE', 'CMA-ES', 'GLM', 'NSGA-II' or "
       "'PADDS', or a job of "
       "several "
       "processes "
       "(MPI)"},
      {"Algorithm_Type = 1 => 'PDDS' & Max_No_Evaluations = 500 => 0",
       "Maximum No. of model evaluations in PDDS algorithm invalid", ""},
      // Scale and location that nothing can give
      {"Option = 2 => 3 & Aggregation_Method = 0 => 1",
       "Standard deviation and location not defined for objective function Flow",
       "Standard_Deviation: expected the keyword, which aggregation method 1 needs"},
      {"Algorithm_Type = 1 => 2 & Aggregation_Method = 0 => 2 & Weight = 0.75 => Standard_Deviation = 2.5",
       "Standard deviation and location not defined for objective function Flow", "Location: expected"},
      // The texts of ranges, by one value each: the rows of the keywords are held to themselves below.
      {"Transformation_Type = 1 => 3", "Transformation type invalid for parameter Depth",
       "setup.kdx:29:29: Transformation_Type: expected 0 to 2, found 3"},
      {"Parameter_Type = 0 => -1", "Parameter type invalid for parameter Depth", ""},
      {"Logical_Operator = 1 => 4", "Invalid logical operator in CONSTRAINT_1", ""},
      {"Logical_Operator = 1 => '=='", "Unable to read keyword in section CONSTRAINT_1 in KDX file",
       "found the text \"==\"; what must be equal needs two constraints, '<=' and '>='"},
      {"Logical_Operator = 1 => '<>'", "Unable to read keyword in section CONSTRAINT_1 in KDX file",
       "found the text \"<>\"; what must differ needs the equation abs(left - right) and '>' 0"},
      {"Aggregation_Method = 0 => 4", "Objective function aggregation method invalid", ""},
      {"Interface_Type = 0 => 2", "Interface type invalid for output measure Flow error", ""},
      {"Statistic_Type = 1 => 5", "Statistic type invalid for output measure Flow error", ""},
      {"Weight_Above = 2.5 => -2.5", "Weight invalid for output measure Flow error", "setup.kdx:68:24: Weight_Above: "},
      {"Function_Type = 2 => 3", "Function type invalid for objective function Flow", ""},
      {"Weight = 0.75 => -0.75", "Weight invalid for objective function Flow", ""},
      {"Option = 2 => 0 & Scenario_Type = 1 => 2", "Invalid scenario type selection", ""},
      {"Option = 2 => 1 & Sensitivity_Type = 0 => 1", "Invalid sensitivity type selection", ""},
      {"Option = 2 => 1 & Differencing = 1 => 2", "Differencing option in local sensitivity analysis invalid", ""},
      {"Option = 2 => 1 & Perturbation_Option = 0 => 2", "Perturbation option in local sensitivity analysis invalid",
       ""},
      {"Option = 2 => 1 & Perturbation_Fraction = 0.02 => 0",
       "Perturbation fraction in local sensitivity analysis invalid", ""},
      {"Algorithm_Type = 1 => 3", "Invalid optimisation algorithm type selection", ""},
      {"Algorithm_Type = 1 => 0 & No_Complexes = 4 => 0", "No. of complexes in SCE algorithm invalid", ""},
      {"Algorithm_Type = 1 => 0 & No_Points_Complex = 7 => 1", "No. of points in a complex in SCE algorithm invalid",
       ""},
      {"Algorithm_Type = 1 => 0 & No_Points_Subcomplex = 6 => 1",
       "No. of points in a subcomplex in SCE algorithm invalid", ""},
      {"Algorithm_Type = 1 => 0 & No_Evaluation_Steps = 8 => 0", "No. of evaluation steps in SCE algorithm invalid",
       ""},
      {"Population_Size = 20 => 0", "Population size in PSE algorithm invalid", ""},
      {"No_Points_Simplex = 5 => 1", "No. of points in a simplex in PSE algorithm invalid", ""},
      {"Prob_Reflection = 0.6 => 1.1", "Probability for reflection step in PSE algorithm invalid", ""},
      {"Prob_Contraction = 0.4 => -0.1", "Probability for contraction step in PSE algorithm invalid", ""},
      {"Algorithm_Type = 1 => 2 & NoSimultaneousSim = 4 => 1 & Perturbation_Parameter = 0.25 => 1.01",
       "Perturbation parameter in DDS algorithm invalid", ""},
      {"Initial_Sample_Generation = 4 => 5", "Initial sample generation method invalid", ""},
      {"Max_No_Evaluations = 500 => 0", "Maximum No. of model evaluations invalid", ""},
      {"No_Loops_Convergence = 12 => 0", "No. of loops for evaluation of convergence criterion invalid", ""},
      {"Min_Change = 0.005 => -0.005", "Minimum change convergence criterion invalid", ""},
      {"Min_Change = 0.005 => Min_Change = 0.005\nMin_Population_Range = -1e-9",
       "Minimum population range convergence criterion invalid", ""},
      {"Min_Change = 0.005 => Min_Change = 0.005\nMin_Population_Range = 1.1",
       "Minimum population range convergence criterion invalid", "0 to 1"},
      {"Model_Type = 0 => 2", "Invalid model type for surrogate modelling optimisation", ""},
      {"Neighbourhood_Size = 60 => -1", "Invalid neighbourhood size for surrogate modelling optimisation", ""},
      {"Sampling_rate = 30 => 101", "Invalid sampling rate for surrogate modelling optimisation", ""},
      {"Sampling_rate = 30 => Sampling_rate = 30\nCheck_Interval = -1",
       "Invalid check interval for surrogate modelling optimisation", "0 or more"},
      {"Sampling_rate = 30 => Sampling_rate = 30\nCheck_Interval = 1",
       "Invalid check interval for surrogate modelling optimisation", "with 1 the surrogate is never used"},
      {"Prob_Reflection = 0.6 => Prob_Reflection = 0.6\nProb_Expansion = 1.1",
       "Probability for expansion step in PSE algorithm invalid", "0 to 1"},
      {"No_Initial_Generations = 2 => 0", "Invalid no of initial generations for surrogate modelling optimisation", ""},
      {"Option = 2 => 3 & Uncertainty_Type = 1 => 2", "Invalid uncertainty estimation type selection", ""},
      {"Population_Size = 20 => 2147483647 & Max_No_Evaluations = 500 => 2147483647",
       "Unable to allocate memory in MIREVO setup",
       "expected at most 10000000 sets of 2 parameters, as all are in memory, found Population_Size = 2147483647 and"},
      {"Option = 2 => 3 & Sample_Size = 200 => 10000001", "Sample size in uncertainty estimation invalid",
       "Sample_Size: expected at most 10000000 sets"},
      {"Option = 2 => 3 & Sample_Size = 200 => Sample_Size = 200\nBand_End_Date = 2004-01-01",
       "End date of the bands invalid", "expected Band_Times = 'steps' beside it"},
      {"Option = 2 => 3 & Sample_Size = 200 => Sample_Size = 200\nBand_Times = 'steps'\nBand_End_Date = 2003-12-31",
       "End date of the bands invalid", "expected the end of the evaluation period, 2003-12-31 24:00, or later, found"},
      {"Option = 2 => 3 & Sample_Size = 200 => 1", "Sample size in uncertainty estimation invalid", ""},
      {"Option = 2 => 3 & Standard_Deviation = 0.3 => 0.0", "Standard deviation in uncertainty estimation invalid", ""},
      {"NoSimultaneousSim = 4 => 0", "Invalid No. of processes", ""},
  };
  for (const auto& [edits, wanted, detail] : cases) {
    const std::string error = failure(edits);
    const std::string message = error.substr(0, error.find('\n'));
    SCOPED_TRACE(edits);
    // The base folder at the end of a message is this machine's.
    EXPECT_THAT(message, StartsWith("Error: " + wanted));
    EXPECT_TRUE(wanted.ends_with(' ') || message.size() == wanted.size() + 7) << message;
    EXPECT_THAT(error.substr(std::min(error.size(), message.size() + 1)), HasSubstr(detail));
    EXPECT_THAT(error, HasSubstr("\nsetup.kdx:")) << "every refusal names its place";
  }
}

/// A keyword row and the setup in which its section is read.
using RowInSetup = std::tuple<const SectionRow*, const KeywordRow*, std::string>;

/// Every keyword of every section that some setup reads.
std::vector<RowInSetup> rowsInSetups(const std::string& setup) {
  static const std::pair<std::string_view, const char*> kOptions[] = {
      {"SCENARIOS", "0"}, {"SENSITIVITY_ANALYSIS", "1"}, {"UNCERTAINTY_ESTIMATION", "3"}};
  static const std::pair<std::string_view, const char*> kAlgorithms[] = {
      {"SCE_", "0"},          {"DDS_", "2"},     {"PDDS_", "'PDDS'"},      {"OPSE_", "'OPSE'"},
      {"CMAES_", "'CMA-ES'"}, {"GLM_", "'GLM'"}, {"NSGAII_", "'NSGA-II'"}, {"PADDS_", "'PADDS'"}};
  // Forms of the sensitivity analysis with a section of their own, and what that needs.
  static const std::tuple<std::string_view, const char*, const char*> kForms[] = {
      {"MORRIS", "'Morris'", ""}, {"SOBOL", "'Sobol'", "Sample_Size = 64\n"}};
  std::vector<RowInSetup> found;
  for (const SectionRow* section : setupSchema().sections()) {
    // Which keywords of these are read depends on others of them: tests/run/tasks/distribution_reading_test.cpp.
    const bool isOfDistributions = section->path.ends_with("Y_ESTIMATION/PARAMETER_n") ||
                                   section->path.ends_with("Y_ANALYSIS/PARAMETER_n") ||
                                   section->path.find("/CORRELATIONS") != std::string_view::npos;
    // Its keywords are those of DREAM.
    const bool isOfOneMeasure = section->path.ends_with("/ERROR_MODEL_n");
    if (isOfDistributions || isOfOneMeasure) continue;
    std::string text = setup;
    for (const auto& [start, option] : kOptions) {
      if (section->path.starts_with(start)) {
        text = SetupFixture::withValue(text, "MIREVO_SIMULATION_OPTION", "Option", option);
      }
    }
    if (section->path.ends_with("/GLUE")) {
      text = SetupFixture::withValue(text, "UNCERTAINTY_ESTIMATION", "Uncertainty_Type", "'GLUE'");
      text = SetupFixture::withValue(text, "ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_n", "Statistic_Type", "'NSE'");
    }
    if (section->path.starts_with("UNCERTAINTY_ESTIMATION")) {
      text.insert(text.find("  [/UNCERTAINTY_ESTIMATION]"), "[DREAM]\nLikelihood = 'normal'\n[/DREAM]\n");
    }
    if (section->path.ends_with("/DREAM")) {
      text = SetupFixture::withValue(text, "UNCERTAINTY_ESTIMATION", "Uncertainty_Type", "'DREAM'");
    }
    for (const auto& [start, algorithm] : kAlgorithms) {
      if (section->path.find(start) == std::string_view::npos) continue;
      text = SetupFixture::withValue(text, "OPTIMISATION_ALGORITHM", "Algorithm_Type", algorithm);
      text = SetupFixture::withValue(text, "SimultaneousSimulations", "NoSimultaneousSim", "1");
    }
    for (const auto& [name, form, needed] : kForms) {
      if (!section->path.starts_with("SENSITIVITY_ANALYSIS")) continue;
      const std::string end = "[/LOCAL_SA]\n";
      text.insert(text.find(end) + end.size(), fmt::format("[{0}]\n{1}[/{0}]\n", name, needed));
      if (section->path != fmt::format("SENSITIVITY_ANALYSIS/{}", name)) continue;
      text = SetupFixture::withValue(text, "SENSITIVITY_ANALYSIS", "Sensitivity_Type", form);
    }
    for (const KeywordRow& row : section->keywords) {
      if (row.store != nullptr) found.push_back({section, &row, text});
    }
  }
  return found;
}

TEST_F(ValidationTest, RefusesNumbersOutsideTheRangeOfTheirRow) {
  int checked = 0;
  for (const auto& [section, row, text] : rowsInSetups(edited(""))) {
    const KeywordFacts& facts = row->facts;
    if (section->path.ends_with("/DREAM")) {
      EXPECT_EQ(facts.refusal.empty(), facts.range.text().empty()) << facts.name << ": nothing keeps its range";
    }
    if (facts.range.text().empty()) continue;
    if (facts.refusal.empty() && row->check != nullptr) continue;  // judged together with others
    const bool isReal = row->type == KeywordType::real;
    const double below = facts.range.lowestExcluded ? facts.range.lowest : facts.range.lowest - (isReal ? 1e-9 : 1);
    for (const double value : {below, facts.range.highest + (isReal ? 1e-6 : 1)}) {
      if (!std::isfinite(value)) continue;
      SCOPED_TRACE(fmt::format("{} {} = {}", section->path, facts.name, value));
      const std::string number = isReal ? fmt::format("{:.15g}", value) : fmt::format("{:.0f}", value);
      const std::string error = failureOf(withValue(text, section->path, facts.name, number));
      EXPECT_THAT(error,
                  StartsWith(facts.refusal.empty() ? "Error: Unable to read keyword" : std::string(facts.refusal)));
      EXPECT_THAT(error, AllOf(HasSubstr(fmt::format("{}: expected {}", facts.name, facts.range.text())),
                               HasSubstr(", found ")));
      EXPECT_THAT(error, HasSubstr("\nsetup.kdx:")) << "every refusal names its location";
      ++checked;
    }
  }
  EXPECT_GT(checked, 90);
}

/// Searches for a front need two objective functions.
std::string withSecondObjective(std::string text) {
  text = SetupFixture::withValue(text, "ObjectiveFunctions/OBJECTIVE_FUNCTIONS", "TqSEKdxListItemCount", "2");
  const auto end = text.find("[/OBJECTIVE_FUNCTIONS]");
  return text.insert(end, "[OBJECTIVE_2]\nName = 'Another'\nFunction_Type = 0\nWeight = 1.0\n[/OBJECTIVE_2]\n");
}

TEST_F(ValidationTest, CodesAreTakenByNumberOrByName) {
  const auto firstLine = [](const std::string& text) { return text.substr(0, text.find('\n')); };
  int compared = 0;
  for (const auto& [section, row, text] : rowsInSetups(withSecondObjective(edited("")))) {
    if (row->type != KeywordType::code) continue;
    SCOPED_TRACE(std::string(section->path) + " " + std::string(row->name()));
    for (const CodeName& code : row->facts.codes) {
      std::string shouted(code.name);
      for (char& c : shouted) c = static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
      const bool needsOrigin = row->name() == "Time_Unit";
      const std::string byName = withValue(text, section->path, row->name(),
                                           "' " + shouted + " '" + (needsOrigin ? "\nTime_Origin = 2001-01-01" : ""));
      if (!code.code) {
        EXPECT_EQ(failureOf(byName), "");
        continue;
      }
      const std::string byNumber = withValue(text, section->path, row->name(), std::to_string(*code.code));
      EXPECT_EQ(firstLine(failureOf(byName)), firstLine(failureOf(byNumber)));
      EXPECT_EQ(logOfText(byName), logOfText(byNumber));
      ++compared;
    }
    const bool hasNumbers = row->facts.codes.front().code.has_value();  // all have one, or the first has none
    for (const auto& [wrong, message, verb] :
         {std::tuple{hasNumbers ? "'nonesuch'" : "1", "Error: Unable to read keyword in section ", ": expected"},
          {"2.0", "Error: Unable to read keyword in section ", ": expected"},
          {"nonesuch", "Error: Unable to open ", " takes"}}) {
      const std::string error = failureOf(withValue(text, section->path, row->name(), wrong));
      EXPECT_THAT(error, StartsWith(message));
      EXPECT_THAT(error, HasSubstr(fmt::format("{}{} {}one of the names '{}'", row->name(), verb,
                                               hasNumbers ? "an integer within 32 bits or " : "",
                                               row->facts.codes.front().name)));
    }
  }
  EXPECT_GT(compared, 40);
  const std::string wanted =
      "an integer within 32 bits or one of the names 'scenarios', 'sensitivity', 'optimisation', 'uncertainty', ";
  EXPECT_THAT(failure("Option = 2 => 'optimsation'"),
              HasSubstr("setup.kdx:3:14: Option: expected " + wanted +
                        "found the text \"optimsation\", did you mean 'optimisation'?"));
  EXPECT_THAT(failure("Option = 2 => 2.0"), HasSubstr("Option: expected " + wanted + "found 2.0"));
  EXPECT_THAT(failure("Option = 2 => Optimisation  // a search"),
              HasSubstr("setup.kdx:3:14: expected a number, a date or a text between quotes, found \"Optimisation\"; "
                        "Option takes " +
                        wanted + "did you mean 'optimisation'?"));
  EXPECT_THAT(logOf("Algorithm_Type = 1 => 'pse'"), HasSubstr("  Algorithm_Type = 1 ('PSE')\n"));
}

TEST_F(ValidationTest, AcceptsTheValuesAtTheEdgeOfWhatIsValid) {
  folder_.write("setup.txt", "#!/bin/sh\n");  // an ending that no model setup has
  const char* const cases[] = {
      "'model\\run.sh' => 'setup.txt'",
      "No_Points_Simplex = 5 => 20",
      "Algorithm_Type = 1 => 0 & NoSimultaneousSim = 4 => 1 & No_Points_Subcomplex = 6 => 7",
      "Algorithm_Type = 1 => 2 & NoSimultaneousSim = 4 => 1 & Perturbation_Parameter = 0.25 => 0",
      "Algorithm_Type = 1 => 2 & NoSimultaneousSim = 4 => 1 & Perturbation_Parameter = 0.25 => 1",
      "Algorithm_Type = 1 => 2 & NoSimultaneousSim = 4 => 1 & Upper_Bound = 1.0 => 0.31 & Lower_Bound = 0.0 => 0.31",
      "Upper_Bound = 1.0 => Upper_Bound = 0.31\nTransformation_Type = 2 & Lower_Bound = 0.0 => 0.31",
      "Min_Change = 0.005 => 0",
      "Min_Change = 0.005 => Min_Change = 0.005\nMin_Population_Range = 0",
      "Weight = 1.25 => 0 & Weight_Above = 2.5 => 0 & Weight = 0.75 => 0",
      "Sampling_rate = 30 => 100",
      "Sampling_rate = 30 => Sampling_rate = 30\nCheck_Interval = 2",
      "Prob_Reflection = 0.6 => Prob_Reflection = 0.6\nProb_Expansion = 1",
      "Neighbourhood_Size = 60 => 6",
      "Neighbourhood_Size = 60 => 0",
      "Lower_Bound = 100 => 412.5",
      "Upper_Bound = 900 => 412.5 & Lower_Bound = 100 => 100",
      "'2003-12-31 24:00' => 2001-01-31T00:00",
      "'2003-12-31 24:00' => 2003-12-31 23:60",
      "'model/soil.tpl' => 'model/blank.tpl'\nFileType = 1",
      "TqSEKdxListItemCount = 1\n    [OUTPUT_FILE_1] => 0\n    [OUTPUT_FILE_1]",
      "Function_Name = 'Flow' => ''",
      "Aggregation_Method = 0 => 2",
      "Aggregation_Method = 0 => 3 & Option = 2 => 0",
      "Option = 2 => 0 & Aggregation_Method = 0 => 1 & Weight = 0.75 => Standard_Deviation = 1.0\nLocation = -2",
      "Option = 2 => 0 & 412.5, 1, 99 => 100, 1, -99",
      "Option = 2 => 0 & Scenario_Type = 1 => 0 & 412.5, 1, 99 => 1",
      "Option = 2 => 1 & Perturbation_Fraction = 0.02 => 0.6",
      "Option = 2 => 3",
      "Option = 2 => 3 & Sample_Size = 200 => 2",
  };
  for (const char* edits : cases) EXPECT_EQ(failure(edits), "") << edits;
}

}  // namespace
}  // namespace mirevo

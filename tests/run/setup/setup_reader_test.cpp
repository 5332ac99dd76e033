#include "run/setup/setup_reader.h"

#include <utility>

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "algorithms/searches/population_method.h"
#include "matchers.h"
#include "run/setup_fixture.h"
#include "run/tasks/optimisation_task.h"

namespace mirevo {
namespace {

using SetupReaderTest = SetupFixture;

// What the summary of the setup tells is tested there.
TEST_F(SetupReaderTest, FillsTheConfigurationOfAnOptimisation) {
  const RunConfig config = read();
  EXPECT_EQ(config.setupName, "setup");
  EXPECT_EQ(config.setupFolder, folder_.path());
  EXPECT_EQ(config.batchItems.at(0).batchFileName, folder_ / "model/run.sh") << "backslash";
  EXPECT_EQ(config.baseFolder, folder_ / "model");
  ASSERT_EQ(config.parameters.size(), 3U);
  EXPECT_THAT(config.parameters[0].keyLines, ElementsAre("soil", "depth"));
  EXPECT_EQ(config.parameters[2].idValue, 1.5e-35);
  EXPECT_EQ(config.measures.at(0).simulation.itemNo, 2);
  EXPECT_EQ(config.measures.at(0).observation.fileName, folder_ / "gauge.csv");
  EXPECT_EQ(config.measures.at(1).measurementNo, 3);
  EXPECT_THAT(config.objectives.at(0).measures, ElementsAre(0U));
  EXPECT_EQ(config.measureFile, folder_ / "model/measures.txt");
  const auto& task = dynamic_cast<const OptimisationTask&>(*config.task);
  EXPECT_EQ(task.method->populationSize(), 20);
  EXPECT_EQ(dynamic_cast<const SimplexMethod&>(*task.method).simplex.pointCount, 5);
  EXPECT_THAT(read("Option = 2 => 0").parameters[0].givenValues, ElementsAre(412.5));
}

TEST_F(SetupReaderTest, RefusesWhatCannotBeReadAndSaysWhere) {
  const std::string longText(256, 'x');
  const auto title = [](const std::string& text) { return "'Upper catchment   ' => '" + text + "'"; };
  // The section whose keyword cannot be read, and what follows "setup.kdx:".
  const std::tuple<std::string, const char*, const char*> keywords[] = {
      {"    Option = 2 => ", "MIREVO_SIMULATION_OPTION",
       "2:3: Option: the keyword is missing in section MIREVO_SIMULATION_OPTION"},
      {"Lower_Bound = 6.5 => Lower_Bond = 6.5", "PARAMETER_3",
       "39:5: Lower_Bound: the keyword is missing in section MODEL_PARAMETERS/PARAMETER_3; found \"Lower_Bond\", did "
       "you mean \"Lower_Bound\"?"},
      {"Weight_Above = 2.5 => Weigth_Above = 2.5", "MEASURE_1",
       "68:9: Weight_Above: the keyword is missing, which would mean 1.0; found \"Weigth_Above\", did you mean "
       "\"Weight_Above\"?"},
      {"    KeyLine = 'soil' => Keyline = 'soil' & KeyLine = 'depth' => ", "Keywords",
       "23:5: KeyLine: the keyword is missing, which would mean ''; found \"Keyline\", did you mean \"KeyLine\"?"},
      {"TqSEKdxListItemCount = 3 => ", "MODEL_PARAMETERS",
       "19:3: TqSEKdxListItemCount: the keyword is missing in section MODEL_PARAMETERS"},
      {"TqSEKdxListItemCount = 3 => -3", "MODEL_PARAMETERS",
       "20:5: TqSEKdxListItemCount: expected 0 or more, found -3"},
      {"Max_No_Evaluations = 500 => 2.0", "STOPPING_CRITERIA",
       "146:28: Max_No_Evaluations: expected an integer within 32 bits, found 2.0"},
      {"Max_No_Evaluations = 500 => 2147483648", "STOPPING_CRITERIA",
       "146:28: Max_No_Evaluations: expected an integer within 32 bits, found 2147483648"},
      {"Option = 2 => 2, 3", "MIREVO_SIMULATION_OPTION", "3:17: Option: expected one value, found 2"},
      {"Initial_Value = 412.5 => 412,5", "PARAMETER_1",
       "26:27: Initial_Value: expected one value, found 2: numbers have a decimal point, a comma separates values"},
      {"'Upper catchment   ' => 2001-01-31", "MIREVO_SIMULATION_OPTION",
       "4:13: Title: expected a text between quotes, found the date 2001-01-31 00:00"},
      {title(longText), "MIREVO_SIMULATION_OPTION", "4:13: Title: expected a text of at most 255 bytes, found 256"},
      {"'Depth'\n    [/P => ' '\n    [/P", "PARAMETER_1", "31:24: Parameter_Name: expected a name, found a blank text"},
      {"'Depth'\n    [/P => 'a\tb'\n    [/P", "PARAMETER_1",
       "31:24: Parameter_Name: expected a name without tabs, which separate the columns of the results"},
      {"2001-01-31 => 'January'", "ObjectiveFunctions",
       "58:18: Start_Date: expected a date such as 2001-01-31 or 2001-01-31 12:30, found the text \"January\""},
      {"412.5, 1, 99 => 412.5, 'one', 99 & Option = 2 => 0", "SCENARIO_1",
       "108:29: Parameters: expected a number, found the text \"one\""},
  };
  for (const auto& [edits, section, detail] : keywords) {
    EXPECT_EQ(failure(edits),
              fmt::format("Error: Unable to read keyword in section {} in KDX file\nsetup.kdx:{}", section, detail));
  }
  const std::pair<const char*, const char*> others[] = {
      {"Title = => Title", " setup.kdx\nsetup.kdx:4:11: expected '=' after keyword \"Title\""},
      {"[MIREVO_PARAMETERS] => [MIREVO_PARAMETER] & [/MIREVO_PARAMETERS] => [/MIREVO_PARAMETER]",
       " section MIREVO_PARAMETERS in KDX file\nsetup.kdx: expected section [MIREVO_PARAMETERS] in the file; found "
       "\"MIREVO_PARAMETER\", did you mean \"MIREVO_PARAMETERS\"?"},
      {"[SIMPARAM] => [SIMPARAMS] & [/SIMPARAM] => [/SIMPARAMS]",
       " section SIMPARAM in KDX file\nsetup.kdx:2:3: expected section [SIMPARAM] in section MIREVO_SIMULATION_OPTION; "
       "found \"SIMPARAMS\", did you mean \"SIMPARAM\"?"},
      {"TqSEKdxListItemCount = 3 => 4",
       " section PARAMETER_4 in KDX file\nsetup.kdx:19:3: expected section [PARAMETER_4] in section MODEL_PARAMETERS\n"
       "setup.kdx:20:28: TqSEKdxListItemCount is 4, and there are here: PARAMETER_1, PARAMETER_2, PARAMETER_3"},
      {"[SIMPARAMITEM_1] => [Item] & [/SIMPARAMITEM_1] => [/Item] & [STOPPING_CRITERIA] => [Stops] & "
       "[/STOPPING_CRITERIA] => [/Stops]",
       " section SIMPARAMITEM_1 in KDX file\nsetup.kdx:11:5: expected section [SIMPARAMITEM_1] in section SIMPARAM\n"
       "setup.kdx:12:30: TqSEKdxListItemCount is 1, and there are here: none\nsections to add:\n   in "
       "[MIREVO_SIMULATION_OPTION/SIMPARAM]:\n   [SIMPARAMITEM_1]\n     ParamFileName = ...\n     TemplateFileName = "
       "...\n   [/SIMPARAMITEM_1]\n   in [OPTIMISATION_ALGORITHM]:\n   [STOPPING_CRITERIA]\n     "
       "Max_No_Evaluations = ...\n   [/STOPPING_CRITERIA]"},
      {"TqSEKdxListItemCount = 3 => 4 & [MEASURE_1] => [First] & [/MEASURE_1] => [/First]",
       " section PARAMETER_4 in KDX file\nsetup.kdx:19:3: expected section [PARAMETER_4] in section MODEL_PARAMETERS\n"
       "setup.kdx:20:28: TqSEKdxListItemCount is 4, and there are here: PARAMETER_1, PARAMETER_2, PARAMETER_3\n"
       "missing, too, in [ObjectiveFunctions/OUTPUT_MEASURES]: [MEASURE_1]"},
      {"[SimultaneousSimulations] => [Simultaneous] & [/SimultaneousSimulations] => [/Simultaneous]",
       " section SimultaneousSimulations in KDX file\nsetup.kdx:1:1: expected section [SimultaneousSimulations] in "
       "section MIREVO_PARAMETERS\nsections to add:\n   in [MIREVO_PARAMETERS]:\n   [SimultaneousSimulations]\n   "
       "[/SimultaneousSimulations]"},
      {"[SIMBATCH] => [B] & [/SIMBATCH] => [/B] & [SIMPARAM] => [SIMPARAMS] & [/SIMPARAM] => [/SIMPARAMS] & "
       "[MODEL_PARAMETERS] => [Model_Parameters] & [/MODEL_PARAMETERS] => [/Model_Parameters]",
       " section SIMBATCH in KDX file\nsetup.kdx:2:3: expected section [SIMBATCH] in section MIREVO_SIMULATION_OPTION\n"
       "sections to add:\n   in [MIREVO_SIMULATION_OPTION]:\n   [SIMBATCH]\n     TqSEKdxListItemCount = ...\n     "
       "[SIMBATCHITEM_1]\n       BatchFileName = ...\n     [/SIMBATCHITEM_1]\n   [/SIMBATCH]\n"
       "misspelt, too, in [MIREVO_SIMULATION_OPTION]: found \"SIMPARAMS\", did you mean \"SIMPARAM\"?\n"
       "misspelt, too, in [MIREVO_PARAMETERS]: found \"Model_Parameters\", did you mean \"MODEL_PARAMETERS\"?"},
      {"[SAVE_OUTPUT_FILES] => [Saved] & [/SAVE_OUTPUT_FILES] => [/Saved] & [STOPPING_CRITERIA] => [Stops] & "
       "[/STOPPING_CRITERIA] => [/Stops]",
       " section SAVE_OUTPUT_FILES in KDX file\nsetup.kdx:1:1: expected section [SAVE_OUTPUT_FILES] in section "
       "MIREVO_PARAMETERS\nsections to add:\n   in [MIREVO_PARAMETERS]:\n   [SAVE_OUTPUT_FILES]\n   "
       "[/SAVE_OUTPUT_FILES]\n   in [OPTIMISATION_ALGORITHM]:\n   [STOPPING_CRITERIA]\n     Max_No_Evaluations = ...\n "
       "  [/STOPPING_CRITERIA]"},
      {"[SAVE_OUTPUT_FILES] => [Saved] & [/SAVE_OUTPUT_FILES] => [/Saved] & Option = 2 => 3 & [UNCERTAINTY_ESTIMATION] "
       "=> [U] & [/UNCERTAINTY_ESTIMATION] => [/U]",
       " section SAVE_OUTPUT_FILES in KDX file\nsetup.kdx:1:1: expected section [SAVE_OUTPUT_FILES] in section "
       "MIREVO_PARAMETERS\nsections to add:\n   in [MIREVO_PARAMETERS]:\n   [SAVE_OUTPUT_FILES]\n   "
       "[/SAVE_OUTPUT_FILES]\n   in [MIREVO_PARAMETERS]:\n   [UNCERTAINTY_ESTIMATION]\n     Uncertainty_Type = ...\n   "
       " "
       " Sample_Size = ...\n   [/UNCERTAINTY_ESTIMATION]\n   in [UNCERTAINTY_ESTIMATION]:\n   [PARAMETER_1]\n     "
       "Mean_Value = ...\n     Standard_Deviation = ...\n   [/PARAMETER_1]\n   in [UNCERTAINTY_ESTIMATION]:\n   "
       "[PARAMETER_2]\n     Mean_Value = ...\n     Standard_Deviation = ...\n   [/PARAMETER_2]"},
      {"[SAVE_OUTPUT_FILES] => [Saved] & [/SAVE_OUTPUT_FILES] => [/Saved] & [PSE_CONTROL_PARAMETERS] => [P] & "
       "[/PSE_CONTROL_PARAMETERS] => [/P] & [SURROGATE_MODEL_PARAMETERS] => [S] & [/SURROGATE_MODEL_PARAMETERS] => "
       "[/S] & [OBSERVATION_FILE] => [O] & [/OBSERVATION_FILE] => [/O]",
       " section OBSERVATION_FILE in KDX file\nsetup.kdx:63:7: expected section [OBSERVATION_FILE] in section MEASURE_1"
       "\nsections to add:\n   in [ObjectiveFunctions/OUTPUT_MEASURES/MEASURE_1]:\n   [OBSERVATION_FILE]\n     "
       "File_Name = ...\n   [/OBSERVATION_FILE]\n   in [MIREVO_PARAMETERS]:\n   [SAVE_OUTPUT_FILES]\n   "
       "[/SAVE_OUTPUT_FILES]\n   in [OPTIMISATION_ALGORITHM]:\n   [PSE_CONTROL_PARAMETERS]\n     Population_Size = "
       "...\n     "
       "No_Points_Simplex = ...\n   [/PSE_CONTROL_PARAMETERS]\n   in [OPTIMISATION_ALGORITHM]:\n   "
       "[SURROGATE_MODEL_PARAMETERS]\n   "
       "[/SURROGATE_MODEL_PARAMETERS]"},
  };
  for (const auto& [edits, error] : others) EXPECT_EQ(failure(edits), std::string("Error: Unable to open") + error);
  EXPECT_EQ(failure(title(longText.substr(1) + "   ")), "") << "trailing blanks do not count";
  EXPECT_EQ(failure("'Depth + Rate' => 'Depth + Rate + " + std::string(1000, '0') + "'"), "") << "free text";
}

TEST_F(SetupReaderTest, StopsAtTheFirstInvalidValueBeforeLaterSectionsAreRead) {
  const std::tuple<const char*, const char*, const char*> ofParameters[] = {
      {"'Depth + Rate' => 'Depth +'", "Error: Unable to create the expression", "\nsetup.kdx:46:28: "},
      {"'Depth + Rate' => 'Sum + Rate'", "Illegal relationship between dependent parameters 3 and 3",
       "\nsetup.kdx:46:28: Parameter_Equation: the equation of \"Sum\" names itself"},
      {"Parameter_Name = 'Depth' => 'Deep' & 'Depth + Rate' => 'Rate'", "Error: Parameter name Depth in template file",
       "\nsetup.kdx:15:28: TemplateFileName: model/soil.tpl:2:1: "},
  };
  for (const auto& [edits, message, detail] : ofParameters) {
    EXPECT_THAT(failure(edits + std::string(" & [INTERNAL_CONSTRAINTS] => [X] & [/INTERNAL_CONSTRAINTS] => [/X]")),
                AllOf(StartsWith(message), HasSubstr(detail)));
  }
  EXPECT_THAT(
      failure("Aggregation_Method = 0 => 9 & [SAVE_OUTPUT_FILES] => [SAVED] & [/SAVE_OUTPUT_FILES] => [/SAVED]"),
      StartsWith("Error: Objective function aggregation method invalid"));
  EXPECT_THAT(failure("Aggregation_Method = 0 => Minimum_Coverage = 1.1"),
              StartsWith("Error: Minimum coverage invalid"));
  EXPECT_THAT(failure("Aggregation_Method = 0 => Largest_Gap = -1.0"), StartsWith("Error: Largest gap invalid"));
  EXPECT_THAT(failure("Option = 2 => 0 & [OPTIMISATION_ALGORITHM] => [X] & [/OPTIMISATION_ALGORITHM] => [/X] & "
                      "NoSimultaneousSim = 4 => 0"),
              StartsWith("Error: Invalid No. of processes"))
      << "a section that the run does not need may be absent";
}

TEST_F(SetupReaderTest, ASetupInAnotherEncodingIsReadLikeOneInUtf8) {
  const std::string text = edited("'Upper catchment   ' => 'Südliches Gebiet'");
  std::string latin1 = text;
  latin1.replace(latin1.find("ü"), 2, "\xFC");
  const std::string utf8Log = logOfText(text);
  EXPECT_THAT(utf8Log, HasSubstr("  Title = 'Südliches Gebiet'\n"));
  EXPECT_EQ(logOfText(latin1), "Warning: setup.kdx: the text is not UTF-8 and is read as Latin-1\n" + utf8Log);
  std::string utf16 = "\xFF\xFE";
  for (const char c : latin1) (utf16 += c) += '\0';
  EXPECT_EQ(logOfText(utf16), "Warning: setup.kdx: the text is not UTF-8 and is read as UTF-16\n" + utf8Log);
}

TEST_F(SetupReaderTest, EchoesEverySectionAndValueInReadingOrder) {
  const std::string log = logOf("");
  EXPECT_THAT(log, StartsWith("[MIREVO_PARAMETERS]\n"
                              "[MIREVO_SIMULATION_OPTION]\n"
                              "  Option = 2 ('optimisation')\n"
                              "  Title = 'Upper catchment'\n"
                              "  Base_Folder = '' (default)\n"
                              "  Restart = 0 ('no') (default)\n"
                              "  Reuse_Results = 1 ('yes') (default)\n"
                              "  FailedRunFolders = 3 (default)\n"
                              "  Report = 1 ('yes') (default)\n"
                              "  Improvement_Command = '' (default)\n"
                              "  Improvement_Command_Time = 60 (default)\n"
                              "[MIREVO_SIMULATION_OPTION/SIMBATCH]\n"
                              "  TqSEKdxListItemCount = 1\n"
                              "[MIREVO_SIMULATION_OPTION/SIMBATCH/SIMBATCHITEM_1]\n"
                              "  BatchFileName = 'model\\run.sh'\n"
                              "  Arguments = '' (default)\n"
                              "[MIREVO_SIMULATION_OPTION/SIMPARAM]\n"));
  EXPECT_THAT(log, HasSubstr("  KeyLine = 'soil'\n  KeyLine = 'depth'\n"));
  EXPECT_THAT(log, HasSubstr("[MODEL_PARAMETERS/PARAMETER_3]\n"
                             "  Initial_Value = 7\n"
                             "  Lower_Bound = 6.5\n"
                             "  Upper_Bound = 7.5\n"
                             "  Transformation_Type = 0 ('none') (default)\n"
                             "  Parameter_Type = 2 ('dependent')\n"
                             "  Parameter_IDValue = 1.5e-35\n"
                             "  Parameter_Name = 'Sum'\n"
                             "  Parameter_Equation = 'Depth + Rate'\n"
                             "  Comment = '' (default)\n"));
  EXPECT_THAT(log, HasSubstr("  Start_Date = 2001-01-31 00:00\n  End_Date = 2003-12-31 24:00\n"));
}

TEST_F(SetupReaderTest, WarnsOfWhatItDoesNotReadAndOfSettingsThatAreSeldomMeant) {
  folder_.write("same.txt", "Depth Rate\n200 0.5\n200 0.5\n");
  folder_.write("steps.txt", "Depth Rate\n200 0.5\n200.5 0.5\n200 0.5\n");
  folder_.write("earlier.dat", "Evaluation\tStatus\tRate\tDepth\tAggregate\n1\tOK\t1.5\t200\t1\n2\tOK\t0.5\t200\t2\n");
  // warning: none where it is empty
  const std::pair<const char*, const char*> cases[] = {
      {"Weight_Above = 2.5 => Weigth_Abov = 2.5",
       "setup.kdx:68:9: keyword \"Weigth_Abov\" is unknown and not read, did you mean \"Weight_Above\"?"},
      {"Min_Change = 0.005 => Min_Change = 0.005\nMin_Change = 1.0",
       "setup.kdx:149:1: keyword \"Min_Change\" is at line 148 already, this one is not read"},
      {"[SCENARIOS] => [Scenario][/Scenario][SCENARIOS]",
       "setup.kdx:103:3: section \"Scenario\" is unknown and not read, did you mean \"SCENARIOS\"?"},
      {"TqSEKdxListItemCount = 3 => 2",
       "setup.kdx:20:28: TqSEKdxListItemCount: 3 sections PARAMETER_n are here, those beyond 2 are not read: "
       "PARAMETER_3\n"},
      {"Function_Name = 'Flow' => ''",
       "setup.kdx:91:16: Name: no output measure has this Function_Name, the objective function is always 0"},
      {"Use_Surrogate_Model = 1 => 2", "setup.kdx:123:27: Use_Surrogate_Model: neither 0 nor 1, no search will be run"},
      {"Max_No_Evaluations = 500 => 3", "NoSimultaneousSim: only 3 can be used by the evaluations of this run"},
      {"Algorithm_Type = 1 => 'PDDS'", "NoSimultaneousSim: only 2 can be used by the evaluations of this run"},
      {"Option = 2 => 4", "setup.kdx:3:14: Option: no task has this number, nothing will be run"},
      {"[/MIREVO_PARAMETERS] => [/MIREVO_PARAMETERS][MIREVO_PARAMETERS][/MIREVO_PARAMETERS]",
       "a second [MIREVO_PARAMETERS] is not read"},
      {"[SCENARIOS] => [TMEMPARAM]\nTmemOption = 1\n[/TMEMPARAM][SCENARIOS]", ""},
      {"[SCENARIOS] => [SCENARIOS]\nTmemOption = 1\n[TMEMPARAM]\n[/TMEMPARAM]",
       "setup.kdx:104:1: keyword \"TmemOption\" is unknown and not read here, it belongs in [TMEMPARAM]\n"},
      {"[SCENARIOS] => [SCENARIOS]\n[TMEMPARAM]\n[/TMEMPARAM]",
       "setup.kdx:104:1: section \"TMEMPARAM\" is unknown and not read here, it belongs in [MIREVO_PARAMETERS]\n"},
      {"[SCENARIOS] => [TMEMPARAM]\nMaxSimTime = 60.0\n[/TMEMPARAM][SCENARIOS]",
       "setup.kdx:104:1: keyword \"MaxSimTime\" is not used; MaxSimulationTime in [SimultaneousSimulations] limits the "
       "time of a model run"},
      // Settings that are certain not to yield what is wanted.
      {"Function_Type = 2\n        Weight = 0.75 => Function_Type = 2\n        Weight = 0.0",
       "setup.kdx:93:18: Weight: the weights of all objective functions are 0, and so is every aggregate"},
      {"Weight = 1.25 => 0 & Weight_Above = 2.5 => 0",
       "setup.kdx:67:18: Weight: both weights are 0, the measure does not depend on the model"},
      {"Weight_Above = 2.5 => 0", ""},
      {"File_Name = 'gauge.csv' => File_Name = 'model/flow.csv'",
       "setup.kdx:64:16: Name: the observed series is in the file of the simulated one, which the model writes"},
      {"File_Name = 'gauge.csv' => File_Name = 'setup_Saved/2/gauge.csv'",
       "setup.kdx:64:16: Name: the observed series is in setup_Saved, which runs of this setup write, rename or "
       "remove: "},
      {"File_Name = 'gauge.csv' => File_Name = 'setup_Band_1.csv'",
       "the observed series is in setup_Band_1.csv, which"},
      {"File_Name = 'gauge.csv' => File_Name = 'setup_Band_x.csv'", ""},
      {"Initial_Sample_File_Name = 'sample.txt' => 'same.txt'",
       "Initial_Sample_File_Name: its 2 sets are the same: with the initial set the sample has two different points"},
      {"Initial_Sample_File_Name = 'sample.txt' => 'same.txt' & Include_Initial_Parameters = 1 => 0",
       "its 2 sets are the same: a search proposes nothing else among equal points"},
      {"Initial_Sample_File_Name = 'sample.txt' => 'steps.txt' & Transformation_Type = 1 => 2 & "
       "Initial_Value = 412.5 => 412",
       "Initial_Sample_File_Name: 1 of the 3 values of the integer parameter \"Depth\" is between its steps: 200.5 is "
       "not a whole number of steps above Lower_Bound = 100, 200 is taken\n"},
      {"TqSEKdxListItemCount = 1\n      [CONSTRAINT_1] => TqSEKdxListItemCount = 0\n      [CONSTRAINT_1]",
       "TqSEKdxListItemCount: 1 section CONSTRAINT_n is here, those beyond 0 are not read: CONSTRAINT_1"},
      {"Left_Equation = 'Rate' => '(Rate) < Depth' & Right_Equation = 'Depth' => '3'",
       "setup.kdx:51:25: Left_Equation: the value of a comparison is 0 or 1, with which this constraint is always "
       "met: "},
      {"Left_Equation = 'Rate' => '1' & Right_Equation = 'Depth' => 'Rate < Depth'", ""},
      {"Left_Equation = 'Rate' => '1' & Right_Equation = 'Depth' => '3'",
       "setup.kdx:51:25: Left_Equation: no side of the constraint names a parameter"},
      {"Left_Equation = 'Rate' => '2 * (Rate < Depth)' & Right_Equation = 'Depth' => '3'", ""},
      {"Aggregation_Method = 0 => 3",
       "setup.kdx:60:26: Aggregation_Method: makes every aggregate 0: the search cannot tell one set from another"},
      {"Interface_Type = 0 => 1 & Aggregation_Method = 0 => Aggregation_Method = 0\nMinimum_Coverage = 0.5",
       "setup.kdx:61:20: Minimum_Coverage: has no effect, as no output measure compares series"},
      {"Aggregation_Method = 0 => Aggregation_Method = 0\nMinimum_Coverage = 0.5", ""},
      {"Interface_Type = 0 => 1 & Aggregation_Method = 0 => Aggregation_Method = 0\nLargest_Gap = 3.0",
       "setup.kdx:61:15: Largest_Gap: has no effect, as no output measure compares series"},
      {"Aggregation_Method = 0 => Aggregation_Method = 0\n[VALIDATION_PERIODS]\nTqSEKdxListItemCount = 1\n"
       "[VALIDATION_1]\nStart_Date = 2004-01-01\nEnd_Date = 2005-12-31\n[/VALIDATION_1]\n"
       "[/VALIDATION_PERIODS]",
       "setup.kdx:64:14: Start_Date: the validation period overlaps the evaluation period, 2001-01-31 00:00 to "},
      {"Aggregation_Method = 0 => Aggregation_Method = 0\n[VALIDATION_PERIODS]\nTqSEKdxListItemCount = 1\n"
       "[VALIDATION_1]\nStart_Date = 2004-01-02\nEnd_Date = 2005-12-31\n[/VALIDATION_1]\n"
       "[/VALIDATION_PERIODS]",
       ""},
      {"Weight = 0.75 => Weight = 0.75\nStandard_Deviation = 2", "Standard_Deviation: has no effect with Aggregation_"},
      {"Weight = 0.75 => Weight = 0.75\nLocation = 2", "Location: has no effect with Aggregation_Method = 0"},
      {"Parameter_Equation = 'Depth + Rate' => Parameter_Equation = 'Depth + Rate'\nTransformation_Type = 2",
       "Transformation_Type: has no effect on a dependent parameter"},
      {"TqSEKdxListItemCount = 2 => 1",
       "setup.kdx:85:21: File_Name: has no effect, as no output measure has Interface_Type = 1"},
      {"'model/measures.txt' => 'model/measures.txt'\nInstruction_File = 'none.ins' & Interface_Type = 1 => 0 & "
       "Function_Name = '' => [SIMULATION_FILE]\nFile_Name = 'model/flow.csv'\n[/SIMULATION_FILE]\n"
       "[OBSERVATION_FILE]\nFile_Name = 'gauge.csv'\n[/OBSERVATION_FILE]",
       "Instruction_File: not read, as no output measure has Interface_Type = 1"},
      {"'model/flow.csv' => 'model/flow.csv'\nInstruction_Step = 24.0",
       "setup.kdx:72:20: Instruction_Step: has no effect without Instruction_File"},
      {"Initial_Sample_Generation = 4 => Initial_Sample_Generation = 4\nEarlier_Result_Order = 'first'",
       "Earlier_Result_Order: has no effect without Earlier_Result_File"},
      {"'sample.txt' => '' & Initial_Sample_Generation = 4 => Initial_Sample_Generation = 1\nEarlier_Result_File = "
       "'earlier.dat'\nEarlier_Result_Sets = 2",
       "Earlier_Result_File: 1 set is left out, as values lie outside the bounds; the first: "},
      {"'sample.txt' => '' & Initial_Sample_Generation = 4 => Initial_Sample_Generation = 1\nEarlier_Result_File = "
       "'earlier.dat'\nEarlier_Result_Sets = 99",
       "Earlier_Result_Sets: only 19 of 99 sets can be used by a population of 20"},
      {"Aggregation_Method = 0 => 3 & Option = 2 => 0 & NoSimultaneousSim = 4 => 1", ""},
      {"Statistic_Type = 1 => 0 & Function_Type = 2 => 0",
       "setup.kdx:92:25: Function_Type: a sum with a difference that may be negative (\"Flow error\") is the smaller "
       "the further the simulation is below the observation, and the search looks for the smallest: absolute values "
       "or squares are meant for differences"},
      {"Statistic_Type = 1 => 4 & Function_Type = 2 => 0", "Function_Type: a sum with a difference"},
      {"Statistic_Type = 1 => 0", ""},
      {"Function_Type = 2 => 0", ""},
      {"Statistic_Type = 1 => 0 & Function_Type = 2 => 0 & Weight = 1.25 => 0", ""},
      {"Statistic_Type = 1 => 0 & Function_Type = 2 => 0 & Option = 2 => 0 & NoSimultaneousSim = 4 => 1", ""},
      {"Algorithm_Type = 1 => 2 & Use_Surrogate_Model = 1 => 0 & Initial_Value = 412.5 => 100 & Upper_Bound = 900 => "
       "100 & Initial_Value = 0.31D0 => 0 & Upper_Bound = 1.0 => 0 & NoSimultaneousSim = 4 => 1",
       "setup.kdx:28:21: Upper_Bound: the bounds leave one value to every variable parameter: all sets of the search "
       "are the same"},
      {"Algorithm_Type = 1 => 2 & Use_Surrogate_Model = 1 => 0 & Initial_Value = 412.5 => 100 & Upper_Bound = 900 => "
       "100 & NoSimultaneousSim = 4 => 1 & Initial_Sample_Generation = 4 => 0 & 'sample.txt' => ''",
       ""},
      {"Algorithm_Type = 1 => 2 & Use_Surrogate_Model = 1 => 0 & NoSimultaneousSim = 4 => 1",
       "Initial_Sample_Generation: 4 has no effect: Dynamically Dimensioned Search starts from the initial values "
       "alone"},
      {"Algorithm_Type = 1 => 2 & Use_Surrogate_Model = 1 => 0 & NoSimultaneousSim = 4 => 1 & "
       "Include_Initial_Parameters = 1 => 0",
       "4 has no effect: Dynamically Dimensioned Search draws its start points uniformly"},
      {"TqSEKdxListItemCount = 1 // files => TqSEKdxListItemCount = 2\n[SIMPARAMITEM_2]\nParamFileName = "
       "'model/soil.par'\nTemplateFileName = 'model/soil.tpl'\n[/SIMPARAMITEM_2]",
       "setup.kdx:14:17: ParamFileName: SIMPARAMITEM_1 writes this file, too; the model gets what is written last, "
       "from this item"},
      {"Parameter_Name = 'Rate' => Parameter_Name = 'Rate'\nParameter_Equation = 'Depth * 2'",
       "setup.kdx:38:22: Parameter_Equation: not used, as only Parameter_Type = 2 makes a parameter dependent"},
      {"'model/soil.tpl' => 'model/blank.tpl'\nFileType = 1 & Parameter_Name = 'Rate' => Parameter_Name = "
       "'Rate'\nParameter_IDValue = 1.5004E-35",
       "setup.kdx:46:27: Parameter_IDValue: taken for that of parameter \"Rate\", 1.5004e-35: ID values must differ by "
       "1e-37 or more"},
      {"Parameter_Name = 'Rate' => Parameter_Name = 'Rate'\nParameter_IDValue = 1.5004E-35", ""},
      {"Initial_Value = 0.31D0 => 1.25 & Lower_Bound = 0.0 => 0.5 & Upper_Bound = 1.0 => Upper_Bound = "
       "3.5\nTransformation_Type = 2",
       "setup.kdx:34:23: Initial_Value: 1.25 is not a whole number of steps above Lower_Bound = 0.5, 0.5 is taken"},
      {"Initial_Value = 0.31D0 => 1.5 & Lower_Bound = 0.0 => 0.5 & Upper_Bound = 1.0 => Upper_Bound = "
       "3\nTransformation_Type = 2",
       "setup.kdx:36:21: Upper_Bound: 3 is not a whole number of steps above Lower_Bound = 0.5, 2.5 is taken"},
      {"Initial_Sample_Generation = 4 => 1",
       "Initial_Sample_File_Name: not read, as Initial_Sample_Generation is 1 and not 4"},
      {"Include_Initial_Parameters = 1 => 2", "Include_Initial_Parameters: found 2, expected 0 or 1; read as 0 (no)"},
      {"Include_Initial_Parameters = 1 => -1", "found -1, expected 0 or 1; read as 1 (yes)"},
      {"Option = 2 => 0 & Scenario_Type = 1 => 0 & NoSimultaneousSim = 4 => 1",
       "setup.kdx:104:21: Scenario_Type: 0 makes a single run with the initial values, SCENARIO_RUNS is not read"},
      {"Option = 2 => 0 & Parameter_Name = 'Rate' => Parameter_Name = 'Rate'\nParameter_Type = 1 & "
       "NoSimultaneousSim = 4 => 1",
       "Parameters: value 2, 1, is not used: parameter \"Rate\" is fixed at 0.31"},
      {"NoSimultaneousSim = 4 => NoSimultaneousSim = 4\nProcessFolder = 'model/runs'",
       "ProcessFolder: is in the base folder model, of which every process folder is a copy"},
      {"NoSimultaneousSim = 4 => NoSimultaneousSim = 4\nProcessFolder = 'scrach/me'",
       "ProcessFolder: scrach does not exist and is made: is the name right?"},
      {"NoSimultaneousSim = 4 => NoSimultaneousSim = 4\nProcessFolder = 'runs'", ""},
      // Settings that end a search early.
      {"", ""},  // two variable parameters, 20 = 4(2n + 1) points
      {"Population_Size = 20 => 19 & Neighbourhood_Size = 60 => 50",
       "Population_Size: found 19, at least 20 are advised for the number of variable parameters"},
      {"No_Points_Simplex = 5 => 2", "No_Points_Simplex: found 2, at least 3 are advised"},
      {"No_Loops_Convergence = 12 => 1", "No_Loops_Convergence: with 1 the search ends after its first loop, use at"},
      {"No_Loops_Convergence = 12 => 1 & Min_Change = 0.005 => 0", ""},
      {"Min_Change = 0.005 => Min_Change = 0.005\nMin_Population_Range = 1e-8", ""},
      {"Algorithm_Type = 1 => 2 & Use_Surrogate_Model = 1 => 0 & NoSimultaneousSim = 4 => 1 & Min_Change = 0.005 => "
       "Min_Change = 0.005\nMin_Population_Range = 1e-8",
       "Min_Population_Range: has no effect: Dynamically Dimensioned Search does not test the range of a population"},
      {"Algorithm_Type = 1 => 'CMA-ES' & Use_Surrogate_Model = 1 => 0 & No_Loops_Convergence = 12 => 1 & Min_Change = "
       "0.005 => Min_Change = 0.005\nMin_Population_Range = 1e-8",
       "Min_Population_Range: has no effect: "},
      {"Neighbourhood_Size = 60 => Neighbourhood_Size = 60\nCheck_Interval = 3", ""},
      {"Neighbourhood_Size = 60 => Neighbourhood_Size = 60\nCheck_Interval = 3 & Use_Surrogate_Model = 1 => 0",
       "Check_Interval: has no effect without Use_Surrogate_Model = 1"},
      {"Use_Surrogate_Model = 1 => 0", ""},  // the others stand in many setups
      {"Algorithm_Type = 1 => 0", ""},
      {"Algorithm_Type = 1 => 0 & No_Points_Complex = 7 => 4 & No_Points_Subcomplex = 6 => 2",
       "No_Points_Complex: found 4, at least 5 are advised"},
      {"Algorithm_Type = 1 => 0 & No_Points_Subcomplex = 6 => 2",
       "No_Points_Subcomplex: found 2, at least 3 are advised"},
      {"Max_No_Evaluations = 500 => 19",
       "Max_No_Evaluations: the initial sample of 20 sets is cut to 19, and no search follows"},
      {"Max_No_Evaluations = 500 => 20", ""},
      {"Max_No_Evaluations = 500 => 61", ""},
      {"Max_No_Evaluations = 500 => 60",
       "Max_No_Evaluations: found 60, the surrogate model chooses nothing before 60 model evaluations: it waits for "
       "No_Initial_Generations = 2, and a quadratic polynomial for 6 sets"},
      {"Population_Size = 20 => 2 & No_Points_Simplex = 5 => 2 & Neighbourhood_Size = 60 => 0 & "
       "No_Initial_Generations = 2 => 1 & Max_No_Evaluations = 500 => 6",
       "found 6, the surrogate model chooses nothing before 6 model evaluations: it waits for "
       "No_Initial_Generations = 1, and a quadratic polynomial for 6 sets"},
      {"Algorithm_Type = 1 => 0 & Max_No_Evaluations = 500 => 27",
       "Max_No_Evaluations: the initial sample of 28 sets is cut to 27"},
      {"Algorithm_Type = 1 => 2 & Use_Surrogate_Model = 1 => 0 & NoSimultaneousSim = 4 => 1 & "
       "Perturbation_Parameter = 0.25 => 0",
       "Perturbation_Parameter: 0 perturbs nothing: every candidate is the best start set again"},
      {"Algorithm_Type = 1 => 2 & Use_Surrogate_Model = 1 => 0 & NoSimultaneousSim = 4 => 1 & "
       "Max_No_Evaluations = 500 => 1",
       "Max_No_Evaluations: the only evaluation is used up by the start of the search, and no search follows"},
      {"Algorithm_Type = 1 => 2 & Max_No_Evaluations = 500 => 10",
       "Dynamically Dimensioned Search uses no surrogate model: the search is the same as with 0, "},
  };
  for (const auto& [edits, warning] : cases) {
    const std::string log = logOf(edits);
    EXPECT_THAT(log, HasSubstr(warning));
    EXPECT_EQ(log.find("Warning") == std::string::npos, *warning == '\0') << edits;
  }
}

TEST_F(SetupReaderTest, RefusesABaseFolderThatARunOfTheSetupRemoves) {
  for (const std::string folder : {"setup_Failed12", "setup_Saved/3", "setup_Failed12x"}) {
    std::string text = edited("'model\\run.sh' => 'model/run.sh'");
    for (auto at = text.find("'model/"); at != std::string::npos; at = text.find("'model/")) {
      text.replace(at, 6, "'" + folder);
    }
    for (const char* name : {"run.sh", "soil.par", "soil.tpl"}) {
      folder_.write(folder + "/" + name, folder_.read(std::string("model/") + name));
    }
    const std::string refused = fmt::format(
        "Error: The base folder {} lies in {}, which a run of this setup removes or "
        "renames\nsetup.kdx:8:25: BatchFileName: expected a folder of your own",
        folder, folder.substr(0, folder.find('/')));
    const std::string failure = failureOf(text);
    EXPECT_TRUE(folder.ends_with('x') ? failure.empty() : failure.starts_with(refused)) << failure;
  }
}

TEST_F(SetupReaderTest, TheSetupIsLookedForWhereItsNameSays) {
  RunLog log;
  EXPECT_EQ(withoutFolder(refusalOf([&] { readSetupFile(folder_ / "none.kdx  ", log); })),
            "Error: Unable to open none.kdx\nNo such file or directory");
  folder_.write("my.setup.KDX", edited(""));
  EXPECT_EQ(readSetupFile(folder_ / "model/../my.setup.KDX", log).setupName, "my.setup");
}

}  // namespace
}  // namespace mirevo

#pragma once

#include <filesystem>
#include <string>
#include <unistd.h>
#include <vector>

#include <gtest/gtest.h>

#include "common/fatal_error.h"
#include "common/files.h"
#include "run/setup_reader.h"

namespace mirevo {

/// A change of the fixture's setup text: the one place where `from` stands becomes `to`.
struct Edit {
  std::string from;
  std::string to;
};

/// A folder with a small model and a valid setup of every section beside it.
class SetupFixture : public testing::Test {
 protected:
  void SetUp() override {
    folder_ = testing::TempDir() + "setup_" + std::to_string(::getpid());
    std::filesystem::remove_all(folder_);
    std::filesystem::create_directories(folder_ + "/model");
    write("model/run.sh", "#!/bin/sh\n");
    write("model/soil.par", "0\n");
    write("model/soil.tpl", "!\n!Depth!\n");
    write("model/blank.tpl", "   \n!Depth!\n");
    write("sample.txt", "Depth\tRate\n");
  }
  void TearDown() override { std::filesystem::remove_all(folder_); }

  void write(const std::string& name, std::string_view content) const {
    std::string reason;
    ASSERT_TRUE(writeByUnlinkAndCreate(folder_ + "/" + name, content, 0644, reason)) << name << ": " << reason;
  }

  std::string edited(const std::vector<Edit>& edits) const {
    std::string text = kText;
    for (const Edit& edit : edits) {
      const auto place = text.find(edit.from);
      EXPECT_NE(place, std::string::npos) << edit.from;
      if (place == std::string::npos) continue;
      EXPECT_EQ(text.find(edit.from, place + 1), std::string::npos) << edit.from << " stands more than once";
      text.replace(place, edit.from.size(), edit.to);
    }
    return text;
  }

  RunConfig read(const std::vector<Edit>& edits = {}) {
    RunLog log;
    return readSetup(folder_ + "/setup.kdx", edited(edits), log);
  }

  /// "message\ndetail" of the error that reading ends with, the fixture's folder left out; empty when it is valid.
  std::string failure(const std::vector<Edit>& edits) {
    try {
      read(edits);
    } catch (const FatalError& error) {
      return withoutFolder(error.message() + "\n" + error.detail());
    }
    return {};
  }

  std::string withoutFolder(std::string text) const {
    const std::string prefix = folder_ + "/";
    for (auto place = text.find(prefix); place != std::string::npos; place = text.find(prefix, place)) {
      text.erase(place, prefix.size());
    }
    return text;
  }

  /// What reading writes to the log, whether it fails or not.
  std::string logOf(const std::vector<Edit>& edits) {
    RunLog log;
    try {
      readSetup(folder_ + "/setup.kdx", edited(edits), log);
    } catch (const FatalError&) {
    }
    std::string reason;
    EXPECT_TRUE(log.open(folder_ + "/setup.log", reason)) << reason;
    return withoutFolder(readTextFile(folder_ + "/setup.log", reason).value_or(reason));
  }

  std::string folder_;
  static const char* const kText;
};

inline const char* const SetupFixture::kText = R"kdx([MIREVO_PARAMETERS]
  [MIREVO_SIMULATION_OPTION]
    Option = 2
    Title = 'Upper catchment   '
    [SIMBATCH]
      TqSEKdxListItemCount = 1
      [SIMBATCHITEM_1]
        BatchFileName = 'model\run.sh'
      [/SIMBATCHITEM_1]
    [/SIMBATCH]
    [SIMPARAM]
      TqSEKdxListItemCount = 1 // files
      [SIMPARAMITEM_1]
        ParamFileName = 'model/soil.par'
        TemplateFileName = 'model/soil.tpl'
      [/SIMPARAMITEM_1]
    [/SIMPARAM]
  [/MIREVO_SIMULATION_OPTION]
  [MODEL_PARAMETERS]
    TqSEKdxListItemCount = 3
    [PARAMETER_1]
      [Keywords]
        KeyLine = 'soil'
        KeyLine = 'depth'
      [/Keywords]
      Initial_Value = 412.5
      Lower_Bound = 100
      Upper_Bound = 900
      Transformation_Type = 1
      Parameter_Type = 0
      Parameter_Name = 'Depth'
    [/PARAMETER_1]
    [PARAMETER_2]
      Initial_Value = 0.31D0
      Lower_Bound = 0.0
      Upper_Bound = 1.0
      Parameter_Name = 'Rate'
    [/PARAMETER_2]
    [PARAMETER_3]
      Initial_Value = 7.0
      Lower_Bound = 6.5
      Upper_Bound = 7.5
      Parameter_Type = 2
      Parameter_IDValue = 1.5E-035
      Parameter_Name = 'Sum'
      Parameter_Equation = 'Depth + Rate'
    [/PARAMETER_3]
    [INTERNAL_CONSTRAINTS]
      TqSEKdxListItemCount = 1
      [CONSTRAINT_1]
        Left_Equation = 'Rate'
        Right_Equation = 'Depth'
        Logical_Operator = 1
      [/CONSTRAINT_1]
    [/INTERNAL_CONSTRAINTS]
  [/MODEL_PARAMETERS]
  [ObjectiveFunctions]
    Start_Date = 2001-01-31
    End_Date = '2003-12-31 24:00'
    Aggregation_Method = 0
    [OUTPUT_MEASURES]
      TqSEKdxListItemCount = 2
      [MEASURE_1]
        Name = 'Flow error'
        Interface_Type = 0
        Statistic_Type = 1
        Weight = 1.25
        Weight_Above = 2.5
        Function_Name = 'Flow'
        [SIMULATION_FILE]
          File_Name = 'model/flow.csv'
          Item_No = 2
        [/SIMULATION_FILE]
        [OBSERVATION_FILE]
          File_Name = 'gauge.csv'
        [/OBSERVATION_FILE]
      [/MEASURE_1]
      [MEASURE_2]
        Name = 'Written'
        Interface_Type = 1
        MeasurementNo = 3
        Function_Name = ''
      [/MEASURE_2]
      [OUTPUT_MEASURE_FILE]
        File_Name = 'model/measures.txt'
      [/OUTPUT_MEASURE_FILE]
    [/OUTPUT_MEASURES]
    [OBJECTIVE_FUNCTIONS]
      TqSEKdxListItemCount = 1
      [OBJECTIVE_1]
        Name = 'Flow'
        Function_Type = 2
        Weight = 0.75
      [/OBJECTIVE_1]
    [/OBJECTIVE_FUNCTIONS]
  [/ObjectiveFunctions]
  [SAVE_OUTPUT_FILES]
    TqSEKdxListItemCount = 1
    [OUTPUT_FILE_1]
      File_name = 'model/out/flow.csv'
    [/OUTPUT_FILE_1]
  [/SAVE_OUTPUT_FILES]
  [SCENARIOS]
    Scenario_Type = 1
    [SCENARIO_RUNS]
      TqSEKdxListItemCount = 1
      [SCENARIO_1]
        Parameters = 412.5, 1, 99
      [/SCENARIO_1]
    [/SCENARIO_RUNS]
  [/SCENARIOS]
  [SENSITIVITY_ANALYSIS]
    Sensitivity_Type = 0
    [LOCAL_SA]
      Differencing = 1
      Perturbation_Option = 0
      Perturbation_Fraction = 0.02
      Calculate_Covmatrix = 1
    [/LOCAL_SA]
  [/SENSITIVITY_ANALYSIS]
  [OPTIMISATION_ALGORITHM]
    Algorithm_Type = 1
    Use_Surrogate_Model = 1
    [SCE_CONTROL_PARAMETERS]
      No_Complexes = 4
      No_Points_Complex = 7
      No_Points_Subcomplex = 6
      No_Evaluation_Steps = 8
    [/SCE_CONTROL_PARAMETERS]
    [PSE_CONTROL_PARAMETERS]
      Population_Size = 20
      No_Points_Simplex = 5
      Prob_Reflection = 0.6
      Prob_Contraction = 0.4
    [/PSE_CONTROL_PARAMETERS]
    [DDS_CONTROL_PARAMETERS]
      Perturbation_Parameter = 0.25
    [/DDS_CONTROL_PARAMETERS]
    [INITIAL_SAMPLE]
      Include_Initial_Parameters = 1
      Random_Seed = -77
      Initial_Sample_Generation = 4
      Initial_Sample_File_Name = 'sample.txt'
    [/INITIAL_SAMPLE]
    [STOPPING_CRITERIA]
      Max_No_Evaluations = 500
      No_Loops_Convergence = 12
      Min_Change = 0.005
    [/STOPPING_CRITERIA]
    [SURROGATE_MODEL_PARAMETERS]
      Sampling_rate = 30
      Neighbourhood_Size = 60
      Model_Type = 0
      No_Initial_Generations = 2
    [/SURROGATE_MODEL_PARAMETERS]
  [/OPTIMISATION_ALGORITHM]
  [UNCERTAINTY_ESTIMATION]
    Uncertainty_Type = 1
    Sample_Size = 200
    Random_Seed = 5
    [PARAMETER_1]
      Mean_Value = 6
      Standard_Deviation = 0.3
    [/PARAMETER_1]
    [PARAMETER_2]
      Mean_Value = 0.5
      Standard_Deviation = 0.1
    [/PARAMETER_2]
  [/UNCERTAINTY_ESTIMATION]
  [SimultaneousSimulations]
    NoSimultaneousSim = 4
  [/SimultaneousSimulations]
[/MIREVO_PARAMETERS]
)kdx";

}  // namespace mirevo

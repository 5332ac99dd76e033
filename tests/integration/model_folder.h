#pragma once

#include <cstdlib>
#include <string>
#include <sys/stat.h>
#include <vector>

#include <fmt/format.h>

#include "integration/program_runner.h"

namespace mirevo::testing {

/// The settings of a run with the small test model; what a test does not name is a short, sound calibration.
struct RunSettings {
  int option = 2;
  int algorithm = 2;
  int maxEvaluations = 40;  ///< also the sample size of an uncertainty analysis
  int seed = 1;
  std::vector<std::string> scenarios = {};  ///< values of a, b and c, "1, 2, 3"; none: a single run
  int slots = 1;
  std::string modelArguments = {};
  std::string batchFile = "model/run.sh";
  std::string templateFile = "model/parameters.tpl";
  std::string simulationFile = "model/simulated.csv";
  std::string observationFile = "observed.csv";
  std::string savedFile = {};  ///< an output file that is kept of every evaluation; none when empty
  std::string processFolder = {};
};

/// A folder with the model, its observations (made with a = 5, b = 2, c = 1) and a setup file `basin.kdx`. Parameters:
/// `a` in [0, 10] from 4, `b` in [0, 5] from 1, `c` fixed at 1; one measure, the root mean square error.
class ModelFolder : public TemporaryFolder {
 public:
  ModelFolder() {
    write("model/run.sh", fmt::format("#!/bin/sh\nexec {} \"$@\"\n", MIREVO_TEST_MODEL), 0755);
    write("model/parameters.txt", "a = 5\nb = 2\nc = 1\n");
    useTemplate("");
    const std::string command = fmt::format("cd '{}/model' && ./run.sh && cp simulated.csv ..", path());
    if (std::system(command.c_str()) != 0) throw std::runtime_error("the test model does not run");
    std::filesystem::rename(*this / "simulated.csv", *this / "observed.csv");
  }

  /// The parameter file with further lines.
  void useTemplate(const std::string& lines) const {
    write("model/parameters.tpl", "!\na = !a              !\nb = !b              !\nc = !c              !\n" + lines);
  }

  /// Writes `basin.kdx` and returns its path.
  std::string writeSetup(const RunSettings& settings) const { return write("basin.kdx", setupText(settings)); }

 private:
  static std::string scenarioText(const RunSettings& settings) {
    std::string items;
    for (std::size_t i = 0; i < settings.scenarios.size(); ++i) {
      items += fmt::format("      [SCENARIO_{0}]\n        Parameters = {1}\n      [/SCENARIO_{0}]\n", i + 1,
                           settings.scenarios[i]);
    }
    return fmt::format(R"(  [SCENARIOS]
    Scenario_Type = {}
    [SCENARIO_RUNS]
      TqSEKdxListItemCount = {}
{}    [/SCENARIO_RUNS]
  [/SCENARIOS]
)",
                       settings.scenarios.empty() ? 0 : 1, settings.scenarios.size(), items);
  }

  static std::string savedText(const RunSettings& settings) {
    const std::string item =
        fmt::format("    [OUTPUT_FILE_1]\n      File_name = '{}'\n    [/OUTPUT_FILE_1]\n", settings.savedFile);
    return fmt::format("  [SAVE_OUTPUT_FILES]\n    TqSEKdxListItemCount = {}\n{}  [/SAVE_OUTPUT_FILES]\n",
                       settings.savedFile.empty() ? 0 : 1, settings.savedFile.empty() ? "" : item);
  }

  static std::string parameterText(int number, const char* name, double initial, double upper, int type) {
    return fmt::format(R"(    [PARAMETER_{0}]
      Initial_Value = {2:.1f}
      Lower_Bound = 0.0
      Upper_Bound = {3:.1f}
      Transformation_Type = 0
      Parameter_Type = {4}
      Parameter_IDValue = {0}.5E-035
      Parameter_Name = '{1}'
      Parameter_Equation = ''
      Comment = ''
      [Keywords]
      [/Keywords]
    [/PARAMETER_{0}]
)",
                       number, name, initial, upper, type);
  }

  static std::string setupText(const RunSettings& settings) {
    std::string text = fmt::format(R"([MIREVO_PARAMETERS]
  [MIREVO_SIMULATION_OPTION]
    Option = {}
    Title = 'Small test basin'
    [SIMBATCH]
      TqSEKdxListItemCount = 1
      [SIMBATCHITEM_1]
        BatchFileName = '{}'
        Arguments = '{}'
      [/SIMBATCHITEM_1]
    [/SIMBATCH]
    [SIMPARAM]
      TqSEKdxListItemCount = 1
      [SIMPARAMITEM_1]
        FileType = 0
        ParamFileName = 'model/parameters.txt'
        TemplateFileName = '{}'
      [/SIMPARAMITEM_1]
    [/SIMPARAM]
  [/MIREVO_SIMULATION_OPTION]
)",
                                   settings.option, settings.batchFile, settings.modelArguments, settings.templateFile);
    text += "  [MODEL_PARAMETERS]\n    TqSEKdxListItemCount = 3\n" + parameterText(1, "a", 4.0, 10.0, 0) +
            parameterText(2, "b", 1.0, 5.0, 0) + parameterText(3, "c", 1.0, 5.0, 1);
    text += fmt::format(R"(    [INTERNAL_CONSTRAINTS]
      TqSEKdxListItemCount = 0
    [/INTERNAL_CONSTRAINTS]
  [/MODEL_PARAMETERS]
  [ObjectiveFunctions]
    Start_Date = 2001-01-01
    End_Date = 2001-12-31
    Aggregation_Method = 0
    [OUTPUT_MEASURES]
      TqSEKdxListItemCount = 1
      [MEASURE_1]
        Name = 'flow'
        Interface_Type = 0
        MeasurementNo = 1
        Statistic_Type = 1
        Weight = 1.0
        Weight_Above = 1.0
        Function_Name = 'fit'
        [SIMULATION_FILE]
          File_Name = '{}'
          Item_No = 1
        [/SIMULATION_FILE]
        [OBSERVATION_FILE]
          File_Name = '{}'
          Item_No = 1
        [/OBSERVATION_FILE]
      [/MEASURE_1]
      [OUTPUT_MEASURE_FILE]
        File_Name = ''
      [/OUTPUT_MEASURE_FILE]
    [/OUTPUT_MEASURES]
    [OBJECTIVE_FUNCTIONS]
      TqSEKdxListItemCount = 1
      [OBJECTIVE_1]
        Name = 'fit'
        Function_Type = 0
        Weight = 1.0
      [/OBJECTIVE_1]
    [/OBJECTIVE_FUNCTIONS]
  [/ObjectiveFunctions]
)",
                        settings.simulationFile, settings.observationFile);
    text += savedText(settings);
    text += scenarioText(settings);
    text +=
        fmt::format(R"(  [SENSITIVITY_ANALYSIS]
    Sensitivity_Type = 0
    [LOCAL_SA]
      Differencing = 1
      Perturbation_Option = 1
      Perturbation_Fraction = 0.005
      Calculate_Covmatrix = 1
    [/LOCAL_SA]
  [/SENSITIVITY_ANALYSIS]
  [OPTIMISATION_ALGORITHM]
    Algorithm_Type = {4}
    Use_Surrogate_Model = 0
    [SCE_CONTROL_PARAMETERS]
      No_Complexes = 2
      No_Points_Complex = 5
      No_Points_Subcomplex = 3
      No_Evaluation_Steps = 5
    [/SCE_CONTROL_PARAMETERS]
    [PSE_CONTROL_PARAMETERS]
      Population_Size = 10
      No_Points_Simplex = 3
    [/PSE_CONTROL_PARAMETERS]
    [DDS_CONTROL_PARAMETERS]
      Perturbation_Parameter = 0.2
    [/DDS_CONTROL_PARAMETERS]
    [INITIAL_SAMPLE]
      Include_Initial_Parameters = 1
      Random_Seed = {0}
      Initial_Sample_Generation = 0
      Initial_Sample_File_Name = ''
    [/INITIAL_SAMPLE]
    [STOPPING_CRITERIA]
      Max_No_Evaluations = {1}
      No_Loops_Convergence = 5
      Min_Change = 0.001
    [/STOPPING_CRITERIA]
  [/OPTIMISATION_ALGORITHM]
  [UNCERTAINTY_ESTIMATION]
    Uncertainty_Type = 1
    Sample_Size = {1}
    Random_Seed = {0}
    [PARAMETER_1]
      Mean_Value = 5.0
      Standard_Deviation = 0.5
    [/PARAMETER_1]
    [PARAMETER_2]
      Mean_Value = 2.0
      Standard_Deviation = 0.1
    [/PARAMETER_2]
  [/UNCERTAINTY_ESTIMATION]
  [SimultaneousSimulations]
    NoSimultaneousSim = {2}
    UseSingleThread = 0
    ProcessFolder = '{3}'
  [/SimultaneousSimulations]
[/MIREVO_PARAMETERS]
)",
                    settings.seed, settings.maxEvaluations, settings.slots, settings.processFolder, settings.algorithm);
    return text;
  }
};

/// A line of a model script that takes 0 to 30 ms, told by the parameter values alone: model runs side by side end in
/// another order than they began.
inline constexpr const char* kSleepByParameters = "sleep 0.0$(($(cksum <parameters.txt | cut -d ' ' -f 1) % 4))";

/// Everything in a result file but when it was made.
inline std::string withoutDate(const std::string& results) {
  const auto start = results.find("# Started: ");
  return start == std::string::npos ? results : results.substr(0, start) + results.substr(results.find('\n', start));
}

/// The rows of a result file, each split at its tabs, the header row first; and its `#` lines.
struct ResultTable {
  std::vector<std::vector<std::string>> rows;
  std::vector<std::string> comments;
};

inline ResultTable readResults(const std::string& text) {
  ResultTable table;
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    if (line.starts_with("#")) {
      table.comments.push_back(line);
      continue;
    }
    table.rows.emplace_back();
    std::istringstream cells(line);
    for (std::string cell; std::getline(cells, cell, '\t');) table.rows.back().push_back(cell);
  }
  return table;
}

}  // namespace mirevo::testing

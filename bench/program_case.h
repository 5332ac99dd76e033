#pragma once

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include <fmt/format.h>

/// Folders with a setup and a model for benchmarks that run the whole program.
namespace mirevo::bench {

/// A setup `case.kdx` with variable parameters and one output measure, which is its objective function.
struct ProgramCase {
  struct Parameter {
    std::string name;
    double initial = 0.0;
    double lower = 0.0;
    double upper = 0.0;
  };

  std::string option = {};  ///< "2", with further lines of the section behind it
  std::string title = {};
  std::vector<Parameter> parameters = {};
  std::string endDate = "2001-12-31";
  std::string name = {};         ///< of the measure and the objective function
  int interfaceType = 0;         ///< 1: a number in `measureFile`
  std::string statistic = "1";   ///< as in setups
  std::string seriesFiles = {};  ///< the sections of the measure's files; empty: none
  std::string measureFile = {};
  std::string task = {};  ///< the section of the task
  int slots = 1;
  std::string modelCommand = {};  ///< started in the model's folder
};

inline void writeText(const std::filesystem::path& path, const std::string& text) {
  std::ofstream(path) << text;
}

inline std::string setupText(const ProgramCase& one) {
  std::string parameters;
  for (std::size_t j = 0; j < one.parameters.size(); ++j) {
    const ProgramCase::Parameter& p = one.parameters[j];
    parameters += fmt::format(
        "[PARAMETER_{0}]\nParameter_Name = '{1}'\nInitial_Value = {2:.17g}\nLower_Bound = {3:.17g}\nUpper_Bound = "
        "{4:.17g}\nTransformation_Type = 0\nParameter_Type = 0\n[/PARAMETER_{0}]\n",
        j + 1, p.name, p.initial, p.lower, p.upper);
  }
  return fmt::format(R"([MIREVO_PARAMETERS]
[MIREVO_SIMULATION_OPTION]
Option = {}
Title = '{}'
[SIMBATCH]
TqSEKdxListItemCount = 1
[SIMBATCHITEM_1]
BatchFileName = 'model/run.sh'
Arguments = ''
[/SIMBATCHITEM_1]
[/SIMBATCH]
[SIMPARAM]
TqSEKdxListItemCount = 1
[SIMPARAMITEM_1]
FileType = 0
ParamFileName = 'model/parameters.txt'
TemplateFileName = 'model/parameters.tpl'
[/SIMPARAMITEM_1]
[/SIMPARAM]
[/MIREVO_SIMULATION_OPTION]
[MODEL_PARAMETERS]
TqSEKdxListItemCount = {}
{}[INTERNAL_CONSTRAINTS]
TqSEKdxListItemCount = 0
[/INTERNAL_CONSTRAINTS]
[/MODEL_PARAMETERS]
[ObjectiveFunctions]
Start_Date = 2001-01-01
End_Date = {}
Aggregation_Method = 0
[OUTPUT_MEASURES]
TqSEKdxListItemCount = 1
[MEASURE_1]
Name = '{}'
Interface_Type = {}
MeasurementNo = 1
Statistic_Type = {}
Weight = 1.0
Weight_Above = 1.0
Function_Name = '{}'
{}[/MEASURE_1]
[OUTPUT_MEASURE_FILE]
File_Name = '{}'
[/OUTPUT_MEASURE_FILE]
[/OUTPUT_MEASURES]
[OBJECTIVE_FUNCTIONS]
TqSEKdxListItemCount = 1
[OBJECTIVE_1]
Name = '{}'
Function_Type = 0
Weight = 1.0
[/OBJECTIVE_1]
[/OBJECTIVE_FUNCTIONS]
[/ObjectiveFunctions]
[SAVE_OUTPUT_FILES]
TqSEKdxListItemCount = 0
[/SAVE_OUTPUT_FILES]
{}[SimultaneousSimulations]
NoSimultaneousSim = {}
UseSingleThread = 0
[/SimultaneousSimulations]
[/MIREVO_PARAMETERS]
)",
                     one.option, one.title, one.parameters.size(), parameters, one.endDate, one.name, one.interfaceType,
                     one.statistic, one.name, one.seriesFiles, one.measureFile, one.name, one.task, one.slots);
}

/// The setup, and the folder of its model with a parameter file of the initial values.
inline void writeCase(const std::filesystem::path& folder, const ProgramCase& one) {
  namespace fs = std::filesystem;
  fs::create_directories(folder / "model");
  std::string values;
  std::string places = "!\n";
  for (const ProgramCase::Parameter& p : one.parameters) {
    values += fmt::format("{:.17g}\n", p.initial);
    places += fmt::format("!{:<24}!\n", p.name);
  }
  writeText(folder / "model/parameters.txt", values);
  writeText(folder / "model/parameters.tpl", places);
  writeText(folder / "model/run.sh", fmt::format("#!/bin/sh\nexec {}\n", one.modelCommand));
  fs::permissions(folder / "model/run.sh", fs::perms::owner_all);
  writeText(folder / "case.kdx", setupText(one));
}

}  // namespace mirevo::bench

/// Samples known distributions with DREAM, by the whole program and a model that is run as a process, and prints the
/// table of docs/dream.md. Usage: known_posteriors [NAME RUNS]...; without arguments all of them.

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/bayes/known_densities.h"
#include "common/data_table.h"
#include "common/files.h"

namespace mirevo::bench {
namespace {

namespace fs = std::filesystem;
using testing::knownDensities;
using testing::KnownDensity;

void write(const fs::path& path, const std::string& text) {
  std::ofstream(path) << text;
}

std::string setupText(const KnownDensity& density, int runs) {
  std::string parameters;
  for (std::size_t j = 1; j <= density.dimensions; ++j) {
    parameters += fmt::format(
        "[PARAMETER_{0}]\nParameter_Name = 'x{0}'\nInitial_Value = 0.0\nLower_Bound = {1}\nUpper_Bound = {2}\n"
        "Transformation_Type = 0\nParameter_Type = 0\n[/PARAMETER_{0}]\n",
        j, -density.bound, density.bound);
  }
  return fmt::format(R"([MIREVO_PARAMETERS]
[MIREVO_SIMULATION_OPTION]
Option = 3
Title = '{0}'
Report = 0
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
TqSEKdxListItemCount = {1}
{2}[INTERNAL_CONSTRAINTS]
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
Name = 'minus log-density'
Interface_Type = 1
MeasurementNo = 1
Statistic_Type = 1
Weight = 1.0
Weight_Above = 1.0
Function_Name = 'unlikely'
[/MEASURE_1]
[OUTPUT_MEASURE_FILE]
File_Name = 'model/result.txt'
[/OUTPUT_MEASURE_FILE]
[/OUTPUT_MEASURES]
[OBJECTIVE_FUNCTIONS]
TqSEKdxListItemCount = 1
[OBJECTIVE_1]
Name = 'unlikely'
Function_Type = 0
Weight = 1.0
[/OBJECTIVE_1]
[/OBJECTIVE_FUNCTIONS]
[/ObjectiveFunctions]
[SAVE_OUTPUT_FILES]
TqSEKdxListItemCount = 0
[/SAVE_OUTPUT_FILES]
[UNCERTAINTY_ESTIMATION]
Uncertainty_Type = 'DREAM'
Sample_Size = {3}
Random_Seed = 1
[DREAM]
Likelihood = 'objective'
Objective_Function = 1
Chain_Count = {4}
Effective_Size = 1000
[/DREAM]
[/UNCERTAINTY_ESTIMATION]
[SimultaneousSimulations]
NoSimultaneousSim = 2
UseSingleThread = 0
[/SimultaneousSimulations]
[/MIREVO_PARAMETERS]
)",
                     density.name, density.dimensions, parameters, runs, density.chains);
}

void writeCase(const fs::path& folder, const KnownDensity& density, int runs) {
  fs::create_directories(folder / "model");
  std::string values;
  std::string places = "!\n";
  for (std::size_t j = 1; j <= density.dimensions; ++j) {
    values += "0.0\n";
    places += fmt::format("!{:<24}!\n", fmt::format("x{}", j));
  }
  write(folder / "model/parameters.txt", values);
  write(folder / "model/parameters.tpl", places);
  write(folder / "model/run.sh", fmt::format("#!/bin/sh\nexec {} {}\n", DENSITY_MODEL, density.name));
  fs::permissions(folder / "model/run.sh", fs::perms::owner_all);
  write(folder / "case.kdx", setupText(density, runs));
}

double cellOf(const ReadTable& table, const std::vector<std::string>& row, const char* column) {
  return std::strtod(row[table.column(column).value()].c_str(), nullptr);
}

/// The share of the states behind burn-in in which the first parameter is above 0.
double shareAbove(const fs::path& chains) {
  std::string reason;
  const ReadTable table = readDataTable(readTextFile(chains.string(), reason).value_or(std::string()));
  double above = 0.0;
  double all = 0.0;
  for (const std::vector<std::string>& row : table.rows) {
    if (cellOf(table, row, "Burn_In") != 0.0) continue;
    all += 1.0;
    above += cellOf(table, row, "x1") > 0.0 ? 1.0 : 0.0;
  }
  return above / all;
}

bool measure(const KnownDensity& density, int runs) {
  const fs::path folder = fs::temp_directory_path() / fmt::format("known-posterior-{}", density.name);
  fs::remove_all(folder);
  writeCase(folder, density, runs);
  const std::string command =
      fmt::format("cd {} && VOLK_PROGRESS=NONE {} case.kdx >/dev/null 2>output.txt", folder.string(), MIREVO_PROGRAM);
  if (std::system(command.c_str()) != 0) {
    fmt::print(stderr, "{}: the run ended with an error, see {}\n", density.name, (folder / "case.log").string());
    return false;
  }
  std::string reason;
  const ReadTable table =
      readDataTable(readTextFile((folder / "case_Posterior.dat").string(), reason).value_or(std::string()));
  double worstMean = 0.0;
  double least = 1.0e9;
  double most = 0.0;
  double rHat = 0.0;
  double size = 1.0e9;
  for (std::size_t j = 0; j < density.dimensions; ++j) {
    const auto& row = table.rows[j];
    const double deviation = density.deviation(j);
    const double effective = cellOf(table, row, "Effective size");
    const double error = std::abs(cellOf(table, row, "Mean") - density.mean(j)) / deviation;
    worstMean = std::max(worstMean, error);
    least = std::min(least, cellOf(table, row, "Standard deviation") / deviation);
    most = std::max(most, cellOf(table, row, "Standard deviation") / deviation);
    rHat = std::max(rHat, cellOf(table, row, "R-hat"));
    size = std::min(size, effective);
  }
  fmt::print("| {} | {} | {} | {:.2f} | {:.2f} to {:.2f} | {:.3f} | {:.0f} | {:.3f} |\n", density.name,
             density.dimensions, runs, worstMean, least, most, rHat, size, shareAbove(folder / "case_Chains.dat"));
  std::fflush(stdout);
  fs::remove_all(folder);
  return true;
}

int run(int argc, char** argv) {
  fmt::print(
      "| distribution | dimensions | runs at most | largest error of a mean, in standard deviations | standard "
      "deviations, true ones 1 | R-hat | effective size | share of x1 above 0 |\n|---|---|---|---|---|---|---|---|\n");
  bool isWell = true;
  if (argc < 3) {
    const int runs[] = {100'000, 100'000, 100'000};
    for (std::size_t i = 0; i < knownDensities().size(); ++i) {
      isWell = measure(knownDensities()[i], runs[i]) && isWell;
    }
  }
  for (int i = 1; i + 1 < argc; i += 2) {
    for (const KnownDensity& density : knownDensities()) {
      if (density.name == argv[i]) isWell = measure(density, std::atoi(argv[i + 1])) && isWell;
    }
  }
  return isWell ? 0 : 1;
}

}  // namespace
}  // namespace mirevo::bench

int main(int argc, char** argv) {
  return mirevo::bench::run(argc, argv);
}

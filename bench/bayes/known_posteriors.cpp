/// Samples known distributions with DREAM, by the whole program and a model that is run as a process, and prints the
/// table of docs/dream.md. Usage: known_posteriors [NAME RUNS]...; without arguments all of them.

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/bayes/known_densities.h"
#include "common/data_table.h"
#include "common/files.h"
#include "program_case.h"

namespace mirevo::bench {
namespace {

namespace fs = std::filesystem;
using testing::knownDensities;
using testing::KnownDensity;

void writeDensityCase(const fs::path& folder, const KnownDensity& density, int runs) {
  ProgramCase one{.option = "3\nReport = 0",
                  .title = std::string(density.name),
                  .name = "minus log-density",
                  .interfaceType = 1,
                  .measureFile = "model/result.txt",
                  .task = fmt::format(R"([UNCERTAINTY_ESTIMATION]
Uncertainty_Type = 'DREAM'
Sample_Size = {}
Random_Seed = 1
[DREAM]
Likelihood = 'objective'
Objective_Function = 1
Chain_Count = {}
Effective_Size = 1000
[/DREAM]
[/UNCERTAINTY_ESTIMATION]
)",
                                      runs, density.chains),
                  .slots = 2,
                  .modelCommand = fmt::format("{} {}", DENSITY_MODEL, density.name)};
  for (std::size_t j = 1; j <= density.dimensions; ++j) {
    one.parameters.push_back({fmt::format("x{}", j), 0.0, -density.bound, density.bound});
  }
  writeCase(folder, one);
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
  writeDensityCase(folder, density, runs);
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

/// Samples known distributions with DREAM and prints the tables of docs/dream.md. Usage:
///   known_posteriors [NAME RUNS]...              by the whole program, with a model that is run as a process; without
///                                                arguments all of them
///   known_posteriors sampler SEEDS [NAME RUNS]...  by the sampler alone, which makes the same chains: many seeds and
///                                                many runs take seconds

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "algorithms/bayes/dream_sampler.h"
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

DreamSampler sampled(const KnownDensity& density, int runs, int seed) {
  DreamProblem problem;
  problem.lower.assign(density.dimensions, -density.bound);
  problem.upper.assign(density.dimensions, density.bound);
  problem.modelParameterCount = density.dimensions;
  problem.drawPrior = [bound = density.bound](std::span<const double> unit) {
    std::vector<double> point;
    for (const double value : unit) point.push_back((2.0 * value - 1.0) * bound);
    return point;
  };
  problem.logPrior = [](std::span<const double>) { return 0.0; };
  problem.evaluate = [&density, number = 0](std::span<const DreamProposal> proposals) mutable {
    std::vector<ProposalResult> results;
    for (const DreamProposal& proposal : proposals) {
      results.push_back({density.lnDensity(proposal.point), proposal.knownRun != 0 ? proposal.knownRun : ++number});
    }
    return results;
  };
  DreamSettings settings;
  settings.mostRuns = runs;
  settings.chainCount = density.chains;
  settings.effectiveSize = 1e9;  // to the end of the budget
  DreamSampler sampler(settings, std::move(problem), seed);
  while (!sampler.isFinished()) sampler.advance();
  return sampler;
}

/// Mean and standard deviation of dimension j behind burn-in.
std::array<double, 2> momentsOf(const DreamSampler& sampler, std::size_t j) {
  double mean = 0.0;
  double squares = 0.0;
  double count = 0.0;
  for (const std::vector<double>& chain : sampler.history().columns(j, *sampler.burnIn())) {
    for (const double value : chain) {
      count += 1.0;
      const double change = value - mean;
      mean += change / count;
      squares += change * (value - mean);
    }
  }
  return {mean, std::sqrt(squares / count)};
}

void measureSampler(const KnownDensity& density, int runs, int seeds) {
  std::vector<double> deviations;  // the worst of each seed, true ones 1
  std::vector<double> errors;
  std::vector<double> rHats;
  std::vector<double> sizes;
  for (int seed = 1; seed <= seeds; ++seed) {
    const DreamSampler sampler = sampled(density, runs, seed);
    double worst = 1.0;
    double error = 0.0;
    for (std::size_t j = 0; j < density.dimensions; ++j) {
      const auto [mean, deviation] = momentsOf(sampler, j);
      const double ratio = deviation / density.deviation(j);
      if (std::abs(std::log(ratio)) > std::abs(std::log(worst))) worst = ratio;
      error = std::max(error, std::abs(mean - density.mean(j)) / density.deviation(j));
    }
    const ConvergenceCheck check = sampler.checkNow().value();
    deviations.push_back(worst);
    errors.push_back(error);
    rHats.push_back(check.largestRHat());
    sizes.push_back(check.leastEffectiveSize());
  }
  for (std::vector<double>* const values : {&deviations, &errors, &rHats, &sizes}) std::ranges::sort(*values);
  const std::size_t middle = deviations.size() / 2;
  const auto shown = [middle](const std::vector<double>& values, int digits) {
    return fmt::format("{:.{}f} ({:.{}f} to {:.{}f})", values[middle], digits, values.front(), digits, values.back(),
                       digits);
  };
  fmt::print("| {} | {} | {} | {} | {} | {} | {} |\n", density.name, runs, seeds, shown(errors, 2),
             shown(deviations, 2), shown(rHats, 3), shown(sizes, 0));
  std::fflush(stdout);
}

int runSampler(int argc, char** argv) {
  const int seeds = argc > 2 ? std::max(std::atoi(argv[2]), 1) : 1;
  fmt::print(
      "| distribution | runs | seeds | largest error of a mean, in standard deviations: median (range) | worst "
      "standard deviation, true ones 1 | R-hat | effective size |\n|---|---|---|---|---|---|---|\n");
  for (int i = 3; i + 1 < argc; i += 2) {
    for (const KnownDensity& density : knownDensities()) {
      if (density.name == argv[i]) measureSampler(density, std::atoi(argv[i + 1]), seeds);
    }
  }
  return 0;
}

int run(int argc, char** argv) {
  if (argc > 1 && std::string_view(argv[1]) == "sampler") return runSampler(argc, argv);
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

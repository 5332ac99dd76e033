/// Prints the tables of docs/algorithms/which-search.md. Usage: search_choice [table], where the table is "hard",
/// "budgets", "surrogate", "noise" or "slots"; without an argument all of them.

#include <cstdio>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "algorithms/rotated_functions.h"
#include "functions.h"
#include "trials.h"

namespace mirevo {
namespace {

using namespace bench;

constexpr int kTrials = 100;
constexpr int kSurrogateTrials = 20;
constexpr std::size_t kSurrogateParameters = 10;
constexpr int kCandidates = 16;

struct Case {
  std::string name;
  std::function<TestFunction(int seed)> make;
};

struct Search {
  std::string_view name;
  Setting setting;
};

/// With the populations of docs/algorithms/search-comparison.md.
std::vector<Search> searches(int budget) {
  const int complexes = budget < 5000 ? 2 : 5;
  return {
      {"CMA-ES", {.method = Method::cma, .budget = budget}},
      {"SCE", {.method = Method::sce, .complexes = complexes, .budget = budget}},
      {"PSE", {.method = Method::pse, .complexes = complexes, .budget = budget}},
      {"DDS", {.method = Method::dds, .budget = budget}},
      {"PDDS", {.method = Method::dds, .budget = budget, .dds = {.candidates = kCandidates, .waitsForAll = false}}}};
}

/// The functions of the comparison for n parameters, with the optimum anywhere.
std::vector<Case> functionsOf(std::size_t n) {
  using namespace testing;
  const auto moved = [](TestFunction function) { return [function](int seed) { return shifted(function, seed); }; };
  return {{"Ackley", moved(cube("", n, -32.768, 32.768, 0, 0.0, ackley))},
          {"Griewank", moved(cube("", n, -600, 600, 0, 0.0, [](const auto& x) { return griewank(x, 4000.0); }))},
          {"Rastrigin", moved(cube("", n, -5.12, 5.12, 0, 0.0, rastrigin))},
          {"Rosenbrock", moved(cube("", n, -5, 5, 1, 0.0, rosenbrock))},
          {"Rotated ellipsoid", [n](int seed) { return rotatedEllipsoid(n, seed); }}};
}

std::vector<Case> hardFunctionsOf(std::size_t n) {
  using namespace testing;
  return {{"Ellipsoid", [n](int seed) { return ellipsoid(n, seed); }},
          {"Discus", [n](int seed) { return discus(n, seed); }},
          {"Bent cigar", [n](int seed) { return bentCigar(n, seed); }},
          {"Schwefel", [n](int seed) { return schwefel(n, seed); }},
          {"Gallagher", [n](int seed) { return gallagher(n, seed); }}};
}

void printHead(const std::string& first, const std::vector<Search>& columns) {
  fmt::print("| {} |", first);
  for (const Search& search : columns) fmt::print(" {} |", search.name);
  fmt::print("\n|---|");
  for (std::size_t i = 0; i < columns.size(); ++i) fmt::print("---|");
  fmt::print("\n");
}

/// A row of medians; with the successes and mean evaluations behind it if there are any, which no time limits.
void printRow(const std::string& name, const Case& function, const std::vector<Search>& columns, int trials,
              bool isTimed = false) {
  fmt::print("| {} |", name);
  for (const Search& search : columns) {
    const std::vector<Outcome> outcomes = runTrials(function.make, search.setting, trials);
    const std::string successes = successText(outcomes);
    fmt::print(" {:.2g}{} |", medianOf(outcomes), isTimed || successes.starts_with("0/") ? "" : " (" + successes + ")");
  }
  fmt::print("\n");
  std::fflush(stdout);
}

void printHard() {
  constexpr int kBudget = 5000;
  fmt::print("\nMedian best value over {} trials, {} evaluations (successes / their mean evaluations)\n\n", kTrials,
             kBudget);
  printHead("function", searches(kBudget));
  for (const std::size_t n : {10, 20}) {
    for (const Case& function : hardFunctionsOf(n)) {
      printRow(fmt::format("{} {}-D", function.name, n), function, searches(kBudget), kTrials);
    }
  }
}

void printBudgets() {
  for (const int budget : {300, 500, 1000, 5000}) {
    fmt::print("\nMedian best value over {} trials, {} evaluations (successes / their mean evaluations)\n\n", kTrials,
               budget);
    printHead("function", searches(budget));
    for (const std::size_t n : {5, 10, 20, 30}) {
      for (const Case& function : functionsOf(n)) {
        printRow(fmt::format("{} {}-D", function.name, n), function, searches(budget), kTrials);
      }
    }
  }
}

/// With the Gaussian process at its default rate, beside CMA-ES and DDS without it.
void printSurrogate() {
  for (const int budget : {300, 500, 1000}) {
    std::vector<Search> columns = searches(budget);
    columns.pop_back();
    for (Search& search : columns) {
      if (search.name != "SCE" && search.name != "PSE") continue;
      search.setting.samplingRate = 25;
      search.setting.modelType = kGaussian;
    }
    fmt::print("\nMedian best value over {} trials, {} evaluations, SCE and PSE with the Gaussian process\n\n",
               kSurrogateTrials, budget);
    printHead("function", columns);
    for (const Case& function : functionsOf(kSurrogateParameters)) {
      printRow(fmt::format("{} {}-D", function.name, kSurrogateParameters), function, columns, kSurrogateTrials);
    }
  }
}

void printNoise() {
  constexpr int kBudget = 1000;
  for (const double noise : {0.01, 0.1}) {
    fmt::print("\nMedian value of the best set without the noise, {} trials, {} evaluations, noise {}\n\n", kTrials,
               kBudget, noise);
    std::vector<Search> columns = searches(kBudget);
    for (Search& search : columns) search.setting.noise = noise;
    printHead("function", columns);
    for (const Case& function : functionsOf(10)) {
      printRow(fmt::format("{} 10-D", function.name), function, columns, kTrials);
    }
  }
}

/// In the time of so many model runs one after the other.
void printSlots() {
  constexpr int kRounds = 300;
  for (const int slots : {4, 16}) {
    fmt::print("\nMedian best value over {} trials in the time of {} model runs, {} slots\n\n", kTrials, kRounds,
               slots);
    std::vector<Search> columns = searches(kRounds * slots);
    columns[0].setting.cma.populationSize = slots < 10 ? 12 : slots;
    columns.insert(columns.begin() + 1, columns[0]);
    columns[1].name = "CMA-ES, two rounds";
    columns[1].setting.cma.populationSize = slots < 10 ? 24 : 2 * slots;
    for (Search& search : columns) {
      search.setting.slots = slots;
      search.setting.rounds = kRounds;
      const bool isDds = search.setting.method == Method::dds;
      if (isDds) search.setting.rounds = 1 << 30;  // its evaluations are counted one by one
      if (search.name == "DDS") search.setting.budget = kRounds;
      if (search.name == "PDDS") search.setting.dds.candidates = 2 * slots;
    }
    printHead("function", columns);
    for (const Case& function : functionsOf(10)) {
      printRow(fmt::format("{} 10-D", function.name), function, columns, kTrials, true);
    }
  }
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  const std::string table = argc > 1 ? argv[1] : "";
  if (table.empty() || table == "hard") mirevo::printHard();
  if (table.empty() || table == "budgets") mirevo::printBudgets();
  if (table.empty() || table == "surrogate") mirevo::printSurrogate();
  if (table.empty() || table == "noise") mirevo::printNoise();
  if (table.empty() || table == "slots") mirevo::printSlots();
  return 0;
}

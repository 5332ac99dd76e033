/// Prints the tables of docs/algorithms/which-search.md. Usage: search_choice [table], where the table is "hard"
/// (functions of the BBOB suite; a budget may follow), "budgets", "noise" or "slots", or of other pages "surrogate"
/// (a search, a number of seeds and a function may follow) and "interval"; without an argument all of them.

#include <cstdio>
#include <cstdlib>
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
constexpr int kSurrogateTrials = 10;
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

void printHard(int only) {
  for (const int budget : {300, 500, 1000, 5000}) {
    if (only > 0 && budget != only) continue;
    fmt::print("\nMedian best value over {} trials, {} evaluations (successes / their mean evaluations)\n\n", kTrials,
               budget);
    printHead("function", searches(budget));
    for (const std::size_t n : {10, 20}) {
      for (const Case& function : hardFunctionsOf(n)) {
        printRow(fmt::format("{} {}-D", function.name, n), function, searches(budget), kTrials);
      }
    }
  }
}

/// How far the median of Rosenbrock 30-D, with its optimum where the comparison has it, is certain: the interval that
/// holds 95 per cent of the medians of samples drawn from the trials (Efron 1979, doi:10.1214/aos/1176344552).
void printInterval() {
  constexpr int kSamples = 10000;
  const TestFunction function = functionNamed("Rosenbrock 30-D");
  fmt::print("\n{}, {} trials, 5000 evaluations of CMA-ES: median (interval of 95 per cent)\n\n", function.name,
             kTrials);
  for (const double step : {0.1, 0.2, 0.3}) {
    const Setting setting{.method = Method::cma, .budget = 5000, .cma = {.initialStep = step}};
    std::vector<double> values;
    for (const Outcome& outcome : runTrials(function, setting, false, kTrials)) values.push_back(outcome.best);
    UniformGenerator random(1);
    std::vector<double> medians;
    for (int sample = 0; sample < kSamples; ++sample) {
      std::vector<double> drawn;
      for (std::size_t i = 0; i < values.size(); ++i) {
        drawn.push_back(values[static_cast<std::size_t>(random.next() * static_cast<double>(values.size()))]);
      }
      medians.push_back(medianOf(std::move(drawn)));
    }
    std::ranges::sort(medians);
    const auto quantile = [&](double share) { return medians[static_cast<std::size_t>(share * kSamples)]; };
    fmt::print("Initial_Step = {}: {:.2f} ({:.2f} to {:.2f})\n", step, medianOf(values), quantile(0.025),
               quantile(0.975));
    std::fflush(stdout);
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

/// With the Gaussian process at its default rate: CMA-ES alone and with it, SCE with it. Medians after 300, 500 and
/// 1000 evaluations of the same runs.
void printSurrogate(std::string_view only, int trials, std::string_view onlyFunction) {
  const std::vector<int> checkpoints = {300, 500, 1000};
  const Setting withModel{
      .complexes = 2, .budget = 1000, .samplingRate = 25, .modelType = kGaussian, .checkpoints = checkpoints};
  Setting cma{.method = Method::cma, .budget = 1000, .checkpoints = checkpoints};
  Setting cmaWithModel = withModel;
  cmaWithModel.method = Method::cma;
  const std::vector<Search> columns = {
      {"CMA-ES", cma}, {"CMA-ES with model", cmaWithModel}, {"SCE with model", withModel}};
  fmt::print("\nMedian best value over {} trials after 300 / 500 / 1000 evaluations\n\n", trials);
  printHead("function", columns);
  for (const std::size_t n : {5, 10}) {
    for (const Case& function : functionsOf(n)) {
      const std::string name = fmt::format("{} {}-D", function.name, n);
      if (!onlyFunction.empty() && name != onlyFunction) continue;
      fmt::print("| {} |", name);
      for (const Search& search : columns) {
        if (!only.empty() && search.name != only) continue;
        const std::vector<Outcome> outcomes = runTrials(function.make, search.setting, trials);
        std::vector<std::string> medians;
        for (std::size_t i = 0; i < checkpoints.size(); ++i) {
          std::vector<double> values;
          for (const Outcome& outcome : outcomes) values.push_back(outcome.bestAfter[i]);
          medians.push_back(fmt::format("{:.2g}", medianOf(std::move(values))));
        }
        fmt::print(" {} |", fmt::join(medians, " / "));
        std::fflush(stdout);
      }
      fmt::print("\n");
      std::fflush(stdout);
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
  if (table.empty() || table == "hard") mirevo::printHard(argc > 2 ? std::atoi(argv[2]) : 0);
  if (table.empty() || table == "budgets") mirevo::printBudgets();
  if (table.empty() || table == "interval") mirevo::printInterval();
  if (table.empty() || table == "surrogate")
    mirevo::printSurrogate(argc > 2 ? argv[2] : "", argc > 3 ? std::atoi(argv[3]) : mirevo::kSurrogateTrials,
                           argc > 4 ? argv[4] : "");
  if (table.empty() || table == "noise") mirevo::printNoise();
  if (table.empty() || table == "slots") mirevo::printSlots();
  return 0;
}

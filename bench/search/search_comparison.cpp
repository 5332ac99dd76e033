/// Prints the tables of docs/algorithms/search-comparison.md. Usage: search_comparison [table], where the table is
/// "success", "budget", "complexes", "candidates", "window", "surrogate" or "overlap"; without an argument all of them.
/// Trials have the seeds 1, 2, 3,
/// ..., so that the figures are the same every time.

#include <algorithm>
#include <iterator>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "functions.h"
#include "trials.h"

namespace mirevo {
namespace {

using namespace bench;

constexpr int kTrials = 100;
constexpr int kCandidateTrials = 400;  // the median of Rosenbrock 10-D scatters much
constexpr int kSurrogateTrials = 20;
constexpr int kSuccessBudget = 25000;
constexpr int kSurrogateBudget = 6000;

void printSuccess() {
  for (const bool isShifted : {false, true}) {
    fmt::print("\nSuccesses of {} / mean evaluations of the successful, {} optimum\n\n", kTrials,
               isShifted ? "shifted" : "centred");
    fmt::print("| function | SCE 2 | SCE 4 | SCE 8 | PSE 2 | PSE 4 | PSE 8 |\n|---|---|---|---|---|---|---|\n");
    for (const TestFunction& function : allFunctions()) {
      constexpr std::string_view kOfOtherTables[] = {"Rastrigin 10-D", "Rosenbrock 10-D", "Ackley 30-D",
                                                     "Griewank 30-D", "Rosenbrock 30-D"};
      if (std::ranges::find(kOfOtherTables, function.name) != std::end(kOfOtherTables)) continue;
      fmt::print("| {} |", function.name);
      for (const Method method : {Method::sce, Method::pse}) {
        for (const int complexes : {2, 4, 8}) {
          const Setting setting{.method = method, .complexes = complexes, .stopsAtTarget = true};
          fmt::print(" {} |", successText(runTrials(function, setting, isShifted, kTrials)));
        }
      }
      fmt::print("\n");
    }
  }
}

void printBudget() {
  fmt::print("\nMean / median best value over {} trials, centred optimum\n\n", kTrials);
  fmt::print("| function | DDS 1000 | SCE 1000 | PSE 1000 | CMA-ES 1000 | SCE 5000 | PSE 5000 | CMA-ES 5000 |\n");
  fmt::print("|---|---|---|---|---|---|---|---|\n");
  for (const std::string name : {"Griewank 10-D", "Ackley 10-D", "Rastrigin 10-D", "Rosenbrock 10-D", "Hartman 6-D",
                                 "Ackley 30-D", "Griewank 30-D", "Rosenbrock 30-D"}) {
    const TestFunction function = functionNamed(name);
    fmt::print("| {} |", name);
    for (const Setting& setting :
         {Setting{.method = Method::dds, .budget = 1000}, Setting{.complexes = 2, .budget = 1000},
          Setting{.method = Method::pse, .complexes = 2, .budget = 1000},
          Setting{.method = Method::cma, .budget = 1000}, Setting{.complexes = 5, .budget = 5000},
          Setting{.method = Method::pse, .complexes = 5, .budget = 5000},
          Setting{.method = Method::cma, .budget = 5000}}) {
      fmt::print(" {} |", meanAndMedianText(runTrials(function, setting, false, kTrials)));
    }
    fmt::print("\n");
  }
}

/// What OPSE costs, by the number of sets in flight relative to the population.
void printOverlap() {
  constexpr double kInFlight[] = {0.0, 0.25, 0.5, 0.75, 1.0, 1.5, 2.0};  // 0: one set
  for (const int complexes : {4, 2}) {
    fmt::print("\nSuccesses of {} / mean evaluations of the successful, shifted optimum, {}(2n + 1) points\n\n",
               kTrials, complexes);
    fmt::print("| function | PSE | W = 1 | N/4 | N/2 | 3N/4 | N | 3N/2 | 2N |\n");
    fmt::print("|---|---|---|---|---|---|---|---|---|\n");
    for (const std::string name :
         {"Goldstein-Price 2-D", "Rosenbrock 2-D", "Six-hump camel-back 2-D", "Rastrigin 2-D", "Griewank 2-D",
          "Shekel 4-D", "Rosenbrock 4-D", "Hartman 6-D", "Griewank 10-D", "Ackley 10-D"}) {
      const TestFunction function = functionNamed(name);
      const Setting alone{.method = Method::pse, .complexes = complexes, .stopsAtTarget = true};
      fmt::print("| {} | {} |", name, successText(runTrials(function, alone, true, kTrials)));
      for (const double inFlight : kInFlight) {
        const Setting setting{
            .method = Method::opse, .complexes = complexes, .stopsAtTarget = true, .inFlight = inFlight};
        fmt::print(" {} |", successText(runTrials(function, setting, true, kTrials)));
      }
      fmt::print("\n");
      std::fflush(stdout);
    }
  }
}

void printOverlapBudget() {
  fmt::print("\nMean / median best value over {} trials, centred optimum\n\n", kTrials);
  fmt::print("| function | PSE 1000 | W = N/2 | W = N | W = 2N | PSE 5000 | W = N/2 | W = N | W = 2N |\n");
  fmt::print("|---|---|---|---|---|---|---|---|---|\n");
  for (const std::string name : {"Griewank 10-D", "Ackley 10-D", "Rastrigin 10-D", "Rosenbrock 10-D", "Hartman 6-D"}) {
    const TestFunction function = functionNamed(name);
    fmt::print("| {} |", name);
    for (const auto& [complexes, budget] : {std::pair{2, 1000}, {5, 5000}}) {
      const Setting alone{.method = Method::pse, .complexes = complexes, .budget = budget};
      fmt::print(" {} |", meanAndMedianText(runTrials(function, alone, false, kTrials)));
      for (const double inFlight : {0.5, 1.0, 2.0}) {
        const Setting setting{.method = Method::opse, .complexes = complexes, .budget = budget, .inFlight = inFlight};
        fmt::print(" {} |", meanAndMedianText(runTrials(function, setting, false, kTrials)));
      }
    }
    fmt::print("\n");
    std::fflush(stdout);
  }
}

void printSmallComplexes() {
  for (const bool goesOn : {false, true}) {
    fmt::print("\nMean / median best value of SCE with 5 complexes after 5000 evaluations over {} trials{}\n\n",
               kTrials, goesOn ? ", without the test of the population's range" : "");
    fmt::print("| function | m = n + 2 | m = n + 4 | m = n + 6 | m = 2n + 1 |\n|---|---|---|---|---|\n");
    for (const std::string name : {"Griewank 10-D", "Ackley 10-D", "Rastrigin 10-D", "Rosenbrock 10-D"}) {
      const TestFunction function = functionNamed(name);
      fmt::print("| {} |", name);
      for (const int extraPoints : {1, 3, 5, 0}) {
        const Setting setting{
            .complexes = 5, .budget = 5000, .extraPoints = extraPoints, .goesOnWhenConverged = goesOn};
        fmt::print(" {} |", meanAndMedianText(runTrials(function, setting, false, kTrials)));
      }
      fmt::print("\n");
    }
  }
}

/// In as many evaluations as a serial search, and in k times as many, which k slots make in the same time.
void printCandidates() {
  constexpr int kSerialBudget = 1000;
  for (const bool isEqualTime : {false, true}) {
    for (const bool waitsForAll : {false, true}) {
      fmt::print("\nMedian best value over {} trials, {} evaluations, centred optimum, {}\n\n", kCandidateTrials,
                 isEqualTime ? fmt::format("{} k", kSerialBudget) : std::to_string(kSerialBudget),
                 waitsForAll ? "steps of k candidates" : "k candidates under way");
      fmt::print("| function | DDS (k = 1) | k = 2 | k = 4 | k = 8 | k = 16 |\n|---|---|---|---|---|---|\n");
      for (const std::string name : {"Ackley 10-D", "Griewank 10-D", "Rastrigin 10-D", "Rosenbrock 10-D"}) {
        const TestFunction function = functionNamed(name);
        fmt::print("| {} |", name);
        for (const int k : {1, 2, 4, 8, 16}) {
          const Setting setting{.method = Method::dds,
                                .budget = isEqualTime ? k * kSerialBudget : kSerialBudget,
                                .dds = {.candidates = k, .waitsForAll = waitsForAll}};
          fmt::print(" {:.3g} |", medianOf(runTrials(function, setting, false, kCandidateTrials)));
        }
        fmt::print("\n");
      }
    }
  }
}

/// More candidates under way than slots: what it costs that slow model runs leave no slot idle.
void printWindows() {
  constexpr int kBudget = 8000;
  fmt::print("\nMedian best value over {} trials, {} evaluations, centred optimum, k candidates under way\n\n", kTrials,
             kBudget);
  fmt::print("| function | DDS (k = 1) | k = 8 | k = 16 | k = 24 | k = 32 |\n|---|---|---|---|---|---|\n");
  for (const std::string name : {"Ackley 10-D", "Griewank 10-D", "Rastrigin 10-D", "Rosenbrock 10-D"}) {
    const TestFunction function = functionNamed(name);
    fmt::print("| {} |", name);
    for (const int k : {1, 8, 16, 24, 32}) {
      const Setting setting{.method = Method::dds, .budget = kBudget, .dds = {.candidates = k, .waitsForAll = false}};
      fmt::print(" {:.3g} |", medianOf(runTrials(function, setting, false, kTrials)));
    }
    fmt::print("\n");
  }
}

void printSurrogate() {
  fmt::print("\nSuccesses of {} / mean evaluations of the successful, shifted optimum, 4 complexes\n\n",
             kSurrogateTrials);
  fmt::print("| function | search | alone | quadratic 50 % | quadratic 25 % | Gaussian 50 % | Gaussian 25 % |\n");
  fmt::print("|---|---|---|---|---|---|---|\n");
  for (const std::string name :
       {"Goldstein-Price 2-D", "Rosenbrock 2-D", "Six-hump camel-back 2-D", "Rastrigin 2-D", "Griewank 2-D",
        "Shekel 4-D", "Rosenbrock 4-D", "Hartman 6-D", "Griewank 10-D", "Ackley 10-D"}) {
    const TestFunction function = functionNamed(name);
    for (const Method method : {Method::sce, Method::pse}) {
      fmt::print("| {} | {} |", name, method == Method::sce ? "SCE" : "PSE");
      for (const auto& [rate, model] :
           {std::pair{100, kQuadratic}, {50, kQuadratic}, {25, kQuadratic}, {50, kGaussian}, {25, kGaussian}}) {
        const Setting setting{method, 4, kSurrogateBudget, rate, model, true};
        fmt::print(" {} |", successText(runTrials(function, setting, true, kSurrogateTrials)));
      }
      fmt::print("\n");
    }
  }
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  const std::string table = argc > 1 ? argv[1] : "";
  if (table.empty() || table == "success") mirevo::printSuccess();
  if (table.empty() || table == "budget") mirevo::printBudget();
  if (table.empty() || table == "overlap") {
    mirevo::printOverlap();
    mirevo::printOverlapBudget();
  }
  if (table.empty() || table == "complexes") mirevo::printSmallComplexes();
  if (table.empty() || table == "candidates") mirevo::printCandidates();
  if (table.empty() || table == "window") mirevo::printWindows();
  if (table.empty() || table == "surrogate") mirevo::printSurrogate();
  return 0;
}

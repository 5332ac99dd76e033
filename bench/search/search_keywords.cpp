/// Prints what optional keywords of the searches bring and cost: tables of docs/algorithms/sce.md, pse.md and
/// surrogate.md. Usage: search_keywords range|factors|expansion|valley [trials], or checks-quadratic|checks-gaussian
/// trials intervals function..., such as checks-gaussian 100 0,4 'Rastrigin 2-D'; seeds are 1, 2, 3, ....

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <sstream>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "functions.h"
#include "trials.h"

namespace mirevo {
namespace {

using namespace bench;

int trials = 100;

const std::vector<std::string> kSuccessFunctions{
    "Goldstein-Price 2-D", "Rosenbrock 2-D", "Six-hump camel-back 2-D", "Rastrigin 2-D", "Griewank 2-D", "Shekel 4-D",
    "Rosenbrock 4-D",      "Hartman 6-D",    "Griewank 10-D",           "Ackley 10-D"};

using Header = std::vector<std::string>;

void printHead(const std::string& title, const Header& columns) {
  fmt::print("\n{}\n\n| function |", title);
  for (const std::string& column : columns) fmt::print(" {} |", column);
  fmt::print("\n|---|");
  for (std::size_t i = 0; i < columns.size(); ++i) fmt::print("---|");
  fmt::print("\n");
}

void printCell(const std::string& text) {
  fmt::print(" {} |", text);
  std::fflush(stdout);
}

/// By the limit of the test of the population's range.
void printRanges() {
  constexpr double kLimits[] = {1e-2, 1e-3, 1e-4, 1e-5, 1e-8, 0.0};
  const Header columns{"1e-2", "1e-3", "1e-4", "1e-5", "1e-8", "0"};
  for (const int complexes : {2, 4}) {
    printHead(fmt::format("Successes of {} / mean evaluations of the successful / of all until the end, SCE with {} "
                          "complexes, centred optimum, budget 5000",
                          trials, complexes),
              columns);
    for (const std::string& name : kSuccessFunctions) {
      fmt::print("| {} |", name);
      for (const double limit : kLimits) {
        const Setting setting{.complexes = complexes, .budget = 5000, .minPopulationRange = limit};
        const auto outcomes = runTrials(functionNamed(name), setting, false, trials);
        double sum = 0.0;
        for (const Outcome& outcome : outcomes) sum += outcome.evaluationsMade;
        printCell(fmt::format("{}/{:.0f}", successText(outcomes), sum / trials));
      }
      fmt::print("\n");
    }
  }
  for (const int extraPoints : {1, 3, 0}) {
    printHead(
        fmt::format("Mean / median best value over {} trials after at most 5000 evaluations, SCE with 5 complexes "
                    "of {} points, centred optimum",
                    trials, extraPoints > 0 ? fmt::format("n + {}", extraPoints + 1) : "2n + 1"),
        columns);
    for (const std::string name : {"Griewank 10-D", "Ackley 10-D", "Rastrigin 10-D", "Rosenbrock 10-D"}) {
      fmt::print("| {} |", name);
      for (const double limit : kLimits) {
        const Setting setting{.complexes = 5, .budget = 5000, .extraPoints = extraPoints, .minPopulationRange = limit};
        printCell(meanAndMedianText(runTrials(functionNamed(name), setting, false, trials)));
      }
      fmt::print("\n");
    }
  }
}

/// With the factors of SCE and with those of the papers.
void printFactors() {
  printHead(fmt::format("Successes of {} / mean evaluations of the successful, SCE with 2 and 4 complexes, own and "
                        "published factors",
                        trials),
            {"centred: 2", "2 published", "4", "4 published", "shifted: 2", "2 published", "4", "4 published"});
  for (const std::string& name : kSuccessFunctions) {
    fmt::print("| {} |", name);
    for (const bool isShifted : {false, true}) {
      for (const int complexes : {2, 4}) {
        for (const bool isPublished : {false, true}) {
          const Setting setting{.complexes = complexes, .stopsAtTarget = true, .usesPublishedFactors = isPublished};
          printCell(successText(runTrials(functionNamed(name), setting, isShifted, trials)));
        }
      }
    }
    fmt::print("\n");
  }
}

/// By the share of expansions among the reflections of PSE, and with OPSE.
void printExpansions() {
  for (const bool isShifted : {false, true}) {
    printHead(
        fmt::format("Successes of {} / mean evaluations of the successful, {} optimum; OPSE has one set in flight",
                    trials, isShifted ? "shifted" : "centred"),
        {"PSE 4, 0", "0.1", "0.2", "0.3", "PSE 8, 0", "0.2", "OPSE 4, 0", "0.2"});
    for (const std::string& name : kSuccessFunctions) {
      fmt::print("| {} |", name);
      const auto print = [&](Method method, int complexes, double share) {
        const Setting setting{
            .method = method, .complexes = complexes, .stopsAtTarget = true, .inFlight = 0.0, .expansionShare = share};
        printCell(successText(runTrials(functionNamed(name), setting, isShifted, trials)));
      };
      for (const double share : {0.0, 0.1, 0.2, 0.3}) print(Method::pse, 4, share);
      for (const double share : {0.0, 0.2}) print(Method::pse, 8, share);
      for (const double share : {0.0, 0.2}) print(Method::opse, 4, share);
      fmt::print("\n");
    }
  }
  printHead(
      fmt::format("Mean / median best value of PSE over {} trials after 5000 evaluations, 5(2n + 1) points, centred "
                  "optimum",
                  trials),
      {"0", "0.1", "0.2", "0.3"});
  for (const std::string name :
       {"Griewank 10-D", "Ackley 10-D", "Rastrigin 10-D", "Rosenbrock 10-D", "Rosenbrock 30-D"}) {
    fmt::print("| {} |", name);
    for (const double share : {0.0, 0.1, 0.2, 0.3}) {
      const Setting setting{.method = Method::pse, .complexes = 5, .budget = 5000, .expansionShare = share};
      printCell(meanAndMedianText(runTrials(functionNamed(name), setting, false, trials)));
    }
    fmt::print("\n");
  }
}

/// Where PSE ends that misses the optimum of a bent valley, by the limit of the population's range.
void printValley() {
  for (const double limit : {1e-5, 0.0}) {
    const Setting setting{.method = Method::pse, .complexes = 4, .stopsAtTarget = true, .minPopulationRange = limit};
    const auto outcomes = runTrials(functionNamed("Rosenbrock 4-D"), setting, false, trials);
    std::vector<double> missed;
    for (const Outcome& outcome : outcomes) {
      if (!outcome.isSuccess) missed.push_back(outcome.best);
    }
    if (missed.empty()) continue;
    const auto [least, most] = std::ranges::minmax(missed);
    fmt::print("Rosenbrock 4-D, limit {}: {}, the others end at values from {:.2g} to {:.2g}\n", limit,
               successText(outcomes), least, most);
  }
}

/// By the interval of loops that are made without the surrogate model.
void printChecks(SurrogateModelType model, const std::vector<int>& intervals, const std::vector<std::string>& names) {
  Header columns{"search", "alone"};
  for (const int interval : intervals) columns.push_back(std::to_string(interval));
  printHead(
      fmt::format("Successes of {} / mean evaluations of the successful, 4 complexes, shifted optimum, {}, rate 25",
                  trials, model == kGaussian ? "Gaussian process" : "quadratic polynomial"),
      columns);
  for (const std::string& name : names) {
    for (const Method method : {Method::sce, Method::pse}) {
      fmt::print("| {} | {} |", name, method == Method::sce ? "SCE" : "PSE");
      const Setting alone{.method = method, .complexes = 4, .budget = 6000, .stopsAtTarget = true};
      printCell(successText(runTrials(functionNamed(name), alone, true, trials)));
      for (const int interval : intervals) {
        Setting setting = alone;
        setting.samplingRate = 25;
        setting.modelType = model;
        setting.checkInterval = interval;
        printCell(successText(runTrials(functionNamed(name), setting, true, trials)));
      }
      fmt::print("\n");
    }
  }
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  const std::string table = argc > 1 ? argv[1] : "";
  if (argc > 2) mirevo::trials = std::atoi(argv[2]);
  if (table == "range") mirevo::printRanges();
  if (table == "factors") mirevo::printFactors();
  if (table == "expansion") mirevo::printExpansions();
  if (table == "valley") mirevo::printValley();
  if (table.starts_with("checks-") && argc > 3) {
    std::vector<int> intervals;
    std::istringstream given(argv[3]);
    for (std::string interval; std::getline(given, interval, ',');) intervals.push_back(std::stoi(interval));
    const std::vector<std::string> names(argv + 4, argv + argc);
    mirevo::printChecks(table == "checks-gaussian" ? mirevo::bench::kGaussian : mirevo::bench::kQuadratic, intervals,
                        names);
  }
  return 0;
}

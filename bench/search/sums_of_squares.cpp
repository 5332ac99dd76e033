/// Prints the table of GLM in docs/algorithms/search-comparison.md: functions that are sums of squares, of which GLM
/// knows the squared terms and the other searches only the sum. Usage: sums_of_squares [seeds]

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/rotated_functions.h"
#include "glm_trials.h"

namespace mirevo {
namespace {

using namespace bench;

struct Problem {
  std::string name;
  std::function<TestFunction(int seed)> function;  ///< its value is not used
  std::function<Residuals(int seed)> residuals;
};

/// With the optimum moved as testing::shifted() moves it.
Problem rosenbrockOf(std::size_t n) {
  const auto function = [n](int seed) {
    return testing::shifted(testing::cube("", n, -5, 5, 1, 0.0, testing::rosenbrock), seed);
  };
  return {fmt::format("Rosenbrock {}-D", n), function, [n, function](int seed) -> Residuals {
            const std::vector<double> optimum = function(seed).optimum;
            return [n, optimum](const std::vector<double>& x) {
              std::vector<double> moved(n);
              for (std::size_t j = 0; j < n; ++j) moved[j] = x[j] - optimum[j] + 1.0;
              std::vector<double> residuals;
              for (std::size_t j = 0; j + 1 < n; ++j) {
                residuals.push_back(10.0 * (moved[j + 1] - moved[j] * moved[j]));
                residuals.push_back(1.0 - moved[j]);
              }
              return residuals;
            };
          }};
}

/// Moré, Garbow and Hillstrom (1981), problem 22: for each four parameters Powell's singular function.
Problem powellOf(std::size_t n) {
  const Residuals residuals = [n](const std::vector<double>& x) {
    std::vector<double> found;
    for (std::size_t j = 0; j + 3 < n; j += 4) {
      found.push_back(x[j] + 10.0 * x[j + 1]);
      found.push_back(std::sqrt(5.0) * (x[j + 2] - x[j + 3]));
      found.push_back(std::pow(x[j + 1] - 2.0 * x[j + 2], 2.0));
      found.push_back(std::sqrt(10.0) * std::pow(x[j] - x[j + 3], 2.0));
    }
    return found;
  };
  return {fmt::format("Powell singular {}-D", n), [n](int) { return testing::cube("", n, -5, 4, 0, 0.0, {}); },
          [residuals](int) { return residuals; }};
}

/// The same, problem 16, with its bounds widened to ±4.5.
Problem beale() {
  const Residuals residuals = [](const std::vector<double>& x) {
    std::vector<double> found;
    double power = 1.0;
    for (const double y : {1.5, 2.25, 2.625}) found.push_back(y - x[0] * (1.0 - (power *= x[1])));
    return found;
  };
  return {"Beale 2-D",
          [](int) {
            TestFunction function = testing::cube("", 2, -4.5, 4.5, 0, 0.0, {});
            function.optimum = {3.0, 0.5};
            return function;
          },
          [residuals](int) { return residuals; }};
}

void print(int seeds) {
  const Setting cma{.method = Method::cma, .budget = kUnlimited, .stopsAtTarget = true};
  const Setting sce{.complexes = 4, .budget = kUnlimited, .stopsAtTarget = true};
  fmt::print("\nSuccesses of {} / mean evaluations of the successful to within 1e-3 of the optimum\n\n", seeds);
  fmt::print("| function | GLM | GLM, 20 sets, 10 starts | CMA-ES | SCE 4 |\n|---|---|---|---|---|\n");
  for (const Problem& problem : {beale(), rosenbrockOf(2), powellOf(4), rosenbrockOf(4), powellOf(8), rosenbrockOf(10),
                                 powellOf(20), rosenbrockOf(30)}) {
    const auto functionOf = [&problem](int seed) {
      TestFunction function = problem.function(seed);
      function.value = [residuals = problem.residuals(seed)](const std::vector<double>& x) {
        double sum = 0.0;
        for (const double value : residuals(x)) sum += value * value;
        return sum;
      };
      return function;
    };
    fmt::print("| {} |", problem.name);
    for (const GlmSettings& settings :
         {GlmSettings{.perturbationFraction = 1e-5},
          GlmSettings{.perturbationFraction = 1e-5, .sampleSize = 20, .startCount = 10}}) {
      std::vector<Outcome> outcomes;
      for (int seed = 1; seed <= seeds; ++seed) {
        outcomes.push_back(runGlmTrial(functionOf(seed), problem.residuals(seed), settings, cma, seed));
      }
      fmt::print(" {} |", successText(outcomes));
    }
    for (const Setting& setting : {cma, sce}) fmt::print(" {} |", successText(runTrials(functionOf, setting, seeds)));
    fmt::print("\n");
    std::fflush(stdout);
  }
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  mirevo::print(argc > 1 ? std::atoi(argv[1]) : 100);
  return 0;
}

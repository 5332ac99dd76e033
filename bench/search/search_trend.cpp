/// Prints how well the trend that the log of a search ends with holds: the fall of the best value over as many
/// evaluations again, divided by the fall that BestCourse expects. Usage: search_trend [seeds].

#include <algorithm>
#include <cstdlib>
#include <string_view>
#include <utility>
#include <vector>

#include <fmt/format.h>

#include "algorithms/rotated_functions.h"
#include "algorithms/searches/best_course.h"
#include "functions.h"
#include "trials.h"

namespace mirevo {
namespace {

using namespace bench;

struct Shares {
  std::vector<double> ratios;  ///< fall that came / expected
  int little = 0;              ///< runs of which "little" was expected
  int littleWrong = 0;         ///< and that fell by more than a tenth
};

double at(std::vector<double> values, double share) {
  if (values.empty()) return 0.0;
  std::sort(values.begin(), values.end());
  return values[static_cast<std::size_t>(share * static_cast<double>(values.size() - 1))];
}

/// The values of the first and of the second half of a run of twice the budget.
void tryOut(TestFunction function, Setting setting, int budget, int seed, Shares& shares) {
  std::vector<double> values;
  function.value = [value = function.value, &values](const std::vector<double>& x) {
    values.push_back(value(x));
    return values.back();
  };
  setting.budget = 2 * budget;
  setting.goesOnWhenConverged = setting.method != Method::dds && setting.method != Method::cma;
  runTrial(function, setting, seed);
  if (std::ssize(values) < 2 * budget) return;
  BestCourse course;
  for (int i = 0; i < budget; ++i) course.add(values[i]);
  const double best = course.bestAfter(budget);
  const double fall = best - std::min(best, *std::min_element(values.begin() + budget, values.begin() + 2 * budget));
  const double expected = course.expectedFall();
  if (expected <= 1.0e-3 * std::abs(best)) {
    ++shares.little;
    if (fall > 0.1 * std::abs(best)) ++shares.littleWrong;
  } else {
    shares.ratios.push_back(fall / expected);
  }
}

int run(int seeds) {
  using namespace testing;
  const std::vector<std::pair<std::string_view, Setting>> searches{
      {"CMA-ES", {.method = Method::cma}}, {"SCE", {.method = Method::sce}}, {"PSE", {.method = Method::pse}}};
  const std::size_t n = 10;
  const std::vector<TestFunction> functions{
      cube("", n, -32.768, 32.768, 0, 0.0, ackley),
      cube("", n, -600, 600, 0, 0.0, [](const auto& x) { return griewank(x, 4000.0); }),
      cube("", n, -5.12, 5.12, 0, 0.0, rastrigin), cube("", n, -5, 5, 1, 0.0, rosenbrock)};
  fmt::print(
      "| search | budget | runs with a fall expected | median of fall / expected | a tenth below | a tenth above | "
      "\"little\" expected | of them fell by more than 10 % |\n|---|---|---|---|---|---|---|---|\n");
  for (const auto& [name, setting] : searches) {
    for (const int budget : {500, 1000, 2500}) {
      Shares shares;
      for (const TestFunction& function : functions) {
        for (int seed = 1; seed <= seeds; ++seed) tryOut(shifted(function, seed), setting, budget, seed, shares);
      }
      fmt::print("| {} | {} | {} | {:.2f} | {:.2f} | {:.2f} | {} | {} |\n", name, budget, shares.ratios.size(),
                 at(shares.ratios, 0.5), at(shares.ratios, 0.1), at(shares.ratios, 0.9), shares.little,
                 shares.littleWrong);
    }
  }
  return 0;
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  return mirevo::run(argc > 1 ? std::atoi(argv[1]) : 50);
}

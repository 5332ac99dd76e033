/// Prints the tables of docs/algorithms/search-comparison.md. Usage: search_comparison [table], where the table is
/// "success", "budget", "complexes", "candidates", "window", "surrogate" or "overlap"; without an argument all of them.
/// Trials have the seeds 1, 2, 3,
/// ..., so that the figures are the same every time.

#include <algorithm>
#include <functional>
#include <iterator>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "algorithms/searches/dds.h"
#include "algorithms/searches/opse.h"
#include "algorithms/searches/pse.h"
#include "algorithms/searches/sce.h"
#include "algorithms/surrogate/proposal_selector.h"
#include "algorithms/test_functions.h"
#include "evaluation/evaluator.h"

namespace mirevo {
namespace {

using testing::TestFunction;

double sixHumpCamelBack(const std::vector<double>& x) {
  const double a = x[0] * x[0];
  const double b = x[1] * x[1];
  return (4.0 - 2.1 * a + a * a / 3.0) * a + x[0] * x[1] + (-4.0 + 4.0 * b) * b;
}

double hartman6(const std::vector<double>& x) {
  static constexpr double a[4][6] = {
      {10, 3, 17, 3.5, 1.7, 8}, {0.05, 10, 17, 0.1, 8, 14}, {3, 3.5, 1.7, 10, 17, 8}, {17, 8, 0.05, 10, 0.1, 14}};
  static constexpr double c[4] = {1.0, 1.2, 3.0, 3.2};
  static constexpr double p[4][6] = {{0.1312, 0.1696, 0.5569, 0.0124, 0.8283, 0.5886},
                                     {0.2329, 0.4135, 0.8307, 0.3736, 0.1004, 0.9991},
                                     {0.2348, 0.1451, 0.3522, 0.2883, 0.3047, 0.6650},
                                     {0.4047, 0.8828, 0.8732, 0.5743, 0.1091, 0.0381}};
  double sum = 0.0;
  for (std::size_t i = 0; i < 4; ++i) {
    double exponent = 0.0;
    for (std::size_t j = 0; j < 6; ++j) exponent += a[i][j] * (x[j] - p[i][j]) * (x[j] - p[i][j]);
    sum -= c[i] * std::exp(-exponent);
  }
  return sum;
}

double goldsteinPrice(const std::vector<double>& x) {
  const double a = x[0];
  const double b = x[1];
  const double first =
      1.0 + (a + b + 1.0) * (a + b + 1.0) * (19.0 - 14.0 * a + 3.0 * a * a - 14.0 * b + 6.0 * a * b + 3.0 * b * b);
  const double second = 30.0 + (2.0 * a - 3.0 * b) * (2.0 * a - 3.0 * b) *
                                   (18.0 - 32.0 * a + 12.0 * a * a + 48.0 * b - 36.0 * a * b + 27.0 * b * b);
  return first * second;
}

/// The two-dimensional form, with the minimum −2.
double rastriginPlane(const std::vector<double>& x) {
  return x[0] * x[0] + x[1] * x[1] - std::cos(18.0 * x[0]) - std::cos(18.0 * x[1]);
}

double shekel10(const std::vector<double>& x) {
  static constexpr double a[10][4] = {{4, 4, 4, 4}, {1, 1, 1, 1}, {8, 8, 8, 8}, {6, 6, 6, 6}, {3, 7, 3, 7},
                                      {2, 9, 2, 9}, {5, 5, 3, 3}, {8, 1, 8, 1}, {6, 2, 6, 2}, {7, 3.6, 7, 3.6}};
  static constexpr double c[10] = {0.1, 0.2, 0.2, 0.4, 0.4, 0.6, 0.3, 0.7, 0.5, 0.5};
  double sum = 0.0;
  for (std::size_t i = 0; i < 10; ++i) {
    double squares = c[i];
    for (std::size_t j = 0; j < 4; ++j) squares += (x[j] - a[i][j]) * (x[j] - a[i][j]);
    sum -= 1.0 / squares;
  }
  return sum;
}

/// The functions of Duan, Sorooshian and Gupta (1993) with their bounds, and ten-dimensional ones that are usual for
/// comparing searches with small budgets.
std::vector<TestFunction> allFunctions() {
  using testing::cube;
  using testing::griewank;
  using testing::rosenbrock;
  using testing::testFunction;
  return {
      {"Goldstein-Price 2-D", {-2, -2}, {2, 2}, {0, -1}, 3.0, goldsteinPrice},
      testFunction("Rosenbrock 2-D"),
      {"Six-hump camel-back 2-D", {-5, -5}, {5, 5}, {0.08984201, -0.71265640}, -1.03162845, sixHumpCamelBack},
      cube("Rastrigin 2-D", 2, -1, 1, 0, -2.0, rastriginPlane),
      testFunction("Griewank 2-D"),
      cube("Griewank 10-D", 10, -600, 600, 0, 0.0, [](const auto& x) { return griewank(x, 4000.0); }),
      {"Shekel 4-D",
       {0, 0, 0, 0},
       {10, 10, 10, 10},
       {4.00074671, 4.00059326, 3.99966290, 3.99950981},
       -10.53640982,
       shekel10},
      {"Hartman 6-D",
       {0, 0, 0, 0, 0, 0},
       {1, 1, 1, 1, 1, 1},
       {0.20168952, 0.15001069, 0.47687398, 0.27533243, 0.31165162, 0.65730054},
       -3.32236801,
       hartman6},
      testFunction("Ackley 10-D"),
      testFunction("Rastrigin 10-D"),
      cube("Rosenbrock 10-D", 10, -5, 5, 1, 0.0, rosenbrock),
      cube("Rosenbrock 4-D", 4, -5, 5, 1, 0.0, rosenbrock),
  };
}

TestFunction functionNamed(const std::string& name) {
  const auto functions = allFunctions();
  const auto found = std::ranges::find(functions, name, &TestFunction::name);
  return functions.at(static_cast<std::size_t>(found - functions.begin()));
}

constexpr int kTrials = 100;
constexpr int kCandidateTrials = 400;  // the median of Rosenbrock 10-D scatters much
constexpr int kSurrogateTrials = 20;
constexpr int kSuccessBudget = 25000;
constexpr int kSurrogateBudget = 6000;

constexpr auto kQuadratic = SurrogateModelType::quadraticPolynomial;
constexpr auto kGaussian = SurrogateModelType::gaussianProcess;

enum class Method { sce, pse, opse, dds };

struct Setting {
  Method method = Method::sce;
  int complexes = 2;  ///< the population has this many times 2n + 1 points, for PSE, too
  int budget = kSuccessBudget;
  int samplingRate = 100;  ///< per cent; below 100 with the surrogate model
  SurrogateModelType modelType = SurrogateModelType::quadraticPolynomial;
  bool stopsAtTarget = false;
  int extraPoints = 0;               ///< points per complex beyond n + 1; 0 means n, that is 2n + 1 points
  double inFlight = 0.5;             ///< of OPSE, sets for each point of the population
  bool goesOnWhenConverged = false;  ///< until the budget is used up, whatever the stopping tests say
  DdsSettings dds = {};
};

struct Outcome {
  bool isSuccess = false;
  int evaluations = 0;  ///< until the first value within the tolerance of the optimum
  double best = 0.0;
};

/// Evaluates a function; counts the evaluations and records when a value is first within the tolerance of the optimum.
class TargetEvaluator final : public Evaluator {
 public:
  explicit TargetEvaluator(TestFunction function, double tolerance = 1.0e-3)
      : function_(std::move(function)), tolerance_(tolerance) {}

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode) override {
    std::vector<EvaluationResult> results(sets.size());
    for (std::size_t i = 0; i < sets.size(); ++i) {
      const double value = function_.value(sets[i]);
      results[i].number = ++evaluations;
      results[i].aggregate = value;
      if (evaluationsToTarget == 0 && value - function_.optimalValue <= tolerance_) evaluationsToTarget = evaluations;
    }
    return results;
  }

  bool hasHitTarget() const { return evaluationsToTarget > 0; }

  int evaluations = 0;
  int evaluationsToTarget = 0;  ///< 0 until the target is reached

 private:
  TestFunction function_;
  double tolerance_;
};

Outcome runTrial(const TestFunction& function, const Setting& setting, int seed) {
  TargetEvaluator evaluator(function);
  UniformGenerator random(seed);
  const SearchBounds bounds = testing::boundsOf(function);
  const int n = static_cast<int>(function.size());
  const SurrogateSettings surrogate{.samplingRate = setting.samplingRate, .modelType = setting.modelType};
  ProposalSelector selector(surrogate, bounds);
  // The test of the change of the objective is switched off by a history that is never filled.
  const StoppingCriteria stopping{setting.budget, 1000000000, 0.0};
  const SearchProblem problem{bounds,
                              stopping,
                              InitialSampleSettings{false, SampleGeneration::latinHypercube, ""},
                              {},
                              evaluator,
                              random,
                              setting.samplingRate < 100 ? &selector : nullptr};
  std::unique_ptr<SearchAlgorithm> search;
  if (setting.method == Method::sce) {
    const int points = n + 1 + (setting.extraPoints > 0 ? setting.extraPoints : n);
    search = std::make_unique<Sce>(SceSettings{setting.complexes, points, points}, SimplexSettings{n + 1}, problem);
  } else if (setting.method == Method::pse) {
    search = std::make_unique<Pse>(PseSettings{setting.complexes * (2 * n + 1)}, SimplexSettings{n + 1}, problem);
  } else if (setting.method == Method::opse) {
    const int points = setting.complexes * (2 * n + 1);
    const int inFlight = std::max(1, static_cast<int>(setting.inFlight * points));
    search = std::make_unique<Opse>(OpseSettings{{points}, inFlight}, SimplexSettings{n + 1}, problem);
  } else {
    search = std::make_unique<Dds>(setting.dds, setting.budget, false, bounds, evaluator, random);
  }
  if (search->initialise() != kSearchOk) return {};
  const auto isOver = [&] {
    if (setting.stopsAtTarget && evaluator.hasHitTarget()) return true;
    return setting.goesOnWhenConverged ? evaluator.evaluations >= setting.budget : search->isTerminated();
  };
  while (!isOver()) {
    if (search->advance() != kSearchOk) return {};
  }
  return {evaluator.hasHitTarget(), evaluator.evaluationsToTarget, search->summary().bestResult.aggregate};
}

std::vector<Outcome> runTrials(const TestFunction& function, Setting setting, bool isShifted, int trials) {
  std::vector<Outcome> outcomes;
  for (int seed = 1; seed <= trials; ++seed) {
    outcomes.push_back(runTrial(isShifted ? testing::shifted(function, seed) : function, setting, seed));
  }
  return outcomes;
}

/// "successes/mean evaluations of the successful trials".
std::string successText(const std::vector<Outcome>& outcomes) {
  int successes = 0;
  double sum = 0.0;
  for (const Outcome& outcome : outcomes) {
    if (!outcome.isSuccess) continue;
    ++successes;
    sum += outcome.evaluations;
  }
  return successes == 0 ? "0/–" : fmt::format("{}/{:.0f}", successes, sum / successes);
}

double medianOf(const std::vector<Outcome>& outcomes) {
  std::vector<double> values;
  for (const Outcome& outcome : outcomes) values.push_back(outcome.best);
  std::sort(values.begin(), values.end());
  return 0.5 * (values[(values.size() - 1) / 2] + values[values.size() / 2]);
}

std::string meanAndMedianText(const std::vector<Outcome>& outcomes) {
  double sum = 0.0;
  for (const Outcome& outcome : outcomes) sum += outcome.best;
  return fmt::format("{:.3g} / {:.3g}", sum / static_cast<double>(outcomes.size()), medianOf(outcomes));
}

void printSuccess() {
  for (const bool isShifted : {false, true}) {
    fmt::print("\nSuccesses of {} / mean evaluations of the successful, {} optimum\n\n", kTrials,
               isShifted ? "shifted" : "centred");
    fmt::print("| function | SCE 2 | SCE 4 | SCE 8 | PSE 2 | PSE 4 | PSE 8 |\n|---|---|---|---|---|---|---|\n");
    for (const TestFunction& function : allFunctions()) {
      constexpr std::string_view kOfOtherTables[] = {"Rastrigin 10-D", "Rosenbrock 10-D"};
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
  fmt::print("| function | DDS 1000 | SCE 1000 | PSE 1000 | SCE 5000 | PSE 5000 |\n|---|---|---|---|---|---|\n");
  for (const std::string name : {"Griewank 10-D", "Ackley 10-D", "Rastrigin 10-D", "Rosenbrock 10-D", "Hartman 6-D"}) {
    const TestFunction function = functionNamed(name);
    fmt::print("| {} |", name);
    for (const Setting& setting :
         {Setting{.method = Method::dds, .budget = 1000}, Setting{.complexes = 2, .budget = 1000},
          Setting{.method = Method::pse, .complexes = 2, .budget = 1000}, Setting{.complexes = 5, .budget = 5000},
          Setting{.method = Method::pse, .complexes = 5, .budget = 5000}}) {
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

/// Prints the tables of docs/algorithms/morris.md. Usage: morris_limits coverage | cost [parameters trajectories
/// [uniform|beta|correlated]].
/// Repetitions have the seeds 1, 2, 3, ..., so that the figures, but for seconds and memory, are the same every time.

#include <array>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <numbers>
#include <string>
#include <string_view>
#include <sys/resource.h>
#include <vector>

#include <fmt/format.h>

#include "algorithms/analyses/morris.h"
#include "algorithms/screening_functions.h"

namespace mirevo {
namespace {

constexpr int kRepetitions = 200;
constexpr std::int32_t kManyTrajectories = 1 << 16;

struct Function {
  const char* name;
  std::size_t size;
  std::function<double(std::span<const double>)> value;
};

double ishigami(std::span<const double> x) {
  const auto angle = [&](std::size_t i) { return std::numbers::pi * (2.0 * x[i] - 1.0); };
  return std::sin(angle(0)) + 7.0 * std::pow(std::sin(angle(1)), 2) + 0.1 * std::pow(angle(2), 4) * std::sin(angle(0));
}

double sobolG(std::span<const double> x) {
  static constexpr double a[] = {0.0, 1.0, 4.5, 9.0, 99.0, 99.0, 99.0, 99.0};
  double product = 1.0;
  for (std::size_t i = 0; i < std::size(a); ++i) product *= (std::abs(4.0 * x[i] - 2.0) + a[i]) / (1.0 + a[i]);
  return product;
}

SearchSpace unitSpace(std::size_t size) {
  std::vector<ModelParameter> parameters;
  for (std::size_t i = 0; i < size; ++i) {
    ModelParameter& parameter = parameters.emplace_back();
    parameter.name = fmt::format("x{}", i);
    parameter.upperBound = 1.0;
  }
  return BuildSearchSpace(parameters);
}

/// Evaluates a function; every n-th evaluation fails, if n is not 0.
class Evaluation final : public Evaluator {
 public:
  Evaluation(std::function<double(std::span<const double>)> value, int failing)
      : value_(std::move(value)), failing_(failing) {}
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode) override {
    std::vector<EvaluationResult> results;
    for (const ParameterSet& set : sets) {
      EvaluationResult& result = results.emplace_back();
      result.number = ++number_;
      result.measureValues = {value_(set)};
      if (failing_ > 0 && (number_ * 7) % failing_ == 0) result.fail({});
    }
    return results;
  }

 private:
  std::function<double(std::span<const double>)> value_;
  int failing_;
  int number_ = 0;
};

/// mu, mu*, sigma and the share of each parameter over a great many trajectories.
using Truth = std::vector<std::array<double, 4>>;

Truth truthOf(const Function& function, MorrisSettings settings) {
  settings.trajectories = kManyTrajectories;
  settings.candidates = 1;
  const SearchSpace space = unitSpace(function.size);
  const auto distributions = ParameterDistributions::uniform(space);
  const EffectPlan plan = planEffects(settings, space, distributions, 12345);
  Truth truth(function.size);
  for (const EffectTrajectory& trajectory : plan.trajectories) {
    std::vector<double> values;
    for (const ParameterSet& set : setsOf(plan, trajectory, distributions)) values.push_back(function.value(set));
    const int first = trajectory.evaluations[0];
    for (const EffectPair& pair : pairsOf(plan, trajectory)) {
      const double effect =
          (values[static_cast<std::size_t>(pair.to - first)] - values[static_cast<std::size_t>(pair.from - first)]) /
          pair.width;
      truth[pair.parameter][0] += effect / kManyTrajectories;
      truth[pair.parameter][1] += std::abs(effect) / kManyTrajectories;
      truth[pair.parameter][2] += effect * effect / kManyTrajectories;
    }
  }
  double largest = 0.0;
  for (auto& t : truth) {
    t[2] = std::sqrt(t[2] - t[0] * t[0]);
    largest = std::max(largest, t[1]);
  }
  for (auto& t : truth) t[3] = t[1] / largest;
  return truth;
}

struct Coverage {
  std::array<double, 4> holding{};
  std::array<double, 4> leastHolding{1.0, 1.0, 1.0, 1.0};  ///< of a single parameter
  int wronglyFixed = 0;
  int fixed = 0;
};

Coverage coverageOf(const Function& function, const MorrisSettings& settings, int failing, const Truth& truth) {
  const SearchSpace space = unitSpace(function.size);
  const auto distributions = ParameterDistributions::uniform(space);
  std::vector<std::array<int, 4>> holding(function.size);
  std::vector<std::array<int, 4>> limited(function.size);
  Coverage coverage;
  for (int seed = 1; seed <= kRepetitions; ++seed) {
    const EffectPlan plan = planEffects(settings, space, distributions, seed);
    Evaluation evaluation(function.value, failing);
    EffectResults results;
    evaluateEffects(plan, distributions, evaluation, results);
    const MorrisOutcome found = screenParameters(plan, results, settings, seed, {}, {space.names, {"y"}, {}});
    for (std::size_t j = 0; j < function.size; ++j) {
      const ParameterEffects& p = found.outputs[0].effects.parameters[j];
      const LimitedValue* values[] = {&p.mu, &p.muStar, &p.sigma, &p.share};
      for (std::size_t k = 0; k < 4; ++k) {
        if (values[k]->hasLimits()) ++limited[j][k];
        const double rounding = 1e-6 * truth[j][1];
        if (values[k]->lower - rounding <= truth[j][k] && truth[j][k] <= values[k]->upper + rounding) ++holding[j][k];
      }
      if (p.verdict != ScreeningVerdict::fix) continue;
      ++coverage.fixed;
      if (truth[j][3] >= settings.negligibleShare) ++coverage.wronglyFixed;
    }
  }
  for (std::size_t j = 0; j < function.size; ++j) {
    for (std::size_t k = 0; k < 4; ++k) {
      const double share = static_cast<double>(holding[j][k]) / limited[j][k];
      coverage.holding[k] += share / static_cast<double>(function.size);
      coverage.leastHolding[k] = std::min(coverage.leastHolding[k], share);
    }
  }
  return coverage;
}

void printCoverage() {
  const Function functions[] = {{"Morris, 20", 20, morrisFunction}, {"Ishigami, 3", 3, ishigami}, {"G, 8", 8, sobolG}};
  struct Case {
    const char* name;
    MorrisSettings settings;
    int failing;
  };
  const Case cases[] = {{"radial", {}, 0},
                        {"radial, a tenth fails", {}, 10},
                        {"trajectories", {.design = EffectDesign::trajectories}, 0},
                        {"trajectories, a tenth fails", {.design = EffectDesign::trajectories}, 10}};
  fmt::print(
      "| design | function | trajectories | mu | mu* | sigma | share | least mu* | fixed, wrongly |\n"
      "|---|---|---|---|---|---|---|---|---|\n");
  for (const Case& one : cases) {
    for (const Function& function : functions) {
      const Truth truth = truthOf(function, one.settings);
      for (const int trajectories : {10, 20, 30, 50, 100}) {
        MorrisSettings settings = one.settings;
        settings.trajectories = trajectories;
        const Coverage c = coverageOf(function, settings, one.failing, truth);
        fmt::print("| {} | {} | {} | {:.1f} | {:.1f} | {:.1f} | {:.1f} | {:.1f} | {}, {} |\n", one.name, function.name,
                   trajectories, 100.0 * c.holding[0], 100.0 * c.holding[1], 100.0 * c.holding[2], 100.0 * c.holding[3],
                   100.0 * c.leastHolding[1], c.fixed, c.wronglyFixed);
        std::fflush(stdout);
      }
    }
  }
}

/// Of `size` parameters: uniform, beta, and uniform with the first two correlated.
ParameterDistributions distributionsOf(std::string_view kind, std::size_t size) {
  const auto one = kind == "beta" ? betaDistribution(2.5, 1.3, 0.0, 1.0) : uniformDistribution(0.0, 1.0);
  const std::vector<DistributionPointer> all(size, one);
  if (kind != "correlated") return ParameterDistributions(all);
  std::vector<std::vector<double>> correlations(size, std::vector<double>(size, 0.0));
  for (std::size_t i = 0; i < size; ++i) correlations[i][i] = 1.0;
  correlations[0][1] = correlations[1][0] = 0.5;
  return ParameterDistributions(all, GaussianCopula(std::move(correlations), std::vector<std::string>(size)));
}

void printCost(std::size_t size, std::int32_t trajectories, std::string_view kind) {
  const SearchSpace space = unitSpace(size);
  const ParameterDistributions distributions = distributionsOf(kind, size);
  using Clock = std::chrono::steady_clock;
  const auto secondsSince = [](Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
  };
  for (const EffectDesign design : {EffectDesign::radial, EffectDesign::trajectories}) {
    const MorrisSettings settings{.design = design, .trajectories = trajectories};
    auto start = Clock::now();
    const EffectPlan plan = planEffects(settings, space, distributions, 1);
    const double planning = secondsSince(start);
    start = Clock::now();
    Evaluation evaluation(
        [](std::span<const double> x) {
          double sum = 0.0;
          for (std::size_t i = 0; i < x.size(); ++i) sum += x[i] * x[(i + 1) % x.size()] / static_cast<double>(i + 1);
          return sum;
        },
        0);
    EffectResults results;
    evaluateEffects(plan, distributions, evaluation, results);
    const double sets = secondsSince(start);
    start = Clock::now();
    const AnalysisNames names{space.names, {"y"}, {}};
    const MorrisOutcome found = screenParameters(plan, results, settings, 1, {}, names);
    formatMorris(found, plan, settings, names, "file");
    dataTableText(morrisTable(found, settings, names));
    rusage use{};
    getrusage(RUSAGE_SELF, &use);
    fmt::print(
        "{} parameters, {}, {} {} trajectories, {} sets: {:.2f} s planning, {:.2f} s for the sets and the function, "
        "{:.2f} s for statistics and texts of one output; {} MB at most so far\n",
        size, kind, trajectories, kEffectDesignNames[static_cast<int>(design)].name, plan.evaluationCount, planning,
        sets, secondsSince(start), use.ru_maxrss / 1024);
  }
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  const std::string_view table = argc > 1 ? argv[1] : "";
  if (table == "coverage") {
    mirevo::printCoverage();
  } else if (table == "cost") {
    mirevo::printCost(argc > 2 ? static_cast<std::size_t>(std::atoi(argv[2])) : 1000,
                      argc > 3 ? std::atoi(argv[3]) : 30, argc > 4 ? argv[4] : "uniform");
  } else {
    fmt::print(stderr, "usage: morris_limits coverage | cost [parameters trajectories [uniform|beta|correlated]]\n");
    return 2;
  }
  return 0;
}

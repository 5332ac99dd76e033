// Memory and time that a Sobol' analysis takes of its own, without model runs: the design, the results in memory, the
// simulated values on disk, the indices of two outputs, and those of a daily series over a year.
//
//   sobol_scale [RUNS] [PARAMETERS] [TIMES]
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <filesystem>
#include <numeric>
#include <sys/resource.h>

#include <fmt/format.h>

#include "algorithms/analyses/sobol_report.h"
#include "algorithms/analyses/sobol_series.h"
#include "algorithms/sobol_functions.h"
#include "run/results/simulated_values_file.h"

namespace mirevo::bench {
namespace {

class Stopwatch {
 public:
  void say(const std::string& what) {
    const auto now = std::chrono::steady_clock::now();
    rusage used{};
    getrusage(RUSAGE_SELF, &used);
    fmt::print("{:<44} {:>8.2f} s, peak {:>7.1f} MB\n", what, std::chrono::duration<double>(now - last_).count(),
               static_cast<double>(used.ru_maxrss) / 1e3);
    last_ = std::chrono::steady_clock::now();
  }

 private:
  std::chrono::steady_clock::time_point last_ = std::chrono::steady_clock::now();
};

void measure(std::size_t runs, std::size_t parameters, std::size_t times) {
  Stopwatch stopwatch;
  const UnitProblem problem(parameters);
  const SobolDesign design{.rows = runs / (parameters + 2), .factors = parameters};
  UniformGenerator random(1);
  const ReplicateBootstrap bootstrap(1000, random);
  const std::vector<ParameterSet> sets = sobolSets(design, problem.factors, problem.distributions, random);
  stopwatch.say(fmt::format("design of {} sets of {} parameters", sets.size(), parameters));

  const std::filesystem::path path =
      std::filesystem::temp_directory_path() / fmt::format("sobol_scale_{}.bin", getpid());
  SimulatedValuesFile file(path.string(), times, SeriesPrecision::single, 0, true);
  file.create();
  std::vector<double> values;
  EvaluationResult result;
  for (const ParameterSet& set : sets) {
    const double sum = std::accumulate(set.begin(), set.end(), 0.0);
    values.push_back(sum * set.front());
    result.number = static_cast<int>(values.size());
    result.simulatedValues.resize(times);
    for (std::size_t t = 0; t < times; ++t) {
      result.simulatedValues[t] = sum + set[t % parameters] * std::sin(static_cast<double>(t) / 58.0);
    }
    file.add(set, result);
  }
  stopwatch.say(fmt::format("simulated values at {} times to disk", times));

  for (const char* name : {"first", "second"}) sobolOutput(design, values, bootstrap, "measure", name);
  stopwatch.say("indices of two outputs, four sample sizes");

  ObservedSeries observed;
  observed.start = {2001, 1, 1};
  for (std::size_t t = 0; t < times; ++t) observed.days.push_back(static_cast<double>(t));
  observed.values.assign(times, 1.0);
  std::vector<std::size_t> positions(sets.size());
  std::iota(positions.begin(), positions.end(), std::size_t{0});
  std::vector<int> numbers(sets.size());
  std::iota(numbers.begin(), numbers.end(), 1);
  const SobolSeries series = sobolSeries(
      "flow", observed, design, problem.factors, positions,
      [&](std::size_t first, std::size_t count) { return file.columns(numbers, first, count); }, bootstrap);
  stopwatch.say(fmt::format("indices of the series, {:.1f} MB of text", static_cast<double>(series.text.size()) / 1e6));
  std::filesystem::remove(path);
}

}  // namespace
}  // namespace mirevo::bench

int main(int argc, char** argv) {
  const auto argument = [&](int at, std::size_t otherwise) {
    return argc > at ? static_cast<std::size_t>(std::atoll(argv[at])) : otherwise;
  };
  mirevo::bench::measure(argument(1, 100'000), argument(2, 18), argument(3, 365));
}

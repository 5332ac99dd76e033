// How often the 95 % limits of first-order indices of a sample hold the true index, and how far the index is from it on
// average. Ishigami and Homma (1990), and the G function of Saltelli and Sobol' (1995); the published answers.
//
//   build/release/bench/sample_sensitivity/sample_sensitivity_bench [repetitions]

#include "algorithms/analyses/sample_sensitivity.h"

#include <chrono>
#include <cmath>
#include <cstdlib>
#include <numbers>

#include <fmt/core.h>

namespace mirevo {
namespace {

struct Function {
  const char* name;
  double lower;
  double upper;
  double (*valueAt)(const ParameterSet&);
  std::vector<double> indices;
};

double ishigami(const ParameterSet& x) {
  return std::sin(x[0]) + 7 * std::pow(std::sin(x[1]), 2) + 0.1 * std::pow(x[2], 4) * std::sin(x[0]);
}

double gFunction(const ParameterSet& x) {
  constexpr double kA[] = {0, 1, 4.5, 9, 99, 99, 99, 99};
  double product = 1.0;
  for (std::size_t j = 0; j < x.size(); ++j) product *= (std::abs(4 * x[j] - 2) + kA[j]) / (1 + kA[j]);
  return product;
}

void tryFunction(const Function& function, int sampleSize, int repetitions) {
  SearchSpace space;
  const std::size_t p = function.indices.size();
  for (std::size_t j = 0; j < p; ++j) space.names.push_back(fmt::format("x{}", j + 1));
  space.lower.assign(p, function.lower);
  space.upper.assign(p, function.upper);
  space.transformation.assign(p, TransformationType::none);
  std::vector<int> held(p);
  std::vector<double> sums(p);
  std::vector<double> widths(p);
  const auto begin = std::chrono::steady_clock::now();
  for (int seed = 1; seed <= repetitions; ++seed) {
    UncertaintySettings settings;
    settings.sampleSize = sampleSize;
    settings.distributions = ParameterDistributions::uniform(space);
    UncertaintyOutcome outcome{uncertaintySample(settings, seed), {}};
    for (const ParameterSet& set : outcome.sample) {
      outcome.results.emplace_back().objectiveValues = {function.valueAt(set)};
    }
    const auto found = sampleSensitivity(outcome, space, {space.names, {}, {"f"}}, seed);
    for (std::size_t j = 0; j < p; ++j) {
      const SampleDependence& one = found.outputs[0].parameters[j];
      held[j] += one.lower <= function.indices[j] && function.indices[j] <= one.upper ? 1 : 0;
      sums[j] += one.firstOrder;
      widths[j] += 0.5 * (one.upper - one.lower);
    }
  }
  const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - begin;
  for (std::size_t j = 0; j < std::min<std::size_t>(p, 5); ++j) {
    fmt::print("{:<9} {:>6} x{}  true {:.4f}  mean {:>7.4f}  limits +-{:.4f}  held {:>5.1f} %\n", function.name,
               sampleSize, j + 1, function.indices[j], sums[j] / repetitions, widths[j] / repetitions,
               100.0 * held[j] / repetitions);
  }
  fmt::print("{:<9} {:>6}     {:.3f} s a sample\n", function.name, sampleSize, taken.count() / repetitions);
}

}  // namespace
}  // namespace mirevo

int main(int argumentCount, char** arguments) {
  const int repetitions = argumentCount > 1 ? std::atoi(arguments[1]) : 200;
  const double pi = std::numbers::pi;
  const mirevo::Function functions[] = {
      {"Ishigami", -pi, pi, mirevo::ishigami, {0.3139, 0.4424, 0.0}},
      {"G", 0, 1, mirevo::gFunction, {0.7162, 0.1790, 0.0237, 0.0072, 0.0001, 0.0001, 0.0001, 0.0001}}};
  for (const mirevo::Function& function : functions) {
    for (const int size : {100, 200, 500, 2000, 10000}) mirevo::tryFunction(function, size, repetitions);
  }
}

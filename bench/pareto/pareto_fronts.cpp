// pareto_fronts [SEEDS [EVALUATIONS [FUNCTION]]]
//
// The hypervolumes that NSGA-II and PADDS reach on published functions with several objectives, as medians over seeds,
// beside those of the true fronts, and how near the last population of NSGA-II is to them. NSGA-II has the settings of
// its publication: populations of 100, 25,000 evaluations. PADDS, which draws from a front of thousands of sets then,
// is left out there where there are three objectives.
#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/multi_objective_functions.h"
#include "algorithms/pareto/hypervolume.h"
#include "algorithms/searches/nsga_ii.h"
#include "algorithms/searches/padds.h"

namespace mirevo {
namespace {

using testing::MultiObjectiveFunction;
using Points = std::vector<std::vector<double>>;

struct Reached {
  Points front;       ///< of the whole search
  Points population;  ///< the last one
};

Reached search(const MultiObjectiveFunction& function, const std::string& name, int evaluations, int seed) {
  FunctionEvaluator evaluator([&](const ParameterSet& set) {
    EvaluationResult result;
    result.objectiveValues = function.values(set);
    result.aggregate = 0.0;
    return result;
  });
  UniformGenerator random(seed);
  ParetoProblem pareto;
  SearchProblem problem{{function.lower, function.upper, function.lower}, {evaluations}, {}, {}, evaluator, random};
  problem.initialSample = {.includeInitialParameters = false, .generation = SampleGeneration::uniformRandom};
  problem.pareto = &pareto;
  std::unique_ptr<SearchAlgorithm> algorithm;
  if (name == "NSGA-II") {
    algorithm = std::make_unique<NsgaIi>(NsgaIiSettings{}, ParetoSettings{}, std::move(problem));
  } else {
    const PaddsSelection selection = name == "crowding" ? PaddsSelection::crowding
                                     : name == "random" ? PaddsSelection::random
                                                        : PaddsSelection::hypervolume;
    algorithm = std::make_unique<Padds>(PaddsSettings{.selection = selection}, ParetoSettings{}, std::move(problem));
  }
  runSearch(*algorithm, name, {});
  Reached reached{pareto.archive.front(), {}};
  for (const ParetoPoint& point : pareto.population) reached.population.push_back(point.objectives.values);
  return reached;
}

double median(std::vector<double> values) {
  std::ranges::sort(values);
  const std::size_t half = values.size() / 2;
  return values.size() % 2 == 1 ? values[half] : 0.5 * (values[half - 1] + values[half]);
}

/// 500 sets of the true front of a ZDT function, even in the first objective.
Points trueFront(const std::string& name) {
  Points front;
  double least = 1e30;
  for (int i = 0; i <= 100'000; ++i) {
    const double f = i / 100'000.0;
    const double second = name == "ZDT2" || name == "ZDT6" ? 1.0 - f * f
                          : name == "ZDT3"                 ? 1.0 - std::sqrt(f) - f * std::sin(10.0 * M_PI * f)
                                                           : 1.0 - std::sqrt(f);
    if (name == "ZDT6" && f < 0.2807753191) continue;
    if (second < least) front.push_back({f, second});
    least = std::min(least, second);
  }
  Points even;
  for (std::size_t i = 0; i < 500; ++i) even.push_back(front[i * (front.size() - 1) / 499]);
  return even;
}

/// The convergence metric of Deb et al. (2002): mean distance of the points to the nearest of the true front.
double meanDistance(const Points& points, const Points& front) {
  double sum = 0.0;
  for (const auto& point : points) {
    double least = 1e30;
    for (const auto& other : front) least = std::min(least, std::hypot(point[0] - other[0], point[1] - other[1]));
    sum += least;
  }
  return sum / static_cast<double>(points.size());
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  using namespace mirevo;
  const int seeds = argc > 1 ? std::atoi(argv[1]) : 20;
  const int evaluations = argc > 2 ? std::atoi(argv[2]) : 25'000;
  std::puts(fmt::format("{} evaluations, medians of {} seeds\n", evaluations, seeds).c_str());
  std::puts(
      "| function | true front | NSGA-II, last population | mean distance | NSGA-II, all | PADDS by hypervolume | by "
      "crowding | at random |\n|---|---|---|---|---|---|---|---|");
  for (const MultiObjectiveFunction& function : testing::multiObjectiveFunctions()) {
    if (argc > 3 && function.name != argv[3]) continue;
    const std::vector<double> reference(function.objectives, 1.0);
    const Points front = function.objectives == 2 ? trueFront(function.name) : Points{};
    std::vector<double> populations;
    std::vector<double> distances;
    std::string row;
    for (const char* name : {"NSGA-II", "hypervolume", "crowding", "random"}) {
      if (function.objectives > 2 && evaluations > 5000 && name != std::string("NSGA-II")) {
        row += "- | ";
        continue;
      }
      std::vector<double> volumes;
      for (int seed = 1; seed <= seeds; ++seed) {
        const Reached reached = search(function, name, evaluations, seed);
        volumes.push_back(hypervolume(reached.front, reference));
        if (reached.population.empty()) continue;
        populations.push_back(hypervolume(reached.population, reference));
        if (!front.empty()) distances.push_back(meanDistance(reached.population, front));
      }
      row += fmt::format("{:.4f} | ", median(volumes));
    }
    std::puts(fmt::format("| {} | {:.4f} | {:.4f} | {} | {}", function.name, function.frontVolume, median(populations),
                          distances.empty() ? std::string("-") : fmt::format("{:.4f}", median(distances)), row)
                  .c_str());
    std::fflush(stdout);
  }
}

// pareto_fronts [SEEDS [EVALUATIONS [FUNCTION]]]
//
// The hypervolumes that NSGA-II and PADDS reach on published functions with several objectives, as medians over seeds,
// beside those of the true fronts. NSGA-II has the settings of its publication: populations of 100, 25,000 evaluations.
// With as many, the two metrics of that publication follow, as means and variances over the seeds (there were ten),
// beside its figures.
#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <memory>
#include <span>
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

/// 500 points of the true front of a ZDT function, even along it.
Points trueFront(const std::string& name) {
  constexpr double kStep = 1.0e-5;
  const bool isConcave = name == "ZDT2" || name == "ZDT6";
  Points front;
  std::vector<double> lengths;  // of the front up to each of its points, without the gaps
  double least = 1e30;
  for (int i = 0; i <= 100'000; ++i) {
    const double f = i * kStep;
    if (name == "ZDT6" && f < 0.2807753191) continue;
    const double second = isConcave        ? 1.0 - f * f
                          : name == "ZDT3" ? 1.0 - std::sqrt(f) - f * std::sin(10.0 * M_PI * f)
                                           : 1.0 - std::sqrt(f);
    if (second >= least) continue;
    least = second;
    const bool isFirst = front.empty() || f - front.back()[0] > 1.5 * kStep;
    const double before = lengths.empty() ? 0.0 : lengths.back();
    lengths.push_back(isFirst ? before : before + std::hypot(f - front.back()[0], second - front.back()[1]));
    front.push_back({f, second});
  }
  Points even;
  for (int i = 0; i < 500; ++i) {
    const auto at = std::ranges::lower_bound(lengths, lengths.back() * i / 499.0 * (1.0 - 1e-12));
    even.push_back(front[static_cast<std::size_t>(at - lengths.begin())]);
  }
  return even;
}

double distance(const std::vector<double>& a, const std::vector<double>& b) {
  return std::hypot(a[0] - b[0], a[1] - b[1]);
}

/// The convergence metric of Deb et al. (2002): mean distance of the points to the nearest of the true front.
double convergence(const Points& points, const Points& front) {
  double sum = 0.0;
  for (const auto& point : points) {
    double least = 1e30;
    for (const auto& other : front) least = std::min(least, distance(point, other));
    sum += least;
  }
  return sum / static_cast<double>(points.size());
}

/// Their diversity metric: how unequal the distances between neighbours are, and how far the ends of the true front.
double diversity(Points points, const Points& front) {
  std::ranges::sort(points);
  const double ends = distance(points.front(), front.front()) + distance(points.back(), front.back());
  std::vector<double> gaps;
  for (std::size_t i = 1; i < points.size(); ++i) gaps.push_back(distance(points[i - 1], points[i]));
  double all = 0.0;
  for (const double gap : gaps) all += gap;
  const double mean = all / static_cast<double>(gaps.size());
  double unequal = 0.0;
  for (const double gap : gaps) unequal += std::abs(gap - mean);
  return (ends + unequal) / (ends + all);
}

Points nondominated(const Points& points) {
  ParetoArchive archive;
  for (const auto& point : points) archive.add(0, {}, point);
  return archive.front();
}

/// Mean and variance over the seeds.
std::string spreadText(std::span<const double> values) {
  double mean = 0.0;
  for (const double value : values) mean += value / static_cast<double>(values.size());
  double variance = 0.0;
  for (const double value : values) variance += (value - mean) * (value - mean) / static_cast<double>(values.size());
  return fmt::format("{:.6f} ({:.6f})", mean, variance);
}

/// Deb, Pratap, Agarwal and Meyarivan (2002), tables II and III: real-coded NSGA-II, means and variances of ten runs of
/// 250 generations of 100.
constexpr int kPublishedEvaluations = 25'000;
struct Published {
  const char* convergence;
  const char* diversity;
};
const std::map<std::string, Published> kPublished{{"ZDT1", {"0.033482 (0.004750)", "0.390307 (0.001876)"}},
                                                  {"ZDT2", {"0.072391 (0.031689)", "0.430776 (0.004721)"}},
                                                  {"ZDT3", {"0.114500 (0.007940)", "0.738540 (0.019706)"}},
                                                  {"ZDT4", {"0.513053 (0.118460)", "0.702612 (0.064648)"}},
                                                  {"ZDT6", {"0.296564 (0.013135)", "0.668025 (0.009923)"}}};

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  using namespace mirevo;
  const int seeds = argc > 1 ? std::atoi(argv[1]) : 20;
  const int evaluations = argc > 2 ? std::atoi(argv[2]) : kPublishedEvaluations;
  std::puts(fmt::format("{} evaluations, medians of {} seeds\n", evaluations, seeds).c_str());
  std::puts(
      "| function | true front | NSGA-II, last population | NSGA-II, all | PADDS by hypervolume | by crowding | at "
      "random |\n|---|---|---|---|---|---|---|");
  std::string metrics;
  for (const MultiObjectiveFunction& function : testing::multiObjectiveFunctions()) {
    if (argc > 3 && function.name != argv[3]) continue;
    const std::vector<double> reference(function.objectives, 1.0);
    const Points front = function.objectives == 2 ? trueFront(function.name) : Points{};
    std::vector<double> populations;
    std::vector<double> convergences;
    std::vector<double> diversities;
    std::string row;
    for (const char* name : {"NSGA-II", "hypervolume", "crowding", "random"}) {
      std::vector<double> volumes;
      for (int seed = 1; seed <= seeds; ++seed) {
        const Reached reached = search(function, name, evaluations, seed);
        volumes.push_back(hypervolume(reached.front, reference));
        if (reached.population.empty()) continue;
        populations.push_back(hypervolume(reached.population, reference));
        if (front.empty()) continue;
        const Points found = nondominated(reached.population);
        convergences.push_back(convergence(found, front));
        diversities.push_back(diversity(found, front));
      }
      row += fmt::format("{:.4f} | ", median(volumes));
    }
    std::puts(fmt::format("| {} | {:.4f} | {:.4f} | {}", function.name, function.frontVolume, median(populations), row)
                  .c_str());
    std::fflush(stdout);
    if (front.empty()) continue;
    const Published& published = kPublished.at(function.name);
    metrics += fmt::format("| {} | {} | {} | {} | {} |\n", function.name, published.convergence,
                           spreadText(convergences), published.diversity, spreadText(diversities));
  }
  if (evaluations != kPublishedEvaluations) return 0;
  std::puts(fmt::format("\n| function | convergence, published | NSGA-II | diversity, published | NSGA-II |\n"
                        "|---|---|---|---|---|\n{}",
                        metrics)
                .c_str());
}

// pareto_cost [MEMBERS ...]
//
// The searches' own time for an evaluation, beside that of the model, when the front has so many members already
// (default: 100, 1000 and 10,000), in milliseconds of the processor: the worst case for PADDS, in which every second
// set joins the front and the others are dominated, so that for each of these the front is another one from which a set
// is drawn. 200 evaluations, populations of 100. And the course of such a front for its table, once at the end.
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <memory>
#include <numbers>
#include <string>
#include <vector>

#include <fmt/format.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/pareto/front_scale.h"
#include "algorithms/searches/nsga_ii.h"
#include "algorithms/searches/padds.h"

namespace mirevo {
namespace {

constexpr int kEvaluations = 200;
constexpr int kStages = 200;  ///< of the course, as the program has them

/// A point of the sphere, by its angles as shares of the right one.
std::vector<double> onSphere(const ParameterSet& angles) {
  std::vector<double> point(angles.size() + 1, 1.0);
  for (std::size_t i = 0; i < point.size(); ++i) {
    for (std::size_t j = 0; j < angles.size() - std::min(i, angles.size()); ++j) {
      point[i] *= std::cos(0.5 * std::numbers::pi * angles[j]);
    }
    if (i > 0) point[i] *= std::sin(0.5 * std::numbers::pi * angles[angles.size() - i]);
  }
  return point;
}

/// On the sphere, all of them not dominated.
ParetoArchive archiveOf(std::size_t objectives, int members, UniformGenerator& random) {
  ParetoArchive archive;
  for (int i = 0; i < members; ++i) {
    ParameterSet angles(objectives - 1);
    for (double& angle : angles) angle = random.next();
    archive.add(i + 1, angles, onSphere(angles));
  }
  return archive;
}

double millisecondsSince(std::clock_t start) {
  return 1000.0 * static_cast<double>(std::clock() - start) / CLOCKS_PER_SEC;
}

double millisecondsOfCourse(std::size_t objectives, int members) {
  UniformGenerator random(1);
  const ParetoArchive archive = archiveOf(objectives, members, random);
  const std::clock_t start = std::clock();
  frontCourse(archive, {}, kStages);
  return millisecondsSince(start);
}

double millisecondsEach(const std::string& name, std::size_t objectives, int members) {
  const ParameterSet lower(objectives - 1, 0.0);
  const ParameterSet upper(objectives - 1, 1.0);
  UniformGenerator random(1);
  ParetoProblem pareto{archiveOf(objectives, members, random)};
  bool isBehind = false;
  FunctionEvaluator evaluator([&isBehind](const ParameterSet& set) {
    EvaluationResult result;
    result.objectiveValues = onSphere(set);
    isBehind = !isBehind;
    for (double& value : result.objectiveValues) value *= isBehind ? 2.0 : 1.0;
    result.aggregate = 0.0;
    return result;
  });
  SearchProblem problem{{lower, upper, lower}, {kEvaluations + 100}, {}, {}, evaluator, random};
  problem.pareto = &pareto;
  std::unique_ptr<SearchAlgorithm> search;
  if (name == "NSGA-II") {
    search = std::make_unique<NsgaIi>(NsgaIiSettings{}, ParetoSettings{}, std::move(problem));
  } else {
    const PaddsSelection selection = name == "crowding" ? PaddsSelection::crowding
                                     : name == "random" ? PaddsSelection::random
                                                        : PaddsSelection::hypervolume;
    search = std::make_unique<Padds>(PaddsSettings{.selection = selection}, ParetoSettings{}, std::move(problem));
  }
  search->initialise();
  const int before = search->summary().evaluationCount;
  const std::clock_t start = std::clock();
  while (search->summary().evaluationCount < before + kEvaluations && !search->isTerminated()) search->advance();
  return millisecondsSince(start) / (search->summary().evaluationCount - before);
}

}  // namespace
}  // namespace mirevo

int main(int argc, char** argv) {
  std::vector<int> sizes;
  for (int i = 1; i < argc; ++i) sizes.push_back(std::atoi(argv[i]));
  if (sizes.empty()) sizes = {100, 1000, 10'000};
  std::puts(
      "| objectives | members | NSGA-II | PADDS by hypervolume | by crowding | at random | course, once "
      "|\n|---|---|---|---|---|---|---|");
  for (const std::size_t objectives : {2U, 3U, 5U}) {
    for (const int members : sizes) {
      std::string row = fmt::format("| {} | {} |", objectives, members);
      for (const char* name : {"NSGA-II", "hypervolume", "crowding", "random"}) {
        row += fmt::format(" {:.2f} |", mirevo::millisecondsEach(name, objectives, members));
      }
      row += fmt::format(" {:.0f} |", mirevo::millisecondsOfCourse(objectives, members));
      std::puts(row.c_str());
      std::fflush(stdout);
    }
  }
}
